// SPDX-License-Identifier: Apache-2.0
#include "words.h"

#include "floats.h"
#include "octets.h"

namespace qori::kernels {
namespace {

constexpr int kOne = 1 << 14, kDropped = 7;  // of a row's sum, between the passes

constexpr int32_t kFixedTaps = 12;  // up to so many the compiler knows their number

/// Octets of a row from their windows. `taps` 0 is any number.
template <int channels, int taps, bool shared>
QORI_INLINE __m256i sumOctet(const uint8_t* low, const uint8_t* high, Bytes order, const __m256i* weights,
                             int32_t count) {
    const int32_t n = taps > 0 ? taps : count;
    __m256i sum = _mm256_set1_epi32((1 << (kDropped - 1)) - 128 * kOne);
#pragma GCC unroll 8
    for (int32_t k = 0; k < n; k += 2) {
        const Bytes window = shared ? repeatBlock(low) : loadBlocks(low, high);
        sum = _mm256_add_epi32(sum, _mm256_madd_epi16(shuffleInBlocks(window, order).v, _mm256_load_si256(weights++)));
        low += 2 * channels;
        high += 2 * channels;
    }
    return _mm256_srai_epi32(sum, kDropped);
}

/// One group of both rows.
template <int channels, int taps, bool shared>
QORI_INLINE void filterGroup(const WordFilter& filter, const WordLines& lines, const WordGroup& tables,
                             const __m256i* weights, const int32_t bases[2][2], int16_t* out) {
    const int32_t octet = (taps > 0 ? taps : filter.taps) / 2;
    // A group moves on by 64 bytes at most.
    prefetch(lines.laterFirst + bases[0][0]);
    prefetch(lines.laterSecond + bases[0][0]);
    const uint8_t* const rows[2] = {lines.first, lines.second};
    __m256i words[2];
    for (int row = 0; row < 2; ++row) {
        const auto sum = [&](int i) {
            return sumOctet<channels, taps, shared>(rows[row] + bases[i][0], rows[row] + bases[i][1],
                                                    load(tables.masks[i]), weights + i * octet, filter.taps);
        };
        words[row] = _mm256_packs_epi32(sum(0), sum(1));
    }
    store(out, Vec<int16_t>{_mm256_unpacklo_epi16(words[0], words[1])});
    store(out + 16, Vec<int16_t>{_mm256_unpackhi_epi16(words[0], words[1])});
}

/// The groups of whole cycles, but the last; returns their number. From copies of the tables, which no store can
/// change.
template <int channels, int taps, bool shared>
QORI_INLINE ptrdiff_t filterCycles(const WordFilter& filter, WordLines lines, int16_t* out) {
    constexpr int cycle = channelCycle(channels);
    WordGroup groups[cycle];
    __m256i weights[cycle * taps];
    for (int c = 0; c < cycle; ++c) groups[c] = filter.list[c];
    for (int k = 0; k < cycle * taps; ++k)
        weights[k] = _mm256_load_si256(reinterpret_cast<const __m256i*>(filter.weights) + k);
    const ptrdiff_t step = filter.list[cycle].bases[0][0] - filter.list[0].bases[0][0];
    ptrdiff_t g = 0;
    for (; g + cycle < filter.groups; g += cycle) {
        for (int c = 0; c < cycle; ++c, out += 32)
            filterGroup<channels, taps, shared>(filter, lines, groups[c], weights + c * taps, groups[c].bases, out);
        lines = {lines.first + step, lines.second + step, lines.laterFirst + step, lines.laterSecond + step};
    }
    return g;
}

template <int channels, int taps, bool shared>
QORI_NOINLINE void filterWordsOf(const WordFilter& filter, WordLines lines, int16_t* out) {
    const auto* weights = reinterpret_cast<const __m256i*>(filter.weights);
    ptrdiff_t g = 0;
    if constexpr (taps > 0)
        if (filter.repeats) g = filterCycles<channels, taps, shared>(filter, lines, out);
    for (; g < filter.groups; ++g) {
        const WordGroup& group = filter.list[g];
        filterGroup<channels, taps, shared>(filter, lines, group, weights + g * filter.taps, group.bases, out + 32 * g);
    }
}

template <int taps>
void filterWordsOf(const WordFilter& filter, WordLines lines, int16_t* out) {
    const auto filterChannels = [&]<int channels>() {
        (filter.shared ? filterWordsOf<channels, taps, true> : filterWordsOf<channels, taps, false>)(filter, lines,
                                                                                                     out);
    };
    switch (filter.channels) {
        case 1: return filterChannels.template operator()<1>();
        case 3: return filterChannels.template operator()<3>();
        default: return filterChannels.template operator()<4>();
    }
}

/// Sixteen elements of 21 fractional bits, rounded but not yet saturated to bytes.
template <int pairs>
QORI_INLINE __m256i sumPairs(const int16_t* const* rows, const __m256i* weights, int32_t count, ptrdiff_t at) {
    constexpr int kFraction = 21;
    const int32_t n = pairs > 0 ? pairs : count;
    __m256i low = _mm256_set1_epi32(128 << kFraction), high = low;
#pragma GCC unroll 8
    for (int32_t k = 0; k < n; ++k) {
        low = _mm256_add_epi32(low, _mm256_madd_epi16(load(rows[k] + at).v, weights[k]));
        high = _mm256_add_epi32(high, _mm256_madd_epi16(load(rows[k] + at + 16).v, weights[k]));
    }
    const auto round = [](__m256i v) {
        const __m256i odd = _mm256_and_si256(_mm256_srli_epi32(v, kFraction), _mm256_set1_epi32(1));
        const __m256i half = _mm256_add_epi32(v, _mm256_set1_epi32((1 << (kFraction - 1)) - 1));
        return _mm256_srai_epi32(_mm256_add_epi32(half, odd), kFraction);
    };
    return _mm256_packs_epi32(round(low), round(high));
}

template <int pairs>
QORI_NOINLINE void sumWordColumn(const int16_t* const* from, const int16_t* given, int32_t count, uint8_t* dst,
                                 ptrdiff_t elements) {
    constexpr int kMost = kWordTaps / 2 + 1;
    const int16_t* rows[kMost];  // not reloaded after every store
    __m256i weights[kMost];
    for (int32_t k = 0; k < count; ++k) {
        rows[k] = from[k];
        weights[k] = _mm256_set1_epi32(static_cast<uint16_t>(given[2 * k]) | given[2 * k + 1] * 65536);
    }
    // Packing has left the quads of 32 elements in the order 0, 2, 4, 6, 1, 3, 5, 7.
    const __m256i inOrder = _mm256_setr_epi32(0, 4, 1, 5, 2, 6, 3, 7);
    for (ptrdiff_t i = 0; i < elements; i += kWordBlock) {
        const __m256i bytes = _mm256_packus_epi16(sumPairs<pairs>(rows, weights, count, 2 * i),
                                                  sumPairs<pairs>(rows, weights, count, 2 * i + 32));
        storeUpTo(dst + i, Bytes{_mm256_permutevar8x32_epi32(bytes, inOrder)}, elements - i);
    }
}

/// Whether the kernels make use of cycles.
bool usesCycles(const WordFilter& filter) { return filter.taps <= kFixedTaps && filter.groups > 2 * filter.cycle; }

/// Whether a group's masks and weights are those of a cycle before, and its bases a step on.
bool goesOn(const WordFilter& filter, ptrdiff_t g) {
    const WordGroup *group = filter.list + g, *before = group - filter.cycle;
    bool same = true;
    for (int octet = 0; octet < 2; ++octet) same = same && isSame(group->masks[octet], before->masks[octet]);
    const ptrdiff_t weights = 16 * ptrdiff_t{filter.taps};
    for (ptrdiff_t i = 0; i < weights; i += 16)
        same = same && isSame(filter.weights + g * weights + i, filter.weights + (g - filter.cycle) * weights + i);
    const int32_t step = filter.list[filter.cycle].bases[0][0] - filter.list[0].bases[0][0];
    for (int quad = 0; quad < 4; ++quad)
        same = same && group->bases[quad / 2][quad & 1] - before->bases[quad / 2][quad & 1] == step;
    return same;
}

/// Rounds the weights of eight pixels as roundWeights() does those of one. rounded[k] are those of tap k.
QORI_INLINE void roundEight(const float* const weights[8], int32_t taps, float scale, __m256i* rounded) {
    const __m256 factor = _mm256_set1_ps(scale), one = _mm256_set1_ps(kOne);
    __m256i rest = _mm256_set1_epi32(kOne), most = _mm256_set1_epi32(INT32_MIN);
    forTaps(weights, taps, [&](int32_t k, __m256 w) {
        rounded[k] = _mm256_cvtps_epi32(_mm256_mul_ps(_mm256_mul_ps(w, factor), one));
        rest = _mm256_sub_epi32(rest, rounded[k]);
        most = _mm256_max_epi32(most, rounded[k]);
    });
    for (int32_t k = 0; k < taps; ++k) {  // the first of the largest takes all of it
        const __m256i taken = _mm256_and_si256(_mm256_cmpeq_epi32(rounded[k], most), rest);
        rounded[k] = _mm256_add_epi32(rounded[k], taken);
        rest = _mm256_sub_epi32(rest, taken);
    }
}

/// The masks and bases of octet `octet` from where its elements' first taps lie.
QORI_INLINE void listOctet(WordGroup& group, int octet, __m256i places, int channels, bool shared) {
    const __m256i base = shared ? leastOfAll(places) : leastOfQuads(places), at = _mm256_sub_epi32(places, base);
    group.bases[octet][0] = _mm256_cvtsi256_si32(base);
    group.bases[octet][1] = _mm256_extract_epi32(base, 4);
    // Per element its byte, a zero, the next tap's, a zero.
    const __m256i rest = _mm256_set1_epi32(static_cast<int32_t>(0x80008000u) | channels << 16);
    store(group.masks[octet], Bytes{_mm256_add_epi32(_mm256_or_si256(at, _mm256_slli_epi32(at, 16)), rest)});
}

/// Lists groups `begin` to before `end`, and what octets are made together with them.
template <int channels>
QORI_NOINLINE void listWordsOf(const WordFilter& filter, const PixelTaps* pixels, int32_t width,
                               const GivenWeights& weights, int32_t origin, ptrdiff_t begin, ptrdiff_t end) {
    __m256i rounded[kWordTaps + 1];
    rounded[weights.taps] = _mm256_setzero_si256();
    for (ptrdiff_t first = 2 * begin / channels * channels; first < 2 * end; first += channels) {
        const EightPixels eight(pixels, width, static_cast<int32_t>(first / channels) * 8, weights.table);
        roundEight(eight.weights, weights.taps, weights.scale, rounded);
        const int octets = static_cast<int>(std::min<ptrdiff_t>(channels, 2 * filter.groups - first));
        for (int j = 0; j < octets; ++j) {
            const ptrdiff_t octet = first + j;
            listOctet(filter.list[octet / 2], octet & 1, octetPlaces<channels>(eight.first, origin, j), channels,
                      filter.shared);
            int16_t* to = filter.weights + 8 * octet * filter.taps;
            for (int32_t k = 0; k < filter.taps; k += 2, to += 16) {
                const __m256i pair = _mm256_blend_epi16(rounded[k], _mm256_slli_epi32(rounded[k + 1], 16), 0xAA);
                store(to, Vec<int16_t>{spreadToOctet<channels>(pair, j)});
            }
        }
    }
}

/// Whether every eight neighbouring elements find a pair of taps within 16 bytes.
bool sharesWindows(const WordFilter& filter, const PixelTaps* pixels, int32_t width) {
    // Elements of pixels that many apart at most are neighbours.
    const int32_t reach = filter.channels == 1 ? 7 : filter.channels == 3 ? 3 : 1;
    int32_t most = 0, i = 0;
    if (width >= 8 + reach) {
        __m256i wide = _mm256_setzero_si256();  // of four pixels, and differences of what is beside their columns
        for (; i + 4 + reach <= width; i += 4) {
            const auto fours = [=](int32_t at) { return load(reinterpret_cast<const int32_t*>(pixels + at)).v; };
            wide = _mm256_max_epi32(wide, _mm256_sub_epi32(fours(i + reach), fours(i)));
        }
        int32_t all[8];
        store(all, Vec<int32_t>{wide});
        for (int k = 0; k < 8; k += 2) most = std::max(most, all[k]);
    }
    for (; i + 1 < width; ++i) {
        const int32_t other = i + reach < width ? i + reach : width - 1;
        most = std::max(most, pixels[other].first - pixels[i].first);
    }
    return (most + 2) * filter.channels <= 16;
}

}  // namespace

void roundWeights(const float* weights, int32_t taps, float scale, int16_t* out) {
    int32_t rest = kOne, largest = 0;
    for (int32_t k = 0; k < taps; ++k) {
        const int32_t whole = _mm_cvtss_si32(_mm_set_ss(weights[k] * scale * kOne));
        out[k] = static_cast<int16_t>(whole);
        rest -= whole;
        if (out[k] > out[largest]) largest = k;
    }
    out[largest] = static_cast<int16_t>(out[largest] + rest);
}

void listWords(WordFilter& filter, const PixelTaps* pixels, int32_t width, const GivenWeights& weights,
               int32_t origin) {
    filter.groups = (ptrdiff_t{width} * filter.channels + 15) / 16;
    filter.cycle = channelCycle(filter.channels);
    const auto list = filter.channels == 1 ? listWordsOf<1> : filter.channels == 3 ? listWordsOf<3> : listWordsOf<4>;
    const int32_t cyclePixels = 16 * filter.cycle / filter.channels;
    if (weights.period > 0 && cyclePixels % weights.period == 0 && usesCycles(filter)) {
        filter.shared = sharesWindows(filter, pixels, std::min(width, 2 * cyclePixels + 8));
        filter.repeats = true;
        const ptrdiff_t middle = std::min<ptrdiff_t>(2 * filter.cycle, filter.groups);
        list(filter, pixels, width, weights, origin, 0, middle);
        list(filter, pixels, width, weights, origin, std::max(middle, filter.groups - filter.cycle), filter.groups);
        return;
    }
    filter.shared = sharesWindows(filter, pixels, width);
    list(filter, pixels, width, weights, origin, 0, filter.groups);
    filter.repeats = usesCycles(filter);
    for (ptrdiff_t g = filter.cycle; g + 1 < filter.groups && filter.repeats; ++g) filter.repeats = goesOn(filter, g);
}

void filterWords(const WordFilter& filter, WordLines lines, int16_t* out) {
    switch (filter.taps) {
        case 2: return filterWordsOf<2>(filter, lines, out);
        case 4: return filterWordsOf<4>(filter, lines, out);
        case 6: return filterWordsOf<6>(filter, lines, out);
        case 8: return filterWordsOf<8>(filter, lines, out);
        case 10: return filterWordsOf<10>(filter, lines, out);
        case 12: return filterWordsOf<12>(filter, lines, out);
        default: return filterWordsOf<0>(filter, lines, out);
    }
}

void filterWordColumn(const int16_t* const* pairs, const int16_t* weights, int32_t count, uint8_t* dst,
                      ptrdiff_t elements) {
    switch (count) {
        case 1: return sumWordColumn<1>(pairs, weights, count, dst, elements);
        case 2: return sumWordColumn<2>(pairs, weights, count, dst, elements);
        case 3: return sumWordColumn<3>(pairs, weights, count, dst, elements);
        case 4: return sumWordColumn<4>(pairs, weights, count, dst, elements);
        default: return sumWordColumn<0>(pairs, weights, count, dst, elements);
    }
}

void padLine(const uint8_t* row, ptrdiff_t elements, int32_t left, int32_t right, int channels, uint8_t* line) {
    uint8_t* const inside = line + ptrdiff_t{left} * channels;
    ptrdiff_t i = 0;
    for (; i + 32 <= elements; i += 32) store(inside + i, load(row + i));
    if (i < elements) storePartial(inside + i, loadPartial(row + i, elements - i), elements - i);
    const auto repeat = [=](const uint8_t* pixel, uint8_t* out, int32_t count) {
        for (int32_t n = 0; n < count; ++n)
            for (int c = 0; c < channels; ++c) *out++ = pixel[c];
    };
    repeat(inside, line, left);
    repeat(inside + elements - channels, inside + elements, right);
}

}  // namespace qori::kernels
