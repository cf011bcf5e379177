// SPDX-License-Identifier: Apache-2.0
#include "copy_rows.h"

namespace qori::kernels {
namespace {

constexpr ptrdiff_t kVector = kVectorBytes;
constexpr ptrdiff_t kStringRow = 8192;  // in rows of 2 to 6 KiB string moves gain nothing and fills lose up to 40 %

/// Bytes from p to the next multiple of `boundary`, a power of two.
QORI_INLINE ptrdiff_t toBoundary(const void* p, uintptr_t boundary) {
    return static_cast<ptrdiff_t>(-reinterpret_cast<uintptr_t>(p) & (boundary - 1));
}

/// Up to 64 bytes by two accesses that overlap; both are read before either is written.
QORI_INLINE void copyShort(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes) {
    if (bytes >= kVector) {
        const Bytes first = load(src), last = load(src + bytes - kVector);
        store(dst, first);
        store(dst + bytes - kVector, last);
    } else if (bytes >= 16) {
        const Bytes ends = loadBlocks(src, src + bytes - 16);
        storeBlocks(dst, dst + bytes - 16, ends);
    } else if (bytes >= 8) {
        const auto first = detail::loadWord<uint64_t>(src), last = detail::loadWord<uint64_t>(src + bytes - 8);
        detail::storeWord(dst, first);
        detail::storeWord(dst + bytes - 8, last);
    } else if (bytes >= 4) {
        const auto first = detail::loadWord<uint32_t>(src), last = detail::loadWord<uint32_t>(src + bytes - 4);
        detail::storeWord(dst, first);
        detail::storeWord(dst + bytes - 4, last);
    } else if (bytes > 0) {
        const uint8_t first = src[0], middle = src[bytes >> 1], last = src[bytes - 1];
        dst[0] = first;
        dst[bytes >> 1] = middle;
        dst[bytes - 1] = last;
    }
}

template <bool streaming, int vectors>
QORI_INLINE void copyVectors(uint8_t* dst, const uint8_t* src) {
    Bytes all[vectors];
    for (int k = 0; k < vectors; ++k) all[k] = load(src + k * kVector);
    for (int k = 0; k < vectors; ++k) storeAs<streaming>(dst + k * kVector, all[k]);
}

QORI_INLINE void copyAligned(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes) {
    if (bytes <= 2 * kVector) return copyShort(dst, src, bytes);
    if (bytes <= 4 * kVector) {
        const Bytes a = load(src), b = load(src + kVector);
        const Bytes c = load(src + bytes - 2 * kVector), d = load(src + bytes - kVector);
        store(dst, a);
        store(dst + kVector, b);
        store(dst + bytes - 2 * kVector, c);
        store(dst + bytes - kVector, d);
        return;
    }
    store(dst, load(src));
    ptrdiff_t done = toBoundary(dst, kVector);
    for (; done < bytes - 4 * kVector; done += 4 * kVector) copyVectors<false, 4>(dst + done, src + done);
    for (ptrdiff_t rest = 4 * kVector; rest > 0; rest -= kVector)
        if (bytes - done > rest - kVector) store(dst + bytes - rest, load(src + bytes - rest));
}

/// `bytes` from src by two moves of `size` bytes that overlap.
template <int size>
QORI_INLINE void copyEnds(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes) {
    const ptrdiff_t last = bytes - size;
    if constexpr (size == 32) {
        const Bytes a = load(src), b = load(src + last);
        store(dst, a);
        store(dst + last, b);
    } else if constexpr (size == 16) {
        storeBlocks(dst, dst + last, loadBlocks(src, src + last));
    } else {
        using Word = std::conditional_t<
            size == 8, uint64_t,
            std::conditional_t<size == 4, uint32_t, std::conditional_t<size == 2, uint16_t, uint8_t>>>;
        const auto a = detail::loadWord<Word>(src), b = detail::loadWord<Word>(src + last);
        detail::storeWord(dst, a);
        detail::storeWord(dst + last, b);
    }
}

template <int size>
void copyRowsByEnds(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, int bytes, int rows) {
    for (; rows > 0; --rows, dst += dstStep, src += srcStep) copyEnds<size>(dst, src, bytes);
}

/// Vectors of the pattern at a phase below 96.
QORI_INLINE Bytes patternAt(const Pattern& pattern, ptrdiff_t offset) {
    return load(pattern.bytes + offset % Pattern::period);
}

/// Six vectors of the pattern from `done` on, again and again, to `end` or less than six vectors before it; gives
/// where.
template <bool streaming>
QORI_INLINE ptrdiff_t fillCycles(uint8_t* dst, const Bytes (&cycle)[3], ptrdiff_t done, ptrdiff_t end) {
    for (; done <= end - 6 * kVector; done += 6 * kVector)
        for (int k = 0; k < 6; ++k) storeAs<streaming>(dst + done + k * kVector, cycle[k % 3]);
    return done;
}

/// Up to 127 bytes of the pattern from a phase on.
QORI_INLINE void fillShort(uint8_t* dst, const Pattern& pattern, ptrdiff_t phase, ptrdiff_t bytes) {
    for (; bytes >= kVector; dst += kVector, phase += kVector, bytes -= kVector) store(dst, patternAt(pattern, phase));
    if (bytes > 0) storePartial(dst, patternAt(pattern, phase), bytes);
}

}  // namespace

void copyRow(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes) { copyAligned(dst, src, bytes); }

void copyRowStreaming(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes, RowStores stores) {
    const auto [head, lines] = StreamedLines::ofBytes(dst, bytes);
    if (lines == 0) return copyAligned(dst, src, bytes);
    copyShort(dst, src, head);
    const ptrdiff_t end = head + lines, ahead = fetchedAhead(stores);
    ptrdiff_t done = head;
    for (; done <= end - 2 * kCacheLine; done += 2 * kCacheLine) {
        fetchLines<2 * kCacheLine>(src + done, ahead);
        copyVectors<true, 4>(dst + done, src + done);
    }
    if (done < end) copyVectors<true, 2>(dst + done, src + done);
    copyShort(dst + end, src + end, bytes - end);
}

void copyRowString(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes) {
    // A string move onto its own source goes byte by byte.
    if (dst == src || bytes < kStringRow) return copyRow(dst, src, bytes);
    const ptrdiff_t head = toBoundary(dst, kCacheLine);
    copyShort(dst, src, head);
    dst += head;
    src += head;
    bytes -= head;
    __asm__ volatile("rep movsb" : "+D"(dst), "+S"(src), "+c"(bytes) : : "memory");
}

void copyNarrowRows(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, int bytes, int rows) {
    const auto copy = bytes >= 32   ? copyRowsByEnds<32>
                      : bytes >= 16 ? copyRowsByEnds<16>
                      : bytes >= 8  ? copyRowsByEnds<8>
                      : bytes >= 4  ? copyRowsByEnds<4>
                      : bytes >= 2  ? copyRowsByEnds<2>
                                    : copyRowsByEnds<1>;
    copy(dst, dstStep, src, srcStep, bytes, rows);
}

void copyRowStreamLoad(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes, bool streamStores) {
    constexpr ptrdiff_t block = 64;
    const ptrdiff_t head = toBoundary(src, block);
    if (bytes < block || head > bytes - block) return copyRow(dst, src, bytes);
    copyRow(dst, src, head);
    const bool streaming = streamStores && toBoundary(dst + head, kVector) == 0;
    ptrdiff_t done = head;
    for (; done <= bytes - block; done += block) {
        const Bytes a{_mm256_stream_load_si256(reinterpret_cast<const __m256i*>(src + done))};
        const Bytes b{_mm256_stream_load_si256(reinterpret_cast<const __m256i*>(src + done + kVector))};
        if (streaming) {
            stream(dst + done, a);
            stream(dst + done + kVector, b);
        } else {
            store(dst + done, a);
            store(dst + done + kVector, b);
        }
    }
    copyRow(dst + done, src + done, bytes - done);
}

void fillRow(uint8_t* dst, const Pattern& pattern, ptrdiff_t bytes) {
    if (bytes <= 4 * kVector) return copyAligned(dst, pattern.bytes, bytes);
    store(dst, load(pattern.bytes));
    const ptrdiff_t head = toBoundary(dst, kVector);
    const Bytes cycle[3] = {load(pattern.bytes + head), load(pattern.bytes + head + kVector),
                            load(pattern.bytes + head + 2 * kVector)};
    const ptrdiff_t done = fillCycles<false>(dst, cycle, head, bytes);
    // Up to six vectors are left, the first five of which may be whole; the cycle goes on.
    for (int k = 0; k < 5; ++k)
        if (done <= bytes - (k + 1) * kVector) store(dst + done + k * kVector, cycle[k % 3]);
    store(dst + bytes - kVector, patternAt(pattern, bytes - kVector));
}

void fillRowStreaming(uint8_t* dst, const Pattern& pattern, ptrdiff_t bytes) {
    const auto [head, lines] = StreamedLines::ofBytes(dst, bytes);
    if (lines == 0) return fillRow(dst, pattern, bytes);
    fillShort(dst, pattern, 0, head);
    const Bytes cycle[3] = {patternAt(pattern, head), patternAt(pattern, head + kVector),
                            patternAt(pattern, head + 2 * kVector)};
    const ptrdiff_t end = head + lines;
    ptrdiff_t done = fillCycles<true>(dst, cycle, head, end);
    for (int k = 0; done < end; done += kVector, ++k) stream(dst + done, cycle[k % 3]);
    fillShort(dst + end, pattern, end, bytes - end);
}

bool repeatsWords(const Pattern& pattern) { return isSame(pattern.bytes, pattern.bytes + 4); }

void fillRowString(uint8_t* dst, const Pattern& pattern, ptrdiff_t bytes) {
    if (bytes < kStringRow) return fillRow(dst, pattern, bytes);
    fillRow(dst, pattern, kCacheLine);
    store(dst + bytes - kVector, patternAt(pattern, bytes - kVector));
    const ptrdiff_t head = toBoundary(dst, kCacheLine);
    const auto word = detail::loadWord<uint32_t>(pattern.bytes + head % 4);
    uint8_t* begin = dst + head;
    ptrdiff_t words = (bytes - head) / 4;
    __asm__ volatile("rep stosl" : "+D"(begin), "+c"(words) : "a"(word) : "memory");
}

}  // namespace qori::kernels
