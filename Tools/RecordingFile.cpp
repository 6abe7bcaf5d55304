#include "Tools/RecordingFile.h"

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <span>
#include <stdexcept>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

namespace ZeltoTouch::Tools {
namespace {

[[noreturn]] void fail(std::string_view verb, const std::string& path, int error) {
    throw std::runtime_error(std::string(verb) + " " + path + ": " + std::strerror(error));
}

// Closes a descriptor on every way out.
class FileDescriptor {
public:
    explicit FileDescriptor(int fd) noexcept : _fd(fd) {}
    ~FileDescriptor() {
        if (_fd >= 0) ::close(_fd);
    }
    FileDescriptor(const FileDescriptor&) = delete;
    FileDescriptor& operator=(const FileDescriptor&) = delete;

    int get() const noexcept { return _fd; }
    int release() noexcept { return std::exchange(_fd, -1); }

private:
    int _fd;
};

}  // namespace

std::string readFile(const std::string& path) {
    FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    if (file.get() < 0) fail("cannot read", path, errno);
    struct stat status {};
    if (::fstat(file.get(), &status) != 0) fail("cannot read", path, errno);
    if (S_ISDIR(status.st_mode)) fail("cannot read", path, EISDIR);

    std::string contents;
    char buffer[1 << 16];
    for (;;) {
        const ssize_t count = ::read(file.get(), buffer, sizeof buffer);
        if (count < 0 && errno == EINTR) continue;
        if (count < 0) fail("cannot read", path, errno);
        if (count == 0) return contents;
        contents.append(buffer, static_cast<size_t>(count));
    }
}

RecordingFile loadRecordingFile(const std::string& path) {
    const std::string text = readFile(path);
    const PropertyValue data = PropertyValue::data(
        std::span(reinterpret_cast<const uint8_t*>(text.data()), text.size()));
    RecordingFile file{PipelineRecording(data), 0};
    // The reader accepted the container, so it is an object with a numeric "Version".
    file.containerVersion = PropertyValue::fromJSON(data).get("Version").toUInt64();
    return file;
}

void writeFileAtomically(const std::string& path, std::string_view contents) {
    std::string temporary = path + ".XXXXXX";
    FileDescriptor file(::mkstemp(temporary.data()));
    if (file.get() < 0) fail("cannot write", path, errno);
    const auto discard = [&](int error) {
        ::unlink(temporary.c_str());
        fail("cannot write", path, error);
    };

    // mkstemp creates the file private; give it the permissions a new file normally gets.
    const mode_t mask = ::umask(0);
    ::umask(mask);
    if (::fchmod(file.get(), 0666 & ~mask) != 0) discard(errno);

    for (size_t written = 0; written < contents.size();) {
        const ssize_t count = ::write(file.get(), contents.data() + written, contents.size() - written);
        if (count < 0 && errno == EINTR) continue;
        if (count < 0) discard(errno);
        written += static_cast<size_t>(count);
    }
    if (::fsync(file.get()) != 0) discard(errno);
    if (::close(file.release()) != 0) discard(errno);
    if (::rename(temporary.c_str(), path.c_str()) != 0) discard(errno);
}

}  // namespace ZeltoTouch::Tools
