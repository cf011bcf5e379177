// SPDX-License-Identifier: Apache-2.0
// Frames and mirrors.
#include <string_view>

#include "panels.h"

namespace demo {
namespace {

/// The axis that a recipe names.
int32_t axisOf(std::string_view name) {
    return name == "horizontal"  ? flipHorizontalAxis
           : name == "vertical"  ? flipVerticalAxis
           : name == "both_axes" ? flipBothAxes
           : name == "diagonal"  ? flipDiagonal
                                 : flipAntiDiagonal;
}

/// Reduced copies in a grid, each in a constant frame of its own colour.
Picture framedTiles(const Picture& photo) {
    using namespace recipes::framedTiles;
    Picture out(photo.size(), 3);
    const QorImageSize tile{photo.width() / columns, photo.height() / rows};
    const int border = tile.height / part, width = tile.width - 2 * border, height = tile.height - 2 * border;
    const uint8_t black[3] = {0, 0, 0};
    require(qoriSet_8u_C3R(black, out.data(), out.step(), out.size()));
    if (border < 1 || width < 1 || height < 1) return out;
    for (int i = 0; i < columns * rows; ++i) {
        const int x = i % columns * tile.width, y = i / columns * tile.height;
        const auto colour =
            bytes<3>({first[0] + more[0] * i, first[1] + more[1] * i, first[2] + more[2] * (i % columns)});
        require(qoriCopyConstBorder_8u_C3R(photo.at(x + border, y + border), photo.step(), {width, height},
                                           out.at(x, y), out.step(), tile, border, border, colour.data()));
    }
    return out;
}

/// The middle of the photograph, its outermost pixels drawn out to the sides.
Picture drawnOut(const Picture& photo) {
    Picture out(photo.size(), 3);
    const int x = photo.width() / recipes::drawnOut::part, y = photo.height() / recipes::drawnOut::part;
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
    uint8_t* const quarters[3] = {out.at(right, 0), out.at(0, below), out.at(right, below)};
    for (size_t i = 0; i < 3; ++i)
        require(qoriMirror_8u_C3R(photo.data(), photo.step(), quarters[i], out.step(), half,
                                  axisOf(recipes::kaleidoscope::axes[i])));
    return out;
}

/// Square tiles, every other one reflected about one of its diagonals.
Picture turnedTiles(const Picture& photo) {
    Picture out(photo.size(), 3);
    require(qoriCopy_8u_C3R(photo.data(), photo.step(), out.data(), out.step(), photo.size()));
    const int side = photo.height() / recipes::turnedTiles::rows;
    if (side < 1) return out;
    for (int y = 0; y + side <= photo.height(); y += side)
        for (int x = (y / side) % 2 * side; x + side <= photo.width(); x += 2 * side)
            require(qoriMirror_8u_C3R(photo.at(x, y), photo.step(), out.at(x, y), out.step(), {side, side},
                                      axisOf(recipes::turnedTiles::axes[static_cast<size_t>(x / side / 2 % 2)])));
    return out;
}

constexpr Panel kPanels[] = {
    {recipes::framedTiles::about, framedTiles, {48, 48}},
    {recipes::drawnOut::about, drawnOut, {16, 16}},
    {recipes::kaleidoscope::about, kaleidoscope, {16, 16}},
    {recipes::turnedTiles::about, turnedTiles, {16, 16}},
};

}  // namespace

std::span<const Panel> borderPanels() { return kPanels; }

}  // namespace demo
