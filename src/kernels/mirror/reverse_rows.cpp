// SPDX-License-Identifier: Apache-2.0
#include "reverse_rows.h"

#include <algorithm>
#include <array>

#include "kernels/byte_tables.h"
#include "kernels/streamed_lines.h"
#include "pixels.h"

namespace qori::kernels {
namespace {

constexpr int kVector = kVectorBytes, kHalf = kBlockBytes;

/// Where a half of a reversed group finds its bytes: two windows of 16 that together hold them all, and an index into
/// each, kNone where the other has the byte.
struct HalfSource {
    int first, second;
    std::array<uint8_t, kHalf> fromFirst, fromSecond;
};

/// Half `half` of a group of so many bytes, which is made of the source's pixels low to high: 24 bytes at most.
template <int pixelBytes>
constexpr HalfSource halfSource(int groupBytes, int half) {
    const int pixels = groupBytes / pixelBytes;
    const int high = pixels - 1 - half * kHalf / pixelBytes, low = pixels - 1 - (half * kHalf + kHalf - 1) / pixelBytes;
    const int begin = low * pixelBytes, end = (high + 1) * pixelBytes;
    HalfSource source{begin, end - kHalf, {}, {}};
    for (int i = 0; i < kHalf; ++i) {
        const int at = half * kHalf + i, from = (pixels - 1 - at / pixelBytes) * pixelBytes + at % pixelBytes;
        const bool isFirst = from < begin + kHalf;
        source.fromFirst[static_cast<size_t>(i)] = isFirst ? static_cast<uint8_t>(from - source.first) : kNone;
        source.fromSecond[static_cast<size_t>(i)] = isFirst ? kNone : static_cast<uint8_t>(from - source.second);
    }
    return source;
}

/// The vector of a reversed group that begins with an even half.
struct VectorSource {
    int first[2], second[2];
    ByteTable fromFirst, fromSecond;
};

template <int pixelBytes>
constexpr auto vectorSources() {
    constexpr int vectors = pixelBytes % 3 == 0 ? 3 : 1;
    std::array<VectorSource, vectors> all{};
    for (int k = 0; k < vectors; ++k)
        for (int h = 0; h < 2; ++h) {
            const HalfSource half = halfSource<pixelBytes>(vectors * kVector, 2 * k + h);
            VectorSource& vector = all[static_cast<size_t>(k)];
            vector.first[h] = half.first;
            vector.second[h] = half.second;
            for (int i = 0; i < kHalf; ++i) {
                vector.fromFirst.at[kHalf * h + i] = half.fromFirst[static_cast<size_t>(i)];
                vector.fromSecond.at[kHalf * h + i] = half.fromSecond[static_cast<size_t>(i)];
            }
        }
    return all;
}

/// Whole pixels in the fewest whole vectors: 32 bytes, or 96 for pixels of 3, 6 and 12.
template <int pixelBytes>
struct Group {
    static constexpr bool even = kHalf % pixelBytes == 0;  ///< Halves hold whole pixels.
    static constexpr int vectors = even ? 1 : 3, bytes = vectors * kVector;

    Bytes at[vectors];

    /// The group of pixels at p, the last one first.
    static QORI_INLINE Group reversed(const uint8_t* p) {
        static constexpr auto sources = vectorSources<pixelBytes>();
        Group group;
        for (int k = 0; k < vectors; ++k) {
            const VectorSource& source = sources[static_cast<size_t>(k)];
            group.at[k] = loadBlocks(p + source.first[0], p + source.first[1]);
            if constexpr (pixelBytes < kHalf) group.at[k] = shuffleInBlocks(group.at[k], load(source.fromFirst.at));
            if constexpr (!even) {
                const Bytes others = loadBlocks(p + source.second[0], p + source.second[1]);
                group.at[k] = group.at[k] | shuffleInBlocks(others, load(source.fromSecond.at));
            }
        }
        return group;
    }

