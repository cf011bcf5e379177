// SPDX-License-Identifier: Apache-2.0
#include "cubic.h"

#include "elements.h"

namespace qori::kernels {
namespace {

using namespace warp;

constexpr int kTaps = 4;

/// Floats too: sixteen roundings of sums that are larger than their result add up to more than 4 units in the last
/// place.
template <class T>
constexpr bool kInDoubles = std::is_floating_point_v<T>;

template <class T>
using WeightOf = std::conditional_t<kInDoubles<T>, double, float>;

/// Whole parts and weights of up to kBatch pixels.
template <class T>
struct CubicBatch {
    int32_t column[kBatch], row[kBatch];
    alignas(kVectorBytes) WeightOf<T> x[kBatch][kTaps], y[kBatch][kTaps];

    void prepare(const DoubleAxis& across, const DoubleAxis& down, const CubicWeights& weights, int32_t first, int n) {
        double fractions[kBatch];
        across.split(first, n, column, fractions);
        weigh(weights, fractions, n, x);
        down.split(first, n, row, fractions);
        weigh(weights, fractions, n, y);
    }

    /// Moves windows into a source of at least their size.
    void hold(const WarpSource& source, int n) {
        hold(column, x, source.left, source.right, n);
        hold(row, y, source.top, source.bottom, n);
    }

private:
    /// The weights of taps beyond the first or last pixel go to it.
    static void hold(int32_t* whole, WeightOf<T> (*weights)[kTaps], int32_t first, int32_t last, int n) {
        for (int i = 0; i < n; ++i) {
            const int32_t begin = whole[i] - 1, held = clampIndex(begin, first, last - (kTaps - 1));
            if (begin == held) continue;
            whole[i] = held + 1;
            // All of them are 1. Copied as a whole: vectors are not forwarded from single weights.
            if (begin <= held - (kTaps - 1) || begin >= held + (kTaps - 1)) {
                static constexpr WeightOf<T> kOne[2][kTaps] = {{1, 0, 0, 0}, {0, 0, 0, 1}};
                __builtin_memcpy(weights[i], kOne[begin > held], sizeof weights[i]);
                continue;
            }
            WeightOf<T> sums[kTaps] = {};
            for (int k = 0; k < kTaps; ++k) sums[clampIndex(begin + k - held, 0, kTaps - 1)] += weights[i][k];
            __builtin_memcpy(weights[i], sums, sizeof sums);
        }
    }

