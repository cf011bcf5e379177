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

/// A third of the width from each plane, in grey.
Picture planes(const Picture& photo) {
    const PlanesOf split(photo);
    const Picture* all[3] = {&split.red, &split.green, &split.blue};
    Picture out(photo.size(), 3);
    for (int i = 0; i < 3; ++i) {
        const int begin = photo.width() * i / 3, end = photo.width() * (i + 1) / 3;
        require(qoriDup_8u_C1C3R(all[i]->at(begin, 0), all[i]->step(), out.at(begin, 0), out.step(),
                                 {end - begin, photo.height()}));
    }
    return out;
}

Picture swappedPlanes(const Picture& photo) {
    const PlanesOf split(photo);
    const uint8_t* order[3] = {split.pointers[2], split.pointers[1], split.pointers[0]};
    Picture out(photo.size(), 3);
    require(qoriCopy_8u_P3C3R(order, split.red.step(), out.data(), out.step(), photo.size()));
    return out;
}

/// The photograph inside a circle, its green channel in grey outside.
Picture circle(const Picture& photo) {
    const QorImageSize size = photo.size();
    Picture mask(size, 1), grey(size, 1), out(size, 3);
    require(qoriSet_8u_C1R(0, mask.data(), mask.step(), size));
    const double radius = 0.46 * (size.width < size.height ? size.width : size.height);
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
    const int bar = photo.width() / 10;
    for (int i = 0; i < 10; i += 2)
        require(qoriSet_8u_C3CR(0, out.at(bar * i, 0) + 2, out.step(), {bar, photo.height()}));
    return out;
}

/// Red moved to the left and blue to the right, as by a poor lens.
Picture fringes(const Picture& photo) {
    Picture out = copyOf(photo), plane(photo.size(), 1);
    const int shift = photo.width() / 60, width = photo.width() - shift;
    const QorImageSize part{width, photo.height()};
    require(qoriCopy_8u_C3C1R(photo.at(shift, 0), photo.step(), plane.data(), plane.step(), part));
    require(qoriCopy_8u_C1C3R(plane.data(), plane.step(), out.data(), out.step(), part));
    require(qoriCopy_8u_C3CR(photo.data() + 2, photo.step(), out.at(shift, 0) + 2, out.step(), part));
    return out;
}

/// The lower part mirrors the upper: a negative step walks the source upwards.
Picture lake(const Picture& photo) {
    Picture out = copyOf(photo);
    const int shore = std::max(photo.height() * 11 / 20, (photo.height() + 1) / 2), depth = photo.height() - shore;
    require(
        qoriCopy_8u_C3R(photo.at(0, shore - 1), -photo.step(), out.at(0, shore), out.step(), {photo.width(), depth}));
    return out;
}

/// The tiles of a 6 x 4 grid exchanged in pairs.
Picture puzzle(const Picture& photo) {
    Picture out = copyOf(photo);
    constexpr int columns = 6, rows = 4;
    const QorImageSize tile{photo.width() / columns, photo.height() / rows};
    for (int i = 0; i < columns * rows; ++i) {
        const int j = (i * 7 + 5) % (columns * rows);
        require(qoriCopy_8u_C3R(photo.at(i % columns * tile.width, i / columns * tile.height), photo.step(),
                                out.at(j % columns * tile.width, j / columns * tile.height), out.step(), tile));
    }
    return out;
}

/// A white mount with a dark inner line, each edge filled as a region of its own.
Picture framed(const Picture& photo) {
    Picture out = copyOf(photo);
    const auto frame = [&](int inset, int thickness, const uint8_t(&colour)[3]) {
        const int w = photo.width() - 2 * inset, h = photo.height() - 2 * inset;
        require(qoriSet_8u_C3R(colour, out.at(inset, inset), out.step(), {w, thickness}));
        require(qoriSet_8u_C3R(colour, out.at(inset, inset + h - thickness), out.step(), {w, thickness}));
        require(qoriSet_8u_C3R(colour, out.at(inset, inset), out.step(), {thickness, h}));
        require(qoriSet_8u_C3R(colour, out.at(inset + w - thickness, inset), out.step(), {thickness, h}));
    };
    const int mount = std::min(photo.width(), photo.height()) / 14;
    frame(0, mount, {246, 243, 236});
    frame(mount - mount / 6, mount / 6, {60, 52, 40});
    return out;
}

constexpr Panel kPanels[] = {
    {"Photograph", "Copy C3", copyOf},
    {"Red, green and blue planes", "Copy C3P3, Dup C1C3", planes, {3, 1}},
    {"Red and blue exchanged", "Copy C3P3, P3C3", swappedPlanes},
    {"Masked by a circle", "Set C1, Copy C3C1, C3M, Dup", circle, {3, 3}},
    {"Blue emptied in bars", "Copy C3, Set C3C", channelBars, {10, 1}},
    {"Colour fringes", "Copy C3C1, C1C3, C3C", fringes, {60, 1}},
    {"Mirrored by a negative step", "Copy C3", lake, {1, 2}},
    {"Tiles exchanged", "Copy C3 on regions", puzzle, {6, 4}},
    {"Framed", "Copy C3, Set C3 on regions", framed, {84, 84}},
};

}  // namespace

std::span<const Panel> copyPanels() { return kPanels; }

}  // namespace demo
