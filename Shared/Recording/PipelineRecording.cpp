#include "Shared/Recording/PipelineRecording.h"

#include <algorithm>
#include <iterator>
#include <string_view>
#include <unordered_set>
#include <utility>

#include "Shared/Util/MachTime.h"

namespace ZeltoTouch {

PipelineRecording::PipelineRecording(const PipelineRecording& other)
    : pipeline(other.pipeline), _frames(other._frames), _maxFrameCount(other._maxFrameCount) {
    copyCursorFrom(other);
}

void PipelineRecording::reserveFrames(size_t count) {
    // One node in and out fixes the pool's block size to the list's node.
    _frames.emplace_back();
    _frames.pop_back();
    _frames.get_allocator().reserve(count);
}

PipelineRecording::PipelineRecording(PipelineRecording&& other) noexcept { *this = std::move(other); }

PipelineRecording& PipelineRecording::operator=(const PipelineRecording& other) {
    if (this != &other) {
        pipeline = other.pipeline;
        _frames = other._frames;
        _maxFrameCount = other._maxFrameCount;
        copyCursorFrom(other);
    }
    return *this;
}

PipelineRecording& PipelineRecording::operator=(PipelineRecording&& other) noexcept {
    if (this == &other) return *this;
    // Moving the list keeps its nodes, so the cursor stays valid, except at the end: that
    // position belongs to the list object, not to a node.
    const bool cursorAtEnd = other._play.valid && other._play.iterator == other._frames.end();
    pipeline = std::move(other.pipeline);
    _frames = std::move(other._frames);
    _maxFrameCount = other._maxFrameCount;
    _play = other._play;
    if (!_play.valid || cursorAtEnd) _play.iterator = _frames.end();
    other.endPlayback();
    return *this;
}

// The cursor moves to the same position in this list; a position in the other list would be
// meaningless here.
void PipelineRecording::copyCursorFrom(const PipelineRecording& other) {
    _play = other._play;
    _play.iterator = _frames.begin();
    if (other._play.valid) {
        const FrameList::const_iterator position = other._play.iterator;
        std::advance(_play.iterator, std::distance(other._frames.begin(), position));
    }
}

void PipelineRecording::setState(uint64_t timestampMach, const std::string& key, const PropertyValue& value) {
    appendFrame({Frame::Type::State, Util::nanosecondsFromMachTime(timestampMach), key, value, {}});
    if (pipeline) pipeline->setState(timestampMach, key, value);
}

void PipelineRecording::handleInputReport(uint64_t timestampMach, const uint8_t* bytes, uint64_t length) {
    appendFrame({Frame::Type::InputReport, Util::nanosecondsFromMachTime(timestampMach), {}, {},
                 ReportBytes(bytes, static_cast<size_t>(length))});
    if (pipeline) pipeline->handleInputReport(timestampMach, bytes, length);
}

void PipelineRecording::handleMetadata(uint64_t timestampMach, const std::string& key, const PropertyValue& value) {
    appendFrame({Frame::Type::Metadata, Util::nanosecondsFromMachTime(timestampMach), key, value, {}});
    if (pipeline) pipeline->handleMetadata(timestampMach, key, value);
}

void PipelineRecording::appendFrame(Frame frame) {
    _frames.push_back(std::move(frame));
    // Trimming waits until the list has doubled past the limit, so its one pass is paid for
    // by as many appends as the limit.
    if (_maxFrameCount != 0 && _frames.size() / 2 >= _maxFrameCount) trimFrames(_frames, _maxFrameCount);
    endPlayback();
}

void PipelineRecording::setMaxFrameCount(uint64_t count) {
    _maxFrameCount = count;
    if (count == 0) return;
    trimFrames(_frames, count);
    endPlayback();
}

void PipelineRecording::trimFrames(FrameList& frames, uint64_t maxFrameCount) {
    // Keys of the State frames kept since the newest kept report or metadata frame. The views
    // point into kept frames, which outlive the pass. The set and its nodes are reused from
    // call to call so that trimming in steady state does not go to the heap.
    using KeySet = std::unordered_set<std::string_view, std::hash<std::string_view>, std::equal_to<>,
                                      PoolAllocator<std::string_view>>;
    thread_local KeySet newerStateKeys;
    newerStateKeys.clear();
    uint64_t keptCount = 0;
    for (auto frame = frames.end(); frame != frames.begin();) {
        --frame;
        bool keep;
        if (frame->type == Frame::Type::State) {
            keep = newerStateKeys.insert(frame->key).second;
        } else {
            keep = keptCount < maxFrameCount;
            if (keep) {
                ++keptCount;
                if (!newerStateKeys.empty()) newerStateKeys.clear();
            }
        }
        if (!keep) frame = frames.erase(frame);
    }
    newerStateKeys.clear();
}

void PipelineRecording::sortFrames(FrameList& frames) {
    const auto earlier = [](const Frame& a, const Frame& b) { return a.timestamp < b.timestamp; };
    if (!std::is_sorted(frames.begin(), frames.end(), earlier)) frames.sort(earlier);
}

}  // namespace ZeltoTouch
