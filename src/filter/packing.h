// SPDX-License-Identifier: Apache-2.0
// Kernels as the sums of kernels/filter/sums.h want them, and how large sums can become.
#pragma once
#include <algorithm>
#include <limits>

#include "kernels/filter/taps.h"

namespace qori::filter {

/// Coefficients of 16 bits in pairs from the last to the first, the first of a pair in the low half, each pair
/// `repeats` times; a pair that ends an odd row holds one.
template <int repeats, class K>
void packPairs(const K* kernel, QorImageSize size, int32_t* packed) {
    for (int32_t j = size.height - 1; j >= 0; --j) {
        const K* const row = kernel + ptrdiff_t{j} * size.width;
        for (int32_t i = size.width - 1; i >= 0; i -= 2) {
            const auto first = static_cast<uint16_t>(row[i]), second = static_cast<uint16_t>(i > 0 ? row[i - 1] : K{0});
            packed = std::fill_n(packed, repeats, static_cast<int32_t>(first | static_cast<uint32_t>(second) << 16));
        }
    }
}

/// Coefficients of 8 bits in pairs as packPairs() orders them, each pair twice in a word.
template <class K>
void packBytes(const K* kernel, QorImageSize size, int32_t* packed) {
    for (int32_t j = size.height - 1; j >= 0; --j) {
        const K* const row = kernel + ptrdiff_t{j} * size.width;
        for (int32_t i = size.width - 1; i >= 0; i -= 2) {
            const uint32_t first = static_cast<uint8_t>(row[i]), second = i > 0 ? static_cast<uint8_t>(row[i - 1]) : 0u;
            *packed++ = static_cast<int32_t>((first | second << 8) * 0x10001u);
        }
    }
}

/// Coefficients from the last to the first, `repeats` times each.
template <int repeats, class C, class K>
void packTurned(const K* kernel, QorImageSize size, C* packed) {
    for (ptrdiff_t i = ptrdiff_t{size.width} * size.height; i-- > 0;)
        packed = std::fill_n(packed, repeats, static_cast<C>(kernel[i]));
}

/// The largest magnitude that a sum of T pixels can have: below 2^63 for kernels of 2^15 * 2^16 coefficients.
template <class T, class K>
int64_t largestSum(const K* kernel, QorImageSize size) {
    constexpr auto most = int64_t{std::numeric_limits<T>::max()}, least = int64_t{std::numeric_limits<T>::min()};
    constexpr int64_t kTooMuch = INT64_MAX / 2;
    int64_t high = 0, low = 0;
    for (ptrdiff_t i = 0; i < ptrdiff_t{size.width} * size.height; ++i) {
        const int64_t k = kernel[i];
        high += k > 0 ? k * most : k * least;
        low += k > 0 ? k * least : k * most;
        if (high > kTooMuch || -low > kTooMuch) return kTooMuch;
    }
    return std::max(high, -low);
}

/// How kernels::InGroups sums a kernel of bytes: in so many groups of rows, none where it cannot.
struct ByteGroups {
    int32_t count = 0, start = 0;  ///< What the sum of each begins with.
};

/// Several groups of fewer rows, or of fewer pairs of coefficients, cost more than sums in 32 bits.
constexpr int32_t kRowsInGroup = 3, kPairsInGroup = 6;

template <class K>
ByteGroups byteGroups(const K* kernel, QorImageSize size) {
    using kernels::ByteTaps;
    constexpr int32_t kMost = kernels::InGroups<ByteTaps>::kMost,
                      kMostInPair = kernels::InGroups<ByteTaps>::kMostInPair;
    struct Weights {
        int64_t positive = 0, negative = 0;  ///< Sums of magnitudes.

        int64_t both() const { return positive + negative; }
        void add(int64_t k) { (k > 0 ? positive : negative) += k > 0 ? k : -k; }
    };
    Weights all, row;  // of the heaviest rows
    for (int32_t j = 0; j < size.height; ++j) {
        Weights here;
        const K* const k = kernel + ptrdiff_t{j} * size.width;
        for (int32_t i = size.width - 1; i >= 0; i -= 2) {
            Weights pair;
            pair.add(k[i]);
            if (i > 0) pair.add(k[i - 1]);
            // A single coefficient of 128 would pass as a pair, but not as a byte.
            if (std::max(pair.positive, pair.negative) > kMostInPair || k[i] > INT8_MAX ||
                (i > 0 && k[i - 1] > INT8_MAX))
                return {};
            here.positive += pair.positive;
            here.negative += pair.negative;
        }
        if (here.both() > kMost) return {};
        all.positive += here.positive;
        all.negative += here.negative;
        row.positive = std::max(row.positive, here.positive);
        row.negative = std::max(row.negative, here.negative);
    }
    if (row.both() == 0 || row.both() > kMost) return {};
    int32_t groups = 1;
    if (all.both() > kMost) {
        const auto most = static_cast<int32_t>(kMost / row.both());
        groups = (size.height + most - 1) / most;
        const int32_t rows = (size.height + groups - 1) / groups;
        all.negative = rows * row.negative;
    }
    const int32_t leastRows = size.height / groups;
    const bool isWorthIt = leastRows >= kRowsInGroup && (int64_t{size.width} + 1) / 2 * leastRows >= kPairsInGroup;
    if (groups > 1 && !isWorthIt) return {};
    return {groups, static_cast<int32_t>(INT16_MIN + 255 * all.negative)};
}

}  // namespace qori::filter
