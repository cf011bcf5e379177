// SPDX-License-Identifier: Apache-2.0
// The zig-zag order of a block: along its diagonals, from the lowest frequencies to the highest.
#pragma once
#include "image/image.h"
#include "kernels/simd.h"

namespace qori::kernels::dct8 {

/// Where each of 64 elements is taken from.
struct BlockOrder {
    uint8_t source[64];
};

/// Row by row from the order of diagonals, of which the first runs to the right.
constexpr BlockOrder zigzagOrder() {
    BlockOrder order{};
    int i = 0;
    for (int diagonal = 0; diagonal < 15; ++diagonal)
        for (int step = 0; step <= diagonal; ++step) {
            const int row = diagonal % 2 == 0 ? diagonal - step : step, column = diagonal - row;
            if (row < 8 && column < 8) order.source[i++] = static_cast<uint8_t>(8 * row + column);
        }
    return order;
}

constexpr BlockOrder inverseOrder(BlockOrder order) {
    BlockOrder inverse{};
    for (int i = 0; i < 64; ++i) inverse.source[order.source[i]] = static_cast<uint8_t>(i);
    return inverse;
}

/// For 16 elements of the result, which bytes of each row go where; zeros for the rest.
struct OrderMasks {
    alignas(kVectorBytes) uint8_t bytes[4][8][32];
    bool isUsed[4][8];
};

constexpr OrderMasks masksOf(BlockOrder order) {
    OrderMasks masks{};
    for (int v = 0; v < 4; ++v)
        for (int row = 0; row < 8; ++row)
            for (int i = 0; i < 32; ++i) {
                const int source = order.source[16 * v + i / 2];
                const bool isHere = source / 8 == row;
                masks.bytes[v][row][i] = static_cast<uint8_t>(isHere ? source % 8 * 2 + i % 2 : 0x80);
                masks.isUsed[v][row] |= isHere;
            }
    return masks;
}

inline constexpr OrderMasks kZigzag = masksOf(zigzagOrder()), kFromZigzag = masksOf(inverseOrder(zigzagOrder()));

/// Sixteen elements of the result; unused rows are known at compile time.
template <const OrderMasks& masks, int v, int row = 0>
QORI_INLINE Bytes gatherElements(const Bytes (&rows)[8]) {
    if constexpr (row == 8) {
        return zero<uint8_t>();
    } else {
        const Bytes rest = gatherElements<masks, v, row + 1>(rows);
        if constexpr (!masks.isUsed[v][row])
            return rest;
        else
            return rest | shuffleInBlocks(rows[row], load(masks.bytes[v][row]));
    }
}

/// dst may be src.
template <const OrderMasks& masks>
QORI_INLINE void reorderBlock(const int16_t* src, int16_t* dst) {
    Bytes rows[8];
    for (int i = 0; i < 8; ++i) rows[i] = repeatBlock(asBytes(src + 8 * i));
    const Bytes made[4] = {gatherElements<masks, 0>(rows), gatherElements<masks, 1>(rows),
                           gatherElements<masks, 2>(rows), gatherElements<masks, 3>(rows)};
    for (int v = 0; v < 4; ++v) store(asBytes(dst + 16 * v), made[v]);
}

}  // namespace qori::kernels::dct8
