#pragma once

#include <cstdint>
#include <functional>
#include <list>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "Host/PropertyValue.h"
#include "Shared/Pipeline/PipelineInput.h"
#include "Shared/Recording/NodePool.h"
#include "Shared/Recording/ReportBytes.h"

namespace ZeltoTouch {

// A stage in front of the pipeline that records every call it forwards, keeps the recording
// within a frame limit, writes and reads it as a JSON container, and plays it back.
//
// Not thread-safe: the owner serialises every call, including copies and playback.
class PipelineRecording final : public PipelineInput {
public:
    // One recorded call.
    struct Frame {
        enum class Type : uint32_t { State = 0, InputReport = 1, Metadata = 2 };

        Type type = Type::State;
        uint64_t timestamp = 0;  // nanoseconds
        std::string key;         // State and Metadata
        PropertyValue value;     // State and Metadata; shared with the caller, may be no value
        ReportBytes data;        // InputReport
    };
    // List nodes come from a pool, so recording reuses the nodes that trimming frees.
    using FrameList = std::list<Frame, PoolAllocator<Frame>>;

    // The downstream stage; may be empty.
    std::shared_ptr<PipelineInput> pipeline;

    PipelineRecording() = default;
    // Reads a container of version 0, 1 or 2 (JSON text in a data value). Throws
    // std::invalid_argument for malformed frames and std::runtime_error("migrateSerializedContainer
    // failed: ...") when the container itself is refused.
    explicit PipelineRecording(const PropertyValue& data);
    // Copies duplicate every frame (values stay shared) and keep the cursor at the same position.
    PipelineRecording(const PipelineRecording& other);
    PipelineRecording(PipelineRecording&& other) noexcept;
    PipelineRecording& operator=(const PipelineRecording& other);
    PipelineRecording& operator=(PipelineRecording&& other) noexcept;
    ~PipelineRecording() = default;

    // Record the call as a frame stamped in nanoseconds, then forward it unchanged.
    void setState(uint64_t timestampMach, const std::string& key, const PropertyValue& value) override;
    void handleInputReport(uint64_t timestampMach, const uint8_t* bytes, uint64_t length) override;
    void handleMetadata(uint64_t timestampMach, const std::string& key, const PropertyValue& value) override;

    // Appends, trims once the list holds twice the limit, and ends any playback.
    void appendFrame(Frame frame);
    // 0 removes the limit; any other limit trims at once (which ends any playback).
    void setMaxFrameCount(uint64_t count);
    uint64_t maxFrameCount() const noexcept { return _maxFrameCount; }
    const FrameList& frames() const noexcept { return _frames; }
    // Room for `count` frames in memory that is already paged in, so that assigning a
    // recording of up to that many frames to this one (under a lock, say) is only copying.
    void reserveFrames(size_t count);

    // Keeps the newest maxFrameCount InputReport and Metadata frames and, of the State frames
    // between two kept ones (and before the oldest), the newest of each key.
    static void trimFrames(FrameList& frames, uint64_t maxFrameCount);
    // Stable, by ascending timestamp.
    static void sortFrames(FrameList& frames);

    // The version 2 container as compact JSON text in a data value; trims (with the limit) and
    // sorts this recording first, which ends any playback. No value when a frame holds something
    // JSON cannot represent.
    PropertyValue json();
    // As json(), but says why it fails: std::runtime_error naming the offending frame.
    PropertyValue jsonOrThrow();
    // As json(), but leaves out the frames JSON cannot hold instead of failing, and counts them.
    PropertyValue jsonLeavingOutUnwritable(size_t& leftOut);
    // Turns a parsed container of version 0, 1 or 2 into version 2; throws std::invalid_argument.
    static PropertyValue migrateSerializedContainer(const PropertyValue& container);

    // Playback into `pipeline`, paced by the frames' timestamps. playReset sorts the list by
    // timestamp (stable) so that every delivery time lies at or after the start.
    void playReset();
    bool playCanContinue() const noexcept;
    // Waits for the next frame's turn and delivers it; a speed of 0 or less plays at 1.
    // Throws std::runtime_error("playback finished") when nothing is left to play.
    void playNextFrame(float speed);

private:
    struct PlayCursor {
        bool valid = false;
        FrameList::iterator iterator;
        uint64_t startTimeMach = 0;
        std::optional<uint64_t> lastFrameTimeNs;
    };

    void endPlayback() noexcept { _play.valid = false; }
    void copyCursorFrom(const PipelineRecording& other);
    // Called with a frame's index, the frame and why JSON cannot hold it.
    using UnwritableFrameHandler = std::function<void(size_t, const Frame&, std::string_view)>;
    PropertyValue writeContainer(const UnwritableFrameHandler& unwritable);

    FrameList _frames;
    uint64_t _maxFrameCount = 0;
    PlayCursor _play;
};

}  // namespace ZeltoTouch
