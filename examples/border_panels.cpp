// SPDX-License-Identifier: Apache-2.0
// Frames and mirrors.
#include "panels.h"

namespace demo {
namespace {

/// Reduced copies in a grid, each in a constant frame of its own colour.
Picture framedTiles(const Picture& photo) {
    constexpr int columns = 4, rows = 3;
    Picture out(photo.size(), 3);
    const QorImageSize tile{photo.width() / columns, photo.height() / rows};
    const int border = tile.height / 16, width = tile.width - 2 * border, height = tile.height - 2 * border;
    const uint8_t black[3] = {0, 0, 0};
    require(qoriSet_8u_C3R(black, out.data(), out.step(), out.size()));
    if (border < 1 || width < 1 || height < 1) return out;
    for (int i = 0; i < columns * rows; ++i) {
        const int x = i % columns * tile.width, y = i / columns * tile.height;
        const uint8_t colour[3] = {static_cast<uint8_t>(60 + 16 * i), static_cast<uint8_t>(220 - 12 * i),
                                   static_cast<uint8_t>(90 + 40 * (i % 4))};
        require(qoriCopyConstBorder_8u_C3R(photo.at(x + border, y + border), photo.step(), {width, height},
                                           out.at(x, y), out.step(), tile, border, border, colour));
    }
    return out;
}

/// The middle of the photograph, its outermost pixels drawn out to the sides.
Picture drawnOut(const Picture& photo) {
    Picture out(photo.size(), 3);
    const int x = photo.width() / 5, y = photo.height() / 5;
    require(qoriCopyReplicateBorder_8u_C3R(photo.at(x, y), photo.step(),
                                           {photo.width() - 2 * x, photo.height() - 2 * y}, out.data(), out.step(),
                                           photo.size(), y, x));
    return out;
}

/// The upper left quarter and its three reflections.
Picture kaleidoscope(const Picture& photo) {
    Picture out(photo.size(), 3);
    const QorImageSize half{photo.width() / 2, photo.height() / 2};
    require(qoriCopy_8u_C3R(photo.data(), photo.step(), out.data(), out.step(), photo.size()));
    if (half.width < 2 || half.height < 2) return out;
    const int right = photo.width() - half.width, below = photo.height() - half.height;
    require(qoriMirror_8u_C3R(photo.data(), photo.step(), out.at(right, 0), out.step(), half, flipVerticalAxis));
    require(qoriMirror_8u_C3R(photo.data(), photo.step(), out.at(0, below), out.step(), half, flipHorizontalAxis));
    require(qoriMirror_8u_C3R(photo.data(), photo.step(), out.at(right, below), out.step(), half, flipBothAxes));
    return out;
}

/// Square tiles, every other one reflected about one of its diagonals.
Picture turnedTiles(const Picture& photo) {
    Picture out(photo.size(), 3);
    require(qoriCopy_8u_C3R(photo.data(), photo.step(), out.data(), out.step(), photo.size()));
    const int side = photo.height() / 6;
    if (side < 1) return out;
    for (int y = 0; y + side <= photo.height(); y += side)
        for (int x = (y / side) % 2 * side; x + side <= photo.width(); x += 2 * side)
            require(qoriMirror_8u_C3R(photo.at(x, y), photo.step(), out.at(x, y), out.step(), {side, side},
                                      x / side % 4 < 2 ? flipDiagonal : flipAntiDiagonal));
    return out;
}

constexpr Panel kPanels[] = {
    {"Framed tiles", "CopyConstBorder C3", framedTiles, {48, 48}},
    {"Outermost pixels repeated", "CopyReplicateBorder C3", drawnOut, {16, 16}},
    {"Mirrored quarters", "Mirror C3, axes 0 to 2", kaleidoscope, {16, 16}},
    {"Tiles about their diagonals", "Mirror C3, axes 3 and 4", turnedTiles, {16, 16}},
};

}  // namespace

std::span<const Panel> borderPanels() { return kPanels; }

}  // namespace demo
