#include "Platform/FileDescriptorSource.h"

namespace ZeltoTouch::Platform {

void FileDescriptorSource::startWaiting(asio::io_context& io) {
    _descriptor.emplace(io, _fd);
    rearm();
}

void FileDescriptorSource::rearm() {
    _descriptor->async_wait(asio::posix::stream_descriptor::wait_read, guarded([this] { fired(); }));
}

void FileDescriptorSource::stopWaiting() noexcept {
    if (!_descriptor) return;
    std::error_code ignored;
    _descriptor->cancel(ignored);
    _descriptor->release();  // the descriptor is the caller's to close
    _descriptor.reset();
}

}  // namespace ZeltoTouch::Platform
