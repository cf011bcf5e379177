// SPDX-License-Identifier: Apache-2.0
#include "linear.h"

#include "elements.h"
#include "linear_bytes.h"

namespace qori::kernels {
namespace {

using namespace warp;

QORI_INLINE __m256 mix(__m256 a, __m256 b, __m256 f) { return _mm256_fmadd_ps(f, b, _mm256_fnmadd_ps(f, a, a)); }
QORI_INLINE __m128 mix(__m128 a, __m128 b, __m128 f) { return _mm_fmadd_ps(f, b, _mm_fnmadd_ps(f, a, a)); }
QORI_INLINE __m256d mix(__m256d a, __m256d b, __m256d f) { return _mm256_fmadd_pd(f, b, _mm256_fnmadd_pd(f, a, a)); }
QORI_INLINE __m128d mix(__m128d a, __m128d b, __m128d f) { return _mm_fmadd_pd(f, b, _mm_fnmadd_pd(f, a, a)); }
QORI_INLINE float mix(float a, float b, float f) { return __builtin_fmaf(f, b, __builtin_fmaf(-f, a, a)); }

// --- one channel, eight pixels at a time ----------------------------------------------------------------------------

/// Neighbours along a row.
struct Pairs {
    __m256 left, right;
};

/// Pairs of 16 bits come in one word.
template <class T>
QORI_INLINE Pairs pairsOf(__m256i words) {
    if constexpr (std::is_signed_v<T>) {
        return {_mm256_cvtepi32_ps(_mm256_srai_epi32(_mm256_slli_epi32(words, 16), 16)),
                _mm256_cvtepi32_ps(_mm256_srai_epi32(words, 16))};
    } else {
        return {_mm256_cvtepi32_ps(_mm256_and_si256(words, _mm256_set1_epi32(65535))),
                _mm256_cvtepi32_ps(_mm256_srli_epi32(words, 16))};
    }
}

template <class T>
QORI_INLINE Pairs gatherPairs(const uint8_t* row, __m256i offsets) {
    if constexpr (std::is_same_v<T, float>) {
        // In the order of warp::Columns, so that one shuffle puts them in their own.
        const auto* quads = reinterpret_cast<const long long*>(row);
        const __m256i order = _mm256_permute4x64_epi64(offsets, 0xD8);
        const __m256 low = _mm256_castsi256_ps(_mm256_i32gather_epi64(quads, _mm256_castsi256_si128(order), 1));
        const __m256 high = _mm256_castsi256_ps(_mm256_i32gather_epi64(quads, _mm256_extracti128_si256(order, 1), 1));
        return {_mm256_shuffle_ps(low, high, 0x88), _mm256_shuffle_ps(low, high, 0xDD)};
    } else {
        return pairsOf<T>(_mm256_i32gather_epi32(reinterpret_cast<const int*>(row), offsets, 1));
    }
}

template <class T>
QORI_INLINE void storeEight(uint8_t* dst, __m256 v, int n) {
    auto* to = reinterpret_cast<T*>(dst);
    if constexpr (std::is_same_v<T, float>) {
        storeUpTo(to, Vec<float>{v}, n);
    } else {
        const __m256i whole = _mm256_cvtps_epi32(v);
        const __m128i low = _mm256_castsi256_si128(whole), high = _mm256_extracti128_si256(whole, 1);
        const __m128i packed = std::is_signed_v<T> ? _mm_packs_epi32(low, high) : _mm_packus_epi32(low, high);
        if (n < 8)
            qori::detail::storeBelow16(dst, packed, n * static_cast<int>(sizeof(T)));
        else
            _mm_storeu_si128(reinterpret_cast<__m128i*>(dst), packed);
    }
}

template <class T, bool anywhere>
void linearGray(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first, int32_t count,
                uint8_t* dst) {
    const auto across = horizontal<anywhere>(line, box);
    const auto down = vertical<anywhere>(line, box);
    const uint8_t *const origin = source.origin, *const below = origin + source.step;
    const auto step = static_cast<int32_t>(source.step);
    forEights(
        first, count, [&](Columns columns, int n) __attribute__((always_inline)) {
            const Places x = across.at(columns), y = down.at(columns);
            const __m256i offsets = offsetsOf<sizeof(T)>(x.whole, y.whole, step);
            if constexpr (!anywhere) prefetchAhead(origin, offsets, source.ahead);
            const Pairs top = gatherPairs<T>(origin, offsets), bottom = gatherPairs<T>(below, offsets);
            const __m256 fx = toFloat(x.fraction), fy = toFloat(y.fraction);
            storeEight<T>(dst, mix(mix(top.left, bottom.left, fy), mix(top.right, bottom.right, fy), fx), n);
            dst += n * static_cast<int>(sizeof(T));
        });
}

// --- packed pixels, one by one --------------------------------------------------------------------------------------

/// Offsets and fractions of up to kBatch pixels.
struct Batch {
    alignas(kVectorBytes) int32_t offsets[kBatch];
    alignas(kVectorBytes) float x[kBatch], y[kBatch];

