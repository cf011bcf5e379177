// SPDX-License-Identifier: Apache-2.0
// The run of every general linear filter: packed kernels and rounding rules meet images. Compiled once for all that
// filter so, in linear_integers.cpp and linear_floats.cpp.
#pragma once
#include "frame/border.h"
#include "frame/checks.h"
#include "frame/float_control.h"
#include "kernels/filter/taps.h"
#include "packing.h"

namespace qori::filter {

using kernels::ByteTaps;
using kernels::DoubleTaps;
using kernels::FloatTaps;
using kernels::PairTaps;

/// Where results go, and how a region is cut so that its windows exist.
template <class S, class D>
struct Target {
    BorderParts parts;
    Image<D> dst;
    int channels;
    bool keepAlpha;
};

/// Elements of a block in pixels that begin and end with it.
constexpr PartHints partHints(int channels, int elementBytes) {
    constexpr int kOverread = 8;
    const int block = elementBytes == 1 ? ByteTaps::block : FloatTaps<float>::block;
    return {channels == 4 ? block / 4 : block, kOverread * elementBytes};
}

template <class S, class D>
Target<S, D> makeTarget(Image<const S> src, Image<D> dst, QorImageSize roi, Layout layout, Reach reach,
                        const BorderRule& rule, uint8_t* buffer) {
    const int n = channels(layout);
    const BorderedImage image{asBytes(src.data), src.step, roi, n * elementBytes<S>, rule};
    return {BorderParts(image, reach, partHints(n, elementBytes<S>), buffer), dst, n, layout == Layout::AC4};
}

/// How integer sums become elements.
struct Division {
    int32_t divisor, mode;
    int64_t sumLimit;  ///< No sum's magnitude is larger. From 2^31 on sums are taken modulo 2^32.
};

/// Sums of pairs of coefficients in 32 bits, from `start` on.
template <class T>
void filterPairs(const int32_t* packed, QorImageSize size, int32_t start, Division division, Target<T, T>& target);

/// In groups where there are any, else at once.
void filterBytes(const int32_t* packed, QorImageSize size, ByteGroups groups, Division division,
                 Target<uint8_t, uint8_t>& target);

template <class S, class D>
void filterSingle(const float* packed, QorImageSize size, int32_t mode, Target<S, D>& target);

template <class S, class D>
void filterDouble(const double* packed, QorImageSize size, Division division, Target<S, D>& target);

}  // namespace qori::filter
