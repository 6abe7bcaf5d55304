// Simulated sensor input compressed into one run through a live service: reports pour in as fast
// as the input report thread takes them, parameters are written between them, and a second
// thread reads and writes properties all the while. Checks that
// - the host receives, in order, exactly the events an offline pipeline makes of the same
//   reports and writes;
// - every snapshot of the recording holds its reports in order without a gap, within its limit,
//   and the last one ends with the last report sent;
// - the heap in use does not grow once the recording has filled up;
// - no thread is left behind once the service is unscheduled.
// The soak build (ZELTO_SOAK, label "soak") runs hours of input, the default test run minutes.

#include <algorithm>
#include <atomic>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include <malloc.h>

#include <gtest/gtest.h>

#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/Log.h"
#include "Tests/Service/ServiceTestSupport.h"

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define ZELTO_SANITIZED_HEAP 1
// The sanitizers' allocator statistics (declared here: gcc ships no header for them).
extern "C" size_t __sanitizer_get_current_allocated_bytes();
#endif

namespace ZeltoTouch::Reliability {
namespace {

using namespace ServiceTest;

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

// An endless sensor session: one round of every gesture, played again and again, each report
// numbered by one running sequence (an image's frame number, a reset's context bytes) so that
// a recording shows whether any report went missing. The image clock starts a minute before
// it wraps.
class EndlessSession {
public:
    Bytes next() {
        Bytes report = _round[_sequence % _round.size()];
        if (report[0] == InputReport::Image::kReportID) {
            const auto round = static_cast<uint32_t>(_sequence / _round.size());
            put32(&report[1], static_cast<uint32_t>(_sequence));
            put32(&report[5], kStartTimeMs + round * static_cast<uint32_t>(_round.size() * 10) + get32(&report[5]));
        } else {
            put32(&report[2], static_cast<uint32_t>(_sequence));
        }
        ++_sequence;
        return report;
    }

