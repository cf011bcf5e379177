// SPDX-License-Identifier: Apache-2.0
// Extremes of windows, as joins of rows: the element at i is the smallest or largest of the elements at i of several
// rows, which may be one row at several offsets. Joins go in any order and may count elements twice.
//
// Floats are joined as keys: unsigned integers in the order of the numbers, -0 below +0, NaNs where a number always
// beats them. So no order of joins shows in the result, and no instruction reads the control register.
#pragma once
#include <cstddef>
#include <cstdint>

#include "kernels/simd.h"

namespace qori::kernels {

using FloatKey = uint32_t;

/// What becomes of joined elements on their way into a destination.
struct JoinFinish {
    bool keepsAlpha;  ///< Every fourth element stays what it is in the destination.
    bool decodes;     ///< Keys become floats' bits again, a quiet NaN where there was no number.

    bool isNone() const { return !keepsAlpha && !decodes; }
};

/// One of several rows that enter a block of rows, one below the other.
template <class T>
struct EnteringRow {
    T* row;              ///< Becomes the join of its taps.
    const T* lastRows;   ///< The join of the rows of the block before that its window has; null where it has none.
    const T* elsewhere;  ///< What else the window has, or null.
    T* to;               ///< Becomes the finished join of all that the window has; may be `elsewhere`.
};

inline constexpr int kMostEntering = 8;

template <class T>
struct EnteringRows {
    const T* const* taps;  ///< So many of the first row, as many of the next ...
    int tapsEach;
    const EnteringRow<T>* row;
    int rows;
    const T* before;  ///< The join of the block's rows above, or null where these are its first.
    T* soFar;         ///< Becomes that join with these rows; may be `before`.
    ptrdiff_t elements;
    JoinFinish finish;
};

/// Rounds of doubling that Joins::widen makes of pixels of so many bytes, in registers. Those whose shifts keep more
/// vectors than registers hold are not worth it.
constexpr int mostRounds(int pixelBytes) {
    int rounds = 0;
    for (int kept = 0; rounds < 5; ++rounds) {
        kept += ((pixelBytes << rounds) + kBlockBytes - 1) / kBlockBytes;
        if (kept > 9) break;
    }
    return rounds;
}

/// Rows that are to be joined with themselves.
template <class T>
struct WideningRows {
    const T* const* row;
    int rows;
    T* const* to;
    ptrdiff_t seen;  ///< Elements of the rows; those of `to` are fewer by the pixels of a window less one.
    int channels, rounds;
    ptrdiff_t ahead;  ///< Elements from a row to one that is read soon, which the processor is told of.
};

/// The joins of an order. Elements are told apart by their bits: 16-bit ones of both kinds are uint16_t here.
template <class T>
struct Joins {
    /// to[i] = the extreme of row[0][i] ... row[count - 1][i]. `to` may be one of the rows.
    void (*join)(const T* const* row, int count, T* to, ptrdiff_t elements);
    /// The same, finished; `to` is none of the rows.
    void (*joinInto)(const T* const* row, int count, T* to, ptrdiff_t elements, JoinFinish finish);
    /// to[k][i] = the extreme of row[k][i] and of the 2^rounds - 1 pixels that follow; 1 to mostRounds() rounds. Whole
    /// blocks of 16 bytes are written of `to`.
    void (*widen)(const WideningRows<T>& rows);
    void (*enter)(const EnteringRows<T>& rows);
    /// Each row becomes its join with all rows below it. Rows are `step` elements apart and padded to whole vectors.
    void (*joinUpwards)(T* last, ptrdiff_t step, int32_t rows, ptrdiff_t elements);
};

/// [0] for the smallest, [1] for the largest.
extern const Joins<uint8_t> kByteJoins[2];
extern const Joins<uint16_t> kWordJoins[2], kSignedWordJoins[2];
extern const Joins<FloatKey> kKeyJoins[2];

/// The keys of an order, of floats' bits; no row is the other. `ahead`: elements from a row to one that is read soon.
template <bool largest>
void toKeys(const FloatKey* bits, FloatKey* keys, ptrdiff_t elements, ptrdiff_t ahead);

}  // namespace qori::kernels
