#include "Tests/Reliability/LiveLoad.h"

#include <atomic>
#include <cstdio>
#include <deque>
#include <mutex>
#include <optional>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include <malloc.h>

#include <gtest/gtest.h>

#include "Shared/Pipeline/Pipeline.h"
#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/Log.h"
#include "Tests/Reliability/GestureStream.h"
#include "Tests/Service/ServiceInspector.h"
#include "Tests/Service/ServiceTestSupport.h"

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define ZELTO_SANITIZED_HEAP 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define ZELTO_SANITIZED_HEAP 1
#endif
#endif
#ifdef ZELTO_SANITIZED_HEAP
// The sanitizers' allocator statistics (declared here: gcc ships no header for them).
extern "C" size_t __sanitizer_get_current_allocated_bytes();
#endif

namespace ZeltoTouch::Reliability {

namespace {

using ServiceTest::Bytes;

// Errors are formatted (a failure would show in a sanitizer report) but nothing is kept: a
// capture of millions of lines would itself be the memory growth the run looks for.
class DiscardingLogSink final : public LogSink {
public:
    bool isEnabled(std::string_view, LogLevel level) const noexcept override { return level != LogLevel::Debug; }
    void write(std::string_view, LogLevel, std::string_view) override {}
};

size_t heapBytesInUse() {
#ifdef ZELTO_SANITIZED_HEAP
    return __sanitizer_get_current_allocated_bytes();
#else
    const struct mallinfo2 info = mallinfo2();
    return info.uordblks + info.hblkhd;
#endif
}

constexpr uint32_t get32(const uint8_t* p) { return p[0] | p[1] << 8 | p[2] << 16 | static_cast<uint32_t>(p[3]) << 24; }
void put32(uint8_t* p, uint32_t v) {
    for (int i = 0; i < 4; ++i) p[i] = static_cast<uint8_t>(v >> (8 * i));
}

// An endless sensor session: one round of every gesture, played again and again, each report
// numbered by one running sequence (an image's frame number, a reset's context bytes) so that
// a recording shows whether any report went missing. The image clock starts a minute before
// it wraps.
class EndlessSession {
public:
    EndlessSession()
        : _round(ServiceTest::reportsOfScript(
              "idle 100ms\ntap volume-up 120ms\nidle 400ms\nhold play-pause 900ms\nidle 300ms\n"
              "slide volume-down volume-up 300ms\nidle 400ms\nbrush volume-up 250ms\nidle 300ms\n"
              "hold volume-down 700ms reset-after 300ms\nidle 300ms\npalm 300ms\nidle 400ms\n")) {}

    Bytes next() {
        Bytes report = _round[_sequence % _round.size()];
        if (report[0] == InputReport::Image::kReportID) {
            const uint32_t roundTimeMs = static_cast<uint32_t>(_round.size() * 10);
            const auto round = static_cast<uint32_t>(_sequence / _round.size());
            put32(&report[1], static_cast<uint32_t>(_sequence));
            put32(&report[5], kStartTimeMs + round * roundTimeMs + get32(&report[5]));
        } else {
            put32(&report[2], static_cast<uint32_t>(_sequence));
        }
        ++_sequence;
        return report;
    }
    uint64_t sent() const { return _sequence; }

    // The running number of a report made by next().
    static uint32_t sequenceOf(const ReportBytes& report) {
        return get32(report.data() + (report.data()[0] == InputReport::Image::kReportID ? 1 : 2));
    }

private:
    static constexpr uint32_t kStartTimeMs = 0xFFFFFFFFu - 60'000;
    const std::vector<Bytes> _round;
    uint64_t _sequence = 0;
};

// The events the host must receive, from an offline pipeline fed in step with the live one;
// the host's callback checks each delivery against the head of the line.
class ExpectedEvents {
public:
    ExpectedEvents() {
        _pipeline->hidEventsProbe = std::make_shared<std::function<void(uint64_t, const HIDEventList&)>>(
            [this](uint64_t, const HIDEventList& events) {
                std::lock_guard lock(_lock);
                for (const HIDEventRef& event : events) _expected.push_back(StreamEvent::of(*event));
            });
    }
    Pipeline& pipeline() { return *_pipeline; }

