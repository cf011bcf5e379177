// SPDX-License-Identifier: Apache-2.0
#include "kernels/correlation/finish.h"

#include <algorithm>
#include <bit>

namespace qori::kernels::correlation {

namespace {

QORI_INLINE Vec<double> loadNumbers(const Pair* p) {
    return {_mm256_cvtepi32_pd(_mm_loadu_si128(reinterpret_cast<const __m128i*>(p)))};
}
QORI_INLINE Vec<double> loadNumbers(const double* p) { return load(p); }

/// a * b - c * d. The rounding errors of both products, exact in a fused multiply-add, are kept: where the products
/// nearly cancel, as in windows of little contrast, the difference is still right.
QORI_INLINE Vec<double> productDifference(Vec<double> a, Vec<double> b, Vec<double> c, Vec<double> d) {
    const __m256d ab = _mm256_mul_pd(a.v, b.v), cd = _mm256_mul_pd(c.v, d.v);
    const __m256d rest = _mm256_sub_pd(_mm256_fmsub_pd(a.v, b.v, ab), _mm256_fmsub_pd(c.v, d.v, cd));
    return {_mm256_add_pd(_mm256_sub_pd(ab, cd), rest)};
}

/// a^(-1/2) to 2^-34, for results that become floats: less than half the time of a root and a division. Halving and
/// turning the exponent gives it to 2^-4.8 (C. Lomont, Fast inverse square root, 2003); e becomes 1.5 e^2 with each of
/// three steps of Newton's. Not a number, or infinite, where a is 0.
QORI_INLINE Vec<double> inverseRoot(Vec<double> a) {
    const __m256i guess =
        _mm256_sub_epi64(_mm256_set1_epi64x(0x5FE6EB50C7B537A9), _mm256_srli_epi64(_mm256_castpd_si256(a.v), 1));
    __m256d root = _mm256_castsi256_pd(guess);
    const __m256d half = _mm256_mul_pd(a.v, _mm256_set1_pd(0.5));
    for (int step = 0; step < 3; ++step) {
        const __m256d product = _mm256_mul_pd(half, root);
        root = _mm256_mul_pd(root, _mm256_fnmadd_pd(product, root, _mm256_set1_pd(1.5)));
    }
    return {root};
}

template <bool isFloat>
QORI_INLINE Vec<double> overRoot(Vec<double> a, Vec<double> square) {
    return isFloat ? a * inverseRoot(square) : a / squareRoot(square);
}

template <Kind kind, bool isFloat, class Cell>
QORI_NOINLINE void finishAs(const Finish& finish, const Cell* crosses, Sums<Cell> sums, ptrdiff_t n, double* results) {
    const Vec<double> area = splat(finish.area), tapSum = splat(finish.tapSum), none = zero<double>();
    const Vec<double> square = splat(finish.norm * finish.norm);
    // A * V and A * N instead of V and N: one division less.
    const Vec<double> byNorm = splat(1 / (finish.norm * __builtin_sqrt(finish.area)));
    const Vec<double> least = splat(finish.norm * 0x1p-23 * finish.area);
    const Vec<double> roundings = splat(finish.roundings * finish.area);
    for (ptrdiff_t x = 0; x < n; x += Vec<double>::lanes) {
        const Vec<double> cross = loadNumbers(crosses + x);
        if constexpr (kind == Kind::plain) {
            // Windows of zeros have no energy; a transform leaves them its errors.
            const bool isKnown = sums.squares == nullptr;
            store(results + x, isKnown ? cross : selectOrZero(~isEqual(loadNumbers(sums.squares + x), none), cross));
        } else if constexpr (kind == Kind::norm) {
            const Vec<double> energy = loadNumbers(sums.squares + x) * square;
            store(results + x, selectOrZero(~isAtMost(energy, none), overRoot<isFloat>(cross, energy)));
        } else {
            const Vec<double> s1 = loadNumbers(sums.values + x), s2 = loadNumbers(sums.squares + x);
            const Vec<double> energy = productDifference(area, s2, s1, s1);
            const Vec<double> centred = productDifference(area, cross, s1, tapSum);
            const Mask<double> isFlat = isLess(energy, least) | isAtMost(energy, roundings * s2);
            store(results + x, selectOrZero(~isFlat, overRoot<isFloat>(centred * byNorm, energy)));
        }
    }
}

}  // namespace

template <class Cell>
void finishRow(const Finish& finish, const Cell* crosses, Sums<Cell> sums, ptrdiff_t n, double* results) {
    const auto as = [&]<Kind kind>() {
        return finish.isFloat ? finishAs<kind, true>(finish, crosses, sums, n, results)
                              : finishAs<kind, false>(finish, crosses, sums, n, results);
    };
    switch (finish.kind) {
        case Kind::plain: return as.template operator()<Kind::plain>();
        case Kind::norm: return as.template operator()<Kind::norm>();
        case Kind::normLevel: return as.template operator()<Kind::normLevel>();
    }
}

template void finishRow<Pair>(const Finish&, const Pair*, Sums<Pair>, ptrdiff_t, double*);
template void finishRow<double>(const Finish&, const double*, Sums<double>, ptrdiff_t, double*);

ptrdiff_t nextFaint(const Finish& finish, Sums<double> sums, double faintest, ptrdiff_t x, ptrdiff_t n) {
    const bool isCentred = finish.kind == Kind::normLevel;
    const Vec<double> area = splat(finish.area), limit = splat(isCentred ? faintest * finish.area : faintest);
    const Vec<double> least = splat(isCentred ? finish.norm * 0x1p-23 * finish.area : 0.0);
    const Vec<double> roundings = splat(finish.roundings * finish.area);
    for (; x < n; x += Vec<double>::lanes) {
        const Vec<double> s2 = load(sums.squares + x);
        Vec<double> energy = s2;
        Mask<double> isFlat = isAtMost(s2, least);
        if (isCentred) {
            const Vec<double> s1 = load(sums.values + x);
            energy = productDifference(area, s2, s1, s1);
            isFlat = isLess(energy, least) | isAtMost(energy, roundings * s2);
        }
        const Mask<double> isFaint = ~(isAtMost(limit, energy) | isFlat);
        if (any(isFaint)) return std::min<ptrdiff_t>(x + firstSelected(isFaint), n);
    }
    return n;
}

template <class D>
void storeRow(const double* results, int32_t scale, D* row, int channels, ptrdiff_t n) {
    const auto put = [=](auto convert) {
        if (channels == 1)
            for (ptrdiff_t x = 0; x < n; ++x) row[x] = convert(results[x]);
        else
            for (ptrdiff_t x = 0; x < n; ++x) row[x * channels] = convert(results[x]);
    };
    if constexpr (std::is_same_v<D, uint8_t>) {
        // 2^-scale by its exponent. From 2^200 on every result but 0 saturates, below 2^-200 all of them are 0.
        const auto exponent = static_cast<uint64_t>(1023 - std::clamp(scale, -200, 200));
        const double factor = std::bit_cast<double>(exponent << 52);
        // A float times a power of two is exact in doubles.
        put([=](double result) {
            const double scaled = static_cast<double>(static_cast<float>(result)) * factor;
            return static_cast<uint8_t>(_mm_cvtsd_si32(_mm_set_sd(std::clamp(scaled, 0.0, 255.0))));
        });
    } else {
        put([](double result) { return static_cast<D>(result); });
    }
}

template void storeRow<uint8_t>(const double*, int32_t, uint8_t*, int, ptrdiff_t);
template void storeRow<float>(const double*, int32_t, float*, int, ptrdiff_t);
template void storeRow<double>(const double*, int32_t, double*, int, ptrdiff_t);

}  // namespace qori::kernels::correlation
