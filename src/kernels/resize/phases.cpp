// SPDX-License-Identifier: Apache-2.0
#include "phases.h"

#include "floats.h"

namespace qori::kernels {
namespace {

/// The even and the odd ones of sixteen floats.
QORI_INLINE void splitPairs(__m256& a, __m256& b) {
    const auto inOrder = [](__m256 v) { return _mm256_castpd_ps(_mm256_permute4x64_pd(_mm256_castps_pd(v), 0xD8)); };
    const __m256 even = inOrder(_mm256_shuffle_ps(a, b, 0x88)), odd = inOrder(_mm256_shuffle_ps(a, b, 0xDD));
    a = even;
    b = odd;
}

/// Every third of 24 floats, from the first, the second and the third on. No two of those that end up together stand at
/// the same place of their vectors: two blends collect them, and one permutation puts them in order.
QORI_INLINE void splitTriples(__m256 (&v)[3]) {
    const auto third = [&](int a, int b, int c, __m256i order) {
        const __m256 mixed = _mm256_blend_ps(_mm256_blend_ps(v[a], v[b], 0x92), v[c], 0x24);
        return _mm256_permutevar8x32_ps(mixed, order);
    };
    // 0x49, 0x92 and 0x24 select the places 0 3 6, 1 4 7 and 2 5.
    const __m256 first = third(0, 1, 2, _mm256_setr_epi32(0, 3, 6, 1, 4, 7, 2, 5));
    const __m256 second = third(2, 0, 1, _mm256_setr_epi32(1, 4, 7, 2, 5, 0, 3, 6));
    const __m256 last = third(1, 2, 0, _mm256_setr_epi32(2, 5, 0, 3, 6, 1, 4, 7));
    v[0] = first;
    v[1] = second;
    v[2] = last;
}

/// The next elements, of which there are n, in one vector per stream; zeros behind them.
template <class T, int streams>
QORI_INLINE void loadStreams(const T* p, ptrdiff_t n, __m256 (&v)[streams]) {
    if constexpr (streams == 2 && sizeof(T) == 2) {  // words are halves of 32 bits
        constexpr bool isSigned = std::is_signed_v<T>;
        __m256i both = loadUpTo(p, n).v;
        loadOnce(both);
        v[0] = _mm256_cvtepi32_ps(isSigned ? _mm256_srai_epi32(_mm256_slli_epi32(both, 16), 16)
                                           : _mm256_and_si256(both, _mm256_set1_epi32(0xFFFF)));
        v[1] = _mm256_cvtepi32_ps(isSigned ? _mm256_srai_epi32(both, 16) : _mm256_srli_epi32(both, 16));
        return;
    }
    for (int s = 0; s < streams; ++s) v[s] = n > 8 * s ? toFloats(p + 8 * s, n - 8 * s) : _mm256_setzero_ps();
    if constexpr (streams == 2) splitPairs(v[0], v[1]);
    if constexpr (streams == 3) splitTriples(v);
    if constexpr (streams == 4) {
        splitPairs(v[0], v[1]);  // 0 2 4 ... 14, 1 3 5 ... 15
        splitPairs(v[2], v[3]);
        splitPairs(v[0], v[2]);  // 0 4 8 ... 28, 2 6 10 ... 30
        splitPairs(v[1], v[3]);
    }
}

template <class T, int streams>
QORI_NOINLINE void dealOutTo(const PhaseFilter& filter, const T* row, ptrdiff_t elements, ptrdiff_t legal,
                             float* line) {
    constexpr ptrdiff_t kRound = 8 * streams;
    const ptrdiff_t step = filter.streamFloats;
    float* to = line + PhaseFilter::kBefore;
    const auto deal = [&](ptrdiff_t i, ptrdiff_t n) {
        __m256 v[streams];
        loadStreams<T, streams>(row + i, n, v);
        for (int s = 0; s < streams; ++s) _mm256_storeu_ps(to + s * step, v[s]);
        to += 8;
    };
    ptrdiff_t i = 0;
    for (; i < elements && i + kRound <= legal; i += kRound) deal(i, kRound);
    if (i < elements) deal(i, legal - i);
}

/// Asks for memory while there is time: a stretch of it per block of results.
struct Later {
    const uint8_t* next;
    int bytes;

