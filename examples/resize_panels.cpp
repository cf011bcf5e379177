// SPDX-License-Identifier: Apache-2.0
#include <array>
#include <string_view>
#include <vector>

#include "panels.h"

namespace demo {
namespace {

enum class Kind { nearest, linear, cubic, lanczos, super, smoothLanczos };

/// The interpolations that a recipe names; one of another name does not compile.
template <size_t n>
consteval std::array<Kind, n> kindsOf(const std::array<const char*, n>& given) {
    constexpr std::string_view names[] = {"nearest",  "linear", "cubic",
                                          "lanczos3", "super",  "lanczos3, antialias=True"};
    std::array<Kind, n> kinds{};
    for (size_t i = 0; i < n; ++i) {
        size_t kind = 0;
        while (names[kind] != given[i]) ++kind;
        kinds[i] = static_cast<Kind>(kind);
    }
    return kinds;
}

/// Plan, initialisation and work buffer of one resize of three channels.
class Resizer {
public:
    Resizer(QorImageSize from, QorImageSize to, Kind kind) : size_(to), kind_(kind) {
        constexpr int32_t interpolations[] = {interpNearest, interpLinear, interpCubic,
                                              interpLanczos, interpSuper,  interpLanczos};
        const bool smooth = kind == Kind::smoothLanczos;
        int32_t planBytes = 0, initBytes = 0, workBytes = 0;
        require(qoriResizeGetSize_8u(from, to, interpolations[static_cast<int>(kind)], smooth, &planBytes, &initBytes));
        plan_.resize(static_cast<size_t>(planBytes));
        std::vector<uint8_t> init(static_cast<size_t>(initBytes));
        switch (kind) {
            case Kind::nearest: require(qoriResizeNearestInit_8u(from, to, plan())); break;
            case Kind::linear: require(qoriResizeLinearInit_8u(from, to, plan())); break;
            case Kind::cubic: require(qoriResizeCubicInit_8u(from, to, 0.0f, 0.5f, plan(), init.data())); break;
            case Kind::lanczos: require(qoriResizeLanczosInit_8u(from, to, 3, plan(), init.data())); break;
            case Kind::super: require(qoriResizeSuperInit_8u(from, to, plan())); break;
            case Kind::smoothLanczos:
                require(qoriResizeAntialiasingLanczosInit(from, to, 3, plan(), init.data()));
                break;
        }
        require(qoriResizeGetBufferSize_8u(plan(), to, 3, &workBytes));
        work_.resize(static_cast<size_t>(workBytes));
    }

    /// The regions have the sizes that the plan was made for.
    void run(const uint8_t* src, int32_t srcStep, uint8_t* dst, int32_t dstStep) {
        const auto with = [&](auto resize, auto... border) {
            require(resize(src, srcStep, dst, dstStep, {0, 0}, size_, border..., plan(), work_.data()));
        };
        constexpr auto edge = static_cast<int32_t>(borderReplicate);
        constexpr const uint8_t* none = nullptr;
        switch (kind_) {
            case Kind::nearest: return with(qoriResizeNearest_8u_C3R);
            case Kind::super: return with(qoriResizeSuper_8u_C3R);
            case Kind::linear: return with(qoriResizeLinear_8u_C3R, edge, none);
            case Kind::cubic: return with(qoriResizeCubic_8u_C3R, edge, none);
            case Kind::lanczos: return with(qoriResizeLanczos_8u_C3R, edge, none);
            case Kind::smoothLanczos: return with(qoriResizeAntialiasing_8u_C3R, edge, none);
        }
    }

private:
    QorResizePlan* plan() { return reinterpret_cast<QorResizePlan*>(plan_.data()); }

    QorImageSize size_;
    Kind kind_;
    std::vector<uint8_t> plan_, work_;
};

/// Calls draw(kind, dst, dstStep, size) for each field of a picture cut into two rows.
template <size_t count, class Draw>
Picture fields(const Picture& photo, const std::array<Kind, count>& kinds, Draw draw) {
    static_assert(count % 2 == 0);
    constexpr int columns = count / 2;
    Picture out(photo.size(), 3);
    for (int i = 0; i < static_cast<int>(count); ++i) {
        const int column = i % columns, x = photo.width() * column / columns;
        const int row = i / columns, y = photo.height() * row / 2;
        const QorImageSize size{photo.width() * (column + 1) / columns - x, photo.height() * (row + 1) / 2 - y};
        draw(kinds[static_cast<size_t>(i)], out.at(x, y), out.step(), size);
    }
    return out;
}

/// A detail, enlarged by each interpolation.
Picture enlarged(const Picture& photo) {
    using namespace recipes::enlarged;
    return fields(photo, kindsOf(kinds), [&](Kind kind, uint8_t* dst, int32_t dstStep, QorImageSize size) {
        const QorImageSize from{size.width / factor, size.height / factor};
        const uint8_t* detail = photo.at((photo.width() - from.width) * left[0] / left[1],
                                         (photo.height() - from.height) * top[0] / top[1]);
        Resizer(from, size, kind).run(detail, photo.step(), dst, dstStep);
    });
}

/// A detail on a part of its width, shown in squares: what aliasing each way leaves.
Picture reduced(const Picture& photo) {
    using namespace recipes::reduced;
    return fields(photo, kindsOf(kinds), [&](Kind kind, uint8_t* dst, int32_t dstStep, QorImageSize size) {
        const QorImageSize to{size.width / factor, size.height / factor}, from{factor * to.width, factor * to.height};
        const Picture small(to, 3);
        const uint8_t* detail =
            photo.at((photo.width() - from.width) * left[0] / left[1], (photo.height() - from.height) / 2);
        Resizer(from, to, kind).run(detail, photo.step(), small.data(), small.step());
        Resizer(to, size, Kind::nearest).run(small.data(), small.step(), dst, dstStep);
    });
}

constexpr Panel kPanels[] = {
    {recipes::enlarged::about, enlarged, {72, 72}},  // Lanczos wants six pixels
    {recipes::reduced::about, reduced, {32, 32}},    // four pixels a field
};

}  // namespace

std::span<const Panel> resizePanels() { return kPanels; }

}  // namespace demo
