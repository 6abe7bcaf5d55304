#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <limits>
#include <memory>
#include <span>
#include <stdexcept>

namespace ZeltoTouch {

// The bytes of one recorded input report. Reports up to kInlineCapacity bytes (every report
// the sensor sends) live inside the object, so recording one costs no heap allocation;
// longer ones go to the heap, their pointer kept in the inline space. 80 bytes in all.
class ReportBytes {
public:
    static constexpr size_t kInlineCapacity = 76;

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
    ~ReportBytes() { release(); }

    const uint8_t* data() const noexcept { return onHeap() ? heap() : _storage; }
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
    bool onHeap() const noexcept { return _size > kInlineCapacity; }
    uint8_t* heap() const noexcept {
        uint8_t* pointer;
        std::memcpy(&pointer, _storage, sizeof pointer);
        return pointer;
    }
    void release() noexcept {
        if (onHeap()) delete[] heap();
        _size = 0;
    }
    void assign(const uint8_t* bytes, size_t length) {
        if (length > std::numeric_limits<uint32_t>::max()) {
            throw std::length_error("ReportBytes: a report longer than 4 GiB");
        }
        if (length > kInlineCapacity) {
            uint8_t* const pointer = std::make_unique_for_overwrite<uint8_t[]>(length).release();
            std::memcpy(pointer, bytes, length);
            release();
            std::memcpy(_storage, &pointer, sizeof pointer);
        } else {
            release();
            if (length) std::memcpy(_storage, bytes, length);
        }
        _size = static_cast<uint32_t>(length);
    }
    void take(ReportBytes& other) noexcept {
        release();
        std::memcpy(_storage, other._storage, other.onHeap() ? sizeof(uint8_t*) : other._size);
        _size = other._size;
        other._size = 0;
    }

    alignas(uint8_t*) uint8_t _storage[kInlineCapacity];  // the bytes, or the heap pointer
    uint32_t _size = 0;
};

static_assert(sizeof(ReportBytes) == 80);

}  // namespace ZeltoTouch
