// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <cmath>

#include "panels.h"

namespace demo {
namespace {

Picture copyOf(const Picture& photo) {
    Picture out(photo.size(), 3);
    require(qoriCopy_8u_C3R(photo.data(), photo.step(), out.data(), out.step(), photo.size()));
    return out;
}

struct PlanesOf {
    Picture red, green, blue;
    uint8_t* pointers[3];

    explicit PlanesOf(const Picture& photo)
        : red(photo.size(), 1),
          green(photo.size(), 1),
          blue(photo.size(), 1),
          pointers{red.data(), green.data(), blue.data()} {
        require(qoriCopy_8u_C3P3R(photo.data(), photo.step(), pointers, red.step(), photo.size()));
    }
};

/// A strip from each plane, in grey.
Picture planes(const Picture& photo) {
    const auto& channels = recipes::planes::channels;
    const PlanesOf split(photo);
    const Picture* all[3] = {&split.red, &split.green, &split.blue};
    Picture out(photo.size(), 3);
    constexpr int strips = static_cast<int>(channels.size());
    for (int i = 0; i < strips; ++i) {
        const Picture& plane = *all[channels[static_cast<size_t>(i)]];
        const int begin = photo.width() * i / strips, end = photo.width() * (i + 1) / strips;
        require(qoriDup_8u_C1C3R(plane.at(begin, 0), plane.step(), out.at(begin, 0), out.step(),
                                 {end - begin, photo.height()}));
    }
    return out;
}

Picture swappedPlanes(const Picture& photo) {
    const PlanesOf split(photo);
    const auto& places = recipes::swappedPlanes::order;
    const uint8_t* order[3] = {split.pointers[places[0]], split.pointers[places[1]], split.pointers[places[2]]};
    Picture out(photo.size(), 3);
    require(qoriCopy_8u_P3C3R(order, split.red.step(), out.data(), out.step(), photo.size()));
    return out;
}

/// The photograph inside a circle, its green channel in grey outside.
Picture circle(const Picture& photo) {
    const QorImageSize size = photo.size();
    Picture mask(size, 1), grey(size, 1), out(size, 3);
    require(qoriSet_8u_C1R(0, mask.data(), mask.step(), size));
    const double radius = recipes::circle::share * (size.width < size.height ? size.width : size.height);
    for (int y = 0; y < size.height; ++y) {
        const double dy = y + 0.5 - size.height / 2.0, square = radius * radius - dy * dy;
        const int half = square > 0 ? static_cast<int>(std::sqrt(square)) : 0;
        if (half > 0) require(qoriSet_8u_C1R(255, mask.at(size.width / 2 - half, y), mask.step(), {2 * half, 1}));
    }
    require(qoriCopy_8u_C3C1R(photo.data() + 1, photo.step(), grey.data(), grey.step(), size));
    require(qoriDup_8u_C1C3R(grey.data(), grey.step(), out.data(), out.step(), size));
    require(qoriCopy_8u_C3MR(photo.data(), photo.step(), out.data(), out.step(), size, mask.data(), mask.step()));
    return out;
}

/// The blue channel emptied in vertical bars.
Picture channelBars(const Picture& photo) {
    Picture out = copyOf(photo);
    constexpr int bars = recipes::channelBars::bars;
    const int bar = photo.width() / bars;
    for (int i = 0; i < bars; i += 2)
        require(qoriSet_8u_C3CR(0, out.at(bar * i, 0) + 2, out.step(), {bar, photo.height()}));
    return out;
}

/// Red moved to the left and blue to the right, as by a poor lens.
Picture fringes(const Picture& photo) {
    Picture out = copyOf(photo), plane(photo.size(), 1);
    const int shift = photo.width() / recipes::fringes::part, width = photo.width() - shift;
    const QorImageSize part{width, photo.height()};
    require(qoriCopy_8u_C3C1R(photo.at(shift, 0), photo.step(), plane.data(), plane.step(), part));
    require(qoriCopy_8u_C1C3R(plane.data(), plane.step(), out.data(), out.step(), part));
    require(qoriCopy_8u_C3CR(photo.data() + 2, photo.step(), out.at(shift, 0) + 2, out.step(), part));
    return out;
}

/// The lower part mirrors the upper: a negative step walks the source upwards.
Picture lake(const Picture& photo) {
    Picture out = copyOf(photo);
    const auto [part, of] = recipes::lake::shore;
    const int shore = std::max(photo.height() * part / of, (photo.height() + 1) / 2), depth = photo.height() - shore;
    require(
        qoriCopy_8u_C3R(photo.at(0, shore - 1), -photo.step(), out.at(0, shore), out.step(), {photo.width(), depth}));
    return out;
}

/// The tiles of a grid exchanged.
Picture puzzle(const Picture& photo) {
    Picture out = copyOf(photo);
    using namespace recipes::puzzle;
    const QorImageSize tile{photo.width() / columns, photo.height() / rows};
    for (int i = 0; i < columns * rows; ++i) {
        const int j = (i * stride + first) % (columns * rows);
        require(qoriCopy_8u_C3R(photo.at(i % columns * tile.width, i / columns * tile.height), photo.step(),
                                out.at(j % columns * tile.width, j / columns * tile.height), out.step(), tile));
    }
    return out;
}

/// A white mount with a dark inner line, each edge filled as a region of its own.
Picture framed(const Picture& photo) {
    using namespace recipes::framed;
    Picture out = copyOf(photo);
    const auto frame = [&](int inset, int thickness, const std::array<int, 3>& rgb) {
        const auto elements = bytes(rgb);
        const uint8_t* const colour = elements.data();
        const int w = photo.width() - 2 * inset, h = photo.height() - 2 * inset;
        require(qoriSet_8u_C3R(colour, out.at(inset, inset), out.step(), {w, thickness}));
        require(qoriSet_8u_C3R(colour, out.at(inset, inset + h - thickness), out.step(), {w, thickness}));
        require(qoriSet_8u_C3R(colour, out.at(inset, inset), out.step(), {thickness, h}));
        require(qoriSet_8u_C3R(colour, out.at(inset + w - thickness, inset), out.step(), {thickness, h}));
    };
    const int mount = std::min(photo.width(), photo.height()) / part;
    frame(0, mount, paper);
    frame(mount - mount / lining, mount / lining, ink);
    return out;
}

/// Whose inner line is one pixel wide.
constexpr int kLeastFramed = recipes::framed::part * recipes::framed::lining;

constexpr Panel kPanels[] = {
    {recipes::copyOf::about, copyOf},
    {recipes::planes::about, planes, {3, 1}},
    {recipes::swappedPlanes::about, swappedPlanes},
    {recipes::circle::about, circle, {3, 3}},
    {recipes::channelBars::about, channelBars, {recipes::channelBars::bars, 1}},
    {recipes::fringes::about, fringes, {recipes::fringes::part, 1}},
    {recipes::lake::about, lake, {1, 2}},
    {recipes::puzzle::about, puzzle, {6, 4}},
    {recipes::framed::about, framed, {kLeastFramed, kLeastFramed}},
};

}  // namespace

std::span<const Panel> copyPanels() { return kPanels; }

}  // namespace demo
