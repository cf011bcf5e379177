// SPDX-License-Identifier: Apache-2.0
// What resizes do with numbers at the ends: elements that are not finite, constants under sums of very many taps, and
// work buffers full of garbage.
#include <immintrin.h>

#include <array>
#include <bit>

#include "resize_jobs.h"

namespace qori::test {
namespace {

/// The operations of an element type and layout, in the order of kMethods' kinds.
template <class T, int channels>
struct Operations;

#define QORI_OPERATIONS(T, t, n)                                                               \
    template <>                                                                                \
    struct Operations<T, n> {                                                                  \
        template <class Use>                                                                   \
        static QorResult with(const Method& m, Use use) {                                      \
            if (m.antialiasing) return use(qoriResizeAntialiasing_##t##_C##n##R);              \
            if (m.interpolation == interpNearest) return use(qoriResizeNearest_##t##_C##n##R); \
            if (m.interpolation == interpLinear) return use(qoriResizeLinear_##t##_C##n##R);   \
            if (m.interpolation == interpCubic) return use(qoriResizeCubic_##t##_C##n##R);     \
            if (m.interpolation == interpLanczos) return use(qoriResizeLanczos_##t##_C##n##R); \
            return use(qoriResizeSuper_##t##_C##n##R);                                         \
        }                                                                                      \
    };
#define QORI_LAYOUTS(T, t)   \
    QORI_OPERATIONS(T, t, 1) \
    QORI_OPERATIONS(T, t, 3) \
    QORI_OPERATIONS(T, t, 4)
QORI_LAYOUTS(uint8_t, 8u)
QORI_LAYOUTS(uint16_t, 16u)
QORI_LAYOUTS(int16_t, 16s)
QORI_LAYOUTS(float, 32f)
#undef QORI_LAYOUTS
#undef QORI_OPERATIONS

const Method kSuper{.interpolation = interpSuper};
const std::vector<Method> kPlain = {{.interpolation = interpLinear},
                                    {.interpolation = interpCubic},
                                    {.interpolation = interpLanczos, .lobes = 2},
                                    {.interpolation = interpLanczos, .lobes = 3}};

std::vector<Method> allMethods() {
    std::vector<Method> all{{.interpolation = interpNearest}, kSuper};
    for (Method m : kPlain) {
        all.push_back(m);
        m.antialiasing = true;
        all.push_back(m);
    }
    return all;
}

std::vector<Method> reducingMethods() {
    std::vector<Method> all{kSuper};
    for (Method m : kPlain) {
        m.antialiasing = true;
        all.push_back(m);
    }
    return all;
}

bool fits(const Method& m, QorImageSize src, QorImageSize dst) {
    const int least = m.interpolation == interpLanczos  ? 2 * m.lobes
                      : m.interpolation == interpCubic  ? 4
                      : m.interpolation == interpLinear ? 2
                                                        : 1;
    if (src.width < least || src.height < least) return false;
    return m.interpolation != interpSuper || (src.width >= dst.width && src.height >= dst.height);
}

/// A plan and packed images of one job, whose tiles are made in a work buffer filled as the caller likes.
template <class T, int channels>
struct Bench {
    Job job;
    const QorResizePlan* plan;
    std::vector<T> src, dst;
    std::vector<uint32_t> buffer;

    explicit Bench(const Job& j, T value = T{})
        : job(j),
          plan(makePlan<T>(j.method, j.src, j.dst)),
          src(size_t(j.src.width) * size_t(j.src.height) * channels, value),
          dst(size_t(j.dst.width) * size_t(j.dst.height) * channels) {
        buffer.resize(size_t(bufferBytes(j.dst) + 3) / 4);
    }
    int32_t bufferBytes(QorImageSize tile) const {
        int32_t bytes = -1;
        EXPECT_EQ(QOR_OK, call(Exports<T>::getBufferSize, plan, tile, channels, &bytes));
        return bytes;
    }
    QorResult run(QorImageRect tile) {
        QorPoint2D at{};
        EXPECT_EQ(QOR_OK, Exports<T>::getSrcOffset(plan, {tile.x, tile.y}, &at));
        const T* from = src.data() + (size_t(at.y) * size_t(job.src.width) + size_t(at.x)) * channels;
        T* to = dst.data() + (size_t(tile.y) * size_t(job.dst.width) + size_t(tile.x)) * channels;
        const int32_t pixel = channels * int32_t{sizeof(T)};
        auto* memory = reinterpret_cast<uint8_t*>(buffer.data());
        return Operations<T, channels>::with(job.method, [&](auto function) {
            if constexpr (std::is_invocable_v<decltype(function), const T*, int32_t, T*, int32_t, QorPoint2D,
                                              QorImageSize, const QorResizePlan*, uint8_t*>)
                return function(from, job.src.width * pixel, to, job.dst.width * pixel, {tile.x, tile.y},
                                {tile.width, tile.height}, plan, memory);
            else
                return function(from, job.src.width * pixel, to, job.dst.width * pixel, {tile.x, tile.y},
                                {tile.width, tile.height}, borderReplicate, nullptr, plan, memory);
        });
    }
    QorResult run() { return run({0, 0, job.dst.width, job.dst.height}); }
};

/// Pairs of lengths around the numbers of taps and ratios that have ways of their own.
constexpr int kLengths[][2] = {{5, 3},  {7, 3}, {8, 3},  {6, 3}, {9, 6},  {12, 3},  {13, 4},  {29, 2},  {30, 4},
                               {17, 5}, {6, 7}, {6, 12}, {6, 6}, {41, 3}, {40, 39}, {33, 19}, {300, 1}, {35, 2}};

// --- elements that are not finite -----------------------------------------------------------------------------------

/// The class of a sum is that of the sum of the taps by which it is defined; weights of 0 take part as any other.
template <int channels>
void expectClasses(const Bench<float, channels>& bench) {
    const Job& job = bench.job;
    for (int y = 0; y < job.dst.height; ++y)
        for (int x = 0; x < job.dst.width; ++x)
            for (int c = 0; c < channels; ++c) {
                const auto fetch = [&](int sx, int sy) {
                    sx = std::clamp(sx, 0, job.src.width - 1);
                    sy = std::clamp(sy, 0, job.src.height - 1);
                    return bench.src[size_t((sy * job.src.width + sx) * channels + c)];
                };
                const auto columns = reference::taps(job.method, job.src.width, job.dst.width, x);
                const auto rows = reference::taps(job.method, job.src.height, job.dst.height, y);
                bool isFinite = true;
                for (const auto& row : rows)
                    for (const auto& column : columns) isFinite &= std::isfinite(fetch(column.index, row.index));
                const float actual = bench.dst[size_t((y * job.dst.width + x) * channels + c)];
                ASSERT_EQ(isFinite, std::isfinite(actual)) << "pixel (" << x << ", " << y << "): " << actual;
                if (isFinite || job.method.interpolation != interpSuper) continue;
                const double value = reference::weigh(columns, rows, fetch).value;  // all weights above 0
                if (std::isnan(value))
                    ASSERT_TRUE(std::isnan(actual)) << x << ", " << y;
                else
                    ASSERT_EQ(value, static_cast<double>(actual)) << x << ", " << y;
            }
}

/// Every pixel, row and column of the destination alone, and what is left of a cut at each.
template <int channels>
void expectTilesEqual(Bench<float, channels>& bench) {
    const std::vector<float> whole = bench.dst;
    const int w = bench.job.dst.width, h = bench.job.dst.height;
    std::vector<QorImageRect> tiles;
    for (int x = 0; x < w; ++x) {
        tiles.push_back({x, 0, 1, h});
        tiles.push_back({x, 0, w - x, h});
        tiles.push_back({0, 0, x + 1, h});
        for (int y = 0; y < h; ++y) tiles.push_back({x, y, 1, 1});
    }
    for (int y = 0; y < h; ++y) {
        tiles.push_back({0, y, w, 1});
        tiles.push_back({0, y, w, h - y});
        tiles.push_back({0, 0, w, y + 1});
    }
    for (const QorImageRect& tile : tiles) {
        std::fill(bench.dst.begin(), bench.dst.end(), -7.0f);
        ASSERT_EQ(QOR_OK, bench.run(tile));
        for (int y = 0; y < h; ++y)
            for (int x = 0; x < w; ++x)
                for (int c = 0; c < channels; ++c) {
                    const size_t i = size_t((y * w + x) * channels + c);
                    const bool isInside =
                        x >= tile.x && x < tile.x + tile.width && y >= tile.y && y < tile.y + tile.height;
                    const float expected = isInside ? whole[i] : -7.0f;
                    ASSERT_TRUE(std::bit_cast<uint32_t>(expected) == std::bit_cast<uint32_t>(bench.dst[i]) ||
                                (std::isnan(expected) && std::isnan(bench.dst[i])))
                        << "tile " << tile.x << ", " << tile.y << ", " << tile.width << "x" << tile.height << ", pixel "
                        << x << ", " << y << ": " << bench.dst[i] << " instead of " << expected;
                }
    }
}

template <int channels>
void checkNonFinite(const Job& job, bool everyCut) {
    SCOPED_TRACE(describe(job));
    Bench<float, channels> bench(job);
    constexpr float kInf = INFINITY, kOdd[] = {kInf, -kInf, NAN, 1e-40f};
    const int odd = 1 + random().below(3);
    for (float& p : bench.src) p = static_cast<float>(1 + random().below(100));
    for (int i = 0; i < odd; ++i)
        bench.src[size_t(random().below(static_cast<int>(bench.src.size())))] = kOdd[random().below(4)];
    ASSERT_EQ(QOR_OK, bench.run());
    if (job.method.interpolation != interpNearest) expectClasses(bench);
    if (everyCut) expectTilesEqual(bench);
}

TEST(ResizeNumbers, NothingOutsideAFootprintTakesPart) {
    // The footprint of the first pixel ends at 5/3.
    Bench<float, 1> row({kSuper, {5, 1}, {3, 1}});
    row.src = {1, 1, INFINITY, 5, 5};
    ASSERT_EQ(QOR_OK, row.run());
    EXPECT_FLOAT_EQ(1, row.dst[0]);
    EXPECT_EQ(INFINITY, row.dst[1]);
    EXPECT_FLOAT_EQ(5, row.dst[2]);
    Bench<float, 1> column({kSuper, {1, 5}, {1, 3}});
    column.src = row.src;
    ASSERT_EQ(QOR_OK, column.run());
    EXPECT_EQ(row.dst, column.dst);
    for (const Method& m : allMethods())
        for (const auto& across : kLengths)
            for (int i = 0; i < 4 && !testing::Test::HasFailure(); ++i) {
                const auto& down = kLengths[random().below(sizeof kLengths / sizeof *kLengths)];
                const QorImageSize src{across[0], down[0]}, dst{across[1], down[1]};
                if (!fits(m, src, dst)) continue;
                const bool everyCut = dst.width * dst.height < 100;
                checkNonFinite<1>({m, src, dst}, everyCut);
                checkNonFinite<4>({m, src, dst}, everyCut && i == 0);
                checkNonFinite<3>({m, src, dst}, false);
            }
}

// --- constants ------------------------------------------------------------------------------------------------------

/// Rows of one memory, so that very high images take little.
template <class T, int channels>
void expectConstant(const Method& m, QorImageSize src, QorImageSize dst, T value) {
    const QorResizePlan* plan = makePlan<T>(m, src, dst);
    const std::vector<T> row(size_t(src.width) * channels, value);
    std::vector<T> result(size_t(dst.width) * size_t(dst.height) * channels);
    int32_t bytes = -1;
    ASSERT_EQ(QOR_OK, call(Exports<T>::getBufferSize, plan, dst, channels, &bytes));
    std::vector<uint8_t> buffer(static_cast<size_t>(bytes));
    ASSERT_EQ(QOR_OK, (Operations<T, channels>::with(m, [&](auto function) {
                  return operate<T>(function, row.data(), 0, result.data(), dst.width * channels * int{sizeof(T)},
                                    {0, 0}, dst, borderReplicate, plan, buffer.data());
              })));
    for (T actual : result)
        if constexpr (std::is_same_v<T, float>) {
            const double ulp = static_cast<double>(std::nextafter(value, INFINITY) - value);
            ASSERT_LE(std::abs(static_cast<double>(actual) - static_cast<double>(value)), 4 * ulp) << value;
        } else {
            ASSERT_EQ(value, actual);
        }
}

TEST(ResizeNumbers, ConstantsStay) {
    constexpr int kRatios[][2] = {{3, 2},    {7, 4},    {2, 1},    {5, 2},   {8, 3},   {3, 1},   {4, 1},
                                  {5, 1},    {8, 1},    {11, 1},   {13, 1},  {16, 1},  {24, 1},  {33, 1},
                                  {64, 1},   {100, 1},  {128, 1},  {129, 1}, {288, 1}, {352, 1}, {1001, 3},
                                  {3000, 1}, {178, 23}, {196, 17}, {187, 17}};
    for (const Method& m : reducingMethods())
        for (const auto& r : kRatios) {
            const int times = r[0] / r[1] > 200 ? 1 : 12 / r[0] + 1;
            const QorImageSize src{r[0] * times, r[0] * times}, dst{r[1] * times, r[1] * times};
            SCOPED_TRACE(describe({m, src, dst}));
            const int draws = src.width > 200 ? 1 : dst.width > 16 ? 100 : 20;
            expectConstant<float, 1>(m, src, dst, 65535);
            for (int i = 0; i < draws; ++i)
                expectConstant<float, 1>(m, src, dst, 1 + static_cast<float>(random().below(1 << 23)) * 0x1p-23f);
            expectConstant<float, 3>(m, src, dst, 1e30f / 3);
            expectConstant<uint16_t, 1>(m, src, dst, 65531);
            expectConstant<uint16_t, 4>(m, src, dst, static_cast<uint16_t>(random().below(65536)));
            expectConstant<int16_t, 3>(m, src, dst, -32767);
            expectConstant<uint8_t, 1>(m, src, dst, 255);
            expectConstant<uint8_t, 4>(m, src, dst, static_cast<uint8_t>(random().below(256)));
            if (testing::Test::HasFailure()) return;
        }
    for (const Method& m : reducingMethods()) {
        expectConstant<uint16_t, 1>(m, {30000, 7}, {1, 5}, 65531);
        expectConstant<uint16_t, 1>(m, {7, 30000}, {5, 1}, 65531);
        expectConstant<float, 1>(m, {30000, 7}, {1, 5}, 65535);
        expectConstant<float, 4>(m, {7, 30000}, {5, 1}, 65535);
        if (!m.antialiasing) continue;
        expectConstant<uint16_t, 3>(m, {7, 30000}, {50, 1}, 65531);  // columns before rows
        expectConstant<float, 1>(m, {7, 30000}, {50, 1}, 65535);
    }
}

// --- work buffers ---------------------------------------------------------------------------------------------------

/// Runs under the default register, whose flags then tell whether a subnormal or signalling element was computed on.
template <class T, int channels>
void expectScratchUnread(const Job& job) {
    SCOPED_TRACE(describe(job));
    Bench<T, channels> bench(job);
    for (T& p : bench.src) p = static_cast<T>(1 + random().below(100));
    const int w = job.dst.width, h = job.dst.height;
    const QorImageRect part{w / 3, h / 3, std::max(1, w / 2), 1 + random().below(h - h / 3)};
    for (const QorImageRect& tile : {QorImageRect{0, 0, w, h}, part}) {
        std::vector<T> first;
        for (uint32_t garbage : {1u, 0x7FA00001u, 0x00400000u, 0u}) {
            std::fill(bench.buffer.begin(), bench.buffer.end(), garbage);
            std::memset(bench.dst.data(), 0, bench.dst.size() * sizeof(T));
            constexpr unsigned kDefault = 0x1F80, kInvalid = 1, kSubnormal = 2;
            const unsigned before = _mm_getcsr();
            _mm_setcsr(kDefault);
            const QorResult status = bench.run(tile);
            const unsigned flags = _mm_getcsr() & (kInvalid | kSubnormal);
            _mm_setcsr(before);
            ASSERT_EQ(QOR_OK, status);
            ASSERT_EQ(0u, flags) << "tile " << tile.width << "x" << tile.height << ", garbage " << garbage;
            if (first.empty()) first = bench.dst;
            ASSERT_EQ(0, std::memcmp(first.data(), bench.dst.data(), first.size() * sizeof(T)));
        }
    }
}

template <class T>
void expectScratchUnreadAnywhere(const Method& m) {
    for (int i = 0; i < 60 && !testing::Test::HasFailure(); ++i) {
        const auto& across = kLengths[random().below(sizeof kLengths / sizeof *kLengths)];
        const auto& down = kLengths[random().below(sizeof kLengths / sizeof *kLengths)];
        const int timesX = 1 + random().below(8), timesY = 1 + random().below(4);
        QorImageSize src{across[0] * timesX, down[0] * timesY}, dst{across[1] * timesX, down[1] * timesY};
        if (random().oneIn(2)) src.width += random().below(9);
        if (!fits(m, src, dst)) continue;
        expectScratchUnread<T, 1>({m, src, dst});
        expectScratchUnread<T, 3>({m, src, dst});
        expectScratchUnread<T, 4>({m, src, dst});
    }
    if (!fits(m, {50, 200}, {33, 130})) return;
    expectScratchUnread<T, 1>({m, {50, 200}, {33, 130}});
}

TEST(ResizeNumbers, NothingIsComputedOnTheBuffersGarbage) {
    for (const Method& m : allMethods()) {
        expectScratchUnreadAnywhere<uint8_t>(m);
        expectScratchUnreadAnywhere<uint16_t>(m);
        expectScratchUnreadAnywhere<int16_t>(m);
        expectScratchUnreadAnywhere<float>(m);
    }
}

TEST(ResizeNumbers, WorkMemoryFollowsTheDestination) {
    constexpr int kMany = 1'000'000, kMost = 1 << 19;
    for (const Method& m : allMethods()) {
        if (!fits(m, {6, 6}, {1, 1})) continue;
        int32_t bytes = INT32_MAX;
        for (QorImageSize src : {QorImageSize{6, kMany}, QorImageSize{kMany, 6}}) {
            int32_t planBytes = 0, initBytes = 0;
            ASSERT_EQ(QOR_OK,
                      qoriResizeGetSize_8u(src, {1, 1}, m.interpolation, m.antialiasing, &planBytes, &initBytes));
            std::vector<uint8_t> memory(static_cast<size_t>(planBytes)), init(static_cast<size_t>(initBytes));
            auto* plan = reinterpret_cast<QorResizePlan*>(memory.data());
            ASSERT_EQ(QOR_OK, initPlan<uint8_t>(m, src, {1, 1}, plan, init.data()));
            EXPECT_EQ(QOR_OK, qoriResizeGetBufferSize_8u(plan, {1, 1}, 4, &bytes));
            EXPECT_LT(bytes, kMost) << describe({m, src, {1, 1}});
        }
    }
}

TEST(ResizeNumbers, SmallerTilesTakeNoMoreMemory) {
    for (const Method& m : allMethods())
        for (int i = 0; i < 40; ++i) {
            const auto& across = kLengths[random().below(sizeof kLengths / sizeof *kLengths)];
            const auto& down = kLengths[random().below(sizeof kLengths / sizeof *kLengths)];
            const int times = 1 + random().below(12);
            const QorImageSize src{across[0] * times, down[0] * times}, dst{across[1] * times, down[1] * times};
            if (!fits(m, src, dst)) continue;
            const Bench<float, 3> bench({m, src, dst});
            QorImageSize tile = dst;
            for (int32_t most = bench.bufferBytes(tile); tile.width > 1 || tile.height > 1;) {
                tile = {1 + random().below(tile.width), 1 + random().below(tile.height)};
                const int32_t bytes = bench.bufferBytes(tile);
                ASSERT_LE(bytes, most) << describe({m, src, dst}) << ", " << tile.width << "x" << tile.height;
                most = bytes;
            }
        }
}

}  // namespace
}  // namespace qori::test