    static void weigh(const CubicWeights& weights, const double* fractions, int n, WeightOf<T> (*out)[kTaps]) {
        const auto power = [&](int k) { return load(weights.power[k]).v; };
        for (int i = 0; i < n; ++i) {
            const __m256d f = _mm256_set1_pd(fractions[i]);
            __m256d w = _mm256_fmadd_pd(power(3), f, power(2));
            w = _mm256_fmadd_pd(w, f, power(1));
            w = _mm256_fmadd_pd(w, f, power(0));
            if constexpr (kInDoubles<T>)
                _mm256_store_pd(out[i], w);
            else
                _mm_store_ps(out[i], _mm256_cvtpd_ps(w));
        }
    }
};

/// The pixels of a window whose first is at p, summed: four channels or three of them, or for one channel four shares
/// of one sum.
template <class T, int channels>
QORI_INLINE __m128 sumWindow(const uint8_t* p, ptrdiff_t step, const float* x, const float* y) {
    constexpr int elements = channels * kTaps, eight = 8 * static_cast<int>(sizeof(T));
    const __m128 across = _mm_loadu_ps(x);
    if constexpr (channels == 1) {
        __m128 sum = _mm_mul_ps(loadFour<T>(p), _mm_broadcast_ss(y));
        for (int j = 1; j < kTaps; ++j) sum = _mm_fmadd_ps(loadFour<T>(p + j * step), _mm_broadcast_ss(y + j), sum);
        return _mm_mul_ps(sum, across);
    } else {
        __m256 first = _mm256_mul_ps(loadEight<T>(p), _mm256_broadcast_ss(y)), second = _mm256_setzero_ps();
        const auto rest = [&](const uint8_t* row) __attribute__((always_inline)) {
            if constexpr (elements == 16) return loadEight<T>(row + eight);
            return _mm256_castps128_ps256(loadFour<T>(row + eight));
        };
        second = _mm256_mul_ps(rest(p), _mm256_broadcast_ss(y));
        for (int j = 1; j < kTaps; ++j) {
            const __m256 weight = _mm256_broadcast_ss(y + j);
            first = _mm256_fmadd_ps(loadEight<T>(p + j * step), weight, first);
            second = _mm256_fmadd_ps(rest(p + j * step), weight, second);
        }
        const __m256 both = _mm256_broadcast_ps(reinterpret_cast<const __m128*>(x));
        if constexpr (channels == 4) {
            const __m256 left = _mm256_permutevar_ps(both, _mm256_setr_epi32(0, 0, 0, 0, 1, 1, 1, 1));
            const __m256 right = _mm256_permutevar_ps(both, _mm256_setr_epi32(2, 2, 2, 2, 3, 3, 3, 3));
            const __m256 sum = _mm256_add_ps(_mm256_mul_ps(first, left), _mm256_mul_ps(second, right));
            return _mm_add_ps(_mm256_castps256_ps128(sum), _mm256_extractf128_ps(sum, 1));
        } else {
            // r0 g0 b0 r1 | g1 b1 r2 g2 and b2 r3 g3 b3
            first = _mm256_mul_ps(first, _mm256_permutevar_ps(both, _mm256_setr_epi32(0, 0, 0, 1, 1, 1, 2, 2)));
            const __m128 last = _mm_mul_ps(_mm256_castps256_ps128(second), _mm_permute_ps(across, 0xFE));
            const __m128 middle = _mm256_extractf128_ps(first, 1), begin = _mm256_castps256_ps128(first);
            const __m256 from1 = _mm256_permutevar8x32_ps(first, _mm256_setr_epi32(3, 4, 5, 5, 5, 5, 5, 5));
            const __m128 pixel1 = _mm256_castps256_ps128(from1);
            const __m128 pixel2 = _mm_shuffle_ps(middle, last, 0x0E);
            const __m128 pixel3 = _mm_permute_ps(last, 0xF9);
            return _mm_add_ps(_mm_add_ps(begin, pixel1), _mm_add_ps(pixel2, pixel3));
        }
    }
}

/// The same in double precision.
template <class T, int channels>
QORI_INLINE __m256d sumDoubles(const uint8_t* p, ptrdiff_t step, const double* x, const double* y) {
    const auto at = [](const uint8_t* row, int element) __attribute__((always_inline)) {
        const T* const from = reinterpret_cast<const T*>(row) + element;
        if constexpr (std::is_same_v<T, float>)
            return _mm256_cvtps_pd(_mm_loadu_ps(from));
        else
            return _mm256_loadu_pd(from);
    };
    if constexpr (channels == 1) {
        __m256d sum = _mm256_mul_pd(at(p, 0), _mm256_broadcast_sd(y));
        for (int j = 1; j < kTaps; ++j) sum = _mm256_fmadd_pd(at(p + j * step, 0), _mm256_broadcast_sd(y + j), sum);
        return _mm256_mul_pd(sum, _mm256_loadu_pd(x));
    } else {
        __m256d sum = _mm256_setzero_pd();
        for (int k = 0; k < kTaps; ++k) {
            // The last of three channels is loaded with the element before it.
            const bool isLast = channels == 3 && k == kTaps - 1;
            const int element = isLast ? channels * k - 1 : channels * k;
            __m256d column = _mm256_mul_pd(at(p, element), _mm256_broadcast_sd(y));
            for (int j = 1; j < kTaps; ++j)
                column = _mm256_fmadd_pd(at(p + j * step, element), _mm256_broadcast_sd(y + j), column);
            if (isLast) column = _mm256_permute4x64_pd(column, 0xF9);
            sum = _mm256_fmadd_pd(column, _mm256_broadcast_sd(x + k), sum);
        }
        return sum;
    }
}

/// Where the first pixels of windows lie: in the source, or with `copies`, of those that leave it, in a copy whose
/// pixels beyond are the nearest ones.
template <class T, int channels, bool copies>
class Windows {
public:
    explicit Windows(const WarpSource& source) : source_(source) {}

