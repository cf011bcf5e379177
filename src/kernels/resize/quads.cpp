// SPDX-License-Identifier: Apache-2.0
#include "quads.h"

#include "floats.h"

namespace qori::kernels {
namespace {

constexpr int kColumnFloats = 4 * kQuadRows;  // a cache line

/// A load of 16 bytes holds so many whole pixels; one channel less than four leaves four bytes of them unused.
template <class T>
constexpr int kLoadPixels = 4 / int{sizeof(T)};
template <class T, int channels>
constexpr int kLoadElements = kLoadPixels<T>* channels;

/// Shuffles that put the elements of one pixel of a load into 32 bits each: into the upper half where they are signed.
template <class T, int channels>
struct Places {
    alignas(kVectorBytes) uint8_t of[kLoadPixels<T>][32];

    constexpr Places() : of{} {
        constexpr int kBytes = sizeof(T), kShift = std::is_signed_v<T> ? 4 - kBytes : 0;
        for (int p = 0; p < kLoadPixels<T>; ++p)
            for (int i = 0; i < 32; ++i) {
                const int channel = i % 16 / 4, byte = i % 4 - kShift;
                const bool isThere = channel < channels && byte >= 0 && byte < kBytes;
                of[p][i] = static_cast<uint8_t>(isThere ? (p * channels + channel) * kBytes + byte : 0x80);
            }
    }
};
template <class T, int channels>
constexpr Places<T, channels> kPlaces{};

/// Pixel p of the loads of two rows.
template <class T, int channels>
QORI_INLINE __m256 quadsOf(Bytes both, int p) {
    if constexpr (std::is_same_v<T, float>) return _mm256_castsi256_ps(both.v);
    const __m256i lanes = shuffleInBlocks(both, load(kPlaces<T, channels>.of[p])).v;
    return _mm256_cvtepi32_ps(std::is_signed_v<T> ? _mm256_srai_epi32(lanes, 16) : lanes);
}

/// Spreads one load of each row.
template <class T, int channels, class Load>
QORI_INLINE void spreadLoad(const T* const rows[kQuadRows], ptrdiff_t at, Load load16, float* out) {
    for (int r = 0; r < kQuadRows; r += 2) {
        const __m128i upper = load16(rows[r] + at), lower = load16(rows[r + 1] + at);
        const Bytes both{_mm256_inserti128_si256(_mm256_castsi128_si256(upper), lower, 1)};
        for (int p = 0; p < kLoadPixels<T>; ++p)
            _mm256_store_ps(out + kColumnFloats * p + 4 * r, quadsOf<T, channels>(both, p));
    }
}

/// Spreads `pixels` pixels that begin at element `at`; up to a load's pixels behind them are written too.
template <class T, int channels>
QORI_INLINE void spreadRows(const T* const from[kQuadRows], ptrdiff_t at, ptrdiff_t pixels, ptrdiff_t legalEnd,
                            float* out) {
    const T* rows[kQuadRows];  // not reloaded after every store
    for (int r = 0; r < kQuadRows; ++r) rows[r] = from[r];
    constexpr ptrdiff_t kElements = kLoadElements<T, channels>, kWhole = 16 / int{sizeof(T)};
    const ptrdiff_t end = at + pixels * channels;
    for (int row = 0; at < end && at + kWhole <= legalEnd; at += kElements, row = (row + 1) % kQuadRows) {
        prefetchAhead(rows[row] + at);
        const auto whole = [](const T* p) { return _mm_loadu_si128(reinterpret_cast<const __m128i*>(p)); };
        spreadLoad<T, channels>(rows, at, whole, out);
        out += kColumnFloats * kLoadPixels<T>;
    }
    for (; at < end; at += kElements) {
        const int bytes = static_cast<int>(std::min(kElements, legalEnd - at)) * int{sizeof(T)};
        const auto partial = [=](const T* p) {
            return bytes < 16 ? qori::detail::loadBelow16(reinterpret_cast<const uint8_t*>(p), bytes)
                              : _mm_loadu_si128(reinterpret_cast<const __m128i*>(p));
        };
        spreadLoad<T, channels>(rows, at, partial, out);
        out += kColumnFloats * kLoadPixels<T>;
    }
}

void repeatColumn(const float* column, float* out, int32_t count) {
    for (int32_t i = 0; i < count; ++i, out += kColumnFloats)
        for (int j = 0; j < kColumnFloats; j += 8) _mm256_store_ps(out + j, _mm256_load_ps(column + j));
}

/// Spreads the columns first..last of the source, some or all of which may lie outside the legal ones.
template <class T, int channels>
QORI_NOINLINE void spreadColumns(const QuadFilter& filter, const T* const rows[kQuadRows], int32_t first,
                                 int32_t last) {
    const auto clamp = [&](int32_t column) { return std::clamp(column, filter.legalFirst, filter.legalLast); };
    const int32_t from = clamp(first), to = clamp(last);
    const int32_t before = std::clamp(from - first, 0, last - first), behind = last - first - before - (to - from);
    float* const inside = filter.columns + ptrdiff_t{before} * kColumnFloats;
    spreadRows<T, channels>(rows, ptrdiff_t{from} * channels, ptrdiff_t{to - from} + 1,
                            (ptrdiff_t{filter.legalLast} + 1) * channels, inside);
    const float* const end = inside + ptrdiff_t{to - from} * kColumnFloats;
    repeatColumn(end, inside + ptrdiff_t{to - from + 1} * kColumnFloats, behind);
    repeatColumn(inside, filter.columns, before);
}

/// One pixel of all rows. `taps` 0 is any number.
template <int taps>
QORI_INLINE void sumQuads(const float* column, const float* weights, int32_t count, __m256 sum[2]) {
    const int32_t n = taps > 0 ? taps : count;
    const __m256 first = _mm256_broadcast_ss(weights);
    for (int j = 0; j < 2; ++j) sum[j] = _mm256_mul_ps(first, _mm256_load_ps(column + 8 * j));
#pragma GCC unroll 8
    for (int32_t k = 1; k < n; ++k) {
        const __m256 weight = _mm256_broadcast_ss(weights + k);
        column += kColumnFloats;
        for (int j = 0; j < 2; ++j) sum[j] = _mm256_fmadd_ps(weight, _mm256_load_ps(column + 8 * j), sum[j]);
    }
}

/// `count` pixels from element `at` on. Each writes four elements, of which the next pixel overwrites those too many.
template <int channels, int taps>
QORI_NOINLINE void sumGroup(const QuadFilter& filter, const PixelTaps* pixels, int32_t count, float* const to[],
                            ptrdiff_t at) {
    float* out[kQuadRows];
    for (int r = 0; r < kQuadRows; ++r) out[r] = to[r] + at;
    const int32_t origin = pixels[0].first, given = filter.taps;
    const float *columns = filter.columns, *weights = filter.weights;
    for (int32_t i = 0; i < count; ++i) {
        __m256 sum[2];
        sumQuads<taps>(columns + ptrdiff_t{pixels[i].first - origin} * kColumnFloats, weights + pixels[i].weights,
                       given, sum);
        for (int r = 0; r < kQuadRows; r += 2) {
            _mm_storeu_ps(out[r] + ptrdiff_t{i} * channels, _mm256_castps256_ps128(sum[r / 2]));
            _mm_storeu_ps(out[r + 1] + ptrdiff_t{i} * channels, _mm256_extractf128_ps(sum[r / 2], 1));
        }
    }
}

template <int channels>
auto chooseSum(int32_t taps) {
    switch (taps) {
        case 2: return sumGroup<channels, 2>;
        case 3: return sumGroup<channels, 3>;
        case 4: return sumGroup<channels, 4>;
        case 6: return sumGroup<channels, 6>;
        case 8: return sumGroup<channels, 8>;
        default: return sumGroup<channels, 0>;
    }
}

/// The last pixel of the rows, and zeros up to a multiple of eight elements.
template <int channels>
void endRows(const QuadFilter& filter, float* const out[kQuadRows]) {
    const PixelTaps& pixel = filter.pixels[filter.width - 1];
    __m256 sum[2];
    sumQuads<0>(filter.columns, filter.weights + pixel.weights, filter.taps, sum);
    float quads[kColumnFloats];
    for (int j = 0; j < 2; ++j) _mm256_storeu_ps(quads + 8 * j, sum[j]);
    const ptrdiff_t at = ptrdiff_t{filter.width - 1} * channels, end = (at + channels + 7) & ~ptrdiff_t{7};
    for (int r = 0; r < kQuadRows; ++r) {
        for (int c = 0; c < channels; ++c) out[r][at + c] = quads[4 * r + c];
        for (ptrdiff_t i = at + channels; i < end; ++i) out[r][i] = 0;
    }
}

/// Source columns that a group may span: 8 KB of them.
constexpr int32_t kMostColumns = 128;

}  // namespace

int32_t quadGroup(double ratio) {
    const double pixels = kMostColumns / ratio;
    return pixels >= kMostColumns ? kMostColumns : static_cast<int32_t>(pixels);
}

int64_t quadColumnFloats(double ratio, int32_t taps) {
    // One column for the rounding of the span, three that the last load writes beyond it.
    return (static_cast<int64_t>((quadGroup(ratio) - 1) * ratio) + taps + 4) * kColumnFloats;
}

template <class T, int channels>
void filterQuads(const QuadFilter& filter, const T* const rows[kQuadRows], float* const out[kQuadRows]) {
    const auto sum = chooseSum<channels>(filter.taps);
    const int32_t last = filter.width - 1;
    for (int32_t x = 0; x < last; x += filter.group) {
        const PixelTaps* pixels = filter.pixels + x;
        const int32_t count = std::min(filter.group, last - x);
        spreadColumns<T, channels>(filter, rows, pixels[0].first, pixels[count - 1].first + filter.taps - 1);
        sum(filter, pixels, count, out, ptrdiff_t{x} * channels);
    }
    spreadColumns<T, channels>(filter, rows, filter.pixels[last].first, filter.pixels[last].first + filter.taps - 1);
    endRows<channels>(filter, out);
}

#define QORI_QUADS(T)                                                                                       \
    template void filterQuads<T, 3>(const QuadFilter&, const T* const[kQuadRows], float* const[kQuadRows]); \
    template void filterQuads<T, 4>(const QuadFilter&, const T* const[kQuadRows], float* const[kQuadRows]);
QORI_QUADS(uint8_t)
QORI_QUADS(uint16_t)
QORI_QUADS(int16_t)
QORI_QUADS(float)
#undef QORI_QUADS

}  // namespace qori::kernels
