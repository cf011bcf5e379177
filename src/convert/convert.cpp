// SPDX-License-Identifier: Apache-2.0
#include <bit>

#include "frame/checks.h"
#include "frame/float_control.h"
#include "kernels/convert/bits.h"
#include "kernels/pack_convert.h"
#include "kernels/convert/scale_integers.h"
#include "frame/streaming.h"

namespace qori::convert {
namespace {

using namespace kernels;

// Operations by element types; `mayStream` where the result is wider than the source.

template <class S, class D>
struct Widen {
    static constexpr bool mayStream = true;

    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<S, n> a) const {
        return extend<D>(a);
    }
};

template <class S, class D>
struct ToFloat {
    static constexpr bool mayStream = true;

    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<S, n> a) const {
        return toFloat(a);
    }
};

template <class S, class D>
struct ClampNegative {
    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<S, n> a) const {
        for (Vec<S>& v : a.v) {
            const __m256i none = _mm256_setzero_si256();
            v.v = sizeof(S) == 1   ? _mm256_max_epi8(v.v, none)
                  : sizeof(S) == 2 ? _mm256_max_epi16(v.v, none)
                                   : _mm256_max_epi32(v.v, none);
        }
        return extend<D>(a);
    }
};

template <class S, class D>
struct Saturate {
    static constexpr bool mayStream = true;

    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<S, n> a) const {
        if constexpr (std::is_same_v<S, uint16_t>) {
            // Brought below 256 first: the narrowing would take 32768 and more for negative.
            Pack<int16_t, n> limited;
            for (int i = 0; i < Pack<S, n>::vectors; ++i)
                limited.v[i] = {_mm256_min_epu16(a.v[i].v, _mm256_set1_epi16(255))};
            return narrow<D>(limited);
        } else {
            return narrow<D>(a);
        }
    }
};

template <class Mode, class D>
struct RoundFloats {
    static constexpr bool mayStream = true;

    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<float, n> a) const {
        return roundTo<Mode, D>(a);
    }
};

/// The product by a power of two in two exact steps: neither factor leaves the normal range, and what the first one
/// makes subnormal is far below a half in the end.
template <class Mode, class D>
struct ScaleFloats {
    float first, second;

    template <int n>
    QORI_INLINE Pack<D, n> operator()(int, Pack<float, n> a) const {
        for (Vec<float>& v : a.v)
            v.v = _mm256_mul_ps(_mm256_mul_ps(v.v, _mm256_set1_ps(first)), _mm256_set1_ps(second));
        return roundTo<Mode, D>(a);
    }
};

/// Lanes of all ones, which is the maximum, where a comparison with 0 holds; else 0.
template <int comparison>
struct MaximumWhere {
    template <int n>
    QORI_INLINE Pack<uint32_t, n> operator()(int, Pack<float, n> a) const {
        Pack<uint32_t, n> out;
        for (int i = 0; i < Pack<float, n>::vectors; ++i)
            out.v[i] = {_mm256_castps_si256(_mm256_cmp_ps(a.v[i].v, _mm256_setzero_ps(), comparison))};
        return out;
    }
};
using PositiveToMaximum = MaximumWhere<_CMP_GT_OQ>;
using NanToMaximum = MaximumWhere<_CMP_UNORD_Q>;

template <Layout layout, class Op, class S, class D>
QorResult mapLayout(Image<const S> src, Image<D> dst, QorImageSize roi, Op op) {
    constexpr int n = channels(layout);
    constexpr StreamRule rule = sizeof(D) > sizeof(S) ? streamRules::widening : streamRules::copy;
    constexpr bool mayStream = requires { Op::mayStream; };
    const bool streaming = mayStream && streams(rule, traffic(roi, n * static_cast<int>(sizeof(S) + sizeof(D))));
    mapImage<layout == Layout::AC4>(roi, n, op, streaming, dst, src);
    return QOR_OK;
}

/// Only rounding to float reads the control register: integers below 2^24 are exact, and all else is integers.
template <template <class, class> class Op, class S, class D, Layout layout>
QorResult convert(Image<const S> src, Image<D> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    const auto body = [&] { return mapLayout<layout>(src, dst, roi, Op<S, D>{}); };
    if constexpr (std::is_same_v<D, float> && sizeof(S) == 4)
        return underDefaultControl(body);
    else
        return body();
}

template <template <class, class> class Op, class S, class D, Layout layout>
QorResult convertChecked(Image<const S> src, Image<D> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst))) return r;
    return convert<Op, S, D, layout>(src, dst, roi);
}

/// run(mode) with the mode's type; every value but the first two means half away from zero.
template <class Run>
QorResult withRounding(int32_t roundMode, Run run) {
    if (roundMode == roundTowardZero) return run(TowardZero{});
    if (roundMode == roundNearestEven) return run(NearestEven{});
    return run(HalfAway{});
}

template <class S, class D>
QorResult scaleIntegers(Image<const S> src, Image<D> dst, QorImageSize roi, int32_t roundMode, int32_t scaleFactor) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    if (scaleFactor <= 0) return mapLayout<Layout::C1>(src, dst, roi, ScaleUp<S, D>(scaleFactor));
    return withRounding(roundMode, [&](auto mode) {
        return mapLayout<Layout::C1>(src, dst, roi, ScaleDown<decltype(mode), S, D>(scaleFactor));
    });
}

template <class D, Layout layout>
QorResult roundFloats(Image<const float> src, Image<D> dst, QorImageSize roi, int32_t roundMode) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst))) return r;
    return underDefaultControl([&] {
        return withRounding(
            roundMode, [&](auto mode) { return mapLayout<layout>(src, dst, roi, RoundFloats<decltype(mode), D>{}); });
    });
}

template <class D>
QorResult runScaled(Image<const float> src, Image<D> dst, QorImageSize roi, int32_t roundMode, int32_t scaleFactor) {
    if constexpr (std::is_same_v<D, uint32_t>) {
        if (scaleFactor < -159) return mapLayout<Layout::C1>(src, dst, roi, PositiveToMaximum{});
        if (scaleFactor > 128) return mapLayout<Layout::C1>(src, dst, roi, NanToMaximum{});
    }
    // Beyond 2^252 either way every result is 0 or saturated.
    const int exponent = scaleFactor < -252 ? 252 : scaleFactor > 252 ? -252 : -scaleFactor;
    const auto power = [](int e) { return std::bit_cast<float>(static_cast<uint32_t>(e + 127) << 23); };
    return withRounding(roundMode, [&](auto mode) {
        const ScaleFloats<decltype(mode), D> op{power(exponent / 2), power(exponent - exponent / 2)};
        return mapLayout<Layout::C1>(src, dst, roi, op);
    });
}

template <class D>
QorResult scaleFloats(Image<const float> src, Image<D> dst, QorImageSize roi, int32_t roundMode, int32_t scaleFactor) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi))) return r;
    return underDefaultControl([&] { return runScaled(src, dst, roi, roundMode, scaleFactor); });
}

QorResult unpackBits(Image<const uint8_t> src, int32_t srcBitOffset, Image<uint8_t> dst, QorImageSize roi) {
    if (QorResult r = firstOf(nullCheck(src, dst), sizeCheck(roi), stepCheck(src, dst))) return r;
    if (srcBitOffset < 0) return QOR_ERR_SIZE;
    for (int32_t y = 0; y < roi.height; ++y)
        unpackBitsRow(dst.row(y), src.row(y) + srcBitOffset / 8, srcBitOffset % 8, roi.width);
    return QOR_OK;
}

}  // namespace
}  // namespace qori::convert

#include "entries/convert.inc"
#include "entries/convert_bits.inc"
