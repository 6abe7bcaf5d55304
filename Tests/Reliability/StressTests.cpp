// A few minutes of sensor input through the live service, short enough for every test run.

#include <gtest/gtest.h>

#include "Tests/Reliability/LiveLoad.h"

namespace ZeltoTouch::Reliability {
namespace {

TEST(LiveLoad, TenMinutesOfFramesWithPropertiesReadAndWritten) {
    runLiveLoad({.reportCount = 60'000, .reportsPerParameterWrite = 2'000});
}

}  // namespace
}  // namespace ZeltoTouch::Reliability
