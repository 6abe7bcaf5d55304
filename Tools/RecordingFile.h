#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "Shared/Recording/PipelineRecording.h"

namespace ZeltoTouch::Tools {

// A recording container read from a file, with the version the file was written in.
struct RecordingFile {
    PipelineRecording recording;
    uint64_t containerVersion = 0;
};

// Reads and parses a container file. A file that cannot be read throws std::runtime_error naming
// it ("cannot read PATH: reason"); a container the reader refuses throws the reader's own error,
// whose message is passed on unchanged.
RecordingFile loadRecordingFile(const std::string& path);

// The whole file; throws std::runtime_error "cannot read PATH: reason".
std::string readFile(const std::string& path);

// Writes through a temporary file in the same folder and renames it into place, so PATH is
// either left as it was or holds all of `contents`. Throws std::runtime_error naming PATH.
void writeFileAtomically(const std::string& path, std::string_view contents);

}  // namespace ZeltoTouch::Tools