    template <bool streaming>
    QORI_INLINE void put(uint8_t* p) const {
        for (int k = 0; k < vectors; ++k) storeAs<streaming>(p + k * kVector, at[k]);
    }
};

/// The bytes of `fresh`, with the last quarter of each pixel from `old` where it is kept.
template <int pixelBytes, bool keepAlpha>
QORI_INLINE Bytes merged(Bytes fresh, Bytes old) {
    if constexpr (!keepAlpha) return fresh;
    alignas(kVectorBytes) static constexpr auto select = selectWithinPixel<pixelBytes>(pixelBytes / 4 * 3);
    return blend(old, fresh, load(select.data()));
}

/// Whole pixels within 16 bytes.
template <int pixelBytes>
constexpr int kHalfBytes = kHalf / pixelBytes* pixelBytes;

/// The pixels in the first n bytes of a vector, n <= kHalfBytes, the last one first and zeros behind them.
template <int pixelBytes>
QORI_INLINE Bytes reversedPart(Bytes a, ptrdiff_t n) {
    static constexpr auto order = [] {
        std::array<uint8_t, 2 * kHalf> index{};
        for (int i = 0; i < 2 * kHalf; ++i)
            index[static_cast<size_t>(i)] = i < kHalfBytes<pixelBytes>
                                                ? static_cast<uint8_t>(kHalfBytes<pixelBytes> - pixelBytes -
                                                                       i / pixelBytes * pixelBytes + i % pixelBytes)
                                                : kNone;
        return index;
    }();
    return shuffleInBlocks(a, repeatBlock(order.data() + kHalfBytes<pixelBytes> - n));
}

template <int pixelBytes, bool keepAlpha>
QORI_INLINE void reversePart(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes) {
    const Bytes fresh = reversedPart<pixelBytes>(loadPartial(src, bytes), bytes);
    if constexpr (keepAlpha)
        storePartial(dst, merged<pixelBytes, true>(fresh, loadPartial(dst, bytes)), bytes);
    else
        storePartial(dst, fresh, bytes);
}

/// Rows shorter than a group.
template <int pixelBytes, bool keepAlpha>
QORI_INLINE void reverseShort(uint8_t* dst, const uint8_t* src, ptrdiff_t bytes) {
    constexpr int part = kHalfBytes<pixelBytes>;
    for (; bytes >= part; bytes -= part, dst += part) reversePart<pixelBytes, keepAlpha>(dst, src + bytes - part, part);
    if (bytes > 0) reversePart<pixelBytes, keepAlpha>(dst, src, bytes);
}

/// Bytes until some pixel of a row lies on a multiple of 32 or 64 bytes, or -1 where none does.
template <int pixelBytes, int boundary>
QORI_INLINE ptrdiff_t bytesTo(const uint8_t* p) {
    const auto ahead = static_cast<int>(-reinterpret_cast<uintptr_t>(p) & (boundary - 1));
    if constexpr (Group<pixelBytes>::even) {
        return ahead % pixelBytes == 0 ? ahead : -1;
    } else {
        constexpr int unit = pixelBytes / 3, inverseOf3 = 43;  // 3 * 43 = 129, modulo 64 and less
        return ahead % unit == 0 ? (ahead / unit * inverseOf3 & (boundary / unit - 1)) * pixelBytes : -1;
    }
}

/// A row, its groups in the destination's order; the first and the last may overlap their neighbours.
template <int pixelBytes, bool keepAlpha>
struct Reversal {
    using G = Group<pixelBytes>;
    /// The fewest groups that are whole cache lines, and several of them.
    static constexpr ptrdiff_t unit = G::even ? kCacheLine : 2 * G::bytes;
    static constexpr ptrdiff_t piece = G::even ? 512 : 3 * unit;
    static_assert(unit % kCacheLine == 0 && piece % unit == 0);

    uint8_t* dst;
    const uint8_t* src;
    ptrdiff_t bytes;
    ptrdiff_t done = 0, streamEnd = 0;

    QORI_INLINE G groupAt(ptrdiff_t at) const {
        G fresh = G::reversed(src + bytes - G::bytes - at);
        if constexpr (keepAlpha) fresh.at[0] = merged<pixelBytes, true>(fresh.at[0], load(dst + at));
        return fresh;
    }
    template <bool streaming>
    QORI_INLINE void put(ptrdiff_t at) const {
        groupAt(at).template put<streaming>(dst + at);
    }

    /// `head` bytes, fewer than two groups; some more where they are no whole groups.
    QORI_INLINE void begin(ptrdiff_t head) {
        if (head > 0) put<false>(0);
        if (head > G::bytes) put<false>(head - G::bytes);
        if (head > 0) done = head;
    }
    /// fetches: the next row, which is so far away, and what becomes of it.
    template <bool fetches>
    QORI_INLINE void finish(ptrdiff_t dstStep = 0, ptrdiff_t srcStep = 0) {
        constexpr int unroll = G::even ? 4 : 1;
        constexpr ptrdiff_t turn = unroll * G::bytes;
        for (; done <= bytes - turn; done += turn) {
            if constexpr (fetches)
                for (ptrdiff_t at = 0; at < turn; at += kCacheLine) {
                    __builtin_prefetch(src + srcStep + bytes - turn - done + at);
                    __builtin_prefetch(dst + dstStep + done + at, 1);
                }
            for (int k = 0; k < unroll; ++k) put<false>(done + k * G::bytes);
        }
        for (; done <= bytes - G::bytes; done += G::bytes) put<false>(done);
        if (done < bytes) put<false>(bytes - G::bytes);
    }

