#include <cstdint>
#include <stdexcept>

#include "Shared/Recording/PipelineRecording.h"
#include "Shared/Util/HostClock.h"
#include "Shared/Util/MachTime.h"

namespace ZeltoTouch {

namespace {

// The wait between two frames (difference in ns, single precision throughout), truncated to
// whole microseconds. A NaN speed waits 0; a wait beyond 64 bits saturates.
uint64_t waitMicroseconds(uint64_t differenceNs, float speed) noexcept {
    const float microseconds = static_cast<float>(differenceNs) / speed / 1000.0f;
    if (!(microseconds >= 1.0f)) return 0;
    if (microseconds >= 18446744073709551616.0f) return UINT64_MAX;
    return static_cast<uint64_t>(microseconds);
}

}  // namespace

// Sorting first keeps every delivery time at or after the start: a frame older than the first
// one would otherwise make its offset wrap. The sort is stable, so frames with equal
// timestamps keep their recorded order, and a list in order is left as it is.
void PipelineRecording::playReset() {
    sortFrames(_frames);
    _play = {true, _frames.begin(), Util::hostClock().machTimeNow(), std::nullopt};
}

bool PipelineRecording::playCanContinue() const noexcept { return _play.valid && _play.iterator != _frames.end(); }

void PipelineRecording::playNextFrame(float speed) {
    if (!playCanContinue()) throw std::runtime_error("playback finished");
    if (speed <= 0.0f) speed = 1.0f;
    const Frame& frame = *_play.iterator++;

    if (_play.lastFrameTimeNs && frame.timestamp > *_play.lastFrameTimeNs)
        Util::hostClock().sleepMicroseconds(waitMicroseconds(frame.timestamp - *_play.lastFrameTimeNs, speed));
    _play.lastFrameTimeNs = frame.timestamp;
    if (!pipeline) return;

    const uint64_t deliveryTime =
        _play.startTimeMach + Util::machTimeFromNanoseconds(frame.timestamp - _frames.front().timestamp);
    switch (frame.type) {
        case Frame::Type::State:
            pipeline->setState(deliveryTime, frame.key, frame.value);
            break;
        case Frame::Type::InputReport:
            pipeline->handleInputReport(deliveryTime, frame.data.data(), frame.data.size());
            break;
        case Frame::Type::Metadata:
            pipeline->handleMetadata(deliveryTime, frame.key, frame.value);
            break;
    }
}

}  // namespace ZeltoTouch
