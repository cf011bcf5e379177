// SPDX-License-Identifier: Apache-2.0
// Palettes and tables by levels, and ladders of the number of levels and of pixels.
#include <algorithm>
#include <cmath>
#include <limits>
#include <memory>
#include <numeric>

#include "unary_row.h"

namespace qori::bench {
namespace {

Row withSmall(Row row) {
    row.sizes.push_back(kSmall);
    return row;
}

/// A table of entries that no operation could compute.
template <class D>
std::shared_ptr<std::vector<D>> noise(size_t entries) {
    auto table = std::make_shared<std::vector<D>>(entries);
    uint32_t state = 7;
    for (D& entry : *table) entry = static_cast<D>((state = state * 1664525u + 1013904223u) >> 8);
    return table;
}

/// Spreads a byte of noise over 16 bits.
uint16_t spread(uint16_t v) { return static_cast<uint16_t>(v * 40'503u); }
float toUnit(float v) { return v / 256; }

/// The plain loop has the table's address in a register, as a user's loop would.
template <class S, class D, class Function>
Row paletteRow(std::string name, Function function, double bestAtL2 = 0, double bestAtFrame = 0) {
    constexpr int bits = 8 * sizeof(S);
    const auto table = noise<D>(size_t{1} << bits);
    const auto make = [=](Size size) {
        const Image<S> src(size, 1);
        const Image<D> dst(size, 1);
        for (int y = 0; sizeof(S) == 2 && y < size.height; ++y)
            for (int x = 0; x < size.width; ++x) src.row(y)[x] = static_cast<S>(spread(src.row(y)[x]));
        return Contenders{
            [=] { must(function(src.data(), src.step(), dst.data(), dst.step(), size.roi(), table->data(), bits)); },
            [=] {
                const D* const entries = table->data();
                const int width = size.width, height = size.height;
                for (int y = 0; y < height; ++y) {
                    const S* const s = src.row(y);
                    D* const d = dst.row(y);
                    for (int x = 0; x < width; ++x) d[x] = entries[s[x]];
                    keep(d);
                }
            },
            {}};
    };
    return withSmall({.operation = std::move(name),
                      .bytesPerPixel = sizeof(S) + sizeof(D),
                      .sizes = kSizes,
                      .make = make,
                      .bestAtL2 = bestAtL2,
                      .bestAtFrame = bestAtFrame});
}

/// Three channels; plain takes them in turn.
Row paletteOfColours() {
    const auto table = noise<uint8_t>(3 * 256);
    const auto make = [=](Size size) {
        const Image<uint8_t> src(size, 3), dst(size, 3);
        return Contenders{
            [=] {
                const uint8_t* const tables[3] = {table->data(), &(*table)[256], &(*table)[512]};
                must(qoriLUTPalette_8u_C3R(src.data(), src.step(), dst.data(), dst.step(), size.roi(), tables, 8));
            },
            [=] {
                const uint8_t *const red = table->data(), *const green = red + 256, *const blue = red + 512;
                const int bytes = 3 * size.width, height = size.height;
                for (int y = 0; y < height; ++y) {
                    const uint8_t* const s = src.row(y);
                    uint8_t* const d = dst.row(y);
                    for (int x = 0; x < bytes; x += 3) {
                        d[x] = red[s[x]];
                        d[x + 1] = green[s[x + 1]];
                        d[x + 2] = blue[s[x + 2]];
                    }
                    keep(d);
                }
            },
            {}};
    };
    return {.operation = "LUT palette 8u C3", .bytesPerPixel = 6, .sizes = kSizes, .make = make};
}

/// Levels spaced evenly over the elements, and values beside them.
template <class L>
struct Levels {
    std::vector<L> levels, values;

    Levels(int count, double span) {
        for (int k = 0; k < count; ++k) {
            levels.push_back(static_cast<L>(span * k / (count - 1)));
            values.push_back(static_cast<L>(span * std::pow(double(k) / (count - 1), 0.8)));
        }
    }
    int32_t count() const { return static_cast<int32_t>(levels.size()); }
};

template <class T>
constexpr double kSpan = std::is_floating_point_v<T> ? 1 : 1 << 8 * sizeof(T) % 32;

/// What a user writes: the first interval that holds the element.
template <class T, class L>
T plainStep(T v, const L* levels, const L* values, int count) {
    for (int k = 0; k < count - 1; ++k)
        if (levels[k] <= v && v < levels[k + 1]) return static_cast<T>(values[k]);
    return v;
}
template <class T, class L>
T plainLine(T v, const L* levels, const L* values, int count) {
    for (int k = 0; k < count - 1; ++k)
        if (levels[k] <= v && v < levels[k + 1])
            return static_cast<T>(values[k] + double(v - levels[k]) * double(values[k + 1] - values[k]) /
                                                  (levels[k + 1] - levels[k]));
    return v;
}

/// The plain loop of cubics draws lines too: what it gives is not compared.
constexpr double kNotCompared = std::numeric_limits<double>::infinity();

template <class T, class L, class Function>
Row levelRow(const std::string& name, int count, Function function, bool isLine, double within = 0) {
    const auto table = std::make_shared<Levels<L>>(count, kSpan<T>);
    T (*prepare)(T) = nullptr;
    if constexpr (sizeof(T) == 2) prepare = spread;
    if constexpr (sizeof(T) == 4) prepare = toUnit;
    const auto ours = [=](auto... a) {
        return function(a..., table->values.data(), table->levels.data(), table->count());
    };
    const std::string fullName = name + ", " + std::to_string(count) + " levels";
    const auto row = [&](auto plain) {
        return withSmall(unaryRow<T, T>(
            fullName, 1, ours,
            [=, levels = table->levels.data(), values = table->values.data()](T v) {
                return plain(v, levels, values, count);
            },
            0, 0, prepare, within));
    };
    return isLine ? row([](auto... a) { return plainLine(a...); }) : row([](auto... a) { return plainStep(a...); });
}

const Rows rows{{
    paletteRow<uint8_t, uint8_t>("LUT palette 8u C1", qoriLUTPalette_8u_C1R, 13'874, 10'639),
    paletteRow<uint8_t, uint32_t>("LUT palette 8u32u C1", qoriLUTPalette_8u32u_C1R),
    paletteRow<uint16_t, uint16_t>("LUT palette 16u C1", qoriLUTPalette_16u_C1R),
    paletteRow<uint16_t, uint8_t>("LUT palette 16u8u C1", qoriLUTPalette_16u8u_C1R),
    paletteOfColours(),
    levelRow<uint8_t, int32_t>("LUT step 8u C1", 5, qoriLUT_8u_C1R, false),
    levelRow<uint8_t, int32_t>("LUT cubic 8u C1", 8, qoriLUT_Cubic_8u_C1R, true, kNotCompared),
    levelRow<uint16_t, int32_t>("LUT step 16u C1", 5, qoriLUT_16u_C1R, false),
    levelRow<uint16_t, int32_t>("LUT step 16u C1", 16, qoriLUT_16u_C1R, false),
    levelRow<uint16_t, int32_t>("LUT linear 16u C1", 16, qoriLUT_Linear_16u_C1R, true, 1),
    levelRow<float, float>("LUT step 32f C1", 5, qoriLUT_32f_C1R, false),
    levelRow<float, float>("LUT step 32f C1", 16, qoriLUT_32f_C1R, false),
    levelRow<float, float>("LUT step 32f C1", 256, qoriLUT_32f_C1R, false),
    levelRow<float, float>("LUT linear 32f C1", 16, qoriLUT_Linear_32f_C1R, true, 1e-6),
    levelRow<float, float>("LUT cubic 32f C1", 16, qoriLUT_Cubic_32f_C1R, true, kNotCompared),
}};

// --- ladders --------------------------------------------------------------------------------------------------------

const std::vector<int> kCounts = {2,  3,  4,   5,   8,   9,   15,  16,   17,   18,  32,
                                  33, 64, 128, 256, 257, 258, 512, 1024, 1026, 4096};
const std::vector<int> kSides = {16, 23, 32, 45, 56, 63, 64, 65, 72, 91, 128, 256};

template <class T, class L, class Function>
Step levelStep(int count, int side, double units, Function function) {
    const auto table = std::make_shared<Levels<L>>(count, kSpan<T>);
    const Image<T> src({side, side}, 1), dst({side, side}, 1);
    for (int y = 0; y < side; ++y)
        for (int x = 0; x < side; ++x)
            src.row(y)[x] = sizeof(T) == 2 ? static_cast<T>(spread(static_cast<uint16_t>(src.row(y)[x])))
                                           : static_cast<T>(src.row(y)[x] / 256);
    return {std::to_string(side) + "^2, " + std::to_string(count), units, [=] {
                must(function(src.data(), src.step(), dst.data(), dst.step(), QorImageSize{side, side},
                              table->values.data(), table->levels.data(), table->count()));
            }};
}

template <class T, class L, class Function>
Ladder countLadder(std::string operation, int side, Function function, std::string reason = {}) {
    return {
        std::move(operation),
        [=] {
            std::vector<Step> steps;
            for (int count : kCounts)
                steps.push_back(levelStep<T, L>(count, side, double(side) * side * (2 + std::log2(count)), function));
            return steps;
        },
        std::move(reason)};
}
template <class T, class L, class Function>
Ladder sideLadder(std::string operation, int count, Function function, std::string reason = {}) {
    return {std::move(operation),
            [=] {
                std::vector<Step> steps;
                for (int side : kSides) steps.push_back(levelStep<T, L>(count, side, double(side) * side, function));
                return steps;
            },
            std::move(reason)};
}

const Ladders ladders{
    {countLadder<float, float>("LUT step 32f, levels", 128, qoriLUT_32f_C1R),
     countLadder<float, float>("LUT cubic 32f, levels", 128, qoriLUT_Cubic_32f_C1R),
     countLadder<uint16_t, int32_t>("LUT step 16u, levels, 32 x 32", 32, qoriLUT_16u_C1R),
     countLadder<uint16_t, int32_t>("LUT step 16u, levels, 128 x 128", 128, qoriLUT_16u_C1R),
     countLadder<uint16_t, int32_t>("LUT linear 16u, levels, 64 x 64", 64, qoriLUT_Linear_16u_C1R),
     countLadder<uint16_t, int32_t>("LUT cubic 16u, levels, 64 x 64", 64, qoriLUT_Cubic_16u_C1R),
     sideLadder<uint16_t, int32_t>("LUT step 16u of 64 levels, squares", 64, qoriLUT_16u_C1R),
     sideLadder<uint16_t, int32_t>("LUT linear 16u of 64 levels, squares", 64, qoriLUT_Linear_16u_C1R)}};

}  // namespace
}  // namespace qori::bench
