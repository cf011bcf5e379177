// SPDX-License-Identifier: Apache-2.0
// Thresholds of one element each, as operations of the row map. Comparisons are strict and no comparison with NaN
// holds: what is not selected passes bit for bit.
#pragma once
#include "kernels/map.h"
#include "kernels/vector_math.h"

namespace qori::kernels {

/// a with the bits of the change inverted.
template <class T>
QORI_INLINE Vec<T> changed(Vec<T> a, Vec<T> change) {
    return fromInteger<T>(_mm256_xor_si256(toInteger(a.v), toInteger(change.v)));
}

/// As changed, where the mask does not select.
template <class T>
QORI_INLINE Vec<T> changedUnless(Mask<T> mask, Vec<T> a, Vec<T> change) {
    return changed(a, fromInteger<T>(_mm256_andnot_si256(mask.v, toInteger(change.v))));
}

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

    /// What turns these constants into others.
    Constants changeTo(Constants others) const {
        for (int i = 0; i < kVectors; ++i) others.v_[i] = changed(others.v_[i], v_[i]);
        return others;
    }

private:
    static constexpr int kVectors = channels == 3 ? 3 : 1;
    Vec<T> v_[kVectors];
};

/// min(source, threshold). The minimum's second operand is what equal elements and NaN give.
template <class T, int channels>
struct ClipAbove {
    static constexpr bool usesSourceAgain = false;
    Constants<T, channels> threshold;

    QORI_INLINE Vec<T> operator()(int phase, Vec<T> source) const { return smaller(threshold[phase], source); }
};

/// max(source, threshold).
template <class T, int channels>
struct ClipBelow {
    static constexpr bool usesSourceAgain = false;
    Constants<T, channels> threshold;

    QORI_INLINE Vec<T> operator()(int phase, Vec<T> source) const { return larger(threshold[phase], source); }
};

// Replacing. Unsigned elements have no comparison of their own: the clipped source tells, by being the source, what
// stays, and elsewhere it is the threshold, which one change turns into the value. That is an instruction less than to
// choose between source and value.

template <class T, int channels>
struct ReplaceAbove {
    static constexpr bool usesSourceAgain = true;
    ReplaceAbove(Constants<T, channels> limit, Constants<T, channels> value)
        : threshold(limit), other(std::is_unsigned_v<T> ? limit.changeTo(value) : value) {}

    QORI_INLINE Vec<T> operator()(int phase, Vec<T> source) const {
        if constexpr (std::is_unsigned_v<T>) {
            const Vec<T> clipped = smaller(source, threshold[phase]);
            return changedUnless(isEqual(clipped, source), clipped, other[phase]);
        } else {
            return select(isLess(threshold[phase], source), other[phase], source);
        }
    }

    Constants<T, channels> threshold, other;  ///< The other: the value, or the change from the threshold to it.
};

template <class T, int channels>
struct ReplaceBelow {
    static constexpr bool usesSourceAgain = true;
    ReplaceBelow(Constants<T, channels> limit, Constants<T, channels> value)
        : threshold(limit), other(std::is_unsigned_v<T> ? limit.changeTo(value) : value) {}

    QORI_INLINE Vec<T> operator()(int phase, Vec<T> source) const {
        if constexpr (std::is_unsigned_v<T>) {
            const Vec<T> clipped = larger(source, threshold[phase]);
            return changedUnless(isEqual(clipped, source), clipped, other[phase]);
        } else {
            return select(isLess(source, threshold[phase]), other[phase], source);
        }
    }

    Constants<T, channels> threshold, other;
};

/// At most one of the sides selects an element, as the lower threshold does not exceed the upper one.
template <class T, int channels>
struct ReplaceOutside {
    static constexpr bool usesSourceAgain = true;
    ReplaceBelow<T, channels> lower;
    ReplaceAbove<T, channels> upper;

    QORI_INLINE Vec<T> operator()(int phase, Vec<T> source) const {
        if constexpr (std::is_unsigned_v<T>) {
            const Vec<T> raised = larger(source, lower.threshold[phase]);
            const Vec<T> clipped = smaller(raised, upper.threshold[phase]);
            const Vec<T> below = changedUnless(isEqual(raised, source), clipped, lower.other[phase]);
            return changedUnless(isEqual(clipped, raised), below, upper.other[phase]);
        } else {
            return select(isLess(upper.threshold[phase], source), upper.other[phase], lower(phase, source));
        }
    }
};

/// A rule of vectors for the row map.
template <class Rule>
struct Thresholding {
    static constexpr bool mayStream = true, inRegisters = true;
    Rule rule;

    template <class T, int n>
    QORI_INLINE Pack<T, n> operator()(int phase, Pack<T, n> source) const {
        static_assert(Pack<T, n>::vectors == 1, "constants repeat from vector to vector");
        if constexpr (Rule::usesSourceAgain) loadOnce(source.v[0].v);
        return {{rule(phase, source.v[0])}};
    }
};

}  // namespace qori::kernels
