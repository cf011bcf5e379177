// SPDX-License-Identifier: Apache-2.0
#include <cmath>
#include <numbers>
#include <string_view>
#include <vector>

#include "panels.h"

namespace demo {
namespace {

struct Map {
    double c[6];
};

/// About the middle of a picture.
Map turn(QorImageSize size, double degrees) {
    const double angle = degrees * std::numbers::pi / 180, c = std::cos(angle), s = std::sin(angle);
    const double x = (size.width - 1) / 2.0, y = (size.height - 1) / 2.0;
    return {{c, -s, x - c * x + s * y, s, c, y - s * x - c * y}};
}

/// Plan, initialisation and work buffer of one warp of three channels; the map takes the source to the destination, or
/// with `isBackward` the destination to the source.
void warp(QorInterpolationKind kind, const Map& map, bool isBackward, const Picture& from, const Picture& to) {
    int32_t planBytes = 0, initBytes = 0, workBytes = 0;
    require(qoriWarpAffineGetSize(from.size(), to.size(), qor8u, map.c, kind, isBackward, borderConstant, &planBytes,
                                  &initBytes));
    std::vector<uint8_t> memory(static_cast<size_t>(planBytes)), init(static_cast<size_t>(initBytes));
    auto* plan = reinterpret_cast<QorWarpPlan*>(memory.data());
    constexpr double grey[3] = {recipes::turned::outside, recipes::turned::outside, recipes::turned::outside};
    const auto fill = [&](auto function, auto... cubic) {
        return function(from.size(), to.size(), qor8u, map.c, isBackward, 3, cubic..., borderConstant, grey, 0);
    };
    if (kind == interpCubic)
        require(fill([&](auto... a) { return qoriWarpAffineCubicInit(a..., plan, init.data()); }, 0.0, 0.5));
    else if (kind == interpLinear)
        require(fill([&](auto... a) { return qoriWarpAffineLinearInit(a..., plan); }));
    else
        require(fill([&](auto... a) { return qoriWarpAffineNearestInit(a..., plan); }));
    require(qoriWarpGetBufferSize(plan, to.size(), &workBytes));
    std::vector<uint8_t> work(static_cast<size_t>(workBytes));
    const auto function = kind == interpNearest  ? qoriWarpAffineNearest_8u_C3R
                          : kind == interpLinear ? qoriWarpAffineLinear_8u_C3R
                                                 : qoriWarpAffineCubic_8u_C3R;
    require(function(from.data(), from.step(), to.data(), to.step(), {0, 0}, to.size(), plan, work.data()));
}

QorInterpolationKind kindOf(std::string_view name) {
    return name == "nearest" ? interpNearest : name == "linear" ? interpLinear : interpCubic;
}

void paste(const Picture& from, QorPoint2D at, const Picture& to, QorPoint2D where, QorImageSize size) {
    require(qoriCopy_8u_C3R(from.at(at.x, at.y), from.step(), to.at(where.x, where.y), to.step(), size));
}

/// The photograph turned, a strip by each angle.
Picture turned(const Picture& photo) {
    constexpr auto& angles = recipes::turned::angles;
    constexpr int kStrips = static_cast<int>(angles.size());
    const Picture out(photo.size(), 3), whole(photo.size(), 3);
    for (int i = 0; i < kStrips; ++i) {
        warp(interpLinear, turn(photo.size(), angles[static_cast<size_t>(i)]), false, photo, whole);
        const int x = photo.width() * i / kStrips;
        paste(whole, {x, 0}, out, {x, 0}, {photo.width() * (i + 1) / kStrips - x, photo.height()});
    }
    return out;
}

/// A detail of the photograph turned by each interpolation, its pixels enlarged.
Picture magnified(const Picture& photo) {
    using namespace recipes::magnified;
    constexpr auto& names = recipes::magnified::kinds;
    constexpr int kStrips = static_cast<int>(names.size());
    const Picture out(photo.size(), 3), whole(photo.size(), 3);
    for (int i = 0; i < kStrips; ++i) {
        warp(kindOf(names[static_cast<size_t>(i)]), turn(photo.size(), angle), false, photo, whole);
        const int x = photo.width() * i / kStrips;
        const Picture field({photo.width() * (i + 1) / kStrips - x, photo.height()}, 3);
        const double left = photo.width() * corner[1], top = photo.height() * corner[0];
        warp(interpNearest, {{1.0 / zoom, 0, left, 0, 1.0 / zoom, top}}, true, whole, field);
        paste(field, {0, 0}, out, {x, 0}, field.size());
    }
    return out;
}

/// Turned and back, on the left; many times what that changed, on the right.
Picture thereAndBack(const Picture& photo) {
    const Picture there(photo.size(), 3), back(photo.size(), 3), out(photo.size(), 3);
    warp(interpCubic, turn(photo.size(), recipes::thereAndBack::angle), false, photo, there);
    warp(interpCubic, turn(photo.size(), recipes::thereAndBack::angle), true, there, back);
    const Picture more(photo.size(), 3), less(photo.size(), 3);
    const auto subtract = [&](const Picture& a, const Picture& b, const Picture& difference) {
        require(qoriSub_8u_C3RSfs(b.data(), b.step(), a.data(), a.step(), difference.data(), difference.step(),
                                  photo.size(), recipes::thereAndBack::scale));
    };
    subtract(back, photo, more);
    subtract(photo, back, less);
    require(
        qoriAdd_8u_C3RSfs(more.data(), more.step(), less.data(), less.step(), out.data(), out.step(), photo.size(), 0));
    paste(back, {0, 0}, out, {0, 0}, {photo.width() / 2, photo.height()});
    return out;
}

constexpr Panel kPanels[] = {
    {recipes::turned::about, turned, {8, 8}},
    {recipes::magnified::about, magnified, {8, 8}},
    {recipes::thereAndBack::about, thereAndBack, {8, 8}},
};

}  // namespace

std::span<const Panel> warpPanels() { return kPanels; }

}  // namespace demo
