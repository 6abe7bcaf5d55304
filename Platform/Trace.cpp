#include "Platform/Trace.h"

#include <atomic>
#include <sys/sdt.h>

namespace ZeltoTouch::Platform {

namespace {

struct ObserverSlot {
    std::atomic<bool> installed{false};
    std::mutex lock;
    std::shared_ptr<TraceObserver> observer;
};

ObserverSlot& observerSlot() {
    static ObserverSlot slot;
    return slot;
}

}  // namespace

void trace(uint32_t code, uint64_t a, uint64_t b, uint64_t c, uint64_t d) noexcept {
    STAP_PROBE5(zelto_touch, trace, code, a, b, c, d);
    ObserverSlot& slot = observerSlot();
    if (!slot.installed.load(std::memory_order_acquire)) return;
    std::shared_ptr<TraceObserver> observer;
    {
        std::lock_guard lock(slot.lock);
        observer = slot.observer;
    }
    if (observer) {
        try {
            observer->traced(code, a, b, c, d);
        } catch (...) {
            // An observer is a diagnostic aid; its failure must not reach the traced code.
        }
    }
}

void setTraceObserver(std::shared_ptr<TraceObserver> observer) {
    ObserverSlot& slot = observerSlot();
    std::lock_guard lock(slot.lock);
    slot.installed.store(observer != nullptr, std::memory_order_release);
    slot.observer = std::move(observer);
}

void TraceRecorder::traced(uint32_t code, uint64_t a, uint64_t b, uint64_t c, uint64_t d) {
    std::lock_guard lock(_lock);
    _records.push_back({code, {a, b, c, d}});
}

std::vector<TraceRecorder::Record> TraceRecorder::records() const {
    std::lock_guard lock(_lock);
    return _records;
}

std::vector<TraceRecorder::Record> TraceRecorder::recordsWithCode(uint32_t code) const {
    std::vector<Record> matching;
    for (const Record& record : records()) {
        if (record.code == code) matching.push_back(record);
    }
    return matching;
}

ScopedTraceRecorder::ScopedTraceRecorder() : _recorder(std::make_shared<TraceRecorder>()) {
    setTraceObserver(_recorder);
}

ScopedTraceRecorder::~ScopedTraceRecorder() { setTraceObserver(nullptr); }

}  // namespace ZeltoTouch::Platform
