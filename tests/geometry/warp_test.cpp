// SPDX-License-Identifier: Apache-2.0
// Every member against the reference, whole and in tiles, at any angle, scale and border.
#include <bit>

#include "warp_jobs.h"

namespace qori::test {
namespace {

using reference::Position;

/// Nearer than this to where a pixel begins or the source ends, either side is right.
constexpr double kTouch = 1e-6;

bool isIn(Position p, QorImageSize size, double margin) {
    return p.x >= -margin && p.y >= -margin && p.x <= size.width - 1 + margin && p.y <= size.height - 1 + margin;
}

template <class T>
T borderElement(double v) {
    if constexpr (std::is_floating_point_v<T>) return static_cast<T>(v);
    return static_cast<T>(
        std::nearbyint(std::clamp<double>(v, std::numeric_limits<T>::min(), std::numeric_limits<T>::max())));
}

template <class T>
bool hasSameBits(T a, T b) {
    using Bits = std::array<uint8_t, sizeof(T)>;
    return std::bit_cast<Bits>(a) == std::bit_cast<Bits>(b);
}

/// Whether an element is what interpolation at a position gives.
template <class T, class Fetch>
bool isRight(const WarpJob& job, Position at, Fetch fetch, T actual) {
    if (job.method.interpolation == interpNearest) {
        for (double dy : {-kTouch, kTouch})
            for (double dx : {-kTouch, kTouch}) {
                const auto x = static_cast<int>(std::floor(at.x + 0.5 + dx)),
                           y = static_cast<int>(std::floor(at.y + 0.5 + dy));
                if (hasSameBits(fetch(x, y), actual)) return true;
            }
        return false;
    }
    const reference::Mixed mixed =
        reference::mixAt(job.method, at, [&](int x, int y) { return static_cast<double>(fetch(x, y)); });
    const double gain = std::max(1.0, mixed.gain / 2), value = static_cast<double>(actual);
    if constexpr (std::is_same_v<T, float>) {
        const auto largest = static_cast<float>(mixed.largestTap);
        const double unit = std::nextafter(largest, INFINITY) - largest;
        return std::abs(value - mixed.value) <= 4 * unit * gain;
    } else if constexpr (std::is_same_v<T, double>) {
        return std::abs(value - mixed.value) <= 4e-11 * mixed.largestTap * gain;
    } else {
        // Linear bytes: fractions of 16 and 15 bits, two roundings of 2^-8.
        const double ofWeights = job.method.interpolation == interpLinear ? 0.02 : 0.001;
        const double error = (sizeof(T) == 1 ? ofWeights : 0.1) * gain;
        const double held =
            std::clamp<double>(mixed.value, std::numeric_limits<T>::min(), std::numeric_limits<T>::max());
        return std::abs(value - held) <= 0.5 + error;
    }
}

template <class T, int channels>
void expectImage(const WarpJob& job, const WarpSource<T, channels>& source, Snapshot before, const TestImage& dst) {
    const auto old = before.view<T>(channels), now = dst.view<T>(channels);
    const bool clampsOutside = job.border == borderReplicate;
    for (int y = 0; y < job.dst.height; ++y)
        for (int x = 0; x < job.dst.width; ++x) {
            Position p = reference::positionOf(job.coeffs, job.isBackward, x, y);
            const bool mayBeIn = clampsOutside || isIn(p, job.src, kTouch), mayBeOut = !isIn(p, job.src, -kTouch);
            // Beyond the edge the nearest pixels go on and on.
            const Position clamped{std::clamp<reference::Real>(p.x, -4, job.src.width + 3),
                                   std::clamp<reference::Real>(p.y, -4, job.src.height + 3)};
            bool isGood = mayBeIn, isOther = mayBeOut && !clampsOutside;
            for (int c = 0; c < channels; ++c) {
                const T actual = now.get(x, y, c);
                const T other = job.border == borderConstant ? borderElement<T>(job.borderValue[static_cast<size_t>(c)])
                                                             : old.get(x, y, c);
                isOther = isOther && hasSameBits(other, actual);
                isGood = isGood && isRight<T>(
                                       job, clamped, [&](int i, int j) { return source.get(i, j, c); }, actual);
            }
            if (!isGood && !isOther)
                FAIL() << "pixel (" << x << ", " << y << ") at " << static_cast<double>(p.x) << ", "
                       << static_cast<double>(p.y) << ", first element " << +now.get(x, y, 0);
        }
}

/// A random partition of the destination.
std::vector<QorImageRect> warpTiles(QorImageSize size) {
    std::vector<QorImageRect> tiles;
    for (int y = 0; y < size.height;) {
        const int height = std::min(size.height - y, 1 + random().below(size.height));
        for (int x = 0; x < size.width;) {
            const int width = std::min(size.width - x, 1 + random().below(size.width));
            tiles.insert(tiles.begin() + random().below(static_cast<int>(tiles.size()) + 1), {x, y, width, height});
            x += width;
        }
        y += height;
    }
    return tiles;
}

template <class T, int channels, class Function>
void checkWarp(Function function, const WarpJob& job, const WarpSource<T, channels>& source, ReadAt<T> at) {
    SCOPED_TRACE(describe(job));
    const Snapshot sourceBefore = source.image.snapshot();
    const auto [plan, status] = makeWarpPlan(job, kTypeCode<T>, channels);
    ASSERT_TRUE(status == QOR_OK || (status == QOR_WARN_WARP_EMPTY && job.readsAll())) << status;
    const TestImage dst(kWarpDst,
                        {.width = job.dst.width,
                         .height = job.dst.height,
                         .padding = WarpSource<T, channels>::padding(),
                         .flipped = random().oneIn(3),
                         .atBegin = random().oneIn(2)},
                        channels * int{sizeof(T)});
    const Snapshot clean = dst.snapshot();
    dst.fill<T>(channels, drawPixel<T>);
    const Snapshot before = dst.snapshot();
    ASSERT_EQ(status, call(function, at.origin, at.step, dst.data<T>(), dst.step(), QorPoint2D{0, 0}, job.dst,
                           static_cast<const QorWarpPlan*>(plan), makeWarpBuffer(plan, job.dst)));
    expectImage(job, source, before, dst);
    QORI_EXPECT_UNCHANGED(source.image, sourceBefore);
    // In tiles, from where the whole began: the same bytes.
    const Snapshot whole = dst.snapshot();
    Snapshot start = before;
    const auto old = start.view<T>(channels);
    const View<T> pixels = dst.view<T>(channels);
    for (int y = 0; y < job.dst.height; ++y)
        for (int x = 0; x < job.dst.width; ++x)
            for (int c = 0; c < channels; ++c) pixels.set(x, y, c, old.get(x, y, c));
    for (const QorImageRect& tile : warpTiles(job.dst)) {
        const bool exceeds = random().oneIn(3);
        const bool atEdge = tile.x + tile.width == job.dst.width && exceeds;
        const QorImageSize size{tile.width + (atEdge ? 1 + random().below(50) : 0), tile.height};
        auto* to = dst.data<uint8_t>() + ptrdiff_t{dst.step()} * tile.y + ptrdiff_t{int{sizeof(T)} * channels} * tile.x;
        ASSERT_EQ(status != QOR_OK ? status
                  : atEdge         ? QOR_WARN_ADJUSTED
                                   : QOR_OK,
                  call(function, at.origin, at.step, reinterpret_cast<T*>(to), dst.step(), QorPoint2D{tile.x, tile.y},
                       size, static_cast<const QorWarpPlan*>(plan), makeWarpBuffer(plan, size)));
    }
    QORI_EXPECT_UNCHANGED(dst, whole);
    Snapshot around = whole;
    const auto blank = around.view<T>(channels), poison = const_cast<Snapshot&>(clean).view<T>(channels);
    for (int y = 0; y < job.dst.height; ++y)
        for (int x = 0; x < job.dst.width; ++x)
            for (int c = 0; c < channels; ++c) blank.set(x, y, c, poison.get(x, y, c));
    EXPECT_EQ(clean.bytes, around.bytes) << "written around the destination";
}

template <class T, int channels, class Function>
void checkWarp(Function function, const WarpJob& job) {
    const WarpSource<T, channels> source(job);
    checkWarp(function, job, source, {source.origin(), source.image.step()});
}

#ifndef _WIN32
template <class T, int channels, class Function>
void checkFarWarp(Function function, WarpJob job) {
    job.src.height = 6 + random().below(15);
    const WarpSource<T, channels> source(job);
    constexpr ptrdiff_t kPixel = channels * int{sizeof(T)};
    const int before = source.before, around = before + source.behind;
    const FarRows rows(source.image.template data<uint8_t>(), source.image.step(), job.src.height + around,
                       static_cast<size_t>((job.src.width + around) * kPixel));
    ASSERT_TRUE(rows.exists());
    checkWarp(function, job, source, {reinterpret_cast<const T*>(rows.row(before) + before * kPixel), FarRows::kStep});
}
#endif

// --- what is drawn --------------------------------------------------------------------------------------------------

double drawReal(double least, double most) {
    return least + (most - least) * static_cast<double>(random().bits() >> 11) * 0x1p-53;
}

/// Turns, scales and shears about the middles of both images.
Coefficients drawMap(QorImageSize from, QorImageSize to) {
    static constexpr double kAngles[] = {0, 15, 45, 90, 180, 270, -0.5, 89.9};
    const double degrees = random().oneIn(2) ? kAngles[random().below(8)] : drawReal(-180, 180);
    const double angle = degrees * std::numbers::pi / 180, cosine = std::cos(angle), sine = std::sin(angle);
    const double scale = random().oneIn(2) ? 1 : std::exp2(drawReal(-3, 3));
    const double shear = random().oneIn(3) ? drawReal(-1, 1) : 0, flip = random().oneIn(5) ? -1 : 1;
    const double a = scale * flip * cosine, b = scale * (shear * cosine - sine), d = scale * flip * sine,
                 e = scale * (shear * sine + cosine);
    const double jitter = random().oneIn(2) ? drawReal(-3, 3) : 0;
    const double x = (from.width - 1) / 2.0, y = (from.height - 1) / 2.0;
    return {a, b, (to.width - 1) / 2.0 - a * x - b * y + jitter, d, e, (to.height - 1) / 2.0 - d * x - e * y};
}

int drawLength() { return 1 + random().below(random().oneIn(4) ? 200 : 40); }

WarpJob drawJob(const Method& method) {
    WarpJob job{method, {}, random().oneIn(2), {1 + drawLength(), 1 + drawLength()}, {drawLength(), drawLength()}};
    job.coeffs = job.isBackward ? drawMap(job.dst, job.src) : drawMap(job.src, job.dst);
    if (random().oneIn(8)) job.coeffs[random().oneIn(2) ? 2 : 5] += drawReal(-300, 300);
    static constexpr int32_t kBorders[] = {borderConstant, borderReplicate, borderReadAll, 7, 0x97, 0xF6};
    job.border = kBorders[random().below(6)];
    for (double& v : job.borderValue) v = drawReal(-70000, 70000);
    return job;
}

const std::vector<Method> kNearest = {{.interpolation = interpNearest}};
const std::vector<Method> kLinear = {{.interpolation = interpLinear}};
const std::vector<Method> kCubic = {{.interpolation = interpCubic, .b = 0, .c = 0.5f},
                                    {.interpolation = interpCubic, .b = 1, .c = 0},
                                    {.interpolation = interpCubic, .b = 0.5f, .c = 0.3f},
                                    {.interpolation = interpCubic, .b = 0, .c = 0.75f},
                                    {.interpolation = interpCubic, .b = -3, .c = 8}};

template <class T, int channels, class Function>
void sweepWarp(const char* name, Function function, const std::vector<Method>& methods) {
    constexpr int kJobs = 60;
    for (int i = 0; i < kJobs && !testing::Test::HasFailure(); ++i)
        checkWarp<T, channels>(function, drawJob(methods[static_cast<size_t>(i) % methods.size()]));
#ifndef _WIN32
    for (int i = 0; i < 5 && !testing::Test::HasFailure(); ++i)
        checkFarWarp<T, channels>(function, drawJob(methods[static_cast<size_t>(i) % methods.size()]));
#endif
    markSwept(name);
    std::string init(name, static_cast<size_t>(std::strchr(name, '_') - name));
    init += "Init";
    for (const char* used : {init.c_str(), "qoriWarpAffineGetSize", "qoriWarpGetBufferSize"}) markSwept(used);
}

#define QORI_SWEEP_(name, operation, S, SL)
#define QORI_SWEEP_R(name, operation, S, SL) \
    TEST(Warp, name) { sweepWarp<S, channels(Layout::SL)>(#name, name, operation##Methods()); }
const std::vector<Method>& warpAffineNearestMethods() { return kNearest; }
const std::vector<Method>& warpAffineLinearMethods() { return kLinear; }
const std::vector<Method>& warpAffineCubicMethods() { return kCubic; }
#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) QORI_SWEEP_##kind(name, operation, S, SL)
#include "members/warp.inc"
#undef QORI_MEMBER
#undef QORI_SWEEP_
#undef QORI_SWEEP_R

}  // namespace
}  // namespace qori::test
