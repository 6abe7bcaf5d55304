// Hours of sensor input through the live service (labelled "soak": `make soak` runs it, the
// default test command leaves it out).

#include <gtest/gtest.h>

#include "Tests/Reliability/LiveLoad.h"

namespace ZeltoTouch::Reliability {
namespace {

TEST(LiveSoak, TenHoursOfFramesWithPropertiesReadAndWritten) {
    runLiveLoad({.reportCount = 3'600'000, .reportsPerParameterWrite = 5'000});
}

}  // namespace
}  // namespace ZeltoTouch::Reliability
