// SPDX-License-Identifier: Apache-2.0
// Passes over lines, for those that put transforms together.
#pragma once
#include "fourier.h"

namespace qori::kernels::line {

/// Blocks up to this many points go through all their stages before the next block does: 32 KiB, which first-level
/// caches hold.
inline constexpr ptrdiff_t kPointsAtOnce = 512;
template <int radix>
inline constexpr bool isOdd = radix % 2 == 1;

template <int radix, class T>
QORI_INLINE void butterflyOf(ComplexLineOf<T> (&a)[radix], const T* turns) {
    if constexpr (isOdd<radix>)
        butterfly<radix>(a, turns);
    else
        butterfly(a);
}

/// Blocks of radix * part points. Without twiddles, part is 1.
template <int radix, bool hasTwiddles, class T>
QORI_NOINLINE void passBlocks(T* lines, ptrdiff_t blocks, ptrdiff_t part, const T* turns,
                              const std::type_identity_t<T>* twiddles) {
    constexpr ptrdiff_t line = kLineBytes / sizeof(T);
    const ptrdiff_t apart = part * line;
    for (ptrdiff_t block = 0; block < blocks; ++block) {
        const T* w = twiddles;
        for (ptrdiff_t j = 0; j < (hasTwiddles ? part : 1); ++j) {
            T* const x = lines + j * line;
            ComplexLineOf<T> a[radix];
            for (int q = 0; q < radix; ++q) a[q] = loadLine(x + q * apart);
            butterflyOf<radix>(a, turns);
            storeLine(x, a[0]);
            for (int p = 1; p < radix; ++p) storeLine(x + p * apart, hasTwiddles ? times(a[p], w + 2 * p - 2) : a[p]);
            w += 2 * (radix - 1);
        }
        lines += radix * apart;
    }
}

/// Where the butterflies of a rotated stage begin among their lines, and how they go around.
template <int radix>
class Rotation {
public:
    /// Lines of a butterfly are `apart` from each other; the next one begins `rotation` of them earlier.
    QORI_INLINE Rotation(ptrdiff_t rotation, ptrdiff_t apart)
        : step_(rotation * apart), apart_(apart), end_(radix * apart) {}

    QORI_INLINE void offsets(ptrdiff_t (&around)[radix]) const {
        ptrdiff_t at = start_;
        for (ptrdiff_t& offset : around) {
            offset = at;
            at = at + apart_ == end_ ? 0 : at + apart_;
        }
    }
    QORI_INLINE void advance() { start_ -= start_ < step_ ? step_ - end_ : step_; }

private:
    ptrdiff_t step_, apart_, end_, start_ = 0;
};

/// Between n points there are 2 n - 1 lags. A cyclic convolution of fewer points has one place for two of them where
/// they are more than half around: so many of either sign, the largest ones, are summed apart. It is an even number, as
/// n is odd and points are whole eights; the last factor is 0.
constexpr int64_t missingLags(int64_t n, int64_t points) { return points >= 2 * n - 1 ? 0 : n - points / 2 + 1; }

/// So many of the parts of a convolution's outer stage hold points of a block: half of them, or one more where lags are
/// missing, which is so up to an eighth of the points.
constexpr int filledParts(int radix) { return radix / 2 + 1; }
/// Products grow with the square of the lags: beyond so many they cost more than any transform, and in the end more
/// than costs can count.
constexpr int64_t kMostMissing = 1 << 16;
constexpr bool mayLackLags(int64_t n, int64_t points) {
    return n <= points / 8 * filledParts(8) && missingLags(n, points) <= kMostMissing;
}

enum class Way { forth, back };

/// One stage of so many blocks; back, the way of a convolution, between exchanged parts.
void runStage(const FourierTable& table, const FourierTable::Stage& stage, float* lines, ptrdiff_t blocks);
void runStageBack(const FourierTable& table, const FourierTable::Stage& stage, float* lines, ptrdiff_t blocks);

/// The convolvedPoints points of a block. work: the lines of the inner transform.
void transformByConvolution(const FourierTable& table, float* block, float* work);

}  // namespace qori::kernels::line
