#pragma once

#include <cstdint>
#include <memory>
#include <mutex>
#include <vector>

namespace ZeltoTouch::Platform {

// Emits a trace point: a static user-space probe "zelto_touch:trace" with the code and four
// arguments (visible to perf and bpftrace, a no-op when nobody listens), and a call to the
// process-wide observer when one is installed. Without an observer the call costs one atomic
// load beside the probe and never allocates.
void trace(uint32_t code, uint64_t a, uint64_t b, uint64_t c, uint64_t d) noexcept;

class TraceObserver {
public:
    virtual ~TraceObserver() = default;
    virtual void traced(uint32_t code, uint64_t a, uint64_t b, uint64_t c, uint64_t d) = 0;
};

// Installs (or, with null, removes) the process-wide observer. A call in flight on another
// thread keeps the observer it started with alive until it returns.
void setTraceObserver(std::shared_ptr<TraceObserver> observer);

// An observer that keeps every trace point, for tests. Thread-safe.
class TraceRecorder final : public TraceObserver {
public:
    struct Record {
        uint32_t code;
        uint64_t args[4];
        friend bool operator==(const Record&, const Record&) = default;
    };

    void traced(uint32_t code, uint64_t a, uint64_t b, uint64_t c, uint64_t d) override;
    std::vector<Record> records() const;
    std::vector<Record> recordsWithCode(uint32_t code) const;

private:
    mutable std::mutex _lock;
    std::vector<Record> _records;
};

// Installs a fresh TraceRecorder for the lifetime of this object (tests).
class ScopedTraceRecorder {
public:
    ScopedTraceRecorder();
    ~ScopedTraceRecorder();
    ScopedTraceRecorder(const ScopedTraceRecorder&) = delete;
    ScopedTraceRecorder& operator=(const ScopedTraceRecorder&) = delete;

    const TraceRecorder& recorder() const noexcept { return *_recorder; }

private:
    std::shared_ptr<TraceRecorder> _recorder;
};

}  // namespace ZeltoTouch::Platform
