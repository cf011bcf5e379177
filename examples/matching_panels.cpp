// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <vector>

#include "panels.h"

namespace demo {
namespace {

/// A part of the photograph to look for: of a regular choice of places the one with the most detail.
struct Pattern {
    QorPoint2D place;
    QorImageSize size;
};

/// By how much it differs from its neighbour a few pixels to the right.
double detailOf(const Picture& grey, QorPoint2D place, QorImageSize size, int shift) {
    double norm = 0;
    require(qoriNormDiff_L2_8u_C1R(grey.at(place.x, place.y), grey.step(), grey.at(place.x + shift, place.y),
                                   grey.step(), size, &norm));
    return norm;
}

Pattern choosePattern(const Picture& grey) {
    constexpr int kPlaces = recipes::foundTemplate::places, kShift = recipes::foundTemplate::shift;
    const int smaller = std::min(grey.width(), grey.height());
    const int side = std::clamp(smaller / recipes::foundTemplate::part, 1, recipes::foundTemplate::most);
    Pattern best{{0, 0}, {side, side}};
    double most = -1;
    for (int i = 0; i < kPlaces * kPlaces; ++i) {
        const QorPoint2D place{(grey.width() - side - kShift) * (i % kPlaces) / (kPlaces - 1),
                               (grey.height() - side) * (i / kPlaces) / (kPlaces - 1)};
        const double detail = detailOf(grey, place, best.size, kShift);
        if (detail > most) {
            most = detail;
            best.place = place;
        }
    }
    return best;
}

Picture greyOf(const Picture& photo) {
    Picture grey(photo.size(), 1);
    require(qoriCopy_8u_C3C1R(photo.data() + 1, photo.step(), grey.data(), grey.step(), photo.size()));
    return grey;
}

/// The pattern in other light: less contrast, and brighter.
Picture dimmed(const Picture& grey, const Pattern& pattern) {
    Picture dim(pattern.size, 1);
    require(qoriMulC_8u_C1RSfs(grey.at(pattern.place.x, pattern.place.y), grey.step(), 1, dim.data(), dim.step(),
                               pattern.size, recipes::foundTemplate::scale));
    require(qoriAddC_8u_C1RSfs(dim.data(), dim.step(), recipes::foundTemplate::light, dim.data(), dim.step(),
                               pattern.size, 0));
    return dim;
}

struct Surface {
    std::vector<float> scores;
    int32_t step;
};

/// Zero-mean normalised: a score for each pixel of the photograph, from -1 to 1, at the template's centre.
Surface correlate(const Picture& grey, const Picture& tpl) {
    constexpr int32_t kAlgorithm = corrNormLevel | corrSame;
    int32_t bytes = 0;
    require(qoriCrossCorrNormGetBufferSize(grey.size(), tpl.size(), kAlgorithm, &bytes));
    std::vector<uint8_t> buffer(static_cast<size_t>(bytes));
    Surface surface{std::vector<float>(static_cast<size_t>(grey.width()) * static_cast<size_t>(grey.height())),
                    grey.width() * static_cast<int32_t>(sizeof(float))};
    require(qoriCrossCorrNorm_8u32f_C1R(grey.data(), grey.step(), grey.size(), tpl.data(), tpl.step(), tpl.size(),
                                        surface.scores.data(), surface.step, kAlgorithm, buffer.data()));
    return surface;
}

void drawFrame(const Picture& out, int x, int y, QorImageSize size, int thickness) {
    constexpr auto colour = bytes(recipes::foundTemplate::colour);
    const auto bar = [&](int left, int top, int right, int bottom) {
        left = std::max(left, 0), top = std::max(top, 0);
        right = std::min(right, out.width()), bottom = std::min(bottom, out.height());
        if (left < right && top < bottom)
            require(qoriSet_8u_C3R(colour.data(), out.at(left, top), out.step(), {right - left, bottom - top}));
    };
    const int right = x + size.width, bottom = y + size.height;
    bar(x - thickness, y - thickness, right + thickness, y);
    bar(x - thickness, bottom, right + thickness, bottom + thickness);
    bar(x - thickness, y, x, bottom);
    bar(right, y, right + thickness, bottom);
}

/// Frames the place of the best score.
void frameBest(const Picture& out, const Surface& surface, QorImageSize size) {
    float best = 0;
    int32_t x = 0, y = 0;
    require(qoriMaxIndx_32f_C1R(surface.scores.data(), surface.step, out.size(), &best, &x, &y));
    const int thickness = 1 + std::min(out.width(), out.height()) / recipes::foundTemplate::thin;
    drawFrame(out, x - size.width / 2, y - size.height / 2, size, thickness);
}

/// What was looked for stands in the corner.
Picture foundTemplate(const Picture& photo) {
    const Picture grey = greyOf(photo);
    const Pattern pattern = choosePattern(grey);
    const Picture tpl = dimmed(grey, pattern);
    Picture out(photo.size(), 3);
    require(qoriCopy_8u_C3R(photo.data(), photo.step(), out.data(), out.step(), photo.size()));
    require(qoriDup_8u_C1C3R(tpl.data(), tpl.step(), out.data(), out.step(), pattern.size));
    frameBest(out, correlate(grey, tpl), pattern.size);
    return out;
}

/// Black is 0 and below, white is 1.
Picture surfaceOfTemplate(const Picture& photo) {
    const Picture grey = greyOf(photo);
    const Pattern pattern = choosePattern(grey);
    const Surface surface = correlate(grey, dimmed(grey, pattern));
    Picture scores(photo.size(), 1), out(photo.size(), 3);
    require(qoriScale_32f8u_C1R(surface.scores.data(), surface.step, scores.data(), scores.step(), photo.size(), 0, 1));
    require(qoriDup_8u_C1C3R(scores.data(), scores.step(), out.data(), out.step(), photo.size()));
    frameBest(out, surface, pattern.size);
    return out;
}

constexpr Panel kPanels[] = {
    {recipes::foundTemplate::about, foundTemplate, {12, 12}},
    {recipes::surfaceOfTemplate::about, surfaceOfTemplate, {12, 12}},
};

}  // namespace

std::span<const Panel> matchingPanels() { return kPanels; }

}  // namespace demo
