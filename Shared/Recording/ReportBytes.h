#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <span>

namespace ZeltoTouch {

// The bytes of one recorded input report. Reports up to kInlineCapacity bytes (every report
// the sensor sends) live inside the object, so recording one costs no heap allocation;
// longer ones go to the heap.
class ReportBytes {
public:
    static constexpr size_t kInlineCapacity = 80;

    ReportBytes() noexcept = default;
    ReportBytes(const uint8_t* bytes, size_t length) { assign(bytes, length); }
    explicit ReportBytes(std::span<const uint8_t> bytes) { assign(bytes.data(), bytes.size()); }
    ReportBytes(const ReportBytes& other) { assign(other.data(), other.size()); }
    ReportBytes(ReportBytes&& other) noexcept { take(other); }
    ReportBytes& operator=(const ReportBytes& other) {
        if (this != &other) assign(other.data(), other.size());
        return *this;
    }
    ReportBytes& operator=(ReportBytes&& other) noexcept {
        if (this != &other) take(other);
        return *this;
    }

    const uint8_t* data() const noexcept { return _heap ? _heap.get() : _inline; }
    size_t size() const noexcept { return _size; }
    bool empty() const noexcept { return _size == 0; }
    const uint8_t* begin() const noexcept { return data(); }
    const uint8_t* end() const noexcept { return data() + _size; }
    std::span<const uint8_t> span() const noexcept { return {data(), _size}; }
    operator std::span<const uint8_t>() const noexcept { return span(); }

    friend bool operator==(const ReportBytes& a, const ReportBytes& b) noexcept {
        return a._size == b._size && (a._size == 0 || std::memcmp(a.data(), b.data(), a._size) == 0);
    }

private:
    void assign(const uint8_t* bytes, size_t length) {
        if (length > kInlineCapacity) {
            auto heap = std::make_unique_for_overwrite<uint8_t[]>(length);
            std::memcpy(heap.get(), bytes, length);
            _heap = std::move(heap);
        } else {
            _heap.reset();
            if (length) std::memcpy(_inline, bytes, length);
        }
        _size = length;
    }
    void take(ReportBytes& other) noexcept {
        _heap = std::move(other._heap);
        if (!_heap && other._size) std::memcpy(_inline, other._inline, other._size);
        _size = other._size;
        other._size = 0;
    }

    size_t _size = 0;
    std::unique_ptr<uint8_t[]> _heap;
    uint8_t _inline[kInlineCapacity];
};

}  // namespace ZeltoTouch
