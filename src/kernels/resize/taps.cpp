// SPDX-License-Identifier: Apache-2.0
#include "taps.h"

#include "floats.h"
#include "turn.h"

namespace qori::kernels {
namespace {

/// Turns n (1 to 8) elements of eight rows into as many vectors; the vectors behind them are written too.
template <class T>
QORI_INLINE void turnIn(const T* const rows[kTapRows], ptrdiff_t at, ptrdiff_t n, float* out) {
    if constexpr (std::is_same_v<T, float>) {
        if (n >= 8) {
            turnFloats(rows, at, out);
            turnFloats(rows, at + 4, out + 32);
            return;
        }
    }
    __m256 upper[4], lower[4];
    for (int j = 0; j < 4; ++j) upper[j] = toFloats(rows[j] + at, n);
    for (int j = 0; j < 4; ++j) lower[j] = toFloats(rows[4 + j] + at, n);
    turnQuads(upper);
    turnQuads(lower);
    for (int j = 0; j < 4; ++j) {
        _mm256_storeu_ps(out + 8 * j, _mm256_permute2f128_ps(upper[j], lower[j], 0x20));
        _mm256_storeu_ps(out + 8 * (4 + j), _mm256_permute2f128_ps(upper[j], lower[j], 0x31));
    }
}

/// Turns eight vectors of eight rows back into eight elements of each row.
QORI_INLINE void turnOut(const float* in, float* const out[kTapRows], ptrdiff_t at) {
    // Four rows at a time: columns c and 4 + c side by side turn into eight elements of a row.
    for (int half = 0; half < 2; ++half) {
        __m256 v[4];
        for (int c = 0; c < 4; ++c) {
            const __m256 low = _mm256_castps128_ps256(_mm_loadu_ps(in + 8 * c + 4 * half));
            v[c] = _mm256_insertf128_ps(low, _mm_loadu_ps(in + 8 * (4 + c) + 4 * half), 1);
        }
        turnQuads(v);
        for (int j = 0; j < 4; ++j) _mm256_storeu_ps(out[4 * half + j] + at, v[j]);
    }
}

template <class T>
QORI_NOINLINE void turnRows(const T* const from[kTapRows], ptrdiff_t at, ptrdiff_t elements, ptrdiff_t legalEnd,
                            float* out) {
    const T* rows[kTapRows];  // not reloaded after every store
    for (int j = 0; j < kTapRows; ++j) rows[j] = from[j];
    ptrdiff_t done = 0;
    // Elements beyond the ones asked for, but inside the row, keep the vectors whole. Eight rows at once are more
    // streams than processors follow by themselves: each block asks for as many lines as it uses up.
    constexpr int kLines = sizeof(T);
    for (int row = 0; done < elements && at + done + 8 <= legalEnd; done += 8, row = (row + kLines) & (kTapRows - 1)) {
        for (int j = row; j < row + kLines; ++j) prefetchAhead(rows[j] + at + done);
        turnIn(rows, at + done, 8, out + 8 * done);
    }
    if (done < elements) turnIn(rows, at + done, elements - done, out + 8 * done);
}

/// Copies one turned pixel to `count` places.
template <int channels>
void repeatPixel(const float* pixel, float* out, int32_t count) {
    for (int32_t i = 0; i < count; ++i, out += 8 * channels)
        for (int c = 0; c < channels; ++c) _mm256_storeu_ps(out + 8 * c, _mm256_loadu_ps(pixel + 8 * c));
}

/// Turns the columns first..last of the source, some or all of which may lie outside the legal ones.
template <class T, int channels>
QORI_INLINE void turnColumns(const RowFilter& filter, const T* const rows[kTapRows], int32_t first, int32_t last) {
    const auto clamp = [&](int32_t column) { return std::clamp(column, filter.legalFirst, filter.legalLast); };
    const int32_t from = clamp(first), to = clamp(last);
    const int32_t before = std::clamp(from - first, 0, last - first), behind = last - first - before - (to - from);
    constexpr ptrdiff_t pixel = 8 * channels;
    float* const inside = filter.columns + before * pixel;
    turnRows(rows, ptrdiff_t{from} * channels, ptrdiff_t{to - from + 1} * channels,
             (ptrdiff_t{filter.legalLast} + 1) * channels, inside);
    repeatPixel<channels>(inside, filter.columns, before);
    repeatPixel<channels>(inside + (to - from) * pixel, inside + (to - from + 1) * pixel, behind);
}

/// One pixel of eight rows. `taps` 0 is any number that a chain holds.
template <int channels, int taps>
QORI_INLINE void sumTaps(const float* column, const float* weights, int32_t count, int32_t oneByOne, float* out) {
    __m256 sum[channels];
    sumChain<channels>(
        weights, taps > 0 ? taps : count, [=](int32_t k) { return column + ptrdiff_t{k} * (8 * channels); }, sum,
        taps > 0 ? kPairedTaps : oneByOne);
    for (int c = 0; c < channels; ++c) _mm256_storeu_ps(out + 8 * c, sum[c]);
}

/// Every period-th pixel, whose weights are the same, so that they stay in registers.
template <int channels, int taps>
QORI_INLINE void sumPhase(const RowFilter& filter, const PixelTaps* pixels, int32_t phase, int32_t count,
                          float* results) {
    const float* weights = filter.weights + pixels[phase].weights;
    Vec<float> weight[taps];
    for (int k = 0; k < taps; ++k) weight[k] = {weightOf(weights + k)};
    for (int32_t i = phase; i < count; i += filter.period) {
        const float* column = filter.columns + ptrdiff_t{pixels[i].first - pixels[0].first} * (8 * channels);
        for (int c = 0; c < channels; ++c, column += 8) {
            __m256 sum;
            sumChain<1>(
                weight, taps, [=](int32_t k) { return column + ptrdiff_t{k} * (8 * channels); }, &sum);
            _mm256_storeu_ps(results + 8 * (ptrdiff_t{i} * channels + c), sum);
        }
    }
}

bool isOfSuper(const RowFilter& filter) { return filter.scale != 1; }

/// The taps of a pixel, of which the last may be none.
QORI_INLINE int32_t tapsOf(const RowFilter& filter, const float* weights) {
    return filter.taps - (filter.isPadded && weights[filter.taps - 1] == 0);
}

template <int channels, int taps>
QORI_NOINLINE void sumPhases(const RowFilter& filter, const PixelTaps* pixels, int32_t count, float* results) {
    for (int32_t phase = 0; phase < filter.period; ++phase) {
        if (tapsOf(filter, filter.weights + pixels[phase].weights) == taps)
            sumPhase<channels, taps>(filter, pixels, phase, count, results);
        else
            sumPhase<channels, taps - 1>(filter, pixels, phase, count, results);
    }
}

/// Pixels whose last tap may be none, of up to kAscendingTaps: there is no branch on it, but nothing is added then, not
/// even to the sign of a zero.
template <int channels, int taps>
QORI_NOINLINE void sumPaddedGroup(const RowFilter& filter, const PixelTaps* pixels, int32_t count, float* out) {
    alignas(kVectorBytes) float nothing[8 * channels];
    for (float& element : nothing) element = -0.0f;
    const int32_t last = (taps > 0 ? taps : filter.taps) - 1;
    for (int32_t i = 0; i < count; ++i, out += 8 * channels) {
        const float* const weights = filter.weights + pixels[i].weights;
        const float* const column = filter.columns + ptrdiff_t{pixels[i].first - pixels[0].first} * (8 * channels);
        const auto at = [=](int32_t k) { return column + ptrdiff_t{k} * (8 * channels); };
        __m256 sum[channels];
        sumAscending<channels>(weights, last, at, sum);
        addTap<channels>(weights[last] == 0 ? nothing : at(last), weights + last, sum);
        for (int c = 0; c < channels; ++c) _mm256_storeu_ps(out + 8 * c, sum[c]);
    }
}

template <int channels, int taps>
QORI_NOINLINE void sumGroup(const RowFilter& filter, const PixelTaps* pixels, int32_t count, float* out) {
    if constexpr (taps > 0) {
        if (filter.period > 0 && 2 * filter.period <= count)
            return sumPhases<channels, taps>(filter, pixels, count, out);
        if (filter.isPadded) return sumPaddedGroup<channels, taps>(filter, pixels, count, out);
    } else if (filter.isPadded && filter.taps <= kAscendingTaps) {
        return sumPaddedGroup<channels, 0>(filter, pixels, count, out);
    }
    const int32_t origin = pixels[0].first, oneByOne = isOfSuper(filter) ? kAscendingTaps : kPairedTaps;
    for (int32_t i = 0; i < count; ++i, out += 8 * channels) {
        const float* const weights = filter.weights + pixels[i].weights;
        sumTaps<channels, taps>(filter.columns + ptrdiff_t{pixels[i].first - origin} * (8 * channels), weights,
                                tapsOf(filter, weights), oneByOne, out);
    }
}

template <int channels>
void storeTotals(const Totals<channels>& totals, double scale, float* out) {
    for (int c = 0; c < channels; ++c) _mm256_storeu_ps(out + 8 * c, totals.times(scale, c));
}

/// More taps than a chain has.
template <int channels>
QORI_NOINLINE void sumLongGroup(const RowFilter& filter, const PixelTaps* pixels, int32_t count, float* out) {
    for (int32_t i = 0; i < count; ++i, out += 8 * channels) {
        const float* const weights = filter.weights + pixels[i].weights;
        const float* const columns = filter.columns + ptrdiff_t{pixels[i].first - pixels[0].first} * (8 * channels);
        Totals<channels> totals;
        totals.clear();
        totals.addBlocks(weights, tapsOf(filter, weights),
                         [=](int32_t k) { return columns + ptrdiff_t{k} * (8 * channels); });
        storeTotals(totals, filter.scale, out);
    }
}

/// Columns that are turned together where one pixel has more taps than are worth keeping turned; whole blocks of taps.
constexpr int32_t kPieceColumns = 128;

/// One pixel of very many taps, a piece of them at a time.
template <class T, int channels>
QORI_NOINLINE void sumPieces(const RowFilter& filter, const T* const rows[kTapRows], const PixelTaps& pixel,
                             float* out) {
    const float* const weights = filter.weights + pixel.weights;
    const int32_t count = tapsOf(filter, weights);
    Totals<channels> totals;
    totals.clear();
    for (int32_t k = 0; k < count; k += kPieceColumns) {
        const int32_t rest = count - k, taps = rest < kPieceColumns ? rest : kPieceColumns;
        turnColumns<T, channels>(filter, rows, pixel.first + k, pixel.first + k + taps - 1);
        totals.addBlocks(weights + k, taps, [&](int32_t i) { return filter.columns + ptrdiff_t{i} * (8 * channels); });
    }
    storeTotals(totals, filter.scale, out);
}

template <int channels>
auto chooseSum(const RowFilter& filter) {
    if (filter.taps > kChainTaps) return sumLongGroup<channels>;
    if (filter.taps > kAscendingTaps && isOfSuper(filter)) return sumGroup<channels, 0>;
    switch (filter.taps) {
        case 2: return sumGroup<channels, 2>;
        case 3: return sumGroup<channels, 3>;
        case 4: return sumGroup<channels, 4>;
        case 6: return sumGroup<channels, 6>;
        case 8: return sumGroup<channels, 8>;
        case 10: return sumGroup<channels, 10>;
        case 12: return sumGroup<channels, 12>;
        default: return sumGroup<channels, 0>;
    }
}

/// Source columns that a group may span before it is made smaller.
constexpr int32_t kMostColumns = 128;

}  // namespace

void pairFractions(const float* fractions, int32_t count, float* pairs) {
    int32_t i = 0;
    for (; i + 8 <= count; i += 8) {
        const __m256 second = _mm256_loadu_ps(fractions + i), first = _mm256_sub_ps(_mm256_set1_ps(1), second);
        const __m256 low = _mm256_unpacklo_ps(first, second), high = _mm256_unpackhi_ps(first, second);
        _mm256_storeu_ps(pairs + 2 * i, _mm256_permute2f128_ps(low, high, 0x20));
        _mm256_storeu_ps(pairs + 2 * i + 8, _mm256_permute2f128_ps(low, high, 0x31));
    }
    for (; i < count; ++i) {
        pairs[2 * i] = 1 - fractions[i];
        pairs[2 * i + 1] = fractions[i];
    }
}

int32_t tapGroup(double ratio, int32_t taps) {
    if (ratio > 2.0 * taps) return 1;
    const double pixels = kMostColumns / ratio;
    return pixels >= kTapChunk ? kTapChunk : pixels < 1 ? 1 : static_cast<int32_t>(pixels);
}

int64_t tapColumnFloats(double ratio, int32_t taps, int channels) {
    const int32_t group = tapGroup(ratio, taps), atOnce = group > 1 || taps < kPieceColumns ? taps : kPieceColumns;
    // One column for the rounding of the span, eight elements that the last turn writes beyond it.
    const auto columns = static_cast<int64_t>((group - 1) * ratio) + atOnce + 1;
    return 8 * (columns * channels + 8);
}

template <class T, int channels>
void filterRows(const RowFilter& filter, const T* const rows[kTapRows], float* const out[kTapRows]) {
    const auto sum = chooseSum<channels>(filter);
    const bool inPieces = filter.group == 1 && filter.taps > kPieceColumns;
    constexpr ptrdiff_t pixel = 8 * channels;
    for (int32_t x = 0; x < filter.width; x += kTapChunk) {
        const int32_t end = x + kTapChunk < filter.width ? x + kTapChunk : filter.width;
        for (int32_t i = x; i < end; i += filter.group) {
            const int32_t count = filter.group < end - i ? filter.group : end - i;
            const PixelTaps* pixels = filter.pixels + i;
            float* const results = filter.results + (i - x) * pixel;
            if (inPieces) {
                sumPieces<T, channels>(filter, rows, pixels[0], results);
                continue;
            }
            turnColumns<T, channels>(filter, rows, pixels[0].first, pixels[count - 1].first + filter.taps - 1);
            sum(filter, pixels, count, results);
        }
        const ptrdiff_t elements = ptrdiff_t{end - x} * channels;
        // Whoever sums the rows up computes on whole vectors.
        for (ptrdiff_t e = elements; e % 8 != 0; ++e) _mm256_storeu_ps(filter.results + 8 * e, _mm256_setzero_ps());
        for (ptrdiff_t e = 0; e < elements; e += 8) turnOut(filter.results + 8 * e, out, ptrdiff_t{x} * channels + e);
    }
}

#define QORI_TAPS(T)                                                                                    \
    template void filterRows<T, 1>(const RowFilter&, const T* const[kTapRows], float* const[kTapRows]); \
    template void filterRows<T, 3>(const RowFilter&, const T* const[kTapRows], float* const[kTapRows]); \
    template void filterRows<T, 4>(const RowFilter&, const T* const[kTapRows], float* const[kTapRows]);
QORI_TAPS(uint8_t)
QORI_TAPS(uint16_t)
QORI_TAPS(int16_t)
QORI_TAPS(float)
#undef QORI_TAPS

}  // namespace qori::kernels
