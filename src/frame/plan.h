// SPDX-License-Identifier: Apache-2.0
// Records and work memory: how blocks are laid out, reached and aligned, whose memory it is, and what happens when
// there is none. The size of a block, its filling and its use go by one layout, so that they cannot disagree.
#pragma once
#include <cstdint>
#include <type_traits>

#include "image/image.h"
#include "qorcore.h"

namespace qori {

inline constexpr int kBlockAlignment = 64;

/// Where a caller's record or buffer begins inside its block: at the next multiple of the alignment.
template <class T>
auto* blockStart(T* block, uintptr_t alignment = kBlockAlignment) {
    const auto beyond = reinterpret_cast<uintptr_t>(block) % alignment;
    return asBytes(block) + (alignment - beyond) % alignment;
}

/// A record at the start of a block of memory of any type; const where the block is.
template <class Record, class Block>
auto* recordIn(Block* block) {
    using Own = std::conditional_t<std::is_const_v<Block>, const Record, Record>;
    return reinterpret_cast<Own*>(blockStart(block));
}

/// A table so many bytes behind the beginning of a record; const where the record is.
template <class T, class Record>
auto* tableOf(Record* record, int64_t offset) {
    using Own = std::conditional_t<std::is_const_v<Record>, const T, T>;
    return reinterpret_cast<Own*>(asBytes(record) + static_cast<ptrdiff_t>(offset));
}

/// Whether a record carries the tag of its type.
template <class Record>
QorResult tagCheck(const Record* record) {
    return record->tag == Record::kTag ? QOR_OK : QOR_ERR_CONTEXT;
}

constexpr int64_t roundUp(int64_t n, int64_t multiple) { return (n + multiple - 1) / multiple * multiple; }

/// Places pieces one behind the other, each on a multiple of the unit.
class BlockLayout {
public:
    explicit constexpr BlockLayout(int64_t unit = kBlockAlignment) : unit_(unit) {}

    /// Returns the offset of the piece.
    constexpr int64_t add(int64_t bytes) {
        const int64_t offset = used_;
        used_ += roundUp(bytes, unit_);
        return offset;
    }
    constexpr int64_t bytes() const { return used_; }

private:
    int64_t unit_, used_ = 0;
};

/// Hands out pieces of a work buffer, each on a 64-byte boundary; without a buffer it only measures.
class WorkBuffer {
public:
    explicit WorkBuffer(uint8_t* block) : start_(block == nullptr ? nullptr : blockStart(block)) {}

    template <class T>
    T* take(int64_t count) {
        const int64_t offset = layout_.add(count * static_cast<int64_t>(sizeof(T)));
        return start_ == nullptr ? nullptr : tableOf<T>(start_, offset);
    }
    /// With the slack for the alignment of the caller's block.
    int64_t bytes() const { return layout_.bytes() + kBlockAlignment; }

private:
    uint8_t* start_;
    BlockLayout layout_;
};

/// A reported size: QOR_ERR_SIZE and nothing stored where 32 bits do not hold it.
inline QorResult reportSize(int64_t bytes, int32_t* size) {
    if (bytes > INT32_MAX) return QOR_ERR_SIZE;
    *size = static_cast<int32_t>(bytes);
    return QOR_OK;
}

/// Null also for what 32 bits do not measure.
inline void* allocate(int64_t bytes) { return bytes > INT32_MAX ? nullptr : qorMalloc(static_cast<int32_t>(bytes)); }

/// Work memory of the caller, or of the allocator for the duration of a call.
class WorkMemory {
public:
    explicit WorkMemory(uint8_t* callers) : memory_(callers) {}
    explicit WorkMemory(int64_t bytes) : memory_(static_cast<uint8_t*>(allocate(bytes))), isOwned_(true) {}
    ~WorkMemory() {
        if (isOwned_) qorFree(memory_);
    }
    WorkMemory(const WorkMemory&) = delete;
    WorkMemory& operator=(const WorkMemory&) = delete;

    QorResult check() const { return memory_ == nullptr ? QOR_ERR_NO_MEMORY : QOR_OK; }
    template <class T>
    T* begin(uintptr_t alignment = kBlockAlignment) const {
        return reinterpret_cast<T*>(blockStart(memory_, alignment));
    }

private:
    uint8_t* memory_;
    bool isOwned_ = false;
};

/// Several blocks of the allocator that outlive the call: all of them, or none.
template <int most>
class OwnedBlocks {
public:
    OwnedBlocks() = default;
    ~OwnedBlocks() {
        while (count_ > 0) qorFree(block_[--count_]);
    }
    OwnedBlocks(const OwnedBlocks&) = delete;
    OwnedBlocks& operator=(const OwnedBlocks&) = delete;

    /// Null, and check() fails from then on, where there is no memory.
    template <class T = uint8_t>
    T* add(int64_t bytes) {
        void* const block = isMissing_ ? nullptr : allocate(bytes);
        isMissing_ |= block == nullptr;
        if (block != nullptr) block_[count_++] = block;
        return static_cast<T*>(block);
    }
    QorResult check() const { return isMissing_ ? QOR_ERR_NO_MEMORY : QOR_OK; }
    /// The blocks are somebody else's from now on.
    void release() { count_ = 0; }

private:
    void* block_[most] = {};
    int count_ = 0;
    bool isMissing_ = false;
};

}  // namespace qori
