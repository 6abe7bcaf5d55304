// A live session, property writes included, must replay from its recording into the very same
// events: the recording is complete and in order.

#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "Tests/Service/ServiceInspector.h"
#include "Tests/Service/ServiceTestSupport.h"

namespace ZeltoTouch::ServiceTest {
namespace {

struct SessionStep {
    const char* script;                         // gestures played after the writes
    std::vector<std::pair<const char*, PropertyValue>> writes;  // property writes before them
};

TEST(LiveSession, ReplaysIntoTheSameEvents) {
    logCapture().clear();
    RegisteredDevice registered;
    ServicePointer service = makeService();
    auto queue = Platform::DispatchQueue::create("live host queue");
    EventCollector collector(queue);
    ASSERT_EQ(service->startWithService(registered.service.handle(), PropertyValue()), kZeltoSuccess);
    service->setEventCallback(EventCollector::callback, &collector, nullptr);
    service->scheduleWithDispatchQueue(queue);
    ASSERT_TRUE(registered.device->waitUntilScheduled());

    const SessionStep steps[] = {
        {"idle 100ms\ntap play-pause 120ms\nidle 500ms\nhold volume-up 900ms\nidle 500ms\n", {}},
        {"tap volume-down 120ms\nidle 500ms\nbrush volume-up 250ms\nidle 500ms\n",
         {{"Pipeline.Algs.EnableTapSuppression", PropertyValue::fromBool(false)},
          {"Pipeline.Algs.HoldTimeoutMilliseconds", PropertyValue::fromUInt32(300)}}},
        {"hold play-pause 700ms\nidle 400ms\ntap volume-up 120ms\nidle 500ms\n",
         {{"Pipeline.Algs.EnableTapSuppression", PropertyValue::fromBool(true)},
          {"Pipeline.Algs.HoldTimeoutMilliseconds", PropertyValue::fromUInt32(800)}}},
    };
    uint32_t startTimeMs = 0;
    for (const SessionStep& step : steps) {
        for (const auto& [key, value] : step.writes) {
            ASSERT_TRUE(service->setProperty(value, PropertyValue::string(key)));
        }
        const auto reports = reportsOfScript(step.script, startTimeMs);
        for (const Bytes& report : reports) ASSERT_TRUE(registered.device->deliver(report));
        startTimeMs += static_cast<uint32_t>(reports.size()) * 10;
    }
    queue->barrier();
    const PropertyValue recording = service->getPropertyForKey(PropertyValue::string("Recording"));
    service->unscheduleWithDispatchQueue(queue);
    queue->barrier();

    const auto live = collector.events();
    ASSERT_GE(live.size(), 8u) << "a session with several gestures";
    ASSERT_TRUE(recording.isString());
    EXPECT_EQ(replayEvents(recording), live);
}

}  // namespace
}  // namespace ZeltoTouch::ServiceTest
