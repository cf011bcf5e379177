// SPDX-License-Identifier: Apache-2.0
// The ways of resizing against each other and, where they are exact, against the definition.
#include "resize_jobs.h"

namespace qori::test {
namespace {

template <class T>
struct Operations;
#define QORI_OPERATIONS(T, t)                                                                              \
    template <>                                                                                            \
    struct Operations<T> {                                                                                 \
        using Function = decltype(&qoriResizeLinear_##t##_C1R);                                            \
        static Function of(const Method& m, int channels) {                                                \
            static constexpr Function all[3][3] = {                                                        \
                {qoriResizeLinear_##t##_C1R, qoriResizeLinear_##t##_C3R, qoriResizeLinear_##t##_C4R},      \
                {qoriResizeCubic_##t##_C1R, qoriResizeCubic_##t##_C3R, qoriResizeCubic_##t##_C4R},         \
                {qoriResizeLanczos_##t##_C1R, qoriResizeLanczos_##t##_C3R, qoriResizeLanczos_##t##_C4R}};  \
            const int kind = m.interpolation == interpLinear ? 0 : m.interpolation == interpCubic ? 1 : 2; \
            return all[kind][channels == 1 ? 0 : channels - 2];                                            \
        }                                                                                                  \
    };
QORI_OPERATIONS(uint8_t, 8u)
QORI_OPERATIONS(uint16_t, 16u)
QORI_OPERATIONS(int16_t, 16s)
QORI_OPERATIONS(float, 32f)
#undef QORI_OPERATIONS

template <class T>
struct Pixels {
    QorImageSize size;
    int channels;
    std::vector<T> elements = std::vector<T>(static_cast<size_t>(size.width) * static_cast<size_t>(size.height) *
                                             static_cast<size_t>(channels));

    int32_t step() const { return size.width * channels * int32_t{sizeof(T)}; }
    T& at(int x, int y, int c) { return elements[static_cast<size_t>((ptrdiff_t{y} * size.width + x) * channels + c)]; }
};

/// The whole image, or it in two tiles side by side.
template <class T>
Pixels<T> resized(const Method& m, const Pixels<T>& src, QorImageSize size, int32_t cut) {
    const QorResizePlan* plan = makePlan<T>(m, src.size, size);
    int32_t bytes = 0;
    EXPECT_EQ(QOR_OK, call(Exports<T>::getBufferSize, plan, size, src.channels, &bytes));
    const TestImage buffer = block(kBuffer, bytes, random().below(64));
    Pixels<T> dst{size, src.channels};
    for (int32_t x = 0; x < size.width; x += cut) {
        QorPoint2D from{};
        EXPECT_EQ(QOR_OK, call(Exports<T>::getSrcOffset, plan, QorPoint2D{x, 0}, &from));
        EXPECT_EQ(QOR_OK, operate<T>(Operations<T>::of(m, src.channels), &src.elements[size_t(from.x * src.channels)],
                                     src.step(), &dst.at(x, 0, 0), dst.step(), {x, 0},
                                     {std::min(cut, size.width - x), size.height}, borderReplicate, plan,
                                     buffer.template data<uint8_t>()));
    }
    return dst;
}

template <class T>
class ResizeWays : public testing::Test {};
using Elements = testing::Types<uint8_t, uint16_t, int16_t, float>;
TYPED_TEST_SUITE(ResizeWays, Elements);

/// Packed channels go other ways than planes do, and their sums are the same bits.
TYPED_TEST(ResizeWays, ChannelsBecomeWhatTheirPlanesBecome) {
    using T = TypeParam;
    const Method methods[] = {{.interpolation = interpLinear},
                              {.interpolation = interpCubic, .c = 0.75f},
                              {.interpolation = interpCubic, .b = 1.0f / 3, .c = 1.0f / 3},
                              {.interpolation = interpLanczos, .lobes = 2},
                              {.interpolation = interpLanczos, .lobes = 3}};
    const QorImageSize sizes[][2] = {{{90, 30}, {60, 20}},   {{97, 31}, {61, 23}},  {{40, 12}, {97, 31}},
                                     {{80, 9}, {20, 9}},     {{7, 6}, {33, 7}},     {{33, 17}, {2, 3}},
                                     {{64, 8}, {64, 16}},    {{6, 70}, {1, 9}},     {{1400, 7}, {2350, 9}},
                                     {{5000, 9}, {2811, 6}}, {{960, 6}, {1920, 7}}, {{1920, 6}, {1280, 5}},
                                     {{2100, 7}, {1200, 3}}};
    for (const Method& m : methods)
        for (const auto& [from, to] : sizes)
            for (int channels : {3, 4}) {
                SCOPED_TRACE(describe({m, from, to}) + ", channels " + std::to_string(channels));
                Pixels<T> src{from, channels};
                for (T& element : src.elements) {
                    element = drawPixel<T>();
                    if constexpr (std::is_same_v<T, float>) element = static_cast<float>(random().below(4000)) / 7;
                }
                Pixels<T> packed = resized(m, src, to, random().oneIn(2) ? to.width : 1 + random().below(to.width));
                for (int c = 0; c < channels; ++c) {
                    Pixels<T> plane{from, 1};
                    for (int y = 0; y < from.height; ++y)
                        for (int x = 0; x < from.width; ++x) plane.at(x, y, 0) = src.at(x, y, c);
                    Pixels<T> alone = resized(m, plane, to, to.width);
                    for (int y = 0; y < to.height; ++y)
                        for (int x = 0; x < to.width; ++x)
                            ASSERT_EQ(alone.at(x, y, 0), packed.at(x, y, c)) << x << ", " << y << ", channel " << c;
                }
            }
}

/// Rows of alike groups of linear 8u, which end where their memory does.
TEST(Resize, LinearRowsOfSimpleRatiosStayInTheirRows) {
    constexpr QorImageSize kSizes[][2] = {
        {{300, 2}, {600, 3}}, {{451, 2}, {902, 3}}, {{450, 3}, {600, 2}}, {{333, 2}, {1332, 4}}, {{903, 3}, {602, 2}}};
    const Method m{.interpolation = interpLinear};
    for (const auto& [from, to] : kSizes)
        for (int channels : {1, 3, 4}) {
            Pixels<uint8_t> src{from, channels};
            for (uint8_t& element : src.elements) element = drawPixel<uint8_t>();
            const Pixels<uint8_t> expected = resized(m, src, to, to.width);
            const auto bytes = static_cast<int>(src.elements.size());
            const TestImage guarded = block(kSrc, bytes, 0);
            std::copy(src.elements.begin(), src.elements.end(), guarded.data<uint8_t>());
            const QorResizePlan* plan = makePlan<uint8_t>(m, from, to);
            int32_t size = 0;
            ASSERT_EQ(QOR_OK, call(qoriResizeGetBufferSize_8u, plan, to, channels, &size));
            const TestImage buffer = block(kBuffer, size, 0);
            Pixels<uint8_t> dst{to, channels};
            ASSERT_EQ(QOR_OK, operate<uint8_t>(Operations<uint8_t>::of(m, channels), guarded.data<uint8_t>(),
                                               src.step(), dst.elements.data(), dst.step(), {0, 0}, to, borderReplicate,
                                               plan, buffer.data<uint8_t>()));
            EXPECT_EQ(expected.elements, dst.elements) << describe({m, from, to}) << ", channels " << channels;
        }
}

/// Rows of nearest pixels by tables and without, and tables whose later lanes span more than the first ones do.
template <class T, class Operation>
void expectNearest(Operation operation, int channels, int32_t width, int32_t height) {
    constexpr int32_t kWidth = 3'000;
    const QorImageSize from{kWidth, 1}, to{width, height};
    Pixels<T> src{from, channels};
    for (T& element : src.elements) element = drawPixel<T>();
    const QorResizePlan* plan = makePlan<T>({.interpolation = interpNearest}, from, to);
    int32_t bytes = 0;
    EXPECT_EQ(QOR_OK, call(Exports<T>::getBufferSize, plan, to, channels, &bytes));
    const TestImage buffer = block(kBuffer, bytes, 0);
    Pixels<T> dst{to, channels};
    EXPECT_EQ(QOR_OK, call(operation, src.elements.data(), src.step(), dst.elements.data(), dst.step(),
                           QorPoint2D{0, 0}, to, plan, buffer.template data<uint8_t>()));
    for (int y = 0; y < height; ++y)
        for (int x = 0; x < width; ++x)
            for (int c = 0; c < channels; ++c)
                ASSERT_EQ(src.at(static_cast<int>((x + 0.5) * kWidth / width - 1e-10), 0, c), dst.at(x, y, c))
                    << "width " << width << ", height " << height << ", " << x << ", channel " << c;
}

TEST(Resize, NearestIsTheSameWithTablesAndWithout) {
    for (int32_t width = 40; width < 9'000; width += 1 + width / 23)
        for (int32_t height : {1, 3, 4, 7}) {
            expectNearest<uint8_t>(qoriResizeNearest_8u_C1R, 1, width, height);
            expectNearest<uint8_t>(qoriResizeNearest_8u_C3R, 3, width, height);
            expectNearest<uint8_t>(qoriResizeNearest_8u_C4R, 4, width, height);
            expectNearest<uint16_t>(qoriResizeNearest_16u_C1R, 1, width, height);
            expectNearest<uint16_t>(qoriResizeNearest_16u_C3R, 3, width, height);
            expectNearest<uint16_t>(qoriResizeNearest_16u_C4R, 4, width, height);
            expectNearest<float>(qoriResizeNearest_32f_C3R, 3, width, height);
            expectNearest<float>(qoriResizeNearest_32f_C4R, 4, width, height);
        }
}

/// Enlarging by 64 meets every odd multiple of 1/128 in both directions, and 64 rows between the same two.
TEST(Resize, LinearIsExactAtShortWeights) {
    const QorImageSize from{23, 4}, to{23 * 64, 4 * 64};
    const Method m{.interpolation = interpLinear};
    std::vector<std::vector<reference::Tap>> columns;
    for (int x = 0; x < to.width; ++x) columns.push_back(reference::taps(m, from.width, to.width, x));
    for (int channels : {1, 3, 4}) {
        Pixels<uint8_t> src{from, channels};
        for (uint8_t& element : src.elements) element = drawPixel<uint8_t>();
        Pixels<uint8_t> dst = resized(m, src, to, to.width);
        for (int y = 0; y < to.height; ++y) {
            const std::vector<reference::Tap> rows = reference::taps(m, from.height, to.height, y);
            for (int x = 0; x < to.width; ++x)
                for (int c = 0; c < channels; ++c) {
                    const auto fetch = [&](int sx, int sy) {
                        return src.at(std::clamp(sx, 0, from.width - 1), std::clamp(sy, 0, from.height - 1), c);
                    };
                    ASSERT_EQ(reference::linear8u(columns[static_cast<size_t>(x)], rows, fetch), dst.at(x, y, c))
                        << x << ", " << y << ", channel " << c << " of " << channels;
                }
        }
    }
}

/// Every width about those at which rows are held in registers, in tiles, against guard pages at both ends.
TEST(Resize, NarrowLinearIsExact) {
    const Method m{.interpolation = interpLinear};
    for (int32_t width = 2; width <= 18; ++width)
        for (int32_t target : {1, 3, 7, 8, 9, 15, 16, 17, 25, 31, 32, 33, 40}) {
            const QorImageSize from{width, 2 + random().below(6)}, to{target, 1 + random().below(15)};
            SCOPED_TRACE(describe({m, from, to}));
            const QorResizePlan* plan = makePlan<uint8_t>(m, from, to);
            const TestImage src = block(kSrc, from.width * from.height, random().below(2) * 5);
            auto* const pixels = src.data<uint8_t>();
            for (int i = 0; i < from.width * from.height; ++i) pixels[i] = drawPixel<uint8_t>();
            const int32_t cut = random().oneIn(2) ? to.width : 1 + random().below(to.width);
            const QorImageSize tile{cut, to.height};
            int32_t bytes = 0;
            ASSERT_EQ(QOR_OK, call(qoriResizeGetBufferSize_8u, plan, tile, 1, &bytes));
            const TestImage buffer = block(kBuffer, bytes, 0);
            const auto fetch = [&](int x, int y) {
                return pixels[std::clamp(y, 0, from.height - 1) * from.width + std::clamp(x, 0, from.width - 1)];
            };
            for (int32_t x0 = 0; x0 < to.width; x0 += cut) {
                const QorImageSize size{std::min(cut, to.width - x0), to.height};
                QorPoint2D at{};
                ASSERT_EQ(QOR_OK, call(qoriResizeGetSrcOffset_8u, plan, QorPoint2D{x0, 0}, &at));
                const TestImage dst = block(kDst, size.width * size.height, 0);
                ASSERT_EQ(QOR_OK,
                          operate<uint8_t>(qoriResizeLinear_8u_C1R, pixels + at.x, from.width, dst.data<uint8_t>(),
                                           size.width, {x0, 0}, size, borderReplicate, plan, buffer.data<uint8_t>()));
                for (int y = 0; y < size.height; ++y)
                    for (int x = 0; x < size.width; ++x)
                        ASSERT_EQ(reference::linear8u(reference::taps(m, from.width, to.width, x0 + x),
                                                      reference::taps(m, from.height, to.height, y), fetch),
                                  dst.data<uint8_t>()[y * size.width + x])
                            << x0 + x << ", " << y;
            }
        }
}

}  // namespace
}  // namespace qori::test