    // The running number of a report made by next().
    static uint32_t sequenceOf(const ReportBytes& report) {
        return get32(report.data() + (report.data()[0] == InputReport::Image::kReportID ? 1 : 2));
    }

private:
    static constexpr uint32_t kStartTimeMs = 0xFFFFFFFFu - 60'000;
    const std::vector<Bytes> _round = reportsOfScript(
        "idle 100ms\ntap volume-up 120ms\nidle 400ms\nhold play-pause 900ms\nidle 300ms\n"
        "slide volume-down volume-up 300ms\nidle 400ms\nbrush volume-up 250ms\nidle 300ms\n"
        "hold volume-down 700ms reset-after 300ms\nidle 300ms\npalm 300ms\nidle 400ms\n");
    uint64_t _sequence = 0;
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
    EXPECT_LE(limited, 4350u) << "reports and metadata beyond the recording's limit";
    return last;
}

void runLiveLoad(uint64_t reportCount, uint64_t reportsPerParameterWrite) {
    static DiscardingLogSink discarding;
    LogSink* const previousSink = Log::sink();
    Log::setSink(&discarding);

    RegisteredDevice registered;
    auto queue = Platform::DispatchQueue::create("load host queue");
    const size_t baselineThreads = threadCount();
    ServicePointer service = makeService();
    EventCollector live(queue, nullptr, service->getServiceInterface());
    EventTrace offline;
    ASSERT_EQ(service->startWithService(registered.service.handle(), PropertyValue()), kZeltoSuccess);
    ASSERT_TRUE(service->openWithOptions(0));
    service->setEventCallback(EventCollector::callback, &live, nullptr);
    service->scheduleWithDispatchQueue(queue);
    ASSERT_TRUE(registered.device->waitUntilScheduled());

    // Played with in turn: the live service gets them as property writes, the offline pipeline
    // as state writes at the same point of the stream.
    const std::pair<std::string, PropertyValue> writes[] = {
        {"HoldTimeoutMilliseconds", PropertyValue::fromUInt32(300)}, {"EnableTapSuppression", PropertyValue::fromBool(false)},
        {"ActivationThreshold", PropertyValue::fromFloat(150)}, {"HoldTimeoutMilliseconds", PropertyValue::fromUInt32(800)},
        {"EnableTapSuppression", PropertyValue::fromBool(true)}, {"ActivationThreshold", PropertyValue::fromFloat(200)},
    };
    EndlessSession session;
    uint64_t eventCount = 0;
    std::optional<size_t> heapAfterWarmUp;
    std::atomic<uint64_t> snapshots{0};
    {
        // The host's other thread reads every kind of property, the recording included, and
        // writes keys that change nothing the gesture machine does.
        std::jthread host([&](std::stop_token stop) {
            for (uint64_t round = 0; !stop.stop_requested(); ++round) {
                for (const char* key : {"Pipeline.Algs.EventStats", "Pipeline.DebugInfo", "FirmwareDebugReports",
                                        "Pipeline.Algs.HoldTimeoutMilliseconds", "Version", "ServicePluginDebug",
                                        "FactoryResetHoldDuration"}) {
                    EXPECT_TRUE(service->getPropertyForKey(PropertyValue::string(key)).hasValue()) << key;
                }
                EXPECT_TRUE(service->setProperty(PropertyValue::fromFloat(static_cast<float>(round % 7)),
                                                 PropertyValue::string("Pipeline.Algs.VirtualNormalizationFactors." +
                                                                       std::to_string(round % 23))));
                EXPECT_TRUE(service->setProperty(PropertyValue(), PropertyValue::string("Pipeline.Algs.ResetEventStats")));
                if (round % 16 == 0 && checkRecordingSnapshot(*service)) ++snapshots;
            }
        });
        for (uint64_t n = 1; n <= reportCount; ++n) {
            const Bytes report = session.next();
            offline.pipeline->handleInputReport(n, report.data(), report.size());
            // Waiting for a report to be handled means every report before it has been too: that
            // keeps the backlog small, lets the events so far be compared, and puts a parameter
            // write after all reports so far.
            const bool writeNow = n % reportsPerParameterWrite == 0;
            if (!writeNow && n % 256 != 0 && n != reportCount) {
                ASSERT_TRUE(registered.device->post(report));
                continue;
            }
            ASSERT_TRUE(registered.device->deliver(report));
            queue->barrier();
            ASSERT_EQ(live.events(), offline.events) << "the events up to report " << n;
            eventCount += offline.events.size();
            live.clear();
            offline.events.clear();
            if (writeNow) {
                const auto& [key, value] = writes[(n / reportsPerParameterWrite - 1) % std::size(writes)];
                ASSERT_TRUE(service->setProperty(value, PropertyValue::string("Pipeline.Algs." + key)));
                offline.pipeline->setState(0, "Algs." + key, value);
            }
            if (!heapAfterWarmUp && n >= reportCount / 5) heapAfterWarmUp = heapBytesInUse();
        }
    }
    EXPECT_GT(snapshots.load(), 0u);
    EXPECT_GT(eventCount, reportCount / 200) << "a session of gestures makes events";
    const std::optional<uint32_t> lastRecorded = checkRecordingSnapshot(*service);
    ASSERT_TRUE(lastRecorded.has_value());
    EXPECT_EQ(*lastRecorded, static_cast<uint32_t>(reportCount - 1)) << "the last report must be recorded";
    const PipelineRecording full(service->getPropertyForKey(PropertyValue::string("Recording")));
    const auto limited = [](const PipelineRecording::Frame& f) { return f.type != PipelineRecording::Frame::Type::State; };
    EXPECT_EQ(std::ranges::count_if(full.frames(), limited), 4350) << "reports and metadata of a full recording";
    EXPECT_LT(heapBytesInUse(), *heapAfterWarmUp + 16 * 1024 * 1024) << "after warm-up: " << *heapAfterWarmUp;
    service->unscheduleWithDispatchQueue(queue);
    queue->barrier();
    EXPECT_EQ(threadCount(), baselineThreads) << "a thread outlived unscheduling";
    EXPECT_EQ(ZeltoTouchHIDServiceInspector(*service).installedProbeCount(), 0);
    Log::setSink(previousSink);
}

#ifdef ZELTO_SOAK
TEST(LiveSoak, TenHoursOfFramesWithPropertiesReadAndWritten) { runLiveLoad(3'600'000, 5'000); }
#else
TEST(LiveLoad, TenMinutesOfFramesWithPropertiesReadAndWritten) { runLiveLoad(60'000, 2'000); }
#endif

}  // namespace
}  // namespace ZeltoTouch::Reliability
