// SPDX-License-Identifier: Apache-2.0
// Where the pixels of a warp come from. A position is one fused multiply-add of the destination column, so that it
// depends on the pixel alone and on nothing that was computed before it.
//
// To a position a bias is added whose exponent leaves the mantissa so many bits below the point: the sum is rounded to
// a fixed-point number, whose words are the whole part and the fraction without any conversion. With the fine bias
// these are 32 bits each: whole parts from -2^19 to 2^19, fractions right to 2^-32 (the row's share and the column's
// are each rounded by 2^-33 at most). Positions that leave the range, whatever their size, remain doubles that compare.
#pragma once
#include "kernels/simd.h"

namespace qori::kernels {

inline constexpr double kFineBias = 0x1.8p20;           ///< 32 bits below the point.
inline constexpr double kCoarseBias = 0x1.8p32;         ///< 20 bits, for whole parts to 2^31.
inline constexpr int32_t kFineLength = (1 << 19) - 16;  ///< Sides of images that the fine bias serves are below it.

/// Fixed positions (fixed_places.h) serve sources whose sides and step are below a word's limit, and destinations as
/// wide; coefficients of columns up to the first of these. They differ from the others' by 2^-31 at most.
inline constexpr int32_t kFixedLength = 1 << 15, kFixedWidth = 1 << 16;
inline constexpr double kFixedMargin = 0x1p-24;
constexpr double unitOfBias(double bias) { return bias == kFineBias ? 0x1p-32 : 0x1p-20; }

/// The positions of one destination row: that of column x is x * along + start, in either direction.
struct WarpLine {
    double alongX, alongY;
    double startX, startY;  ///< With the bias.
    double exactX, exactY;  ///< Without it, for elements of double precision.
    double bias;
    uint64_t fixedAlongX, fixedAlongY;  ///< In units of 2^-48, modulo 2^64, for kernels of fixed positions.
    uint64_t fixedX, fixedY;
    /// For which of eight pixels a kernel prefetches. Where each lies in a line of its own, rows take turns.
    int32_t turn;
};

/// Positions without bias, ends included.
struct WarpBox {
    double left, top, right, bottom;
};

/// Weights of four taps as polynomials of a fraction f: power[0] + f * (power[1] + f * (power[2] + f * power[3])).
struct CubicWeights {
    double power[4][4];
};

/// What is read.
struct WarpSource {
    const uint8_t* origin;  ///< Pixel (0, 0).
    ptrdiff_t step;
    int32_t left, top, right, bottom;  ///< The first and last columns and rows that may be.
    const CubicWeights* cubic;         ///< Of the cubic kernels.
    ptrdiff_t ahead;                   ///< Bytes from a pixel to where the destination some rows below reads; a hint.
};

/// Makes count pixels from column first on. Positions are moved into the box where they leave it, unless the kernel
/// wants them inside.
using WarpKernel = void (*)(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first,
                            int32_t count, uint8_t* dst);

/// The kernels of an element type, channel count and interpolation.
struct WarpKernels {
    /// For positions whose reads lie inside the source: pixel (x, y) reads columns x - left to x + right, and rows
    /// likewise.
    WarpKernel inside;
    /// For any position: reads are moved into the source.
    WarpKernel anywhere;
    /// The same for sources that 32-bit offsets or 19 bits of whole parts do not cover, or with rows below
    /// kNearRowBytes.
    WarpKernel far;
    int32_t left, top, right, bottom;
    /// As `inside`, by fixed positions; null if there is none.
    WarpKernel fixed = nullptr;
};

inline constexpr int kNearRowBytes = 8;

namespace warp {

/// Eight columns in two vectors, in the order in which one shuffle joins halves of their lanes.
struct Columns {
    __m256d low, high;
};

QORI_INLINE Columns columnsFrom(int32_t first) {
    const __m256d base = _mm256_set1_pd(first);
    return {_mm256_add_pd(base, _mm256_setr_pd(0, 1, 4, 5)), _mm256_add_pd(base, _mm256_setr_pd(2, 3, 6, 7))};
}

/// Whole parts and fractions (in 2^-32) of eight positions.
struct Places {
    __m256i whole, fraction;
};

/// One direction, under the fine bias.
template <bool clamps>
class Axis {
public:
    QORI_INLINE Axis(double along, double start, double low, double high)
        : along_(_mm256_set1_pd(along)),
          start_(_mm256_set1_pd(start)),
          low_(_mm256_set1_pd(kFineBias + low)),
          high_(_mm256_set1_pd(kFineBias + high)) {}

