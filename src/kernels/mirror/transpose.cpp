// SPDX-License-Identifier: Apache-2.0
#include "transpose.h"

#include <algorithm>

#include "kernels/copy/select_rows.h"
#include "pixels.h"

namespace qori::kernels {
namespace {

/// Interleaves the halves of two vectors by elements of so many bytes: the low or the high quarters.
template <int element, bool high>
QORI_INLINE Bytes interleave(Bytes a, Bytes b) {
    if constexpr (element == 1)
        return {high ? _mm256_unpackhi_epi8(a.v, b.v) : _mm256_unpacklo_epi8(a.v, b.v)};
    else if constexpr (element == 2)
        return {high ? _mm256_unpackhi_epi16(a.v, b.v) : _mm256_unpacklo_epi16(a.v, b.v)};
    else if constexpr (element == 4)
        return {high ? _mm256_unpackhi_epi32(a.v, b.v) : _mm256_unpacklo_epi32(a.v, b.v)};
    else
        return {high ? _mm256_unpackhi_epi64(a.v, b.v) : _mm256_unpacklo_epi64(a.v, b.v)};
}

/// Turns n vectors whose halves hold n elements each: element j of vector i becomes element i of vector j, in both
/// halves. A round interleaves the first half of the vectors with the second, which rotates the bits of (vector,
/// element) by one; after as many rounds as either has bits they have changed places.
template <int n>
QORI_INLINE void turn(Bytes (&v)[n]) {
    constexpr int element = 16 / n;
    for (int round = 1; round < n; round *= 2) {
        Bytes next[n];
        for (int i = 0; i < n / 2; ++i) {
            next[2 * i] = interleave<element, false>(v[i], v[i + n / 2]);
            next[2 * i + 1] = interleave<element, true>(v[i], v[i + n / 2]);
        }
        for (int i = 0; i < n; ++i) v[i] = next[i];
    }
}

/// How pixels of a size are turned. Those of 3, 6 and 12 bytes are turned in elements of 4, 8 and 16.
template <int pixelBytes>
struct Turning {
    static constexpr bool even = 16 % pixelBytes == 0;
    static constexpr int element = even ? pixelBytes : pixelBytes / 3 * 4;
    static constexpr int n = 16 / element;            ///< Pixels in a half.
    static constexpr int rows = 2 * n;                ///< Source rows of a block.
    static constexpr int columns = even ? n : 2 * n;  ///< Source columns of a block: 16 or 24 bytes.
    /// Whole cache lines of the destination. Measured at 3840 x 2160: wider pixels gain a third from two of them.
    static constexpr int tileRowBytes = !even ? 192 : pixelBytes < 8 ? 64 : 128;
    static constexpr int tileRows = tileRowBytes / pixelBytes;
    static constexpr int tileColumns = std::min(64, (even ? 128 : 96) / pixelBytes);
    /// Of images beyond the second-level cache, whose lines come in pairs. Bytes took 1.35 times as long in tiles of
    /// one line each. From cache to cache the larger tiles lose by a quarter where steps are powers of two.
    static constexpr int farRows = even && pixelBytes < 4 ? 128 / pixelBytes : tileRows;
    static constexpr int farColumns = even && pixelBytes < 4 ? 128 / pixelBytes : tileColumns;
    /// A block of uneven pixels stores four bytes behind its last.
    static constexpr int tileStep = tileRowBytes + (even ? 0 : 32);
};

/// Pixels of 3, 6 or 12 bytes spread over elements of 4, 8 or 16. The first 12 bytes of both halves, or the last.
template <int pixelBytes>
constexpr ByteTable spread(bool last) {
    return bothHalves([=](int i) {
        constexpr int element = pixelBytes / 3 * 4;
        return i % element < pixelBytes ? i / element * pixelBytes + i % element + (last ? 4 : 0) : int{kNone};
    });
}

template <int pixelBytes>
constexpr ByteTable gathered() {
    return bothHalves([](int i) {
        constexpr int element = pixelBytes / 3 * 4;
        return i < 12 ? i / pixelBytes * element + i % pixelBytes : int{kNone};
    });
}

/// A block of `rows` x `columns` source pixels.
template <int pixelBytes>
QORI_INLINE void turnBlock(uint8_t* to, ptrdiff_t toStep, const uint8_t* from, ptrdiff_t fromStep) {
    constexpr int n = Turning<pixelBytes>::n;
    Bytes v[n];
    if constexpr (Turning<pixelBytes>::even) {
        for (int i = 0; i < n; ++i) v[i] = loadBlocks(from + i * fromStep, from + (i + n) * fromStep);
        turn(v);
        for (int i = 0; i < n; ++i) store(to + i * toStep, v[i]);
    } else {
        static constexpr ByteTable spreads[2] = {spread<pixelBytes>(false), spread<pixelBytes>(true)};
        static constexpr ByteTable gather = gathered<pixelBytes>();
        for (int side = 0; side < 2; ++side, from += 8, to += n * toStep) {
            for (int i = 0; i < n; ++i)
                v[i] =
                    shuffleInBlocks(loadBlocks(from + i * fromStep, from + (i + n) * fromStep), load(spreads[side].at));
            turn(v);
            for (int i = 0; i < n; ++i)
                storeBlocks(to + i * toStep, to + i * toStep + 12, shuffleInBlocks(v[i], load(gather.at)));
        }
    }
}

/// A block of half as many rows.
template <int pixelBytes>
QORI_INLINE void turnHalfBlock(uint8_t* to, ptrdiff_t toStep, const uint8_t* from, ptrdiff_t fromStep) {
    constexpr int n = Turning<pixelBytes>::n;
    Bytes v[n];
    for (int i = 0; i < n; ++i) v[i] = repeatBlock(from + i * fromStep);
    turn(v);
    for (int i = 0; i < n; ++i) storePartial(to + i * toStep, v[i], kBlockBytes);
}

/// Enough blocks for so many rows and columns, into a tile.
template <int pixelBytes>
QORI_INLINE void turnBlocks(uint8_t* tile, const uint8_t* from, ptrdiff_t fromStep, int32_t rows, int32_t columns) {
    using T = Turning<pixelBytes>;
    for (int32_t x = 0; x < columns; x += T::columns)
        for (int32_t y = 0; y < rows; y += T::rows)
            turnBlock<pixelBytes>(tile + x * T::tileStep + y * pixelBytes, T::tileStep,
                                  from + y * fromStep + x * pixelBytes, fromStep);
}

/// Turns tile after tile. A tile is turned on the stack, so that the destination is written in whole cache lines and
/// the source is read no further than its edge.
template <int pixelBytes, bool keepAlpha>
class Turner {
    using T = Turning<pixelBytes>;

public:
    static constexpr bool canTurnDirectly = !keepAlpha && T::even;

