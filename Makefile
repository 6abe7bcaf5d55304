# Convenience front end: every target forwards to Scripts/dev, which installs what is
# missing, configures the CMake preset and builds before running the job.
JOBS := deps build test test-asan test-tsan demo bench clean fuzz-smoke soak
.PHONY: $(JOBS) fuzz
$(JOBS):
	@Scripts/dev $@
# make fuzz [FUZZ_SECONDS=N]: each target runs N seconds (default 60)
fuzz:
	@Scripts/dev fuzz $(FUZZ_SECONDS)
