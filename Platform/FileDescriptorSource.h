#pragma once

#include <asio/posix/stream_descriptor.hpp>
#include <optional>

#include "Platform/RunLoopSource.h"

namespace ZeltoTouch::Platform {

// Calls back whenever a descriptor is readable (a pipe, socket, eventfd or character device;
// regular files cannot be waited on). The callback should read what is there: the source waits
// again only after it returns. The descriptor stays the caller's; detaching never closes it.
class FileDescriptorSource final : public RunLoopSource {
public:
    FileDescriptorSource(int fd, std::function<void()> onReadable)
        : RunLoopSource(std::move(onReadable)), _fd(fd) {}
    ~FileDescriptorSource() override { detach(); }

private:
    void startWaiting(asio::io_context& io) override;
    void stopWaiting() noexcept override;
    bool rearmsBeforeCallback() const noexcept override { return false; }
    void rearm() override;

    const int _fd;
    std::optional<asio::posix::stream_descriptor> _descriptor;
};

}  // namespace ZeltoTouch::Platform
