#pragma once

#include <cstddef>
#include <memory>
#include <new>
#include <vector>

namespace ZeltoTouch {

// Fixed-size blocks carved from large chunks, with freed blocks kept for reuse. A recording
// that appends and trims in turn keeps reusing the same nodes and never goes to the heap once
// its list has reached its largest size. Not thread-safe: one pool serves one container.
class NodePool {
public:
    void* allocate(size_t blockSize) {
        if (_freeBlocks) {
            FreeBlock* block = _freeBlocks;
            _freeBlocks = block->next;
            return block;
        }
        if (_blockSize == 0) _blockSize = roundUp(blockSize);
        if (_leftInChunk == 0) addChunk();
        void* block = _nextInChunk;
        _nextInChunk += _blockSize;
        --_leftInChunk;
        return block;
    }
    void deallocate(void* block) noexcept { _freeBlocks = new (block) FreeBlock{_freeBlocks}; }

    // Puts at least `count` blocks on the free list, once the first allocation has fixed their
    // size. Each block is written on the way, so its page is resident: the next `count`
    // allocations neither call the heap nor fault a page in.
    void reserve(size_t count) {
        if (_blockSize == 0) return;
        std::vector<void*> blocks(count);
        for (void*& block : blocks) block = allocate(_blockSize);
        for (void* block : blocks) deallocate(block);
    }

    // The block size this pool serves, once fixed by its first allocation (0 before).
    bool serves(size_t blockSize) const noexcept { return _blockSize == 0 || _blockSize == roundUp(blockSize); }

private:
    struct FreeBlock {
        FreeBlock* next;
    };
    static constexpr size_t kBlocksPerChunk = 256;
    static constexpr size_t kAlignment = alignof(std::max_align_t);

    static size_t roundUp(size_t size) noexcept {
        size = size < sizeof(FreeBlock) ? sizeof(FreeBlock) : size;
        return (size + kAlignment - 1) / kAlignment * kAlignment;
    }
    void addChunk() {
        _chunks.push_back(std::make_unique_for_overwrite<std::byte[]>(_blockSize * kBlocksPerChunk));
        _nextInChunk = _chunks.back().get();
        _leftInChunk = kBlocksPerChunk;
    }

    size_t _blockSize = 0;
    FreeBlock* _freeBlocks = nullptr;
    std::byte* _nextInChunk = nullptr;
    size_t _leftInChunk = 0;
    std::vector<std::unique_ptr<std::byte[]>> _chunks;
};

// A standard allocator over a shared NodePool for node-based containers (one element per
// allocation). Anything else (arrays, a second node size) falls back to the heap. A copied
// container gets a pool of its own.
template <typename T>
class PoolAllocator {
public:
    using value_type = T;
    using propagate_on_container_copy_assignment = std::false_type;
    using propagate_on_container_move_assignment = std::true_type;
    using propagate_on_container_swap = std::true_type;
    using is_always_equal = std::false_type;

    PoolAllocator() : _pool(std::make_shared<NodePool>()) {}
    // Moving copies too: a moved-from container must still be able to allocate.
    PoolAllocator(const PoolAllocator&) noexcept = default;
    PoolAllocator& operator=(const PoolAllocator&) noexcept = default;
    template <typename U>
    PoolAllocator(const PoolAllocator<U>& other) noexcept : _pool(other._pool) {}

    T* allocate(size_t count) {
        if (usesPool(count)) return static_cast<T*>(_pool->allocate(sizeof(T)));
        return static_cast<T*>(::operator new(count * sizeof(T), std::align_val_t{alignof(T)}));
    }
    void deallocate(T* pointer, size_t count) noexcept {
        if (usesPool(count)) return _pool->deallocate(pointer);
        ::operator delete(pointer, std::align_val_t{alignof(T)});
    }
    PoolAllocator select_on_container_copy_construction() const { return PoolAllocator(); }

    // Room for `count` more nodes, once the container has allocated its first one.
    void reserve(size_t count) { _pool->reserve(count); }

    template <typename U>
    friend bool operator==(const PoolAllocator& a, const PoolAllocator<U>& b) noexcept {
        return a._pool == b._pool;
    }

private:
    template <typename U>
    friend class PoolAllocator;

    bool usesPool(size_t count) const noexcept {
        return count == 1 && alignof(T) <= alignof(std::max_align_t) && _pool->serves(sizeof(T));
    }

    std::shared_ptr<NodePool> _pool;
};

}  // namespace ZeltoTouch
