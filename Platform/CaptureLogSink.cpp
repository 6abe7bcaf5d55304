#include "Platform/CaptureLogSink.h"

#include <algorithm>

namespace ZeltoTouch::Platform {

bool CaptureLogSink::isEnabled(std::string_view, LogLevel level) const noexcept {
    return thresholdAdmits(_threshold, level);
}

void CaptureLogSink::write(std::string_view category, LogLevel level, std::string_view message) {
    if (!isEnabled(category, level)) return;
    Line line{std::string(category), level, std::string(message)};
    std::lock_guard lock(_lock);
    _lines.push_back(std::move(line));
}

std::vector<CaptureLogSink::Line> CaptureLogSink::lines() const {
    std::lock_guard lock(_lock);
    return _lines;
}

size_t CaptureLogSink::count() const {
    std::lock_guard lock(_lock);
    return _lines.size();
}

template <typename Predicate>
size_t CaptureLogSink::countWhere(Predicate predicate) const {
    std::lock_guard lock(_lock);
    return static_cast<size_t>(std::count_if(_lines.begin(), _lines.end(), predicate));
}

size_t CaptureLogSink::countEqual(std::string_view message) const {
    return countWhere([&](const Line& line) { return line.message == message; });
}

size_t CaptureLogSink::countContaining(std::string_view text) const {
    return countWhere([&](const Line& line) { return line.message.find(text) != std::string::npos; });
}

size_t CaptureLogSink::countAtLevel(LogLevel level) const {
    return countWhere([&](const Line& line) { return line.level == level; });
}

void CaptureLogSink::clear() {
    std::lock_guard lock(_lock);
    _lines.clear();
}

}  // namespace ZeltoTouch::Platform
