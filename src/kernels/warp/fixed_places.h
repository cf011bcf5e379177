// SPDX-License-Identifier: Apache-2.0
// Blocks of positions for kernels of bytes and of nearest pixels: offsets, and fractions of 16 bits, rounded down.
//
// Fixed positions are integers of 16 bits above the point and 48 below, modulo 2^64: start + column * along, so that
// they too depend on the pixel alone. Their high words are all that kernels look at, whole part and fraction in one:
// half the shuffles of positions that are doubles, and offsets by one multiplication of words. An error of 2^-49 in
// `along` grows to 2^-33 over kFixedWidth columns.
#pragma once
#include "places.h"

namespace qori::kernels::warp {

/// Eight pixels. Of x and y the low word of each lane is the fraction.
struct Block {
    __m256i offsets, shifts, x, y;
};

/// Lane l of vector k is the column of pixel 2k + l % 2, for the upper two lanes half a block further: vectors 2k and
/// 2k + 1 give the words of four pixels, and in the upper half those half a block further, by one shuffle.
template <int pixels>
constexpr int columnOf(int k, int lane) {
    return 2 * k + lane % 2 + lane / 2 * (pixels / 2);
}

template <int pixels>
class FixedAxis {
public:
    QORI_INLINE FixedAxis(uint64_t start, uint64_t along, int32_t first) {
        const __m256i odd = _mm256_setr_epi32(0, 0, -1, -1, 0, 0, -1, -1),
                      upper = _mm256_setr_epi32(0, 0, 0, 0, -1, -1, -1, -1);
        const __m256i within =
            _mm256_add_epi64(_mm256_and_si256(all(along), odd), _mm256_and_si256(all(along * (pixels / 2)), upper));
        at_[0] = _mm256_add_epi64(all(start + along * static_cast<uint64_t>(first)), within);
        for (int k = 1; k < kVectors; ++k) at_[k] = _mm256_add_epi64(at_[k - 1], all(2 * along));
        advance_ = all(pixels * along);
    }

    /// Behind the last of n columns the last is repeated.
    QORI_INLINE FixedAxis(uint64_t start, uint64_t along, int32_t first, int n) {
        for (int k = 0; k < kVectors; ++k) {
            alignas(kVectorBytes) uint64_t lanes[4];
            for (int i = 0; i < 4; ++i) {
                const int column = columnOf<pixels>(k, i);
                lanes[i] = start + along * static_cast<uint64_t>(first + (column < n ? column : n - 1));
            }
            at_[k] = _mm256_load_si256(reinterpret_cast<const __m256i*>(lanes));
        }
        advance_ = _mm256_setzero_si256();
    }

    /// 16 bits on either side of the point.
    QORI_INLINE __m256i words(int k) const {
        return _mm256_castps_si256(
            _mm256_shuffle_ps(_mm256_castsi256_ps(at_[2 * k]), _mm256_castsi256_ps(at_[2 * k + 1]), 0xDD));
    }

    QORI_INLINE void next() {
        for (__m256i& a : at_) a = _mm256_add_epi64(a, advance_);
    }

private:
    static constexpr int kVectors = pixels / 4;

    QORI_INLINE static __m256i all(uint64_t v) { return _mm256_set1_epi64x(static_cast<long long>(v)); }

    __m256i at_[kVectors], advance_;
};

template <int pixels, int pixelBytes>
class FixedBlocks {
public:
    static constexpr int kPixels = pixels;

    QORI_INLINE FixedBlocks(const WarpLine& line, const WarpSource& source, int32_t first)
        : x_(line.fixedX, line.fixedAlongX, first), y_(line.fixedY, line.fixedAlongY, first), apart_(apart(source)) {}
    QORI_INLINE FixedBlocks(const WarpLine& line, const WarpSource& source, int32_t first, int n)
        : x_(line.fixedX, line.fixedAlongX, first, n),
          y_(line.fixedY, line.fixedAlongY, first, n),
          apart_(apart(source)) {}

    QORI_INLINE Block at(int k) const {
        const __m256i x = x_.words(k), y = y_.words(k);
        const __m256i whole = _mm256_blend_epi16(_mm256_srli_epi32(x, 16), y, 0xAA);
        return {_mm256_madd_epi16(whole, apart_), _mm256_setzero_si256(), x, y};
    }

    QORI_INLINE void next() {
        x_.next();
        y_.next();
    }

private:
    /// Bytes between pixels and between rows, as words.
    QORI_INLINE static __m256i apart(const WarpSource& source) {
        return _mm256_set1_epi32(static_cast<int32_t>(static_cast<uint32_t>(source.step) << 16 | pixelBytes));
    }

    FixedAxis<pixels> x_, y_;
    __m256i apart_;
};

/// The same from doubles, for sources of any size. Where positions are clamped, words of so many bytes that would end
/// behind their row begin further ahead, and are to be shifted.
template <int pixels, int pixelBytes, bool clamps, int wordBytes>
class DoubleBlocks {
public:
    static constexpr int kPixels = pixels;

