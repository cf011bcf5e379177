// SPDX-License-Identifier: Apache-2.0
// Records and work buffers in the caller's memory: blocks of a reported size at any address, used from the next
// multiple of 64 on.
#pragma once
#include "image.h"

namespace qori {

inline constexpr int kBlockAlignment = 64;

/// Where a caller's record or buffer begins inside its block.
template <class T>
auto* blockStart(T* block) {
    using Byte = std::conditional_t<std::is_const_v<T>, const uint8_t, uint8_t>;
    constexpr uintptr_t mask = kBlockAlignment - 1;
    return reinterpret_cast<Byte*>((reinterpret_cast<uintptr_t>(block) + mask) & ~mask);
}

/// The next multiple of the alignment, for sizes of tables and rows inside a block.
constexpr int64_t roundUpToBlock(int64_t bytes) { return (bytes + kBlockAlignment - 1) & ~int64_t{kBlockAlignment - 1}; }

/// A reported size: QOR_ERR_SIZE and nothing stored where 32 bits do not hold it.
inline QorResult reportSize(int64_t bytes, int32_t* size) {
    if (bytes > INT32_MAX) return QOR_ERR_SIZE;
    *size = static_cast<int32_t>(bytes);
    return QOR_OK;
}

}  // namespace qori
