#pragma once

#include <cstdint>

namespace ZeltoTouch::Reliability {

// Hours of simulated sensor input compressed into one run through a live service: reports pour
// in as fast as the input report thread takes them, parameters are written between them, and a
// second thread reads and writes properties all the while. Checks, with gtest expectations:
// - every event the host receives is the one an offline pipeline makes of the same reports and
//   writes, in the same order, and none is missing at the end;
// - every snapshot of the recording holds its reports in order without a gap, within its limit,
//   and the last one ends with the last report sent;
// - the heap in use does not grow once the recording has filled up;
// - no thread is left behind once the service is unscheduled.
struct LiveLoadOptions {
    uint64_t reportCount = 0;
    uint64_t reportsPerParameterWrite = 5000;
};

void runLiveLoad(const LiveLoadOptions& options);

}  // namespace ZeltoTouch::Reliability