    QORI_INLINE Places at(Columns columns) const {
        const __m256 low = position(columns.low), high = position(columns.high);
        constexpr int kLowWords = 0x88, kHighWords = 0xDD;
        constexpr int32_t kWholeOfBias = 0x41380000;
        const __m256i whole = _mm256_castps_si256(_mm256_shuffle_ps(low, high, kHighWords));
        return {_mm256_sub_epi32(whole, _mm256_set1_epi32(kWholeOfBias)),
                _mm256_castps_si256(_mm256_shuffle_ps(low, high, kLowWords))};
    }

private:
    QORI_INLINE __m256 position(__m256d columns) const {
        __m256d at = _mm256_fmadd_pd(columns, along_, start_);
        if constexpr (clamps) at = _mm256_min_pd(_mm256_max_pd(at, low_), high_);
        return _mm256_castpd_ps(at);
    }

    __m256d along_, start_, low_, high_;
};

template <bool clamps>
QORI_INLINE Axis<clamps> horizontal(const WarpLine& line, const WarpBox& box) {
    return {line.alongX, line.startX, box.left, box.right};
}
template <bool clamps>
QORI_INLINE Axis<clamps> vertical(const WarpLine& line, const WarpBox& box) {
    return {line.alongY, line.startY, box.top, box.bottom};
}

/// To the nearest single; those next to 1 become 1.
QORI_INLINE __m256 toFloat(__m256i fraction) {
    return _mm256_mul_ps(_mm256_cvtepi32_ps(_mm256_srli_epi32(fraction, 1)), _mm256_set1_ps(0x1p-31f));
}

/// Calls body(columns, n) for the columns, eight by eight; behind the last of the n columns the last is repeated.
template <class Body>
QORI_INLINE void forEights(int32_t first, int32_t count, Body body) {
    constexpr int kLanes = 8;
    const __m256d eight = _mm256_set1_pd(kLanes);
    Columns columns = columnsFrom(first);
    int32_t left = count;
    for (; left >= kLanes; left -= kLanes) {
        body(columns, kLanes);
        columns = {_mm256_add_pd(columns.low, eight), _mm256_add_pd(columns.high, eight)};
    }
    if (left > 0) {
        const __m256d last = _mm256_set1_pd(static_cast<double>(first) + (count - 1));
        body({_mm256_min_pd(columns.low, last), _mm256_min_pd(columns.high, last)}, left);
    }
}

/// Byte offsets of pixels, exact where they fit in 32 bits.
template <int pixelBytes>
QORI_INLINE __m256i offsetsOf(__m256i columns, __m256i rows, int32_t step) {
    const __m256i across = pixelBytes == 1 ? columns : _mm256_mullo_epi32(columns, _mm256_set1_epi32(pixelBytes));
    return _mm256_add_epi32(across, _mm256_mullo_epi32(rows, _mm256_set1_epi32(step)));
}

/// How many pixels kernels that go pixel by pixel prepare at once.
inline constexpr int kBatch = 64;

/// The same in double precision with whole parts of 32 bits, for n columns (rounded up to fours): positions are moved
/// between low and high; the whole part is `most` at the most.
struct DoubleAxis {
    double along, start, bias, low, high, most;

