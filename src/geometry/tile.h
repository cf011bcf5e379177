// SPDX-License-Identifier: Apache-2.0
// Tiles of a destination.
#pragma once
#include "frame/checks.h"

namespace qori::geometry {

/// The part of a tile inside the destination, in destination pixels.
struct Tile {
    int32_t x, y, width, height;
};

/// Source indices first..last.
struct Range {
    int32_t first, last;

    int32_t clamp(int32_t index) const { return index < first ? first : index > last ? last : index; }
};

/// A tile that begins inside a destination, without what lies outside.
inline Tile trimmedTile(QorPoint2D offset, QorImageSize size, QorImageSize whole) {
    const auto trimmed = [](int32_t length, int32_t most) { return length < most ? length : most; };
    return {offset.x, offset.y, trimmed(size.width, whole.width - offset.x),
            trimmed(size.height, whole.height - offset.y)};
}

/// A tile must begin inside the destination.
inline QorResult offsetCheck(QorPoint2D offset, QorImageSize whole) {
    const bool inside = offset.x >= 0 && offset.y >= 0 && offset.x < whole.width && offset.y < whole.height;
    return inside ? QOR_OK : QOR_ERR_OUT_OF_RANGE;
}

}  // namespace qori::geometry
