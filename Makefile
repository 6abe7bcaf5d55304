# Convenience front end: every target forwards to Scripts/dev, which installs what is
# missing, configures the CMake preset and builds before running the job.
JOBS := deps build test test-asan test-tsan demo bench clean
.PHONY: $(JOBS)
$(JOBS):
	@Scripts/dev $@