    template <int pixelBytes, bool clamps>
    QORI_INLINE void prepare(const Axis<clamps>& across, const Axis<clamps>& down, int32_t step, int32_t first, int n) {
        int at = 0;
        forEights(
            first, n, [&](Columns columns, int) __attribute__((always_inline)) {
                const Places px = across.at(columns), py = down.at(columns);
                store(offsets + at, Vec<int32_t>{offsetsOf<pixelBytes>(px.whole, py.whole, step)});
                store(x + at, Vec<float>{toFloat(px.fraction)});
                store(y + at, Vec<float>{toFloat(py.fraction)});
                at += 8;
            });
    }
};

/// Two neighbouring pixels, the second in the upper half or, of three channels, behind the first.
template <class T, int channels, bool anywhere>
QORI_INLINE __m256 loadPair(const uint8_t* p) {
    if constexpr (channels == 3 && anywhere)
        return loadSix<T>(p);
    else
        return loadEight<T>(p);
}

template <int channels>
QORI_INLINE __m128 secondOfPair(__m256 pair) {
    if constexpr (channels == 4) return _mm256_extractf128_ps(pair, 1);
    return _mm256_castps256_ps128(_mm256_permutevar8x32_ps(pair, _mm256_setr_epi32(3, 4, 5, 5, 5, 5, 5, 5)));
}

template <class T, int channels, bool anywhere>
void linearPacked(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first, int32_t count,
                  uint8_t* dst) {
    constexpr int pixelBytes = channels * static_cast<int>(sizeof(T));
    const auto across = horizontal<anywhere>(line, box);
    const auto down = vertical<anywhere>(line, box);
    Batch batch;
    for (int n; count > 0; count -= n, first += n) {
        n = count < kBatch ? count : kBatch;
        batch.prepare<pixelBytes>(across, down, static_cast<int32_t>(source.step), first, n);
        const auto pixel = [&](int i) __attribute__((always_inline)) {
            const uint8_t* p = source.origin + batch.offsets[i];
            if (!anywhere && i % 2 == 0) prefetchAhead(p, source.ahead);
            const __m256 top = loadPair<T, channels, anywhere>(p);
            const __m256 bottom = loadPair<T, channels, anywhere>(p + source.step);
            const __m256 pair = mix(top, bottom, _mm256_broadcast_ss(batch.y + i));
            return narrowFour<T>(
                mix(_mm256_castps256_ps128(pair), secondOfPair<channels>(pair), _mm_broadcast_ss(batch.x + i)));
        };
        // Four elements at a time: the fourth of three is the next pixel's first, which is written next.
        for (int i = 0; i + 1 < n; ++i, dst += pixelBytes) storeFirst<T, 4>(dst, pixel(i));
        storeFirst<T, channels>(dst, pixel(n - 1));
        dst += pixelBytes;
    }
}

// --- doubles --------------------------------------------------------------------------------------------------------

/// Whole parts leave a pixel to the right and below, so that a fraction can be 1.
template <class T>
DoubleAxis acrossPairs(const WarpLine& line, const WarpBox& box, const WarpSource& source) {
    return horizontalDoubles<T>(line, box, source.right - 1);
}
template <class T>
DoubleAxis downPairs(const WarpLine& line, const WarpBox& box, const WarpSource& source) {
    return verticalDoubles<T>(line, box, source.bottom - 1);
}

template <int channels>
QORI_INLINE void mixDoubles(const uint8_t* top, const uint8_t* bottom, double x, double y, uint8_t* dst, bool isLast) {
    const auto *a = reinterpret_cast<const double*>(top), *b = reinterpret_cast<const double*>(bottom);
    if constexpr (channels == 1) {
        const __m128d pair = mix(_mm_loadu_pd(a), _mm_loadu_pd(b), _mm_set1_pd(y));
        const __m128d mixed = mix(pair, _mm_unpackhi_pd(pair, pair), _mm_set1_pd(x));
        _mm_store_sd(reinterpret_cast<double*>(dst), mixed);
    } else {
        // Of three channels the second pixel is loaded with the element before it.
        constexpr int second = channels == 3 ? 2 : 4;
        const __m256d fy = _mm256_set1_pd(y);
        const __m256d left = mix(_mm256_loadu_pd(a), _mm256_loadu_pd(b), fy);
        __m256d right = mix(_mm256_loadu_pd(a + second), _mm256_loadu_pd(b + second), fy);
        if constexpr (channels == 3) right = _mm256_permute4x64_pd(right, 0xF9);
        const Vec<double> mixed{mix(left, right, _mm256_set1_pd(x))};
        auto* to = reinterpret_cast<double*>(dst);
        if constexpr (channels == 3) {
            if (isLast) return storePartial(to, mixed, channels);
        }
        store(to, mixed);
    }
}

/// Calls make(upper left pixel, fractions across and down, destination, whether it is the last of a batch).
template <class T, int channels, class Make>
QORI_INLINE void forPairs(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first,
                          int32_t count, uint8_t* dst, Make make) {
    constexpr int pixelBytes = channels * static_cast<int>(sizeof(T));
    const DoubleAxis across = acrossPairs<T>(line, box, source), down = downPairs<T>(line, box, source);
    int32_t column[kBatch], row[kBatch];
    double x[kBatch], y[kBatch];
    for (int n; count > 0; count -= n, first += n) {
        n = count < kBatch ? count : kBatch;
        across.split(first, n, column, x);
        down.split(first, n, row, y);
        for (int i = 0; i < n; ++i, dst += pixelBytes)
            make(source.origin + row[i] * source.step + column[i] * ptrdiff_t{pixelBytes}, x[i], y[i], dst, i + 1 == n);
    }
}

template <int channels>
void linearDoubles(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first, int32_t count,
                   uint8_t* dst) {
    forPairs<double, channels>(
        source, line, box, first, count,
        dst, [&](const uint8_t* p, double x, double y, uint8_t* to, bool isLast) __attribute__((always_inline)) {
            mixDoubles<channels>(p, p + source.step, x, y, to, isLast);
        });
}

// --- anything far ---------------------------------------------------------------------------------------------------

template <class T>
QORI_INLINE T roundTo(float v) {
    if constexpr (std::is_same_v<T, float>) return v;
    return static_cast<T>(_mm_cvtss_si32(_mm_set_ss(v)));
}

template <class T, int channels>
void linearFar(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first, int32_t count,
               uint8_t* dst) {
    constexpr int pixelBytes = channels * static_cast<int>(sizeof(T));
    forPairs<T, channels>(
        source, line, box, first, count, dst, [&](const uint8_t* p, double x, double y, uint8_t* to, bool) {
            const auto fx = static_cast<float>(x), fy = static_cast<float>(y);
            for (int c = 0; c < channels; ++c) {
                const auto element = [=](const uint8_t* pixel) {
                    return static_cast<float>(qori::detail::loadWord<T>(pixel + c * static_cast<int>(sizeof(T))));
                };
                const float left = mix(element(p), element(p + source.step), fy);
                const float right = mix(element(p + pixelBytes), element(p + pixelBytes + source.step), fy);
                qori::detail::storeWord(to + c * static_cast<int>(sizeof(T)), roundTo<T>(mix(left, right, fx)));
            }
        });
}

}  // namespace

template <class T, int channels>
WarpKernels linearKernels() {
    if constexpr (std::is_same_v<T, double>) {
        constexpr WarpKernel any = linearDoubles<channels>;
        return {any, any, any, 0, 0, 1, 1};
    } else if constexpr (sizeof(T) == 1) {  // words of 4 bytes are read, or blocks of 16 from 8 before
        constexpr int32_t left = channels == 1 ? 0 : channels == 3 ? 3 : 2;
        constexpr int32_t right = channels == 1 ? 3 : channels == 3 ? 5 : 3;
        return {linearBytes<channels, ByteReads::inside>,
                linearBytes<channels, ByteReads::anywhere>,
                linearFar<T, channels>,
                left,
                0,
                right,
                1,
                linearBytes<channels, ByteReads::fixed>};
    } else if constexpr (channels == 1) {
        return {linearGray<T, false>, linearGray<T, true>, linearFar<T, 1>, 0, 0, 1, 1};
    } else {  // of three channels eight elements are read, six of which are the pair
        return {linearPacked<T, channels, false>,
                linearPacked<T, channels, true>,
                linearFar<T, channels>,
                0,
                0,
                channels == 3 ? 2 : 1,
                1};
    }
}

#define QORI_LINEAR(T)                          \
    template WarpKernels linearKernels<T, 1>(); \
    template WarpKernels linearKernels<T, 3>(); \
    template WarpKernels linearKernels<T, 4>();
QORI_LINEAR(uint8_t)
QORI_LINEAR(uint16_t)
QORI_LINEAR(int16_t)
QORI_LINEAR(float)
QORI_LINEAR(double)
#undef QORI_LINEAR

}  // namespace qori::kernels
