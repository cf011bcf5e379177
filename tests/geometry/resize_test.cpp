// SPDX-License-Identifier: Apache-2.0
#include <array>
#include <bit>

#include "resize_jobs.h"

namespace qori::test {
namespace {

using reference::Tap;

/// A source with memory beyond it on the open sides only, as wide as the filter reaches.
template <class T, int channels>
struct Source {
    Job job;
    int left, top;
    TestImage image;

    explicit Source(const Job& j)
        : job(j),
          left(j.open(borderReadLeft) ? reachX() : 0),
          top(j.open(borderReadTop) ? reachY() : 0),
          image(kSrc, shape(), channels * int{sizeof(T)}) {
        image.fill<T>(channels, drawPixel<T>);
    }
    int reachX() const { return reference::halfWidth(job.method, job.src.width, job.dst.width); }
    int reachY() const { return reference::halfWidth(job.method, job.src.height, job.dst.height); }
    Shape shape() const {
        return {.width = job.src.width + left + (job.open(borderReadRight) ? reachX() : 0),
                .height = job.src.height + top + (job.open(borderReadBottom) ? reachY() : 0),
                .padding = random().below(3) * random().below(40),
                .flipped = random().oneIn(3),
                .atBegin = random().oneIn(2),
                .shift = random().below(3)};
    }
    const T* pixel(int x, int y) const {
        return reinterpret_cast<const T*>(image.data<uint8_t>() + ptrdiff_t{image.step()} * (top + y) +
                                          ptrdiff_t{int{sizeof(T)} * channels} * (left + x));
    }
    T get(int x, int y, int c) const {
        if (!job.open(borderReadLeft)) x = std::max(x, 0);
        if (!job.open(borderReadRight)) x = std::min(x, job.src.width - 1);
        if (!job.open(borderReadTop)) y = std::max(y, 0);
        if (!job.open(borderReadBottom)) y = std::min(y, job.src.height - 1);
        return image.view<T>(channels).get(left + x, top + y, c);
    }
};

/// Exact for nearest and linear 8u, else within rounding and the error of the sums.
template <class T, class Fetch>
void expectPixel(const Job& job, const std::vector<Tap>& columns, const std::vector<Tap>& rows, Fetch fetch, T actual) {
    if (job.method.interpolation == interpNearest) {
        const T expected = fetch(columns[0].index, rows[0].index);
        using Bits = std::array<uint8_t, sizeof(T)>;
        EXPECT_EQ(std::bit_cast<Bits>(expected), std::bit_cast<Bits>(actual));
        return;
    }
    if constexpr (std::is_same_v<T, uint8_t>)
        if (job.method.interpolation == interpLinear && !job.method.antialiasing) {
            EXPECT_EQ(reference::linear8u(columns, rows, fetch), actual);
            return;
        }
    const reference::Weighted w = reference::weigh(columns, rows, fetch);
    const double unit = std::is_same_v<T, double> ? 0x1p-53 : 0x1p-24;
    if constexpr (std::is_floating_point_v<T>) {
        EXPECT_LE(std::abs(static_cast<double>(actual) - w.value), w.error * unit);
    } else {
        const double value = std::clamp<double>(w.value, std::numeric_limits<T>::min(), std::numeric_limits<T>::max());
        double bound = 0.5 + w.error * unit;
        if (sizeof(T) == 1 && reference::inUnits(job.method, job.src, job.dst, columns.size(), rows.size()))
            bound += reference::errorOfUnits(columns, rows);
        EXPECT_LE(std::abs(actual - value), bound) << "expected about " << value << ", got " << +actual;
    }
}

template <class T, int channels>
void expectImage(const Source<T, channels>& source, const TestImage& dst) {
    const Job& job = source.job;
    std::vector<std::vector<Tap>> columns;
    for (int x = 0; x < job.dst.width; ++x)
        columns.push_back(reference::taps(job.method, job.src.width, job.dst.width, x));
    for (int y = 0; y < job.dst.height; ++y) {
        const std::vector<Tap> rows = reference::taps(job.method, job.src.height, job.dst.height, y);
        for (int x = 0; x < job.dst.width; ++x)
            for (int c = 0; c < channels; ++c) {
                expectPixel<T>(
                    job, columns[static_cast<size_t>(x)], rows, [&](int sx, int sy) { return source.get(sx, sy, c); },
                    dst.view<T>(channels).get(x, y, c));
                if (testing::Test::HasFailure()) FAIL() << "at pixel (" << x << ", " << y << ") channel " << c;
            }
    }
}

/// A work buffer of exactly the size that a tile takes.
template <class T>
uint8_t* makeBuffer(const QorResizePlan* plan, QorImageSize tile, int channels) {
    int32_t bytes = -1;
    EXPECT_EQ(QOR_OK, call(Exports<T>::getBufferSize, plan, tile, channels, &bytes));
    return block(kBuffer, bytes, random().below(64)).template data<uint8_t>();
}

/// The bounding box of what a destination rectangle is made of.
QorImageRect tapBox(const Job& job, QorImageRect dst) {
    const auto ends = [&](int srcLength, int dstLength, int from, int count, int& first, int& length) {
        first = std::max(0, reference::taps(job.method, srcLength, dstLength, from).front().index);
        length =
            std::min(srcLength - 1, reference::taps(job.method, srcLength, dstLength, from + count - 1).back().index) -
            first + 1;
    };
    QorImageRect box;
    ends(job.src.width, job.dst.width, dst.x, dst.width, box.x, box.width);
    ends(job.src.height, job.dst.height, dst.y, dst.height, box.y, box.height);
    return box;
}

/// Makes a tile from a copy of the source rectangle that the query reports, and of nothing else.
template <class T, int channels, class Function>
void runTileAlone(Function function, const Source<T, channels>& source, const TestImage& dst, QorImageRect tile,
                  const QorResizePlan* plan) {
    const Job& job = source.job;
    QorImageRect from, trimmed;
    ASSERT_EQ(QOR_OK, call(Exports<T>::getSrcRoi, plan, tile, &from, &trimmed));
    ASSERT_EQ(0, std::memcmp(&tile, &trimmed, sizeof tile));
    const QorImageRect box = tapBox(job, tile);
    ASSERT_EQ(0, std::memcmp(&box, &from, sizeof box));
    QorPoint2D at;
    ASSERT_EQ(QOR_OK, call(Exports<T>::getSrcOffset, plan, QorPoint2D{tile.x, tile.y}, &at));
    ASSERT_EQ(int64_t{tile.x} * job.src.width / job.dst.width, at.x);
    ASSERT_EQ(int64_t{tile.y} * job.src.height / job.dst.height, at.y);
    const TestImage part(
        kTileSrc,
        {.width = from.width, .height = from.height, .padding = random().below(9), .atBegin = random().oneIn(2)},
        channels * int{sizeof(T)});
    for (int y = 0; y < from.height; ++y)
        for (int x = 0; x < from.width; ++x)
            for (int c = 0; c < channels; ++c)
                part.view<T>(channels).set(x, y, c, source.get(from.x + x, from.y + y, c));
    constexpr ptrdiff_t pixel = int{sizeof(T)} * channels;
    const auto* src = part.data<uint8_t>() + ptrdiff_t{part.step()} * (at.y - from.y) + pixel * (at.x - from.x);
    auto* to = dst.data<uint8_t>() + ptrdiff_t{dst.step()} * tile.y + pixel * tile.x;
    const QorImageSize size{tile.width, tile.height};
    ASSERT_EQ(QOR_OK,
              operate<T>(function, reinterpret_cast<const T*>(src), part.step(), reinterpret_cast<T*>(to), dst.step(),
                         {tile.x, tile.y}, size, job.border, plan, makeBuffer<T>(plan, size, channels)));
}

/// A random partition of the destination, in random order.
std::vector<QorImageRect> tiling(QorImageSize size) {
    const auto cuts = [](int length) {
        std::vector<int> at{0};
        while (at.back() < length) at.push_back(std::min(length, at.back() + 1 + random().below(length)));
        return at;
    };
    const std::vector<int> xs = cuts(size.width), ys = cuts(size.height);
    std::vector<QorImageRect> tiles;
    for (size_t j = 0; j + 1 < ys.size(); ++j)
        for (size_t i = 0; i + 1 < xs.size(); ++i)
            tiles.insert(tiles.begin() + random().below(static_cast<int>(tiles.size()) + 1),
                         {xs[i], ys[j], xs[i + 1] - xs[i], ys[j + 1] - ys[j]});
    return tiles;
}

template <class T, int channels, class Function>
void checkJob(Function function, const Job& job) {
    SCOPED_TRACE(describe(job));
    const Source<T, channels> source(job);
    const Snapshot sourceBefore = source.image.snapshot();
    const QorResizePlan* plan = makePlan<T>(job.method, job.src, job.dst);
    const TestImage dst(kDst,
                        {.width = job.dst.width,
                         .height = job.dst.height,
                         .padding = random().below(20),
                         .flipped = random().oneIn(3),
                         .atBegin = random().oneIn(2)},
                        channels * int{sizeof(T)});
    const Snapshot untouched = dst.snapshot();
    ASSERT_EQ(QOR_OK, operate<T>(function, source.pixel(0, 0), source.image.step(), dst.data<T>(), dst.step(), {0, 0},
                                 job.dst, job.border, plan, makeBuffer<T>(plan, job.dst, channels)));
    expectImage(source, dst);
    QORI_EXPECT_UNCHANGED(source.image, sourceBefore);
    // In tiles, cleared first: the same bytes, and none around them.
    Snapshot whole = dst.snapshot();
    dst.fill<T>(channels, [] { return T{}; });
    for (const QorImageRect& tile : tiling(job.dst)) {
        if (job.border == borderReplicate) {
            runTileAlone<T, channels>(function, source, dst, tile, plan);
            continue;
        }
        QorPoint2D at;
        ASSERT_EQ(QOR_OK, call(Exports<T>::getSrcOffset, plan, QorPoint2D{tile.x, tile.y}, &at));
        const QorImageSize size{tile.width, tile.height};
        auto* to = dst.data<uint8_t>() + ptrdiff_t{dst.step()} * tile.y + ptrdiff_t{int{sizeof(T)} * channels} * tile.x;
        ASSERT_EQ(QOR_OK, operate<T>(function, source.pixel(at.x, at.y), source.image.step(), reinterpret_cast<T*>(to),
                                     dst.step(), {tile.x, tile.y}, size, job.border, plan,
                                     makeBuffer<T>(plan, size, channels)));
    }
    QORI_EXPECT_UNCHANGED(dst, whole);
    Snapshot cleared = whole;
    const auto blank = cleared.view<T>(channels), before = const_cast<Snapshot&>(untouched).view<T>(channels);
    for (int y = 0; y < job.dst.height; ++y)
        for (int x = 0; x < job.dst.width; ++x)
            for (int c = 0; c < channels; ++c) blank.set(x, y, c, before.get(x, y, c));
    EXPECT_EQ(untouched.bytes, cleared.bytes) << "written around the destination";
}

/// Pairs of lengths: every ratio of small ones, powers and near-powers of two, the vector sizes, reductions by a lot.
QorImageSize drawLengths(int least, bool reducesOnly) {
    static constexpr int kFixed[][2] = {{2, 1}, {3, 2}, {1, 2}, {3, 1}, {4, 1}, {5, 4}, {1, 1}, {9, 1}, {2, 3}};
    int src, dst;
    if (random().oneIn(2)) {
        const auto& fixed = kFixed[random().below(9)];
        const int times = 1 + random().below(random().oneIn(4) ? 60 : 12);
        src = fixed[0] * times;
        dst = fixed[1] * times;
    } else {
        src = 1 + random().below(random().oneIn(4) ? 400 : 40);
        dst = 1 + random().below(random().oneIn(4) ? 150 : 40);
    }
    src = std::max(src, least);
    return {src, reducesOnly ? std::min(src, dst) : dst};
}

int leastLength(Method method) {
    return method.interpolation == interpLanczos  ? 2 * method.lobes
           : method.interpolation == interpCubic  ? 4
           : method.interpolation == interpLinear ? 2
                                                  : 1;
}

Job drawJob(Method method) {
    const int least = leastLength(method);
    const bool reduces = method.interpolation == interpSuper;
    const QorImageSize x = drawLengths(least, reduces);
    QorImageSize y = drawLengths(least, reduces);
    while (y.width > 90) y = drawLengths(least, reduces);
    Job job{method, {x.width, y.width}, {x.height, std::min(y.height, 90)}};
    const bool bordered = method.interpolation != interpNearest && !reduces;
    if (bordered && random().oneIn(2))
        job.border = random().oneIn(4) ? borderReadAll : borderReplicate | 16 * random().below(16);
    return job;
}

/// The initialiser and the queries by which a compared image was made.
template <class T>
void markUsed(const Method& m) {
    const std::string kind = m.interpolation == interpNearest  ? "Nearest"
                             : m.interpolation == interpLinear ? "Linear"
                             : m.interpolation == interpCubic  ? "Cubic"
                             : m.interpolation == interpSuper  ? "Super"
                                                               : "Lanczos";
    const std::string type = std::string("_") + Exports<T>::suffix;
    markSwept(m.antialiasing ? ("qoriResizeAntialiasing" + kind + "Init").c_str()
                             : ("qoriResize" + kind + "Init" + type).c_str());
    for (const char* query : {"GetBufferSize", "GetSrcOffset", "GetSrcRoi"})
        markSwept(("qoriResize" + (query + type)).c_str());
}

/// Wide enough for rows to be done in several strips.
Job drawWideJob(Method method) {
    const bool reduces = method.interpolation == interpSuper;
    int32_t src = 3000 + random().below(6000), dst = 2500 + random().below(2500);
    if (random().oneIn(2)) {  // ratios that have ways of their own
        const int half = 2100 + random().below(500), from = 2 + random().below(3);
        dst = 2 * half;
        src = from * half;
    }
    return {method, {src, 6 + random().below(3)}, {reduces ? std::min(src, dst) : dst, 1 + random().below(6)}};
}

/// A row or two of every width around the vectors, at ratios that have ways of their own and at odd ones in turn.
constexpr int kEveryWidth = 70;

Job widthJob(Method method, int width, int turn) {
    static constexpr int kRatios[][2] = {{2, 1}, {3, 2}, {1, 2}, {7, 5}, {1, 1}, {5, 7}, {4, 1}};
    const auto& ratio = kRatios[static_cast<size_t>(turn) % std::size(kRatios)];
    const int height = 1 + turn % 2, least = leastLength(method);
    const auto sourceOf = [&](int length) { return std::max((length * ratio[0] + ratio[1] - 1) / ratio[1], least); };
    QorImageSize src{sourceOf(width), sourceOf(height)};
    if (method.interpolation == interpSuper) src = {std::max(src.width, width), std::max(src.height, height)};
    return {method, src, {width, height}};
}

void expectEach(std::initializer_list<std::pair<QorResult, QorResult>> expectedAndActual) {
    int i = 0;
    for (const auto& [expected, actual] : expectedAndActual) EXPECT_EQ(expected, actual) << "refusal " << i++;
}

/// What every member refuses, with its output left alone.
template <class T, int channels, class Function>
void expectRefusals(Function function, const Method& method) {
    const QorImageSize size{12, 15};
    const TestImage src(kSrc, {.width = 20, .height = 20}, channels * int{sizeof(T)}),
        dst(kDst, {.width = size.width, .height = size.height}, channels * int{sizeof(T)});
    const Snapshot before = dst.snapshot();
    const T* s = src.data<T>();
    T* d = dst.data<T>();
    const auto run = [&](const T* from, T* to, const QorResizePlan* plan, uint8_t* buffer, QorPoint2D at = {0, 0},
                         QorImageSize tile = {12, 15}, int32_t border = borderReplicate) {
        return operate<T>(function, from, src.step(), to, dst.step(), at, tile, border, plan, buffer);
    };
    // A plan of another kind, and one whose tag is not that of a plan.
    const Method other{.interpolation = interpLinear, .antialiasing = !method.antialiasing};
    const QorResizePlan* plan = makePlan<T>(other, {20, 20}, size);
    uint8_t* buffer = makeBuffer<T>(plan, size, channels);
    expectEach({{QOR_ERR_UNSUPPORTED_MODE, run(s, d, plan, buffer)}});
    if constexpr (!std::is_same_v<T, double>) {
        plan = makePlan<T>({.interpolation = method.interpolation == interpNearest ? interpSuper : interpNearest},
                           {20, 20}, size);
        expectEach({{QOR_ERR_UNSUPPORTED_MODE, run(s, d, plan, buffer)}});
    }
    QorResizePlan* own = makePlan<T>(method, {20, 20}, size);
    buffer = makeBuffer<T>(own, size, channels);
    expectEach({{QOR_ERR_NULL_PTR, run(nullptr, d, own, buffer)},
                {QOR_ERR_NULL_PTR, run(s, nullptr, own, buffer)},
                {QOR_ERR_NULL_PTR, run(s, d, nullptr, buffer)},
                {QOR_ERR_NULL_PTR, run(s, d, own, nullptr)},
                {QOR_WARN_NOTHING_TO_DO, run(s, d, own, buffer, {0, 0}, {0, 15})},
                {QOR_ERR_SIZE, run(s, d, own, buffer, {0, 0}, {12, -1})},
                {QOR_ERR_OUT_OF_RANGE, run(s, d, own, buffer, {12, 0})},
                {QOR_ERR_OUT_OF_RANGE, run(s, d, own, buffer, {0, -1})}});
    if (method.interpolation != interpNearest && method.interpolation != interpSuper)
        expectEach({{QOR_ERR_BORDER, run(s, d, own, buffer, {0, 0}, size, borderReplicate | 8)},
                    {QOR_ERR_UNSUPPORTED_MODE, run(s, d, own, buffer, {0, 0}, size, 0xF0)}});
    auto* tag = reinterpret_cast<uint32_t*>((reinterpret_cast<uintptr_t>(own) + 63) & ~uintptr_t{63});
    EXPECT_EQ(0x4B617389u, *tag);
    *tag ^= 1u << random().below(32);
    expectEach({{QOR_ERR_CONTEXT, run(s, d, own, buffer)}});
    QORI_EXPECT_UNCHANGED(dst, before);
}

template <class T, int channels, class Function>
void sweep(const char* name, Function function, const std::vector<Method>& methods, int jobs) {
    constexpr int kWide = 4;
    for (int i = 0; i < jobs + kWide && !testing::Test::HasFailure(); ++i) {
        const Method& method = methods[static_cast<size_t>(i) % methods.size()];
        checkJob<T, channels>(function, i < jobs ? drawJob(method) : drawWideJob(method));
    }
    for (int width = 1; width <= kEveryWidth; ++width)
        for (int turn : {2 * width, 2 * width + 1})
            checkJob<T, channels>(function, widthJob(methods[static_cast<size_t>(turn) % methods.size()], width, turn));
    expectRefusals<T, channels>(function, methods[0]);
    markSwept(name);
    for (const Method& m : methods) markUsed<T>(m);
}

constexpr float kThird = 1.0f / 3;
const std::vector<Method> kCubics = {{.interpolation = interpCubic, .b = 0, .c = 0.5f},
                                     {.interpolation = interpCubic, .b = 1, .c = 0},
                                     {.interpolation = interpCubic, .b = 0.5f, .c = 0.3f},
                                     {.interpolation = interpCubic, .b = kThird, .c = kThird},
                                     {.interpolation = interpCubic, .b = 4000, .c = -3000}};  // sums leave 32 bits
const std::vector<Method> kLanczoses = {{.interpolation = interpLanczos, .lobes = 2},
                                        {.interpolation = interpLanczos, .lobes = 3}};

std::vector<Method> antialiasingMethods() {
    std::vector<Method> all = kCubics;
    all.insert(all.end(), kLanczoses.begin(), kLanczoses.end());
    all.push_back({.interpolation = interpLinear});
    for (Method& m : all) m.antialiasing = true;
    return all;
}

// What each operation of the registry is swept with; a new one does not compile until it is here.
#define QORI_METHODS(operation, methods, jobs)             \
    template <class T, int channels, class Function>       \
    void operation(const char* name, Function function) {  \
        sweep<T, channels>(name, function, methods, jobs); \
    }
QORI_METHODS(resizeNearest, {Method{.interpolation = interpNearest}}, 240)
QORI_METHODS(resizeLinear, {Method{.interpolation = interpLinear}}, 240)
QORI_METHODS(resizeCubic, kCubics, 160)
QORI_METHODS(resizeLanczos, kLanczoses, 160)
QORI_METHODS(resizeSuper, {Method{.interpolation = interpSuper}}, 200)
QORI_METHODS(resizeAntialiasing, antialiasingMethods(), 210)
#undef QORI_METHODS

#define QORI_SWEEP_(...)
#define QORI_SWEEP_R(name, operation, S, SL) \
    TEST(ResizeSweep, name) { operation<S, channels(Layout::SL)>(#name, &name); }
#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) QORI_SWEEP_##kind(name, operation, S, SL)
#include "members/resize.inc"
#undef QORI_MEMBER
#undef QORI_SWEEP_
#undef QORI_SWEEP_R

// --- queries --------------------------------------------------------------------------------------------------------

template <class T>
class ResizeQueries : public testing::Test {};
using Elements = testing::Types<uint8_t, uint16_t, int16_t, float, double>;
TYPED_TEST_SUITE(ResizeQueries, Elements);

TYPED_TEST(ResizeQueries, PlanSizesFollowTheirFormulas) {
    using E = Exports<TypeParam>;
    const auto sizes = [](QorImageSize dst, int32_t interpolation) {
        std::pair<int32_t, int32_t> result{-1, -1};
        EXPECT_EQ(QOR_OK,
                  call(E::getSize, QorImageSize{4000, 4000}, dst, interpolation, 0, &result.first, &result.second));
        return result;
    };
    using Pair = std::pair<int32_t, int32_t>;
    const QorImageSize odd{33, 65};  // rounded up: 64 and 96
    EXPECT_EQ(Pair(4 * 160 + 244, 64), sizes(odd, interpNearest));
    EXPECT_EQ(Pair(8 * 160 + 244, 64), sizes(odd, interpLinear));
    EXPECT_EQ(Pair(4 * 160 + 4 * (256 + 384) + 244, 4 * 160 + 64), sizes(odd, interpCubic));
    EXPECT_EQ(Pair(4 * 160 + 4 * (384 + 576) + 244, 4 * 160 + 64), sizes(odd, interpLanczos));
    EXPECT_EQ(Pair(4 * 64 + 4 * (128 + 128) + 244, 4 * 64 + 64), sizes({1, 1}, interpCubic));
    EXPECT_EQ(Pair(8 * 4000 * 2 + 244, 64), sizes({4000, 4000}, interpLinear));
    markSwept((std::string("qoriResizeGetSize_") + E::suffix).c_str());
}

TYPED_TEST(ResizeQueries, RefusesSizesBeyond32Bits) {
    using E = Exports<TypeParam>;
    int32_t plan = 7, init = 7;
    const auto status = [&](QorImageSize dst, int32_t interpolation, int32_t antialiasing) {
        return call(E::getSize, QorImageSize{1 << 29, 1 << 29}, dst, interpolation, antialiasing, &plan, &init);
    };
    // 8 * (W + H) + 244 reaches 2^31 at W + H = 2^28 - 30; lengths count in steps of 32.
    EXPECT_EQ(QOR_ERR_SIZE, status({(1 << 28) - 32, 1}, interpLinear, 0));
    EXPECT_EQ(QOR_ERR_SIZE, status({1 << 29, 1 << 29}, interpNearest, 0));
    EXPECT_EQ(QOR_ERR_SIZE, status({1 << 27, 1}, interpCubic, 0));
    EXPECT_EQ(QOR_ERR_SIZE, status({4, 1 << 28}, interpLanczos, 0));
    EXPECT_EQ(QOR_ERR_SIZE, status({1 << 10, 1 << 10}, interpLanczos, 1));  // 12 taps per source pixel
    EXPECT_EQ(7, plan);
    EXPECT_EQ(7, init);
    EXPECT_EQ(QOR_OK, status({(1 << 28) - 96, 1}, interpLinear, 0));
    EXPECT_EQ(8 * ((1 << 28) - 64) + 244, plan);
}

TEST(Resize, RefusesWorkBuffersBeyond32Bits) {
    // 80 bytes per pixel of four floats.
    const QorImageSize dst{27'000'000, 1};
    int32_t planBytes = 0, initBytes = 0, bytes = 7;
    ASSERT_EQ(QOR_OK, qoriResizeGetSize_32f({4, 1}, dst, interpNearest, 0, &planBytes, &initBytes));
    std::vector<uint8_t> memory(static_cast<size_t>(planBytes));
    auto* plan = reinterpret_cast<QorResizePlan*>(memory.data());
    ASSERT_EQ(QOR_OK, qoriResizeNearestInit_32f({4, 1}, dst, plan));
    EXPECT_EQ(QOR_ERR_SIZE, qoriResizeGetBufferSize_32f(plan, dst, 4, &bytes));
    EXPECT_EQ(7, bytes);
    EXPECT_EQ(QOR_OK, qoriResizeGetBufferSize_32f(plan, dst, 3, &bytes));
    EXPECT_LT(1'500'000'000, bytes);
    // So wide that the bytes of a row wrap in 32 bits. The tables would take 1 GB; the record alone is changed.
    constexpr int32_t kWide = 1 << 28;
    auto* record = reinterpret_cast<int32_t*>((reinterpret_cast<uintptr_t>(plan) + 63) & ~uintptr_t{63});
    std::replace(record, record + 40, dst.width, kWide);
    EXPECT_EQ(QOR_ERR_SIZE, qoriResizeGetBufferSize_32f(plan, {kWide, 1}, 4, &bytes));
    EXPECT_EQ(QOR_ERR_SIZE, qoriResizeGetBufferSize_32f(plan, {kWide, 1}, 1, &bytes));
}

TYPED_TEST(ResizeQueries, BordersAreTheReachOfTheFilter) {
    using E = Exports<TypeParam>;
    const auto expectBorder = [](const Method& m, QorImageSize src, QorImageSize dst) {
        QorBorderExtent border{-1, -1, -1, -1};
        EXPECT_EQ(QOR_OK, call(E::getBorderSize, makePlan<TypeParam>(m, src, dst), &border));
        const int x = reference::halfWidth(m, src.width, dst.width),
                  y = reference::halfWidth(m, src.height, dst.height);
        EXPECT_TRUE(border.left == x && border.right == x && border.top == y && border.bottom == y) << m.interpolation;
    };
    expectBorder({.interpolation = interpLinear}, {60, 50}, {20, 90});
    expectBorder({.interpolation = interpLinear, .antialiasing = true}, {60, 50}, {20, 90});
    expectBorder({.interpolation = interpCubic, .antialiasing = true}, {61, 50}, {20, 19});
    expectBorder({.interpolation = interpLanczos, .antialiasing = true, .lobes = 3}, {61, 50}, {20, 19});
    if constexpr (!std::is_same_v<TypeParam, double>) {
        expectBorder({.interpolation = interpNearest}, {60, 50}, {20, 90});
        expectBorder({.interpolation = interpSuper}, {60, 50}, {20, 30});
        expectBorder({.interpolation = interpCubic}, {60, 50}, {20, 90});
        for (int lobes : {2, 3}) expectBorder({.interpolation = interpLanczos, .lobes = lobes}, {60, 50}, {20, 90});
    }
    markSwept((std::string("qoriResizeGetBorderSize_") + E::suffix).c_str());
}

TEST(Resize, IdentityMovesPixels) {
    for (int32_t interpolation : {interpNearest, interpLinear, interpCubic, interpLanczos, interpSuper}) {
        const Job job{{.interpolation = interpolation}, {37, 9}, {37, 9}};
        const Source<uint8_t, 3> source(job);
        const QorResizePlan* plan = makePlan<uint8_t>(job.method, job.src, job.dst);
        const TestImage dst(kDst, {.width = 37, .height = 9}, 3);
        const auto run = [&](auto function) {
            return operate<uint8_t>(function, source.pixel(0, 0), source.image.step(), dst.data<uint8_t>(), dst.step(),
                                    {0, 0}, job.dst, job.border, plan, makeBuffer<uint8_t>(plan, job.dst, 3));
        };
        EXPECT_EQ(QOR_OK, interpolation == interpNearest  ? run(qoriResizeNearest_8u_C3R)
                          : interpolation == interpLinear ? run(qoriResizeLinear_8u_C3R)
                          : interpolation == interpCubic  ? run(qoriResizeCubic_8u_C3R)
                          : interpolation == interpSuper  ? run(qoriResizeSuper_8u_C3R)
                                                          : run(qoriResizeLanczos_8u_C3R));
        for (int y = 0; y < 9; ++y)
            for (int x = 0; x < 37; ++x)
                for (int c = 0; c < 3; ++c)
                    ASSERT_EQ(source.get(x, y, c), dst.view<uint8_t>(3).get(x, y, c)) << interpolation;
    }
}

TEST(Resize, MeansOfFourRoundTiesToEven) {
    // Every sum of four bytes, in 8u and in the wider type whose plan takes the general way.
    const QorImageSize src{2 * 1021, 2}, dst{1021, 1};
    const TestImage bytes(kSrc, {.width = src.width, .height = 2}, 1),
        words(kTileSrc, {.width = src.width, .height = 2}, 2);
    for (int x = 0; x < src.width; ++x)
        for (int y = 0; y < 2; ++y) {
            const int sum = x / 2, place = 2 * y + x % 2, value = (sum + place) / 4;
            bytes.view<uint8_t>(1).set(x, y, 0, static_cast<uint8_t>(value));
            words.view<uint16_t>(1).set(x, y, 0, static_cast<uint16_t>(value));
        }
    const TestImage means(kDst, {.width = dst.width, .height = 1}, 1),
        wide(kPlanCopy, {.width = dst.width, .height = 1}, 2);
    const Method method{.interpolation = interpSuper};
    const QorResizePlan* plan = makePlan<uint8_t>(method, src, dst);
    ASSERT_EQ(QOR_OK,
              operate<uint8_t>(qoriResizeSuper_8u_C1R, bytes.data<uint8_t>(), bytes.step(), means.data<uint8_t>(),
                               means.step(), {0, 0}, dst, 0, plan, makeBuffer<uint8_t>(plan, dst, 1)));
    plan = makePlan<uint16_t>(method, src, dst);
    ASSERT_EQ(QOR_OK,
              operate<uint16_t>(qoriResizeSuper_16u_C1R, words.data<uint16_t>(), words.step(), wide.data<uint16_t>(),
                                wide.step(), {0, 0}, dst, 0, plan, makeBuffer<uint16_t>(plan, dst, 1)));
    for (int sum = 0; sum <= 1020; ++sum) {
        const int whole = sum / 4, rest = sum % 4, expected = whole + (rest == 3 || (rest == 2 && whole % 2 == 1));
        ASSERT_EQ(expected, means.view<uint8_t>(1).get(sum, 0)) << sum;
        ASSERT_EQ(expected, wide.view<uint16_t>(1).get(sum, 0)) << sum;
    }
}

TEST(Resize, CubicIsExactWhereItsWeightsAre) {
    // At quarters of a pixel the weights are multiples of 1/128: sums in double, and theirs, have no error.
    const auto fetch = [](const Source<uint8_t, 3>& source, int c) {
        return [&source, c](int x, int y) { return source.get(x, y, c); };
    };
    const QorImageSize sizes[] = {{120, 60}, {30, 15}, {90, 45}};
    for (QorImageSize src : sizes) {
        const Job job{{.interpolation = interpCubic}, src, {60, 30}};
        const Source<uint8_t, 3> source(job);
        const TestImage dst(kDst, {.width = 60, .height = 30}, 3);
        const QorResizePlan* plan = makePlan<uint8_t>(job.method, job.src, job.dst);
        ASSERT_EQ(QOR_OK, operate<uint8_t>(qoriResizeCubic_8u_C3R, source.pixel(0, 0), source.image.step(),
                                           dst.data<uint8_t>(), dst.step(), {0, 0}, job.dst, job.border, plan,
                                           makeBuffer<uint8_t>(plan, job.dst, 3)));
        for (int y = 0; y < 30; ++y)
            for (int x = 0; x < 60; ++x)
                for (int c = 0; c < 3; ++c) {
                    const double value =
                        reference::weigh(reference::taps(job.method, src.width, 60, x),
                                         reference::taps(job.method, src.height, 30, y), fetch(source, c))
                            .value;
                    ASSERT_EQ(std::nearbyint(std::clamp(value, 0.0, 255.0)), dst.view<uint8_t>(3).get(x, y, c));
                }
    }
}

}  // namespace
}  // namespace qori::test