    void split(int32_t first, int n, int32_t* whole, double* fraction) const {
        const __m256d upper = _mm256_set1_pd(high), lower = _mm256_set1_pd(low);
        for (int i = 0; i < n; i += 4) {
            const __m256d columns =
                _mm256_add_pd(_mm256_set1_pd(static_cast<double>(first) + i), _mm256_setr_pd(0, 1, 2, 3));
            const __m256d biased = _mm256_fmadd_pd(columns, _mm256_set1_pd(along), _mm256_set1_pd(start));
            const __m256d at = _mm256_min_pd(_mm256_max_pd(_mm256_sub_pd(biased, _mm256_set1_pd(bias)), lower), upper);
            const __m256d floor = _mm256_min_pd(_mm256_floor_pd(at), _mm256_set1_pd(most));
            _mm_storeu_si128(reinterpret_cast<__m128i*>(whole + i), _mm256_cvttpd_epi32(floor));
            _mm256_storeu_pd(fraction + i, _mm256_sub_pd(at, floor));
        }
    }
};

/// Elements of double precision take positions as they are, the others those of the vector kernels.
template <class T>
DoubleAxis horizontalDoubles(const WarpLine& line, const WarpBox& box, double most) {
    if constexpr (std::is_same_v<T, double>) return {line.alongX, line.exactX, 0, box.left, box.right, most};
    return {line.alongX, line.startX, line.bias, box.left, box.right, most};
}
template <class T>
DoubleAxis verticalDoubles(const WarpLine& line, const WarpBox& box, double most) {
    if constexpr (std::is_same_v<T, double>) return {line.alongY, line.exactY, 0, box.top, box.bottom, most};
    return {line.alongY, line.startY, line.bias, box.top, box.bottom, most};
}

QORI_INLINE int32_t clampIndex(int32_t index, int32_t first, int32_t last) {
    return index < first ? first : index > last ? last : index;
}

/// Has the line that will be read some rows later brought near: tilted rows cross many lines, in no order that the
/// processor foresees.
QORI_INLINE void prefetchAhead(const uint8_t* at, ptrdiff_t ahead) {
    // As a number, which may lie outside the image. NOLINTNEXTLINE(performance-no-int-to-ptr)
    _mm_prefetch(reinterpret_cast<const char*>(reinterpret_cast<uintptr_t>(at) + static_cast<uintptr_t>(ahead)),
                 _MM_HINT_T0);
}

/// For two of eight pixels, between which there are few lines at most angles.
QORI_INLINE void prefetchAhead(const uint8_t* origin, __m256i offsets, ptrdiff_t ahead) {
    prefetchAhead(origin + _mm_cvtsi128_si32(_mm256_castsi256_si128(offsets)), ahead);
    prefetchAhead(origin + _mm_cvtsi128_si32(_mm256_extracti128_si256(offsets, 1)), ahead);
}

/// The first bytes of a vector: 8, or 16 to 32 in eights.
template <int bytes>
QORI_INLINE void storeFirst(uint8_t* dst, Bytes a) {
    if constexpr (bytes == 32) return store(dst, a);
    if constexpr (bytes >= 16) _mm_storeu_si128(reinterpret_cast<__m128i*>(dst), _mm256_castsi256_si128(a.v));
    const __m128i rest = bytes >= 16 ? _mm256_extracti128_si256(a.v, 1) : _mm256_castsi256_si128(a.v);
    if constexpr (bytes % 16 != 0) _mm_storel_epi64(reinterpret_cast<__m128i*>(dst + bytes / 16 * 16), rest);
}

/// A pixel of fixed size, read before it is written: images may overlap where the caller does not mind what comes out.
template <int bytes>
QORI_INLINE void movePixel(uint8_t* to, const uint8_t* from) {
    uint8_t pixel[bytes];
    __builtin_memcpy(pixel, from, bytes);
    __builtin_memcpy(to, pixel, bytes);
}

/// Pixel (x, y), or the nearest one that may be read.
template <int pixelBytes>
QORI_INLINE const uint8_t* nearestPixel(const WarpSource& source, int32_t x, int32_t y) {
    return source.origin + clampIndex(y, source.top, source.bottom) * source.step +
           clampIndex(x, source.left, source.right) * ptrdiff_t{pixelBytes};
}

}  // namespace warp
}  // namespace qori::kernels