    QORI_INLINE void prefetchNext() {
        for (int i = 0; i < bytes; i += 64) prefetchToL2(next + i);
        next += bytes;
    }
};

enum class Order { ascending, chain, fours, any };

template <Order order>
QORI_NOINLINE void filterOne(const PhaseFilter& filter, const float* line, Later later, ptrdiff_t results, float* out) {
    constexpr int n = PhaseFilter::kVectors;
    const PairedTaps taps = filter.taps;  // not reloaded after every store
    for (ptrdiff_t i = 0; i < results; i += PhaseFilter::kBlock) {
        later.prefetchNext();
        __m256 sum[n];
        const auto at = [&](int32_t k) { return line + i + filter.offsets[k]; };
        if constexpr (order == Order::ascending)
            sumAscending<n>(taps.first, taps.count, at, sum);
        else if constexpr (order == Order::chain)
            sumChain<n>(taps.first, taps.count, at, sum);
        else if constexpr (order == Order::any)
            sumOne<n>(taps.first, taps.count, at, sum);
        for (int v = 0; v < n && order == Order::fours; v += kPairVectors)
            sumFours<kPairVectors>(
                taps.first, taps.count, [&](int32_t k) { return at(k) + 8 * v; }, sum + v);
        for (int v = 0; v < n; ++v) _mm256_storeu_ps(out + i + 8 * v, sum[v]);
    }
}

/// Results of both phases take turns.
template <int vectors>
QORI_INLINE void storeTurns(const __m256 (&even)[vectors], const __m256 (&odd)[vectors], float* out) {
    for (int v = 0; v < vectors; ++v, out += 16) {
        const __m256 low = _mm256_unpacklo_ps(even[v], odd[v]), high = _mm256_unpackhi_ps(even[v], odd[v]);
        _mm256_storeu_ps(out, _mm256_permute2f128_ps(low, high, 0x20));
        _mm256_storeu_ps(out + 8, _mm256_permute2f128_ps(low, high, 0x31));
    }
}

template <class Fixed>
QORI_NOINLINE void filterBoth(const PhaseFilter& filter, const float* line, Later later, ptrdiff_t results,
                              float* out) {
    const PairedTaps taps = filter.taps;  // not reloaded after every store
    for (ptrdiff_t i = 0; i < results; i += PhaseFilter::kBlock, line += PhaseFilter::kBlock / 2) {
        later.prefetchNext();
        __m256 even[kPairVectors], odd[kPairVectors];
        sumPair<kPairVectors>(
            taps, Fixed{}, [&](int32_t k) { return line + filter.offsets[k]; }, even, odd);
        storeTurns(even, odd, out + i);
    }
}

/// The same for few taps. These begin anywhere in their streams, so that half of the loads touch two cache lines:
/// weights stay in registers to spare the load ports.
template <class Fixed>
QORI_NOINLINE void filterBothOfFew(const PhaseFilter& filter, const float* line, Later later, ptrdiff_t results,
                                   float* out) {
    constexpr int kVectors = 2, kResults = 16 * kVectors;
    Vec<float> first[Fixed::count], second[Fixed::count];
    const float* places[Fixed::count + Fixed::shift];
    for (int k = 0; k < Fixed::count; ++k) {
        first[k] = {weightOf(filter.taps.first + k)};
        second[k] = {weightOf(filter.taps.second + k)};
    }
    for (int k = 0; k < Fixed::count + Fixed::shift; ++k) places[k] = line + filter.offsets[k];
    const PairedTapsOf<Vec<float>> taps{first, second, Fixed::count, Fixed::shift};
    for (ptrdiff_t i = 0; i < results; i += kResults) {
        if (i % PhaseFilter::kBlock == 0) later.prefetchNext();
        __m256 even[kVectors], odd[kVectors];
        sumPair<kVectors>(
            taps, Fixed{}, [&](int32_t k) { return places[k] + i / 2; }, even, odd);
        storeTurns(even, odd, out + i);
    }
}

}  // namespace

template <class T>
void dealOut(const PhaseFilter& filter, const T* row, const LineEnds& ends, float* line) {
    const auto [elements, legal, left, right] = ends;
    switch (filter.streams) {
        case 1: dealOutTo<T, 1>(filter, row, elements, legal, line); break;
        case 2: dealOutTo<T, 2>(filter, row, elements, legal, line); break;
        case 3: dealOutTo<T, 3>(filter, row, elements, legal, line); break;
        default: dealOutTo<T, 4>(filter, row, elements, legal, line); break;
    }
    for (int32_t i = 1; i <= left; ++i) line[filter.place(-i)] = line[filter.place(0)];
    for (int32_t i = 0; i < right; ++i) line[filter.place(elements + i)] = line[filter.place(elements - 1)];
}

void filterPhases(const PhaseFilter& filter, const float* line, const uint8_t* later, int elementBytes,
                  ptrdiff_t results, float* out) {
    Later ahead{later, PhaseFilter::kBlock * elementBytes * filter.streams / filter.phases};
    if (filter.phases == 2)
        return withFixedTaps(filter.taps, [&]<class Fixed>(Fixed) {
            constexpr bool few = 0 < Fixed::count && Fixed::count <= 4 && kPairVectors == 4;
            if constexpr (few)
                filterBothOfFew<Fixed>(filter, line, ahead, results, out);
            else
                filterBoth<Fixed>(filter, line, ahead, results, out);
        });
    const auto filterBy = filter.taps.count <= kAscendingTaps ? filterOne<Order::ascending>
                          : filter.taps.count <= kPairedTaps  ? filterOne<Order::chain>
                          : filter.taps.count <= kChainTaps   ? filterOne<Order::fours>
                                                              : filterOne<Order::any>;
    filterBy(filter, line, ahead, results, out);
}

template void dealOut(const PhaseFilter&, const uint8_t*, const LineEnds&, float*);
template void dealOut(const PhaseFilter&, const uint16_t*, const LineEnds&, float*);
template void dealOut(const PhaseFilter&, const int16_t*, const LineEnds&, float*);
template void dealOut(const PhaseFilter&, const float*, const LineEnds&, float*);

}  // namespace qori::kernels