    /// No group before the lines or behind them reaches into one. Measured: fewer lines than a piece lose.
    QORI_INLINE void beginStreaming() {
        const ptrdiff_t head = bytesTo<pixelBytes, kCacheLine>(dst);
        const ptrdiff_t lines = head < 0 ? 0 : StreamedLines::ofBytes(dst + head, bytes - head).lines;
        ptrdiff_t inUnits = lines / unit * unit;
        if (const ptrdiff_t rest = bytes - head - inUnits; rest > 0 && rest < G::bytes) inUnits -= unit;
        if (inUnits < piece) return begin(bytesTo<pixelBytes, kVector>(dst));
        if (head < G::bytes)
            reverseShort<pixelBytes, false>(dst, src + bytes - head, head);
        else
            begin(head);
        done = head;
        streamEnd = head + inUnits;
    }
    /// The next piece, if the row has one. The source is read backwards, which is fetched ahead no further than a page.
    QORI_INLINE bool streamPiece() {
        if (streamEnd - done < piece) return false;
        const uint8_t* const ahead = src + bytes - done - 2 * piece;
        for (ptrdiff_t at = 0; at < piece; at += kCacheLine) __builtin_prefetch(ahead + at);
        for (ptrdiff_t at = 0; at < piece; at += G::bytes) put<true>(done + at);
        done += piece;
        return true;
    }
    QORI_INLINE void finishStreaming() {
        for (; done < streamEnd; done += G::bytes) put<true>(done);
        finish<false>();
    }
};

/// Some rows together.
template <int pixelBytes>
QORI_NOINLINE void streamReversed(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep,
                                  ptrdiff_t bytes, int32_t rows) {
    using Row = Reversal<pixelBytes, false>;
    for (; rows > 0; rows -= kStreamedTogether) {
        Row row[kStreamedTogether];
        const int32_t together = std::min(rows, kStreamedTogether);
        for (int32_t k = 0; k < together; ++k, dst += dstStep, src += srcStep) {
            row[k] = {dst, src, bytes};
            row[k].beginStreaming();
        }
        for (bool isMore = true; isMore;) {
            isMore = false;
            for (int32_t k = 0; k < together; ++k) isMore |= row[k].streamPiece();
        }
        for (int32_t k = 0; k < together; ++k) row[k].finishStreaming();
    }
}

/// Whether the next row is fetched while one is reversed, which images in the first-level cache need not. Measured:
/// two pairs of rows of more than 12,000 bytes do not stay there, short rows and pixels of 12 and 16 bytes gain
/// nothing. Of 512 x 512 pixels of 3 bytes it saves a fifth of the time.
bool fetchesNextRow(ptrdiff_t bytes, int32_t rows) {
    return bytes >= 512 && bytes <= 12'000 && bytes >= 24 * 1024 / rows;
}

template <int pixelBytes, bool keepAlpha, bool fetches>
QORI_INLINE void reverseInCache(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, ptrdiff_t bytes,
                                int32_t rows) {
    for (; rows > 0; --rows, dst += dstStep, src += srcStep) {
        Reversal<pixelBytes, keepAlpha> row{dst, src, bytes};
        row.begin(bytesTo<pixelBytes, kVector>(dst));
        row.template finish<fetches>(dstStep, srcStep);
    }
}

/// Groups of three vectors take each way apart: together they leave 32-bit code too few registers, 1.15 times the time
/// of small images. Single vectors lose as much by a call.
template <int pixelBytes, bool keepAlpha, bool fetches>
QORI_NOINLINE void reverseApart(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, ptrdiff_t bytes,
                                int32_t rows) {
    reverseInCache<pixelBytes, keepAlpha, fetches>(dst, dstStep, src, srcStep, bytes, rows);
}

}  // namespace

template <int pixelBytes, bool keepAlpha>
void reverseRows(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, ptrdiff_t pixels, int32_t rows,
                 bool streaming) {
    const ptrdiff_t bytes = pixels * pixelBytes;
    if (bytes < Group<pixelBytes>::bytes) {
        for (; rows > 0; --rows, dst += dstStep, src += srcStep) reverseShort<pixelBytes, keepAlpha>(dst, src, bytes);
        return;
    }
    if constexpr (!keepAlpha)
        if (streaming && bytes >= Reversal<pixelBytes, false>::piece)
            return streamReversed<pixelBytes>(dst, dstStep, src, srcStep, bytes, rows);
    const bool fetches = pixelBytes <= 8 && !streaming && fetchesNextRow(bytes, rows);
    if constexpr (!Group<pixelBytes>::even) {
        if (fetches) return reverseApart<pixelBytes, keepAlpha, true>(dst, dstStep, src, srcStep, bytes, rows);
        reverseApart<pixelBytes, keepAlpha, false>(dst, dstStep, src, srcStep, bytes, rows);
    } else {
        if (fetches) return reverseInCache<pixelBytes, keepAlpha, true>(dst, dstStep, src, srcStep, bytes, rows);
        reverseInCache<pixelBytes, keepAlpha, false>(dst, dstStep, src, srcStep, bytes, rows);
    }
}

template <int pixelBytes, bool keepAlpha>
void swapReversed(uint8_t* left, uint8_t* rightEnd, ptrdiff_t pixels) {
    using G = Group<pixelBytes>;
    ptrdiff_t bytes = pixels * pixelBytes;
    for (; bytes >= G::bytes; bytes -= G::bytes, left += G::bytes) {
        rightEnd -= G::bytes;
        G toLeft = G::reversed(rightEnd), toRight = G::reversed(left);
        if constexpr (keepAlpha) {
            toLeft.at[0] = merged<pixelBytes, true>(toLeft.at[0], load(left));
            toRight.at[0] = merged<pixelBytes, true>(toRight.at[0], load(rightEnd));
        }
        toLeft.template put<false>(left);
        toRight.template put<false>(rightEnd);
    }
    while (bytes > 0) {
        constexpr ptrdiff_t most = kHalfBytes<pixelBytes>;
        const ptrdiff_t part = bytes < most ? bytes : most;
        rightEnd -= part;
        const Bytes l = loadPartial(left, part), r = loadPartial(rightEnd, part);
        storePartial(left, merged<pixelBytes, keepAlpha>(reversedPart<pixelBytes>(r, part), l), part);
        storePartial(rightEnd, merged<pixelBytes, keepAlpha>(reversedPart<pixelBytes>(l, part), r), part);
        bytes -= part;
        left += part;
    }
}

template <int pixelBytes, bool keepAlpha>
void reverseRowsInPlace(uint8_t* image, ptrdiff_t step, ptrdiff_t pixels, int32_t rows) {
    const ptrdiff_t bytes = pixels * pixelBytes;
    for (; rows > 0; --rows, image += step) {
        if (bytes <= kHalfBytes<pixelBytes>)
            reversePart<pixelBytes, keepAlpha>(image, image, bytes);
        else
            swapReversed<pixelBytes, keepAlpha>(image, image + bytes, pixels / 2);
    }
}

template <int pixelBytes, bool keepAlpha>
void swapRows(uint8_t* a, uint8_t* b, ptrdiff_t pixels) {
    const ptrdiff_t bytes = pixels * pixelBytes;
    ptrdiff_t done = 0;
    for (; done <= bytes - kVector; done += kVector) {
        const Bytes x = load(a + done), y = load(b + done);
        store(a + done, merged<pixelBytes, keepAlpha>(y, x));
        store(b + done, merged<pixelBytes, keepAlpha>(x, y));
    }
    if (const ptrdiff_t rest = bytes - done; rest > 0) {
        const Bytes x = loadPartial(a + done, rest), y = loadPartial(b + done, rest);
        storePartial(a + done, merged<pixelBytes, keepAlpha>(y, x), rest);
        storePartial(b + done, merged<pixelBytes, keepAlpha>(x, y), rest);
    }
}

#define QORI_INSTANTIATE(pixelBytes, keepAlpha)                                                                 \
    template void reverseRows<pixelBytes, keepAlpha>(uint8_t*, ptrdiff_t, const uint8_t*, ptrdiff_t, ptrdiff_t, \
                                                     int32_t, bool);                                            \
    template void reverseRowsInPlace<pixelBytes, keepAlpha>(uint8_t*, ptrdiff_t, ptrdiff_t, int32_t);           \
    template void swapReversed<pixelBytes, keepAlpha>(uint8_t*, uint8_t*, ptrdiff_t);                           \
    template void swapRows<pixelBytes, keepAlpha>(uint8_t*, uint8_t*, ptrdiff_t)
QORI_FOR_EACH_PIXEL(QORI_INSTANTIATE)

}  // namespace qori::kernels