    static void callback(void* target, void*, void*, HIDEvent* event, uint32_t) {
        static_cast<ExpectedEvents*>(target)->delivered(StreamEvent::of(*event));
    }
    uint64_t matched() const {
        std::lock_guard lock(_lock);
        return _matched;
    }
    size_t outstanding() const {
        std::lock_guard lock(_lock);
        return _expected.size();
    }
    std::string firstMismatch() const {
        std::lock_guard lock(_lock);
        return _firstMismatch;
    }

private:
    void delivered(const StreamEvent& event) {
        std::lock_guard lock(_lock);
        if (!_firstMismatch.empty()) return;
        std::ostringstream text;
        if (_expected.empty()) {
            text << "event " << _matched << " " << event << " was not expected";
        } else if (!(_expected.front() == event)) {
            text << "event " << _matched << " was " << event << ", expected " << _expected.front();
        } else {
            _expected.pop_front();
            ++_matched;
            return;
        }
        _firstMismatch = text.str();
    }

    std::shared_ptr<Pipeline> _pipeline = std::make_shared<Pipeline>();
    mutable std::mutex _lock;
    std::deque<StreamEvent> _expected;
    uint64_t _matched = 0;
    std::string _firstMismatch;
};

// One look at the recording through the "Recording" property: reports in order without a gap,
// at most the limit of reports and metadata. Returns the last report's sequence number.
std::optional<uint32_t> checkRecordingSnapshot(ZeltoTouchHIDService& service) {
    const PropertyValue text = service.getPropertyForKey(PropertyValue::string("Recording"));
    EXPECT_TRUE(text.isString());
    if (!text.isString()) return std::nullopt;
    const PipelineRecording recording(text);
    uint64_t limited = 0, lastTimestamp = 0;
    std::optional<uint32_t> last;
    for (const PipelineRecording::Frame& frame : recording.frames()) {
        EXPECT_GE(frame.timestamp, lastTimestamp) << "recording out of time order";
        lastTimestamp = frame.timestamp;
        if (frame.type == PipelineRecording::Frame::Type::State) continue;
        ++limited;
        if (frame.type != PipelineRecording::Frame::Type::InputReport) continue;
        const uint32_t sequence = EndlessSession::sequenceOf(frame.data);
        if (last && sequence != *last + 1) {
            ADD_FAILURE() << "recording jumps from report " << *last << " to " << sequence;
            return std::nullopt;
        }
        last = sequence;
    }
    EXPECT_LE(limited, ZeltoTouchHIDService::kMaxRecordedFrames);
    return last;
}

// The host's other thread: reads every kind of property, the recording included, and writes
// keys that change nothing the gesture machine does, until told to stop.
class HostProperties {
public:
    explicit HostProperties(ZeltoTouchHIDService& service)
        : _thread([this, &service] {
              const char* reads[] = {"Pipeline.Algs.EventStats", "Pipeline.DebugInfo", "Pipeline.Algs.HoldTimeoutMilliseconds",
                                     "FirmwareDebugReports", "Version", "FactoryResetHoldDuration"};
              for (uint64_t round = 0; !_stop.load(); ++round) {
                  for (const char* key : reads) service.getPropertyForKey(PropertyValue::string(key));
                  service.setProperty(PropertyValue::fromFloat(static_cast<float>(round % 7)),
                                      PropertyValue::string("Pipeline.Algs.VirtualNormalizationFactors." + std::to_string(round % 23)));
                  service.setProperty(PropertyValue(), PropertyValue::string("Pipeline.Algs.ResetEventStats"));
                  if (round % 16 == 0) {
                      checkRecordingSnapshot(service);
                      _snapshots.fetch_add(1);
                  }
              }
          }) {}
    ~HostProperties() { stop(); }
    void stop() {
        _stop = true;
        if (_thread.joinable()) _thread.join();
    }
    uint64_t snapshots() const { return _snapshots.load(); }

private:
    std::atomic<bool> _stop{false};
    std::atomic<uint64_t> _snapshots{0};
    std::thread _thread;
};

// The parameters the session is played with in turn; the live service gets them as property
// writes, the offline pipeline as state writes at the same point of the stream.
const std::vector<std::pair<std::string, PropertyValue>>& parameterWrites() {
    static const std::vector<std::pair<std::string, PropertyValue>> writes = {
        {"HoldTimeoutMilliseconds", PropertyValue::fromUInt32(300)},
        {"EnableTapSuppression", PropertyValue::fromBool(false)},
        {"ActivationThreshold", PropertyValue::fromFloat(150)},
        {"HoldTimeoutMilliseconds", PropertyValue::fromUInt32(800)},
        {"EnableTapSuppression", PropertyValue::fromBool(true)},
        {"ActivationThreshold", PropertyValue::fromFloat(200)},
        {"HoldTimeoutMilliseconds", PropertyValue::fromUInt32(500)},
    };
    return writes;
}

}  // namespace

void runLiveLoad(const LiveLoadOptions& options) {
    static DiscardingLogSink discarding;
    LogSink* const previousSink = Log::sink();
    Log::setSink(&discarding);

    ServiceTest::RegisteredDevice registered;
    auto queue = Platform::DispatchQueue::create("load host queue");
    const size_t baselineThreads = ServiceTest::threadCount();
    ServiceTest::ServicePointer service = ServiceTest::makeService();
    ExpectedEvents expected;
    ASSERT_EQ(service->startWithService(registered.service.handle(), PropertyValue()), kZeltoSuccess);
    ASSERT_TRUE(service->openWithOptions(0));
    service->setEventCallback(ExpectedEvents::callback, &expected, nullptr);
    service->scheduleWithDispatchQueue(queue);
    ASSERT_TRUE(registered.device->waitUntilScheduled());

    EndlessSession session;
    std::optional<size_t> heapAfterWarmUp;
    {
        HostProperties host(*service);
        size_t nextWrite = 0;
        for (uint64_t n = 1; n <= options.reportCount; ++n) {
            const Bytes report = session.next();
            expected.pipeline().handleInputReport(n, report.data(), report.size());
            // Waiting for a report to be handled means every report before it has been too: that
            // keeps the backlog small, and puts a parameter write after all reports so far.
            const bool writeNow = n % options.reportsPerParameterWrite == 0;
            const bool wait = writeNow || n % 256 == 0 || n == options.reportCount;
            ASSERT_TRUE(wait ? registered.device->deliver(report) : registered.device->post(report));
            if (writeNow) {
                const auto& [key, value] = parameterWrites()[nextWrite++ % parameterWrites().size()];
                ASSERT_TRUE(service->setProperty(value, PropertyValue::string("Pipeline.Algs." + key)));
                expected.pipeline().setState(0, "Algs." + key, value);
            }
            if (n == options.reportCount / 5) {
                queue->barrier();
                heapAfterWarmUp = heapBytesInUse();
            }
        }
        queue->barrier();
        host.stop();
        EXPECT_GT(host.snapshots(), 0u);
    }

    EXPECT_EQ(expected.firstMismatch(), "");
    EXPECT_EQ(expected.outstanding(), 0u) << "events the host never received";
    EXPECT_GT(expected.matched(), options.reportCount / 200) << "a session of gestures makes events";
    const std::optional<uint32_t> lastRecorded = checkRecordingSnapshot(*service);
    ASSERT_TRUE(lastRecorded.has_value());
    EXPECT_EQ(*lastRecorded, static_cast<uint32_t>(session.sent() - 1)) << "the last report must be recorded";
    if (heapAfterWarmUp) {
        const size_t heapAtEnd = heapBytesInUse();
        std::printf("%llu reports, %llu events: heap in use %zu bytes after warm-up, %zu at the end\n",
                    static_cast<unsigned long long>(options.reportCount),
                    static_cast<unsigned long long>(expected.matched()), *heapAfterWarmUp, heapAtEnd);
        EXPECT_LT(heapAtEnd, *heapAfterWarmUp + 16 * 1024 * 1024)
            << "heap grew from " << *heapAfterWarmUp << " to " << heapAtEnd << " bytes";
    }

    service->unscheduleWithDispatchQueue(queue);
    queue->barrier();
    EXPECT_EQ(ServiceTest::threadCount(), baselineThreads) << "a thread outlived unscheduling";
    ZeltoTouchHIDServiceInspector inspector(*service);
    EXPECT_EQ(inspector.installedProbeCount(), 0);
    Log::setSink(previousSink);
}

}  // namespace ZeltoTouch::Reliability