    struct Window {
        const uint8_t* first;
        ptrdiff_t step;
    };

    /// Copies of four windows live at once.
    QORI_INLINE Window at(int32_t column, int32_t row, int slot) {
        if constexpr (copies) {
            const bool isInside =
                column > source_.left && column + 2 <= source_.right && row > source_.top && row + 2 <= source_.bottom;
            if (!isInside) return {copy(column, row, slot), kStep};
        }
        return {source_.origin + (row - 1) * source_.step + (column - 1) * ptrdiff_t{kPixel}, source_.step};
    }

private:
    static constexpr int kPixel = channels * static_cast<int>(sizeof(T)), kStep = kTaps * kPixel;

    const uint8_t* copy(int32_t column, int32_t row, int slot) {
        uint8_t* to = memory_[slot];
        for (int j = -1; j <= 2; ++j)
            for (int i = -1; i <= 2; ++i, to += kPixel)
                movePixel<kPixel>(to, nearestPixel<kPixel>(source_, column + i, row + j));
        return memory_[slot];
    }

    const WarpSource& source_;
    uint8_t memory_[copies ? 4 : 1][copies ? kTaps * kStep : 1];
};

/// The first n of four sums, n from 1 on.
template <class T>
QORI_INLINE void storeSums(uint8_t* dst, __m256d sums, int n) {
    if constexpr (std::is_same_v<T, double>) {
        storeUpTo(reinterpret_cast<double*>(dst), Vec<double>{sums}, n);
    } else {
        const __m128 floats = _mm256_cvtpd_ps(sums);
        if (n == 4)
            _mm_storeu_ps(reinterpret_cast<float*>(dst), floats);
        else
            storePartial(reinterpret_cast<float*>(dst), Vec<float>{_mm256_zextps128_ps256(floats)}, n);
    }
}

/// One channel, which the compiler prefers where there is one: four pixels at a time.
template <class T, bool copies>
void makePixels(Windows<T, 1, copies>& windows, const CubicBatch<T>& batch, int n, uint8_t* dst) {
    for (int i = 0; i < n; i += 4, dst += 4 * sizeof(T)) {
        const auto sum = [&](int k) __attribute__((always_inline)) {
            const int at = i + k < n ? i + k : n - 1;
            const auto window = windows.at(batch.column[at], batch.row[at], k);
            if constexpr (kInDoubles<T>)
                return sumDoubles<T, 1>(window.first, window.step, batch.x[at], batch.y[at]);
            else
                return sumWindow<T, 1>(window.first, window.step, batch.x[at], batch.y[at]);
        };
        const auto a = sum(0), b = sum(1), c = sum(2), d = sum(3);
        if constexpr (kInDoubles<T>) {
            const __m256d low = _mm256_hadd_pd(a, b), high = _mm256_hadd_pd(c, d);  // a b a b, c d c d
            const __m256d crossed = _mm256_permute2f128_pd(low, high, 0x21), straight = _mm256_blend_pd(low, high, 12);
            storeSums<T>(dst, _mm256_add_pd(crossed, straight), n - i < 4 ? n - i : 4);
        } else {
            const __m128i four = narrowFour<T>(clampTo<T>(_mm_hadd_ps(_mm_hadd_ps(a, b), _mm_hadd_ps(c, d))));
            if (n - i >= 4)
                storeFirst<T, 4>(dst, four);
            else
                storeUpTo(reinterpret_cast<T*>(dst), fromInteger<T>(_mm256_zextsi128_si256(four)), n - i);
        }
    }
}

template <class T, int channels, bool copies>
void makePixels(Windows<T, channels, copies>& windows, const CubicBatch<T>& batch, int n, uint8_t* dst) {
    for (int i = 0; i < n; ++i, dst += channels * sizeof(T)) {
        const auto window = windows.at(batch.column[i], batch.row[i], 0);
        // Four elements at a time: the fourth of three is the next pixel's first, which is written next.
        if constexpr (kInDoubles<T>) {
            const __m256d sum = sumDoubles<T, channels>(window.first, window.step, batch.x[i], batch.y[i]);
            storeSums<T>(dst, sum, i + 1 == n && channels == 3 ? 3 : 4);
        } else {
            const __m128 sum = sumWindow<T, channels>(window.first, window.step, batch.x[i], batch.y[i]);
            const __m128i pixel = narrowFour<T>(clampTo<T>(sum));
            if (i + 1 == n) return storeFirst<T, channels>(dst, pixel);
            storeFirst<T, 4>(dst, pixel);
        }
    }
}

/// Windows beyond the edge are held at it, or copied: of sources that are smaller than a window, and of floats, as a
/// weight of 0 does not keep an infinity out that the window has nothing to do with.
enum class Reach { inside, held, copied };

template <class T, int channels, Reach reach>
void cubicRun(const WarpSource& source, const WarpLine& line, const WarpBox& box, int32_t first, int32_t count,
              uint8_t* dst) {
    if constexpr (reach == Reach::held) {
        if (source.right - source.left < kTaps - 1 || source.bottom - source.top < kTaps - 1)
            return cubicRun<T, channels, Reach::copied>(source, line, box, first, count, dst);
    }
    const DoubleAxis across = horizontalDoubles<T>(line, box, INT32_MAX);
    const DoubleAxis down = verticalDoubles<T>(line, box, INT32_MAX);
    constexpr bool copies = reach == Reach::copied;
    Windows<T, channels, copies> windows(source);
    CubicBatch<T> batch;
    for (int n; count > 0; count -= n, first += n, dst += n * static_cast<int>(sizeof(T)) * channels) {
        n = count < kBatch ? count : kBatch;
        batch.prepare(across, down, *source.cubic, first, n);
        if constexpr (reach == Reach::held) batch.hold(source, n);
        makePixels(windows, batch, n, dst);
    }
}

}  // namespace

CubicWeights weightsOf(Cubic cubic) {
    const double b = cubic.b, c = cubic.c;
    // The outer and inner pieces of the filter, as functions of their taps' distances 1 + f, f, 1 - f and 2 - f.
    return {{{b / 6, 1 - b / 3, b / 6, 0},
             {-b / 2 - c, 0, b / 2 + c, 0},
             {b / 2 + 2 * c, 2 * b + c - 3, 3 - 2.5 * b - 2 * c, -c},
             {-b / 6 - c, 2 - 1.5 * b - c, 1.5 * b + c - 2, b / 6 + c}}};
}

template <class T, int channels>
WarpKernels cubicKernels() {
    constexpr WarpKernel any = cubicRun < T, channels, std::is_floating_point_v<T> ? Reach::copied : Reach::held > ;
    return {cubicRun<T, channels, Reach::inside>, any, any, 1, 1, 2, 2};
}

#define QORI_CUBIC(T)                          \
    template WarpKernels cubicKernels<T, 1>(); \
    template WarpKernels cubicKernels<T, 3>(); \
    template WarpKernels cubicKernels<T, 4>();
QORI_CUBIC(uint8_t)
QORI_CUBIC(uint16_t)
QORI_CUBIC(int16_t)
QORI_CUBIC(float)
QORI_CUBIC(double)
#undef QORI_CUBIC

}  // namespace qori::kernels