    /// Whole blocks touch no byte outside: straight from image to image.
    static void turnDirectly(uint8_t* to, ptrdiff_t toStep, const uint8_t* from, ptrdiff_t fromStep, int32_t rows,
                             int32_t columns) {
        for (int32_t x = 0; x < columns; x += T::columns, to += T::columns * toStep, from += T::columns * pixelBytes) {
            int32_t y = 0;
            for (; y <= rows - T::rows; y += T::rows)
                turnBlock<pixelBytes>(to + ptrdiff_t{y} * pixelBytes, toStep, from + y * fromStep, fromStep);
            if (y < rows)
                turnHalfBlock<pixelBytes>(to + ptrdiff_t{y} * pixelBytes, toStep, from + y * fromStep, fromStep);
        }
    }

    /// A tile at from, of no more rows and columns than a tile has.
    void turnTile(uint8_t* to, ptrdiff_t toStep, const uint8_t* from, ptrdiff_t fromStep, int32_t rows, int32_t columns,
                  bool streaming) {
        if (rows == T::tileRows && columns == T::tileColumns) {
            turnBlocks<pixelBytes>(tile_, from, fromStep, T::tileRows, T::tileColumns);
            return putWhole(to, toStep, streaming);
        }
        if (canTurnDirectly && rows % T::n == 0 && columns % T::columns == 0)
            return turnDirectly(to, toStep, from, fromStep, rows, columns);
        for (int32_t y = 0; y < rows; ++y)
            copyRow(edge_ + y * kEdgeStep, from + y * fromStep, ptrdiff_t{columns} * pixelBytes);
        turnBlocks<pixelBytes>(tile_, edge_, kEdgeStep, rows, columns);
        for (int32_t x = 0; x < columns; ++x) {
            if constexpr (keepAlpha)
                selectRow<pixelBytes, pixelBytes / 4 * 3>(to + x * toStep, tile_ + x * T::tileStep, rows);
            else
                copyRow(to + x * toStep, tile_ + x * T::tileStep, ptrdiff_t{rows} * pixelBytes);
        }
    }

