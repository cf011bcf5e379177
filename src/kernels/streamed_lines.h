// SPDX-License-Identifier: Apache-2.0
// Which part of a row goes past the cache: whole lines. A line of which one part goes past the cache and the other
// through it costs half a microsecond.
#pragma once
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>

#include "simd.h"

namespace qori::kernels {

inline constexpr ptrdiff_t kCacheLine = 64;

/// A row's elements before the lines that stream, and in them; what is left follows. Without lines the row does not
/// stream.
struct StreamedLines {
    ptrdiff_t head, lines;

    /// Less gains nothing over what it costs to leave the cache and to come back.
    static constexpr ptrdiff_t fewestBytes = 3 * kCacheLine;

    static StreamedLines ofBytes(const uint8_t* dst, ptrdiff_t bytes) {
        return behind(static_cast<ptrdiff_t>(-reinterpret_cast<uintptr_t>(dst) & (kCacheLine - 1)), bytes);
    }

    /// Of rows that begin with a line or in the middle of one. In the latter case 96 bytes come first: whole groups of
    /// 12 elements, after which the constants of channels begin anew.
    template <class T>
    static StreamedLines ofGroups(const T* dst, ptrdiff_t elements) {
        constexpr ptrdiff_t size = sizeof(T), halfLine = kCacheLine / 2;
        const auto at = static_cast<ptrdiff_t>(reinterpret_cast<uintptr_t>(dst) % kCacheLine);
        if (at != 0 && at != halfLine) return {0, 0};
        const StreamedLines bytes = behind(at == 0 ? 0 : 3 * halfLine, elements * size);
        return {bytes.head / size, bytes.lines / size};
    }

private:
    static StreamedLines behind(ptrdiff_t head, ptrdiff_t bytes) {
        const ptrdiff_t lines = (bytes - head) / kCacheLine * kCacheLine;
        return lines < fewestBytes ? StreamedLines{0, 0} : StreamedLines{head, lines};
    }
};

/// How a row is stored.
enum class RowStores {
    cached,
    streamed,  ///< Whole lines past the cache.
    fetching   ///< Streamed, while what is read next is fetched.
};

inline constexpr ptrdiff_t kFetchedAhead = 512;
constexpr ptrdiff_t fetchedAhead(RowStores stores) { return stores == RowStores::fetching ? kFetchedAhead : 0; }

/// Fetches the lines of so many bytes that lie `ahead` behind p. As a function of its own, which has no effect that the
/// compiler knows of, it would not be called.
template <ptrdiff_t bytes, class T>
QORI_INLINE void fetchLines(const T* p, ptrdiff_t ahead) {
    const auto begin = reinterpret_cast<uintptr_t>(p) + static_cast<uintptr_t>(ahead);
    for (uintptr_t at = 0; at < bytes; at += kCacheLine) __builtin_prefetch(reinterpret_cast<const char*>(begin + at));
}

/// How rows that are read from an image stream. Behind the end of a row lies another one that is read soon; what lies
/// behind short rows of a much wider image would be fetched for nothing.
inline RowStores storesOfRows(int32_t rows, ptrdiff_t step, ptrdiff_t bytes) {
    const bool isWaste = rows > 1 && bytes < 4 * kFetchedAhead && std::abs(step) - bytes > bytes / 4;
    return isWaste ? RowStores::streamed : RowStores::fetching;
}

/// Rows that stream together, a piece of each in turn: the processor fetches ahead within a page of 4 KiB, so that one
/// row alone leaves memory waiting at each of them, and rows of one page are no better. Measured on copies: 64 KiB
/// apart is 1.05 to 1.1 times as fast as 8 KiB, 1 MiB or a quarter of the image, and pieces of 1536 bytes take 1.2
/// times as long as those of 512.
inline constexpr int kStreamedTogether = 4;
inline constexpr ptrdiff_t kStreamedApart = 65'536;

/// Rows from one to the next of those together.
inline int32_t streamedApart(ptrdiff_t step) {
    return static_cast<int32_t>(kStreamedApart / std::clamp<ptrdiff_t>(std::abs(step), 1, kStreamedApart));
}

/// make(row, begin, count) for all elements of all rows. pieceOf(row, begin) is how many elements from there on, at
/// most `elements` - begin, come next.
template <class PieceOf, class Make>
void forStreamedPieces(int32_t rows, int32_t apart, ptrdiff_t elements, PieceOf pieceOf, Make make) {
    const auto makeTogether = [&](int64_t first) {
        ptrdiff_t done[kStreamedTogether] = {};
        for (bool isMore = true; isMore;) {
            isMore = false;
            for (int k = 0; k < kStreamedTogether; ++k) {
                const int64_t row = first + int64_t{apart} * k;
                if (row >= rows || done[k] == elements) continue;
                const ptrdiff_t count = pieceOf(static_cast<int32_t>(row), done[k]);
                make(static_cast<int32_t>(row), done[k], count);
                done[k] += count;
                isMore |= done[k] < elements;
            }
        }
    };
    for (int64_t group = 0; group < rows; group += int64_t{apart} * kStreamedTogether)
        for (int64_t y = group; y < std::min<int64_t>(group + apart, rows); ++y) makeTogether(y);
}

}  // namespace qori::kernels
