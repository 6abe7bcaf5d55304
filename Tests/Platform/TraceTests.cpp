#include <gtest/gtest.h>

#include "Platform/Trace.h"

namespace ZeltoTouch::Platform {
namespace {

TEST(Trace, TheObserverSeesCodeAndArgumentsInOrder) {
    trace(0x2B150180, 9, 9, 9, 9);  // nobody listening: nothing to see later
    std::vector<TraceRecorder::Record> records;
    {
        ScopedTraceRecorder recorder;
        trace(0x2B150180, 1, 2, 3, 4);
        trace(0x2B150184, 3, 0, 0, 0);
        records = recorder.recorder().records();
        EXPECT_EQ(recorder.recorder().recordsWithCode(0x2B150184).size(), 1u);
    }
    trace(0x2B150188, 5, 5, 5, 5);  // after removal: not recorded
    const std::vector<TraceRecorder::Record> expected = {{0x2B150180, {1, 2, 3, 4}}, {0x2B150184, {3, 0, 0, 0}}};
    EXPECT_EQ(records, expected);
}

}  // namespace
}  // namespace ZeltoTouch::Platform
