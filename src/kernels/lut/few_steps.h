// SPDX-License-Identifier: Apache-2.0
// Tables of constants with few levels, by comparing every element with each of them.
#pragma once
#include <algorithm>

#include "kernels/map.h"
#include "kernels/vector_math.h"

namespace qori::kernels {

inline constexpr int kMostFewSteps = 32;

/// For 16-bit elements or floats, with levels that never decrease.
///
/// Each level that is not above the element changes the bits of the result into those of its interval's value, and the
/// last one changes them to zero, where the element itself comes in: between the first level and the last it does not.
/// Three operations a level; NaN is above none.
template <class T, int channels>
class FewSteps {
public:
    using Bits = std::conditional_t<std::is_floating_point_v<T>, uint32_t, uint16_t>;
    using Level = std::conditional_t<std::is_floating_point_v<T>, float, int32_t>;

    /// Room for as many levels as the longest channel has.
    explicit FewSteps(int most) : count_(most) {}

    /// Levels and values of a channel. One of fewer levels than the longest has its last interval's level repeated.
    void setChannel(int channel, const Level* levels, const Level* values, int count) {
        constexpr Bits all = static_cast<Bits>(~Bits{0});
        State state{}, start{};
        for (int i = 0; i < count_; ++i) {
            const bool isLast = i == count_ - 1;
            const int k = isLast ? count - 1 : std::min(i, count - 2);
            const State next = isLast ? State{} : State{bitsOf(values[k]), all};
            limits_[i][channel] = limitOf(levels[k]);
            State change{};
            if (isBelowAll(levels[k]))
                start = next;  // no limit lies below every element
            else
                change = {static_cast<Bits>(next.bits ^ state.bits), static_cast<Bits>(next.inside ^ state.inside)};
            changes_[i][channel] = change.bits;
            if (i == 0) enters_[channel] = change.inside;
            if (isLast) leaves_[channel] = change.inside;
            state = next;
        }
        starts_[channel] = start.bits;
        startsInside_[channel] = start.inside;
    }
    /// To be called when all channels are set.
    void finish() {
        for (int i = 0; i < count_; ++i) {
            spread(limits_[i], limit_[i]);
            spread(changes_[i], change_[i]);
        }
        spread(starts_, start_);
        spread(startsInside_, startInside_);
        spread(enters_, enter_);
        spread(leaves_, leave_);
    }

    /// The vector of a row that has this phase, for so many levels.
    QORI_INLINE Vec<T> map(int phase, int count, Vec<T> v) const {
        const int p = vectors == 1 ? 0 : phase;
        Vec<Bits> result = start_[p];
        for (int i = 0; i < count; ++i) result = changedWhere(result, reached(v, limit_[i][p]), change_[i][p]);
        Vec<Bits> inside = changedWhere(startInside_[p], reached(v, limit_[0][p]), enter_[p]);
        inside = changedWhere(inside, reached(v, limit_[count - 1][p]), leave_[p]);
        const Vec<T> outside = selectOrZero(~Mask<T>{inside.v}, v);
        return fromInteger<T>(_mm256_xor_si256(result.v, toInteger(outside.v)));
    }

private:
    static constexpr int vectors = channels == 3 ? 3 : 1;

    /// What the levels up to one make of an element: `bits`, where it is inside, else the element itself.
    struct State {
        Bits bits, inside;
    };
    /// 16 bits are compared as signed elements, unsigned ones with their top bit flipped, with the level less 1.
    using Limit = std::conditional_t<std::is_floating_point_v<T>, float, int16_t>;
    static constexpr int32_t kLowest = std::is_signed_v<T> ? -32'768 : 0, kHighest = kLowest + 65'535;

    static Bits bitsOf(Level value) {
        if constexpr (std::is_floating_point_v<T>)
            return __builtin_bit_cast(Bits, value);
        else
            return static_cast<Bits>(std::clamp(value, kLowest, kHighest));
    }
    static bool isBelowAll(Level level) { return !std::is_floating_point_v<T> && level <= static_cast<Level>(kLowest); }
    static Limit limitOf(Level level) {
        if constexpr (std::is_floating_point_v<T>)
            return level;
        else
            return static_cast<int16_t>(std::clamp(level, kLowest + 1, kHighest + 1) - 1 - kLowest - 32'768);
    }
    QORI_INLINE static Mask<Bits> reached(Vec<T> v, Vec<Limit> limit) {
        if constexpr (std::is_floating_point_v<T>) {
            return {isAtMost(limit, v).v};
        } else {
            const Vec<Bits> flip = splat(static_cast<Bits>(std::is_signed_v<T> ? 0 : 0x8000));
            return {isLess(limit, Vec<int16_t>{_mm256_xor_si256(v.v, flip.v)}).v};
        }
    }
    QORI_INLINE static Vec<Bits> changedWhere(Vec<Bits> a, Mask<Bits> mask, Vec<Bits> change) {
        return {_mm256_xor_si256(a.v, _mm256_and_si256(mask.v, change.v))};
    }
    template <class V>
    static void spread(const V (&perChannel)[channels], Vec<V> (&to)[vectors]) {
        if constexpr (channels == 1) {
            to[0] = splat(perChannel[0]);
        } else {
            const ChannelVectors<V> all = channelVectors(perChannel, channels);
            for (int p = 0; p < vectors; ++p) to[p] = all.v[p];
        }
    }

    int count_;
    Vec<Limit> limit_[kMostFewSteps][vectors];
    Vec<Bits> change_[kMostFewSteps][vectors];
    Vec<Bits> start_[vectors], startInside_[vectors], enter_[vectors], leave_[vectors];
    Limit limits_[kMostFewSteps][channels];
    Bits changes_[kMostFewSteps][channels];
    Bits starts_[channels] = {}, startsInside_[channels] = {}, enters_[channels] = {}, leaves_[channels] = {};
};

/// As an operation of the row map. Only where the steps are is copied for each row.
template <class T, int channels>
struct ApplyFewSteps {
    static constexpr bool inRegisters = true;
    const FewSteps<T, channels>* steps;
    int count;

    template <int n>
    QORI_INLINE Pack<T, n> operator()(int phase, Pack<T, n> source) const {
        static_assert(Pack<T, n>::vectors == 1);
        return {{steps->map(phase, count, source.v[0])}};
    }
};

}  // namespace qori::kernels