    /// A tile of an image beyond the second-level cache, of no more rows and columns than such a tile has.
    QORI_NOINLINE void turnFarTile(uint8_t* to, ptrdiff_t toStep, const uint8_t* from, ptrdiff_t fromStep, int32_t rows,
                                   int32_t columns) {
        if constexpr (canTurnDirectly)
            if (rows == T::farRows && columns == T::farColumns)
                return turnDirectly(to, toStep, from, fromStep, rows, columns);
        for (int32_t x = 0; x < columns; x += T::tileColumns)
            for (int32_t y = 0; y < rows; y += T::tileRows)
                turnTile(to + x * toStep + ptrdiff_t{y} * pixelBytes, toStep,
                         from + y * fromStep + ptrdiff_t{x} * pixelBytes, fromStep, std::min(T::tileRows, rows - y),
                         std::min(T::tileColumns, columns - x), false);
    }

private:
    static constexpr int kEdgeStep = (T::tileColumns + T::columns) * pixelBytes;

    void putWhole(uint8_t* to, ptrdiff_t toStep, bool streaming) const {
        for (int x = 0; x < T::tileColumns; ++x)
            for (int i = 0; i < T::tileRowBytes; i += 32) {
                uint8_t* const p = to + x * toStep + i;
                Bytes a = load(tile_ + x * T::tileStep + i);
                if constexpr (keepAlpha) {
                    alignas(kVectorBytes) static constexpr auto colour =
                        selectWithinPixel<pixelBytes>(pixelBytes / 4 * 3);
                    a = blend(load(p), a, load(colour.data()));
                }
                if (streaming)
                    stream(p, a);
                else
                    store(p, a);
            }
    }

