// SPDX-License-Identifier: Apache-2.0
// What must come out exactly: maps of pixels to pixels, border values, positions of any size; and how often rounded
// results are the correctly rounded ones.
#include <bit>
#include <limits>

#include "warp_jobs.h"

namespace qori::test {
namespace {

template <class T, int channels, class Function>
void runWhole(Function function, const WarpJob& job, const TestImage& src, const TestImage& dst) {
    const auto [plan, status] = makeWarpPlan(job, kTypeCode<T>, channels);
    ASSERT_EQ(QOR_OK, status);
    ASSERT_EQ(QOR_OK,
              call(function, static_cast<const T*>(src.data<T>()), src.step(), dst.data<T>(), dst.step(),
                   QorPoint2D{0, 0}, job.dst, static_cast<const QorWarpPlan*>(plan), makeWarpBuffer(plan, job.dst)));
}

/// Source pixels, any bits, at whole positions: column x from (quarter turns of) x plus whole shifts.
template <class T, int channels, class Function>
void expectMoved(Function function, Method method) {
    constexpr int kCosines[] = {1, 0, -1, 0}, kSines[] = {0, 1, 0, -1};
    for (int i = 0; i < 48; ++i) {
        const int turn = i % 4;
        const bool isBackward = i & 4;
        WarpJob job{method, {}, isBackward, {2 + random().below(90), 2 + random().below(90)}, {}, (i / 8) % 2 ? 1 : 0};
        const bool isUpright = turn % 2 == 0;
        job.dst = isUpright ? job.src : QorImageSize{job.src.height, job.src.width};
        // About the middles, with the rounding of sines and of what is added; some shifted on.
        const double angle = turn * std::numbers::pi / 2, c = std::cos(angle), s = std::sin(angle);
        const QorImageSize from = isBackward ? job.dst : job.src, to = isBackward ? job.src : job.dst;
        const double x = (from.width - 1) / 2.0, y = (from.height - 1) / 2.0;
        const int shiftX = random().below(7) - 3, shiftY = random().below(7) - 3;
        job.coeffs = {c, -s, (to.width - 1) / 2.0 - c * x + s * y + shiftX,
                      s, c,  (to.height - 1) / 2.0 - s * x - c * y + shiftY};
        SCOPED_TRACE(describe(job));
        const TestImage src(kWarpSrc, {.width = job.src.width, .height = job.src.height, .padding = 8},
                            channels * int{sizeof(T)});
        src.fill<T>(channels, [] { return random().value<T>(); });
        const TestImage dst(kWarpDst, {.width = job.dst.width, .height = job.dst.height}, channels * int{sizeof(T)});
        runWhole<T, channels>(function, job, src, dst);
        for (int v = 0; v < job.dst.height; ++v)
            for (int u = 0; u < job.dst.width; ++u) {
                // In twice the pixels, so that middles are whole.
                const int co = kCosines[turn], si = kSines[turn];
                int px = 2 * u - (job.dst.width - 1), py = 2 * v - (job.dst.height - 1), qx, qy;
                if (isBackward) {
                    qx = co * px - si * py + 2 * shiftX;
                    qy = si * px + co * py + 2 * shiftY;
                } else {
                    px -= 2 * shiftX;
                    py -= 2 * shiftY;
                    qx = co * px + si * py;
                    qy = -si * px + co * py;
                }
                const int sx = (qx + job.src.width - 1) / 2, sy = (qy + job.src.height - 1) / 2;
                const bool isInside =
                    qx >= 1 - job.src.width && qy >= 1 - job.src.height && sx < job.src.width && sy < job.src.height;
                for (int k = 0; k < channels; ++k) {
                    const T pixel = src.view<T>(channels).get(std::clamp(sx, 0, job.src.width - 1),
                                                              std::clamp(sy, 0, job.src.height - 1), k);
                    const T expected = isInside || job.border == borderReplicate ? pixel : T{};
                    using Bits = std::array<uint8_t, sizeof(T)>;
                    ASSERT_EQ(std::bit_cast<Bits>(expected), std::bit_cast<Bits>(dst.view<T>(channels).get(u, v, k)))
                        << u << ", " << v;
                }
            }
    }
}

constexpr Method kNearest{.interpolation = interpNearest}, kLinear{.interpolation = interpLinear},
    kCubic{.interpolation = interpCubic, .b = 0, .c = 0.5f};

TEST(WarpExact, IdentityShiftsAndQuarterTurnsMovePixels) {
    expectMoved<uint8_t, 1>(qoriWarpAffineNearest_8u_C1R, kNearest);
    expectMoved<uint8_t, 1>(qoriWarpAffineLinear_8u_C1R, kLinear);
    expectMoved<uint8_t, 3>(qoriWarpAffineLinear_8u_C3R, kLinear);
    expectMoved<uint8_t, 4>(qoriWarpAffineCubic_8u_C4R, kCubic);
    expectMoved<uint16_t, 3>(qoriWarpAffineNearest_16u_C3R, kNearest);
    expectMoved<int16_t, 1>(qoriWarpAffineCubic_16s_C1R, kCubic);
    expectMoved<float, 1>(qoriWarpAffineLinear_32f_C1R, kLinear);  // not-a-numbers and infinities too
    expectMoved<float, 3>(qoriWarpAffineCubic_32f_C3R, kCubic);
    expectMoved<double, 1>(qoriWarpAffineLinear_64f_C1R, kLinear);
    expectMoved<double, 3>(qoriWarpAffineNearest_64f_C3R, kNearest);
    expectMoved<double, 4>(qoriWarpAffineCubic_64f_C4R, kCubic);
}

/// Whole positions of a map that has others too.
TEST(WarpExact, PixelsOfWholePositionsInEnlargements) {
    WarpJob job{kLinear, {1.0 / 3, 0, 0, 0, 1.0 / 3, 0}, true, {30, 20}, {88, 58}, borderConstant, {200}};
    const TestImage src(kWarpSrc, {.width = 30, .height = 20}, 1), dst(kWarpDst, {.width = 88, .height = 58}, 1);
    src.fill<uint8_t>(1, drawPixel<uint8_t>);
    runWhole<uint8_t, 1>(qoriWarpAffineLinear_8u_C1R, job, src, dst);
    for (int y = 0; y < 20; ++y)
        for (int x = 0; x < 30; ++x)
            ASSERT_EQ(src.view<uint8_t>(1).get(x, y), dst.view<uint8_t>(1).get(3 * x, 3 * y)) << x << ", " << y;
}

/// Infinities count in windows that hold them, and in no other: beyond the edges windows hold their nearest pixels
/// only.
template <class T, int channels, class Function>
void expectFiniteBeside(Function function, Method method, bool isColumn) {
    constexpr int side = 9, infinite = 3, reach = 6;
    const double shift = -reach - 0.375;  // column x is made of position x - 6.375
    WarpJob job{method,
                {1, 0, isColumn ? shift : 0.25, 0, 1, isColumn ? 0.25 : shift},
                true,
                {side, side},
                {side + 2 * reach, side + 2 * reach},
                borderReplicate};
    SCOPED_TRACE(describe(job));
    const TestImage src(kWarpSrc, {.width = side, .height = side}, channels * int{sizeof(T)});
    const TestImage dst(kWarpDst, {.width = job.dst.width, .height = job.dst.height}, channels * int{sizeof(T)});
    src.fill<T>(channels, [] { return static_cast<T>(random().below(100)); });
    for (int i = 0; i < side; ++i)
        for (int c = 0; c < channels; ++c)
            src.view<T>(channels).set(isColumn ? infinite : i, isColumn ? i : infinite, c,
                                      std::numeric_limits<T>::infinity());
    runWhole<T, channels>(function, job, src, dst);
    const int before = method.interpolation == interpCubic ? 1 : 0, after = before + 1;
    for (int y = 0; y < job.dst.height; ++y)
        for (int x = 0; x < job.dst.width; ++x) {
            const int begin = static_cast<int>(std::floor((isColumn ? x : y) + shift));
            const bool holdsIt = begin - before <= infinite && infinite <= begin + after;
            for (int c = 0; c < channels; ++c)
                ASSERT_EQ(!holdsIt, std::isfinite(dst.view<T>(channels).get(x, y, c))) << x << ", " << y;
        }
}

TEST(WarpExact, InfinitiesStayInTheirWindows) {
    for (bool isColumn : {true, false}) {
        expectFiniteBeside<float, 1>(qoriWarpAffineLinear_32f_C1R, kLinear, isColumn);
        expectFiniteBeside<float, 1>(qoriWarpAffineCubic_32f_C1R, kCubic, isColumn);
        expectFiniteBeside<float, 4>(qoriWarpAffineCubic_32f_C4R, kCubic, isColumn);
        expectFiniteBeside<double, 3>(qoriWarpAffineCubic_64f_C3R, kCubic, isColumn);
    }
}

template <class T, class Function>
void expectBorder(Function function, std::array<double, 4> values, std::array<T, 4> expected) {
    WarpJob job{kNearest, {1, 0, 1000, 0, 1, 0}, true, {9, 9}, {37, 3}, borderConstant, values};
    const TestImage src(kWarpSrc, {.width = 9, .height = 9}, 4 * int{sizeof(T)}),
        dst(kWarpDst, {.width = 37, .height = 3}, 4 * int{sizeof(T)});
    src.fill<T>(4, drawPixel<T>);
    runWhole<T, 4>(function, job, src, dst);
    for (int y = 0; y < 3; ++y)
        for (int x = 0; x < 37; ++x)
            for (int c = 0; c < 4; ++c) EXPECT_EQ(expected[static_cast<size_t>(c)], dst.view<T>(4).get(x, y, c));
}

TEST(WarpExact, BorderValuesAreRoundedAndSaturated) {
    expectBorder<uint8_t>(qoriWarpAffineNearest_8u_C4R, {127.5, 126.5, 300, -1e300}, {128, 126, 255, 0});
    expectBorder<uint8_t>(qoriWarpAffineNearest_8u_C4R, {std::nan(""), INFINITY, 0.5, 254.51}, {0, 255, 0, 255});
    expectBorder<uint16_t>(qoriWarpAffineNearest_16u_C4R, {65534.5, 65535.5, 1.5, -0.6}, {65534, 65535, 2, 0});
    expectBorder<int16_t>(qoriWarpAffineNearest_16s_C4R, {-32768.5, -2.5, 32766.5, 1e9}, {-32768, -2, 32766, 32767});
    expectBorder<float>(qoriWarpAffineNearest_32f_C4R, {0.1, -2.5, 1e300, 1e-40}, {0.1f, -2.5f, INFINITY, 1e-40f});
    expectBorder<double>(qoriWarpAffineNearest_64f_C4R, {0.1, -2.5, 1e300, 1e-310}, {0.1, -2.5, 1e300, 1e-310});
}

/// Nothing is read outside: guard pages are on both sides. Everything is the border value, or a corner.
TEST(WarpExact, PositionsOfAnySize) {
    const Coefficients maps[] = {{1e9, 0, 1e12, 0, 1e9, 1e12},       {1, 0, -1e300, 0, 1, 1e300},
                                 {1e100, 3, -1e300, -3, 1e100, 7e8}, {1e-3, 0, 4294967296.0, 0, 1e-3, -4294967296.0},
                                 {1, 0, 2147483648.0, 0, 1, 0},      {3e8, -5e8, 1 - 4e9, 2e8, 9e8, 1e9}};
    for (const Coefficients& map : maps)
        for (int32_t border : {borderConstant, borderReplicate}) {
            const auto check = [&]<class T, int channels>(auto function, Method method) {
                WarpJob job{method, map, true, {21, 13}, {70, 5}, border};
                SCOPED_TRACE(describe(job));
                const TestImage src(kWarpSrc, {.width = 21, .height = 13, .atBegin = random().oneIn(2)},
                                    channels * int{sizeof(T)}),
                    dst(kWarpDst, {.width = 70, .height = 5}, channels * int{sizeof(T)});
                src.fill<T>(channels, drawPixel<T>);
                runWhole<T, channels>(function, job, src, dst);
                for (int y = 0; y < 5; ++y)
                    for (int x = 0; x < 70; ++x) {
                        const reference::Position p = reference::positionOf(map, true, x, y);
                        if (p.x > -0.5 && p.y > -0.5 && p.x < 20.5 && p.y < 12.5) continue;
                        const int sx = static_cast<int>(std::clamp<reference::Real>(p.x, 0, 20)),
                                  sy = static_cast<int>(std::clamp<reference::Real>(p.y, 0, 12));
                        const bool isCorner = (p.x < -3 || p.x > 23) && (p.y < -3 || p.y > 15);
                        const auto actual = static_cast<double>(dst.view<T>(channels).get(x, y, 0));
                        const auto pixel = static_cast<double>(src.view<T>(channels).get(sx, sy, 0));
                        if (border == borderConstant) {
                            ASSERT_EQ(0, actual);
                        } else if (isCorner) {
                            ASSERT_NEAR(pixel, actual, 1e-6 * std::abs(pixel));
                        }
                    }
            };
            check.template operator()<uint8_t, 1>(qoriWarpAffineNearest_8u_C1R, kNearest);
            check.template operator()<uint8_t, 1>(qoriWarpAffineLinear_8u_C1R, kLinear);
            check.template operator()<uint8_t, 3>(qoriWarpAffineLinear_8u_C3R, kLinear);
            check.template operator()<uint16_t, 3>(qoriWarpAffineLinear_16u_C3R, kLinear);
            check.template operator()<float, 4>(qoriWarpAffineCubic_32f_C4R, kCubic);
            check.template operator()<double, 1>(qoriWarpAffineLinear_64f_C1R, kLinear);
            check.template operator()<double, 3>(qoriWarpAffineCubic_64f_C3R, kCubic);
        }
}

/// Sources of more columns than the words of fixed positions count, or than 19 bits, which go by other kernels, at
/// either end.
TEST(WarpExact, SourcesOfManyColumns) {
    for (int width : {32'767, 32'768, 700'000}) {
        const TestImage src(kWarpSrc, {.width = width, .height = 3}, 3), dst(kWarpDst, {.width = 300, .height = 4}, 3);
        src.fill<uint8_t>(3, drawPixel<uint8_t>);
        const auto check = [&](auto function, Method method) {
            for (double start : {-4.25, width - 280.75, 0.75 * width - 0.5})
                for (int32_t border : {borderConstant, borderReplicate}) {
                    const WarpJob job{
                        method, {1, 0.25, start, 0.005, 0.5, 0.2512}, true, {width, 3}, {300, 4}, border, {50, 60, 70}};
                    SCOPED_TRACE(describe(job));
                    runWhole<uint8_t, 3>(function, job, src, dst);
                    for (int y = 0; y < 4; ++y)
                        for (int x = 0; x < 300; ++x) {
                            const reference::Position p = reference::positionOf(job.coeffs, true, x, y);
                            const bool isInside = p.x >= 0 && p.y >= 0 && p.x <= width - 1 && p.y <= 2;
                            const auto actual = dst.view<uint8_t>(3).get(x, y, 1);
                            if (border == borderConstant && !isInside) {
                                ASSERT_EQ(60, actual) << x << ", " << y;
                                continue;
                            }
                            const auto fetch = [&](int i, int j) -> double {
                                return src.view<uint8_t>(3).get(std::clamp(i, 0, width - 1), std::clamp(j, 0, 2), 1);
                            };
                            const double value = method.interpolation == interpNearest
                                                     ? fetch(static_cast<int>(std::floor(p.x + 0.5)),
                                                             static_cast<int>(std::floor(p.y + 0.5)))
                                                     : std::clamp(reference::mixAt(method, p, fetch).value, 0.0, 255.0);
                            ASSERT_NEAR(value, actual, 0.52) << x << ", " << y;
                        }
                }
        };
        check(qoriWarpAffineNearest_8u_C3R, kNearest);
        check(qoriWarpAffineLinear_8u_C3R, kLinear);
        check(qoriWarpAffineCubic_8u_C3R, kCubic);
    }
}

/// Fixed positions are counted from column 0 of the destination, whatever the tile: at the far end of a row as wide as
/// they serve, and of a wider one, an error of the step between columns has grown to its largest.
TEST(WarpExact, PositionsAtTheEndOfLongRows) {
    for (int width : {65'536, 65'537}) {
        constexpr double kAlong = 0.1 + 1e-7;
        const WarpJob job{kLinear,        {kAlong, 0, -0.5, -kAlong / 700, 1, 19}, true, {7000, 40}, {width, 3},
                          borderReplicate};
        SCOPED_TRACE(describe(job));
        const TestImage src(kWarpSrc, {.width = 7000, .height = 40}, 1),
            dst(kWarpDst, {.width = width, .height = 3}, 1);
        src.fill<uint8_t>(1, drawPixel<uint8_t>);
        runWhole<uint8_t, 1>(qoriWarpAffineLinear_8u_C1R, job, src, dst);
        for (int x = width - 200; x < width; ++x) {
            const reference::Position p = reference::positionOf(job.coeffs, true, x, 1);
            const auto fetch = [&](int i, int j) -> double { return src.view<uint8_t>(1).get(i, j); };
            ASSERT_NEAR(reference::mixAt(kLinear, p, fetch).value, dst.view<uint8_t>(1).get(x, 1), 0.52) << x;
        }
    }
}

/// Noise, turned: the share of elements that are the correctly rounded ones.
template <int channels, class Function>
double shareRight(Function function, Method method) {
    const double c = std::cos(0.26), s = std::sin(0.26);
    const WarpJob job{method, {c, -s, 40.3, s, c, -20.1}, true, {200, 200}, {180, 160}, borderReplicate};
    const TestImage src(kWarpSrc, {.width = 200, .height = 200}, channels),
        dst(kWarpDst, {.width = 180, .height = 160}, channels);
    src.fill<uint8_t>(channels, drawPixel<uint8_t>);
    runWhole<uint8_t, channels>(function, job, src, dst);
    int right = 0, all = 0;
    for (int y = 0; y < 160; ++y)
        for (int x = 0; x < 180; ++x) {
            const reference::Position p = reference::positionOf(job.coeffs, true, x, y);
            const reference::Mixed mixed = reference::mixAt(method, p, [&](int i, int j) -> double {
                return src.view<uint8_t>(channels).get(std::clamp(i, 0, 199), std::clamp(j, 0, 199), 0);
            });
            const double rounded = std::clamp(std::nearbyint(mixed.value), 0.0, 255.0);
            const int actual = dst.view<uint8_t>(channels).get(x, y, 0);
            EXPECT_LE(std::abs(actual - rounded), 1);
            right += actual == rounded;
            ++all;
        }
    return static_cast<double>(right) / all;
}

/// 99.6 % for linear bytes, with a deviation of 0.04 % over so many.
TEST(WarpExact, NearlyAllBytesAreCorrectlyRounded) {
    EXPECT_GT(shareRight<1>(qoriWarpAffineLinear_8u_C1R, kLinear), 0.994);
    EXPECT_GT(shareRight<3>(qoriWarpAffineLinear_8u_C3R, kLinear), 0.994);
    EXPECT_GT(shareRight<1>(qoriWarpAffineCubic_8u_C1R, kCubic), 0.999);
    EXPECT_GT(shareRight<4>(qoriWarpAffineCubic_8u_C4R, kCubic), 0.999);
}

}  // namespace
}  // namespace qori::test