    QORI_INLINE DoubleBlocks(const WarpLine& line, const WarpBox& box, const WarpSource& source, int32_t first, int n)
        : across_(horizontal<clamps>(line, box)),
          down_(vertical<clamps>(line, box)),
          step_(static_cast<int32_t>(source.step)),
          lastWord_((source.right + 1) * pixelBytes - wordBytes) {
        const __m256d last = _mm256_set1_pd(static_cast<double>(first) + (n - 1));
        for (int k = 0; k < kVectors; ++k) {
            const __m256d within = _mm256_setr_pd(columnOf<pixels>(k, 0), columnOf<pixels>(k, 1),
                                                  columnOf<pixels>(k, 2), columnOf<pixels>(k, 3));
            at_[k] = _mm256_min_pd(_mm256_add_pd(_mm256_set1_pd(first), within), last);
        }
    }

    QORI_INLINE Block at(int k) const {
        const Columns columns{at_[2 * k], at_[2 * k + 1]};
        const Places x = across_.at(columns), y = down_.at(columns);
        Block block{offsetsOf<pixelBytes>(x.whole, y.whole, step_), _mm256_setzero_si256(),
                    _mm256_srli_epi32(x.fraction, 16), _mm256_srli_epi32(y.fraction, 16)};
        if constexpr (clamps && pixelBytes % wordBytes != 0) {
            const __m256i begin = offsetsOf<pixelBytes>(x.whole, block.shifts, 0);
            const __m256i surplus =
                _mm256_max_epi32(_mm256_sub_epi32(begin, _mm256_set1_epi32(lastWord_)), block.shifts);
            block.offsets = _mm256_sub_epi32(block.offsets, surplus);
            block.shifts = _mm256_slli_epi32(surplus, 3);
        }
        return block;
    }

    QORI_INLINE void next() {
        for (__m256d& a : at_) a = _mm256_add_pd(a, _mm256_set1_pd(pixels));
    }

private:
    static constexpr int kVectors = pixels / 4;

    Axis<clamps> across_, down_;
    int32_t step_, lastWord_;
    __m256d at_[kVectors];
};

/// Makes pixels block by block, of which the last begins early enough to end with them; of fewer the last is repeated.
/// Way::prepare takes positions to what Way::make reads pixels by. Where kPreparesAhead, it runs a block ahead: offsets
/// that go through memory would be waited for. `blocksFrom` is given a column and how many there are.
template <class Way, class From>
QORI_INLINE void makeBlocks(const Way& way, From blocksFrom, int32_t first, int32_t count, uint8_t* dst) {
    constexpr int n = Way::kPixels, pixelBytes = Way::kPixelBytes;
    const auto makeAt = [&](const auto& blocks, int at, int pixels) __attribute__((always_inline)) {
        typename Way::Prepared prepared;
        way.prepare(blocks, prepared);
        way.make(prepared, dst + ptrdiff_t{at} * pixelBytes, pixels);
    };
    if (count < n) return makeAt(blocksFrom(first, count), 0, count);
    auto blocks = blocksFrom(first, n);
    int at = 0;
    if constexpr (Way::kPreparesAhead) {
        typename Way::Prepared ring[2];
        way.prepare(blocks, ring[0]);
        for (int k = 0; count - at >= n; at += n, k ^= 1) {
            blocks.next();
            way.prepare(blocks, ring[k ^ 1]);
            way.make(ring[k], dst + ptrdiff_t{at} * pixelBytes, n);
        }
    } else {
        for (; count - at >= n; at += n, blocks.next()) makeAt(blocks, at, n);
    }
    if (at < count) makeAt(blocksFrom(first + count - n, n), count - n, n);
}

template <class Way>
QORI_INLINE void makeFixedBlocks(const Way& way, const WarpSource& source, const WarpLine& line, int32_t first,
                                 int32_t count, uint8_t* dst) {
    using Blocks = FixedBlocks<Way::kPixels, Way::kPixelBytes>;
    const auto from = [&](int32_t column, int n) __attribute__((always_inline)) {
        return n < Way::kPixels ? Blocks(line, source, column, n) : Blocks(line, source, column);
    };
    makeBlocks(way, from, first, count, dst);
}

template <bool clamps, class Way>
QORI_INLINE void makeDoubleBlocks(const Way& way, const WarpSource& source, const WarpLine& line, const WarpBox& box,
                                  int32_t first, int32_t count, uint8_t* dst) {
    using Blocks = DoubleBlocks<Way::kPixels, Way::kPixelBytes, clamps, Way::kWord>;
    const auto from = [&](int32_t column, int n) __attribute__((always_inline)) {
        return Blocks(line, box, source, column, n);
    };
    makeBlocks(way, from, first, count, dst);
}

}  // namespace qori::kernels::warp