    // Blocks may turn what edges leave unset; it is not stored.
    alignas(kVectorBytes) uint8_t tile_[(T::tileColumns + T::columns) * T::tileStep];
    alignas(kVectorBytes) uint8_t edge_[(T::tileRows + T::rows) * kEdgeStep];
};

/// Bytes of an image from which on lines are fetched ahead: below, they are in the second-level cache already, and
/// fetching them costs half as much again.
constexpr int64_t kFarBytes = 512 * 1024;
/// From here on the destination is fetched a tile ahead as well. Below, lines whose addresses are powers of two apart
/// push each other out of the first-level cache before they are written.
constexpr int64_t kFarAheadBytes = 3 * kFarBytes;

/// Rows of the source, or of the destination, that a panel of tiles spans. Each is a page or more apart from the next,
/// and a page must still be known to the processor when the next tiles come to it: a multiple of every tile's sides.
constexpr int32_t kPanel = 1024;

/// Fetches the lines of a rectangle. No prefetcher of the processor follows as many rows as a tile has.
template <int locality>
QORI_INLINE void prefetch(const uint8_t* p, ptrdiff_t step, int32_t rows, ptrdiff_t bytes) {
    for (; rows > 0; --rows, p += step)
        for (ptrdiff_t at = 0; at < bytes; at += 64) __builtin_prefetch(p + at, 0, locality);
}

}  // namespace

template <int pixelBytes, bool keepAlpha>
void transposeImage(uint8_t* dst, ptrdiff_t dstStep, const uint8_t* src, ptrdiff_t srcStep, QorImageSize size,
                    bool streaming) {
    using T = Turning<pixelBytes>;
    Turner<pixelBytes, keepAlpha> turner;
    // Half a cache line does not go past the cache: tiles write them whole, if they lie like that.
    streaming = streaming && ((reinterpret_cast<uintptr_t>(dst) | static_cast<uintptr_t>(dstStep)) & 63u) == 0;
    const int64_t bytes = int64_t{size.width} * size.height * pixelBytes;
    const bool far = bytes >= kFarBytes, fetchesAhead = !T::even || bytes >= kFarAheadBytes;
    // What lies far apart need not be written line by line, as a pair of lines stays in the first-level cache.
    const bool isDirect = Turner<pixelBytes, keepAlpha>::canTurnDirectly && far && !streaming;
    const int32_t tileRows = isDirect ? T::farRows : T::tileRows;
    const int32_t tileColumns = isDirect ? T::farColumns : T::tileColumns;
    const auto turnAt = [&](int32_t x, int32_t y, int32_t nextX, int32_t nextY) __attribute__((always_inline)) {
        const int32_t rows = std::min(tileRows, size.height - y), columns = std::min(tileColumns, size.width - x);
        uint8_t* const to = dst + x * dstStep + ptrdiff_t{y} * pixelBytes;
        if (far && !fetchesAhead && !streaming) prefetch<3>(to, dstStep, columns, ptrdiff_t{rows} * pixelBytes);
        if (far && nextX < size.width && nextY < size.height) {
            const int32_t nextRows = std::min(tileRows, size.height - nextY);
            const int32_t nextColumns = std::min(tileColumns, size.width - nextX);
            prefetch<3>(src + nextY * srcStep + ptrdiff_t{nextX} * pixelBytes, srcStep, nextRows,
                        ptrdiff_t{nextColumns} * pixelBytes);
            if (fetchesAhead && !streaming)
                prefetch<T::even ? 3 : 2>(dst + nextX * dstStep + ptrdiff_t{nextY} * pixelBytes, dstStep, nextColumns,
                                          ptrdiff_t{nextRows} * pixelBytes);
        }
        const uint8_t* const from = src + y * srcStep + ptrdiff_t{x} * pixelBytes;
        if (!isDirect) return turner.turnTile(to, dstStep, from, srcStep, rows, columns, streaming);
        turner.turnFarTile(to, dstStep, from, srcStep, rows, columns);
    };
    // Measured: tiles of 96 bytes a row leave lines half read, which the next tile of the same rows finds in the cache;
    // the others gain where the destination's rows are written on.
    if constexpr (T::even) {
        for (int32_t top = 0; top < size.height; top += kPanel) {
            const int32_t bottom = std::min(size.height, top + kPanel);
            for (int32_t x = 0; x < size.width; x += tileColumns)
                for (int32_t y = top; y < bottom; y += tileRows) {
                    const bool isLast = y + tileRows >= bottom;
                    turnAt(x, y, isLast ? x + tileColumns : x, isLast ? top : y + tileRows);
                }
        }
    } else {
        for (int32_t left = 0; left < size.width; left += kPanel) {
            const int32_t right = std::min(size.width, left + kPanel);
            for (int32_t y = 0; y < size.height; y += tileRows)
                for (int32_t x = left; x < right; x += tileColumns) {
                    const bool isLast = x + tileColumns >= right;
                    turnAt(x, y, isLast ? left : x + tileColumns, isLast ? y + tileRows : y);
                }
        }
    }
}

#define QORI_INSTANTIATE(pixelBytes, keepAlpha)                                                                       \
    template void transposeImage<pixelBytes, keepAlpha>(uint8_t*, ptrdiff_t, const uint8_t*, ptrdiff_t, QorImageSize, \
                                                        bool)
QORI_FOR_EACH_PIXEL(QORI_INSTANTIATE)

}  // namespace qori::kernels
