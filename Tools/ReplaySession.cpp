#include "Tools/ReplaySession.h"

#include <stdexcept>

#include "Shared/Util/HostClock.h"

namespace ZeltoTouch::Tools {
namespace {

// The installed clock's time and timebase, without any waiting.
class NonWaitingClock final : public Util::HostClock {
public:
    explicit NonWaitingClock(const Util::HostClock& base) noexcept : _base(base) {}
    Util::Timebase timebase() const noexcept override { return _base.timebase(); }
    uint64_t machTimeNow() const noexcept override { return _base.machTimeNow(); }
    void sleepMicroseconds(uint64_t) const noexcept override {}

private:
    const Util::HostClock& _base;
};

// Installs a non-waiting clock for its lifetime when asked to.
class ScopedNonWaitingClock {
public:
    explicit ScopedNonWaitingClock(bool active) : _previous(Util::hostClock()), _clock(_previous), _active(active) {
        if (_active) Util::setHostClock(&_clock);
    }
    ~ScopedNonWaitingClock() {
        if (_active) Util::setHostClock(&_previous);
    }
    ScopedNonWaitingClock(const ScopedNonWaitingClock&) = delete;
    ScopedNonWaitingClock& operator=(const ScopedNonWaitingClock&) = delete;

private:
    const Util::HostClock& _previous;
    NonWaitingClock _clock;
    bool _active;
};

}  // namespace

StateWrite StateWrite::parse(std::string_view assignment) {
    const size_t equals = assignment.find('=');
    if (equals == std::string_view::npos || equals == 0) {
        throw std::invalid_argument("invalid state write \"" + std::string(assignment) +
                                    "\" (expected KEY=VALUE, e.g. Algs.EnableTapSuppression=0)");
    }
    const std::string_view text = assignment.substr(equals + 1);
    PropertyValue value = PropertyValue::fromJSON(text);
    if (!value) value = PropertyValue::string(text);
    return {std::string(assignment.substr(0, equals)), std::move(value)};
}

ReplaySession::ReplaySession(PipelineRecording recording, ReplayOptions options)
    : _pipeline(std::make_shared<Pipeline>()), _recording(std::move(recording)), _options(std::move(options)) {
    _recording.pipeline = _pipeline;
}

void ReplaySession::run(const std::function<void(const DeliveredFrame&)>& onFrame) {
    ScopedNonWaitingClock clock(_options.fast);

    // Events are collected while the pipeline runs and reported after it returns, so that
    // nothing the observer does can reach back into the pipeline.
    HIDEventList events;
    _pipeline->hidEventsProbe = std::make_shared<std::function<void(uint64_t, const HIDEventList&)>>(
        [&events](uint64_t, const HIDEventList& list) { events.insert(events.end(), list.begin(), list.end()); });

    for (const StateWrite& write : _options.stateWrites) {
        _pipeline->setState(Util::hostClock().machTimeNow(), write.key, write.value);
    }

    _recording.playReset();  // sorts the frames by timestamp
    auto next = _recording.frames().begin();
    for (size_t index = 0; _recording.playCanContinue(); ++index, ++next) {
        events.clear();
        _recording.playNextFrame(_options.speed);
        const PipelineRecording::Frame& frame = *next;
        std::optional<InputReport::Image> image;
        if (frame.type == PipelineRecording::Frame::Type::InputReport) {
            image = InputReport::Image::parse(frame.data.data(), frame.data.size());
        }
        onFrame(DeliveredFrame{frame, index, image, events});
    }
    _pipeline->hidEventsProbe.reset();
}

}  // namespace ZeltoTouch::Tools
