// SPDX-License-Identifier: Apache-2.0
// Which part of a row goes past the cache: whole lines. A line of which one part goes past the cache and the other
// through it costs half a microsecond.
#pragma once
#include <cstddef>
#include <cstdint>

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

}  // namespace qori::kernels
