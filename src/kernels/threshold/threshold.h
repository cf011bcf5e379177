// SPDX-License-Identifier: Apache-2.0
// Thresholds of one element each, as operations of the row map. Comparisons are strict and no comparison with NaN
// holds: what is not selected passes bit for bit.
#pragma once
#include "kernels/map.h"
#include "kernels/vector_math.h"

namespace qori::kernels {

/// One constant per channel, in as many vectors as it takes for them to repeat.
template <class T, int channels>
class Constants {
public:
    /// One per channel in memory.
    explicit Constants(const T* values) {
        if constexpr (channels == 1) {
            v_[0] = splat(values[0]);
        } else {
            const ChannelVectors<T> all = channelVectors(values, channels);
            for (int i = 0; i < kVectors; ++i) v_[i] = all.v[i];
        }
    }
    QORI_INLINE Vec<T> operator[](int phase) const { return v_[kVectors == 1 ? 0 : phase]; }

private:
    static constexpr int kVectors = channels == 3 ? 3 : 1;
    Vec<T> v_[kVectors];
};

/// Where a < b the value, else the source. Unsigned elements compare the other way round, which saves an instruction.
template <class T>
QORI_INLINE Vec<T> selectWhereLess(Vec<T> a, Vec<T> b, Vec<T> value, Vec<T> source) {
    if constexpr (std::is_unsigned_v<T>)
        return select(isAtMost(b, a), source, value);
    else
        return select(isLess(a, b), value, source);
}

/// min(source, threshold). The minimum's second operand is what equal elements and NaN give.
template <class T, int channels>
struct ClipAbove {
    Constants<T, channels> threshold;

    QORI_INLINE Vec<T> operator()(int phase, Vec<T> source) const { return smaller(threshold[phase], source); }
};

/// max(source, threshold).
template <class T, int channels>
struct ClipBelow {
    Constants<T, channels> threshold;

    QORI_INLINE Vec<T> operator()(int phase, Vec<T> source) const { return larger(threshold[phase], source); }
};

template <class T, int channels>
struct ReplaceAbove {
    Constants<T, channels> threshold, value;

    QORI_INLINE Vec<T> operator()(int phase, Vec<T> source) const {
        return selectWhereLess(threshold[phase], source, value[phase], source);
    }
};

template <class T, int channels>
struct ReplaceBelow {
    Constants<T, channels> threshold, value;

    QORI_INLINE Vec<T> operator()(int phase, Vec<T> source) const {
        return selectWhereLess(source, threshold[phase], value[phase], source);
    }
};

/// At most one of the sides selects an element, as the lower threshold does not exceed the upper one.
template <class T, int channels>
struct ReplaceOutside {
    ReplaceBelow<T, channels> below;
    Constants<T, channels> upper, valueAbove;

    QORI_INLINE Vec<T> operator()(int phase, Vec<T> source) const {
        return selectWhereLess(upper[phase], source, valueAbove[phase], below(phase, source));
    }
};

/// A rule of vectors for the row map.
template <class Rule>
struct Thresholding {
    static constexpr bool mayStream = true;
    Rule rule;

    template <class T, int n>
    QORI_INLINE Pack<T, n> operator()(int phase, Pack<T, n> source) const {
        static_assert(Pack<T, n>::vectors == 1, "constants repeat from vector to vector");
        return {{rule(phase, source.v[0])}};
    }
};

}  // namespace qori::kernels
