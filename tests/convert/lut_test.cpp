// SPDX-License-Identifier: Apache-2.0
#include "reference/lut.h"

#include <cstring>
#include <numeric>

#include "harness/pixelwise.h"

namespace qori::test {
namespace {

using reference::Form;
using reference::Level;
using reference::LevelTable;

template <class T>
constexpr double kLowest = std::is_floating_point_v<T> ? -100 : double(std::numeric_limits<T>::min());
template <class T>
constexpr double kSpan = std::is_floating_point_v<T> ? 200 : 1 << 8 * sizeof(T) % 32;

/// Counts around the bounds between ways, more often small ones.
int drawCount() {
    constexpr int counts[] = {2, 2, 3, 3, 4, 4, 5, 8, 12, 13, 31, 32, 33, 257, 258, 600};
    return counts[random().below(16)];
}

/// A level within the element's range and a little beyond it.
template <class T>
Level<T> drawLevel() {
    const double place = (random().below(1'101) - 50) / 1'000.0;
    return static_cast<Level<T>>(kLowest<T> + place * kSpan<T>);
}

template <class T>
Level<T> drawValue() {
    if constexpr (std::is_floating_point_v<T>)
        return drawPixel<T>();
    else
        return random().oneIn(8) ? random().value<int32_t>()
                                 : static_cast<int32_t>(kLowest<T> + random().below(1'000) / 999.0 * kSpan<T>);
}

/// Ascending levels, equal ones among them, or one time in four levels in any order. Straight lines and constants stand
/// extremes; NaN and infinities as levels only constants.
template <class T>
LevelTable<Level<T>> drawTable(Form form, int count) {
    LevelTable<Level<T>> table;
    const bool isOrdered = !random().oneIn(4);
    for (int k = 0; k < count; ++k) {
        table.levels.push_back(drawLevel<T>());
        table.values.push_back(drawValue<T>());
    }
    if (form != Form::cubic && random().oneIn(3)) {
        using Limits = std::numeric_limits<Level<T>>;
        Level<T>& one = table.levels[size_t(random().below(count))];
        Level<T>& other = table.levels[size_t(random().below(count))];
        if constexpr (std::is_floating_point_v<T>) {
            one = form == Form::step ? -INFINITY : -1e30f;
            other = form == Form::step ? (random().oneIn(2) ? INFINITY : NAN) : 1e30f;
        } else {
            one = Limits::min();
            other = Limits::max();
        }
    }
    if (isOrdered && !std::isnan(double(std::accumulate(table.levels.begin(), table.levels.end(), 0.0))))
        std::sort(table.levels.begin(), table.levels.end());
    if (form == Form::cubic) {
        // Apart from each other, so that rounding errors stay small; then two near each other coincide or change
        // places.
        for (int k = 0; k < count; ++k)
            table.levels[size_t(k)] =
                static_cast<Level<T>>(kLowest<T> + (k + random().below(500) / 1'000.0) / count * kSpan<T>);
        auto& level = table.levels;
        const int one = random().below(count), other = std::clamp(one + random().below(7) - 3, 0, count - 1);
        if (random().oneIn(3)) level[size_t(one)] = level[size_t(other)];
        if (!isOrdered) std::swap(level[size_t(one)], level[size_t(other)]);
    }
    return table;
}

/// Whether an element's result does not hang on the last bits of double precision: the polynomial is far enough from
/// where the element's rounding changes.
template <class T, class L>
bool isClear(T v, const LevelTable<L>& table, Form form) {
    const int k = reference::intervalOf(v, table, form);
    if (form != Form::cubic || k < 0 || table.levels.size() < 4) return true;
    const long double p = reference::cubic(table, k, v);
    const long double error = 1e-8L * (1 + std::abs(p)) + (std::is_integral_v<T> ? 1e-4L : 1e-10L);
    const auto rounded = [](long double r) {
        if constexpr (std::is_integral_v<T>)
            return std::trunc(r + 0.5L);
        else
            return static_cast<T>(r);
    };
    return rounded(p - error) == rounded(p + error);
}

/// Half of the elements equal a level or lie beside one; of the channel that is next.
template <class T>
struct NearLevels {
    const LevelTable<Level<T>>* tables;
    Form form;
    int channels, processed;
    int next = 0;

    T operator()() {
        const int c = next;
        next = (next + 1) % channels;
        const LevelTable<Level<T>>& table = tables[c < processed ? c : 0];
        for (int tries = 0; tries < 200; ++tries) {
            const T v = draw(table);
            if (isClear(v, table, form)) return v;
        }
        return static_cast<T>(table.levels.back());
    }

    T draw(const LevelTable<Level<T>>& table) const {
        if (random().oneIn(4)) return random().value<T>();
        if (random().oneIn(2)) return static_cast<T>(kLowest<T> + random().below(1'000) / 1'000.0 * (kSpan<T> - 1));
        const Level<T> level = table.levels[size_t(random().below(static_cast<int>(table.levels.size())))];
        if constexpr (std::is_floating_point_v<T>)
            return random().oneIn(2) ? level : std::nextafter(level, random().oneIn(2) ? INFINITY : -INFINITY);
        else
            return static_cast<T>(int64_t{level} + random().below(3) - 1);
    }
};

/// Tables in memory that ends at no-access pages, and the arguments that name them.
template <class L>
class Arguments {
public:
    explicit Arguments(const std::vector<LevelTable<L>>& tables) {
        for (size_t c = 0; c < tables.size(); ++c) {
            const size_t count = tables[c].levels.size(), bytes = count * sizeof(L);
            L* const at = block(2 + static_cast<int>(c), static_cast<int>(2 * bytes)).template data<L>();
            std::memcpy(at, tables[c].values.data(), bytes);
            std::memcpy(at + count, tables[c].levels.data(), bytes);
            values_[c] = at;
            levels_[c] = at + count;
            counts_[c] = static_cast<int32_t>(count);
        }
    }

    template <Layout layout, Kind kind, class T, class Function>
    QorResult callWith(Function function, const T* src, int32_t srcStep, T* dst, int32_t dstStep, QorImageSize roi) {
        const auto invoke = [&](auto... parameters) {
            if constexpr (kind == Kind::IR)
                return call(function, dst, dstStep, roi, parameters...);
            else
                return call(function, src, srcStep, dst, dstStep, roi, parameters...);
        };
        if constexpr (layout == Layout::C1)
            return invoke(values_[0], levels_[0], counts_[0]);
        else
            return invoke(static_cast<const L* const*>(values_), static_cast<const L* const*>(levels_),
                          static_cast<const int32_t*>(counts_));
    }

private:
    const L *values_[4] = {}, *levels_[4] = {};
    int32_t counts_[4] = {};
};

template <class T, Layout layout, Kind kind, class Function>
void checkTables(Function function, const Shape& shape, Form form, const std::vector<LevelTable<Level<T>>>& tables) {
    Arguments<Level<T>> arguments(tables);
    checkUnary<T, T, layout, kind>(
        shape,
        [&](const TestImage& src, const TestImage& dst, QorImageSize roi) {
            EXPECT_EQ(QOR_OK, (arguments.template callWith<layout, kind, T>(function, src.data<T>(), src.step(),
                                                                            dst.data<T>(), dst.step(), roi)));
        },
        [&](T v, int c) { return reference::throughLevels(v, tables[size_t(c)], form); },
        NearLevels<T>{tables.data(), form, channels(layout), processedChannels(layout)});
}

template <class T, Layout layout>
std::vector<LevelTable<Level<T>>> drawTables(Form form) {
    std::vector<LevelTable<Level<T>>> tables;
    const int few = random().oneIn(2) ? 32 : 1'000;
    for (int c = 0; c < processedChannels(layout); ++c)
        tables.push_back(random().oneIn(8) && c > 0 ? tables[0] : drawTable<T>(form, std::min(few, drawCount())));
    return tables;
}

template <class T, Layout layout, Kind kind, class Function>
void sweep(const char* name, Function function, Form form) {
    forShapes(smallShapes(), [&](Shape shape) {
        shape.flipped = false;
        checkTables<T, layout, kind>(function, shape, form, drawTables<T, layout>(form));
    });
    markSwept(name);
}

constexpr Form lutStep = Form::step, lutLinear = Form::linear, lutCubic = Form::cubic;

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(LutSweep, name) { sweep<S, Layout::SL, Kind::kind>(#name, &name, operation); }
#include "members/lut.inc"
#undef QORI_MEMBER

/// 16 bits: small regions are searched, larger ones go through a table; few levels are compared, whatever the size.
template <class T, class Function>
void checkWays(Function function, Form form) {
    const auto check = [=](int count, int height) {
        SCOPED_TRACE(testing::Message() << count << " levels, " << height << " rows");
        checkTables<T, Layout::C1, Kind::R>(function, {.width = 64, .height = height}, form,
                                            {drawTable<T>(form, count)});
    };
    for (int count : {2, 3, 4, 12, 13, 32, 33, 257, 258})
        for (int height : {1, 64, 65, 128, 129}) check(count, height);
    for (int count : {1'025, 1'026, 3'000})
        for (int height : {1, 65}) check(count, height);
}
TEST(Lut, WaysAgree) {
    checkWays<uint16_t>(qoriLUT_16u_C1R, Form::step);
    checkWays<int16_t>(qoriLUT_16s_C1R, Form::step);
    checkWays<float>(qoriLUT_32f_C1R, Form::step);
    checkWays<uint16_t>(qoriLUT_Linear_16u_C1R, Form::linear);
    checkWays<int16_t>(qoriLUT_Linear_16s_C1R, Form::linear);
    checkWays<float>(qoriLUT_Linear_32f_C1R, Form::linear);
    checkWays<uint16_t>(qoriLUT_Cubic_16u_C1R, Form::cubic);
    checkWays<int16_t>(qoriLUT_Cubic_16s_C1R, Form::cubic);
    checkWays<float>(qoriLUT_Cubic_32f_C1R, Form::cubic);
}

/// Every byte through a table.
template <class Function>
std::vector<int> ofAllBytes(Function function, const std::vector<int32_t>& levels, const std::vector<int32_t>& values) {
    uint8_t src[256], dst[256];
    for (int i = 0; i < 256; ++i) src[i] = static_cast<uint8_t>(i);
    EXPECT_EQ(QOR_OK, call(function, src, 256, dst, 256, QorImageSize{256, 1}, values.data(), levels.data(),
                           static_cast<int32_t>(levels.size())));
    return {dst, dst + 256};
}
template <class Expected>
void expectBytes(const std::vector<int>& actual, Expected expected) {
    for (int i = 0; i < 256; ++i) EXPECT_EQ(expected(i), actual[size_t(i)]) << "of " << i;
}

TEST(Lut, BytesByHand) {
    expectBytes(ofAllBytes(qoriLUT_8u_C1R, {0, 128, 256}, {10, 200, 7}), [](int v) { return v < 128 ? 10 : 200; });
    expectBytes(ofAllBytes(qoriLUT_8u_C1R, {50, 100}, {0, 0}), [](int v) { return v >= 50 && v < 100 ? 0 : v; });
    expectBytes(ofAllBytes(qoriLUT_8u_C1R, {0, 200, 100}, {1, 2, 3}), [](int v) { return v < 100 ? 1 : v; });
    expectBytes(ofAllBytes(qoriLUT_8u_C1R, {-5, 3, 300, 400}, {-9, 999, 5, 5}), [](int v) { return v < 3 ? 0 : 255; });
    // Truncated towards zero, and rounded by a half that negative values have added too.
    expectBytes(ofAllBytes(qoriLUT_Linear_8u_C1R, {0, 256}, {0, 128}), [](int v) { return v / 2; });
    expectBytes(ofAllBytes(qoriLUT_Linear_8u_C1R, {0, 100, 256}, {0, 100, 568}),
                [](int v) { return v < 100 ? v : std::min(255, 100 + 3 * (v - 100)); });
    expectBytes(ofAllBytes(qoriLUT_Cubic_8u_C1R, {0, 85, 170, 255}, {0, 85, 170, 255}), [](int v) { return v; });
    // v^3 / 32768 runs through these nodes; every interval of the list of six takes the same cubic.
    expectBytes(ofAllBytes(qoriLUT_Cubic_8u_C1R, {0, 32, 64, 128, 160, 256}, {0, 1, 8, 64, 125, 512}),
                [](int v) { return std::min(255, static_cast<int>(v * v * v / 32'768.0 + 0.5)); });
}

/// The image's own values between, at and outside the levels, NaN among them.
TEST(Lut, FloatsByHand) {
    const auto of = [](float v, std::vector<float> levels, std::vector<float> values) {
        float dst = -1;
        EXPECT_EQ(QOR_OK, call(qoriLUT_32f_C1R, &v, 4, &dst, 4, QorImageSize{1, 1}, values.data(), levels.data(),
                               static_cast<int32_t>(levels.size())));
        return dst;
    };
    EXPECT_EQ(1, of(1, {0, 1}, {7, 9}));
    EXPECT_EQ(7, of(0.999f, {0, 1}, {7, 9}));
    EXPECT_EQ(1, of(199.99f, {0, 200, 100}, {1, 2, 3}));
    EXPECT_EQ(5, of(-INFINITY, {-INFINITY, 0, INFINITY}, {5, 6, 7}));
    EXPECT_EQ(INFINITY, of(INFINITY, {-INFINITY, 0, INFINITY}, {5, 6, 7}));
    EXPECT_TRUE(std::isnan(of(NAN, {-INFINITY, INFINITY}, {5, 6})));
    EXPECT_EQ(3, of(3, {0, NAN, 10}, {5, 6, 7}));
    // Subnormals that the caller's register would take for zero.
    for (int i = 0; i < 64; ++i) EXPECT_EQ(2, of(1e-40f, {-1, 1e-41f, 2e-40f}, {1, 2, 3}));
    std::vector<float> many(100), values(100);
    for (int k = 0; k < 100; ++k) many[size_t(k)] = 1e-42f * static_cast<float>(k), values[size_t(k)] = float(k);
    for (int i = 0; i < 64; ++i) EXPECT_EQ(50, of(many[50], many, values));
}

TEST(Lut, CubicOfThreeLevelsIsLinear) {
    const std::vector<float> levels = {0, 0.3f, 1}, values = {0.1f, 0.7f, 0.2f};
    float src[101], linear[101], cubic[101];
    for (int i = 0; i < 101; ++i) src[i] = static_cast<float>(i) / 100;
    const auto run = [&](auto function, float* dst) {
        EXPECT_EQ(QOR_OK, call(function, src, 404, dst, 404, QorImageSize{101, 1}, values.data(), levels.data(), 3));
    };
    run(qoriLUT_Linear_32f_C1R, linear);
    run(qoriLUT_Cubic_32f_C1R, cubic);
    EXPECT_EQ(0, std::memcmp(linear, cubic, sizeof linear));
}

// --- statuses -------------------------------------------------------------------------------------------------------

class LutStatus : public testing::Test {
protected:
    static constexpr QorImageSize kRoi{140, 60}, kNone{0, 60};
    TestImage src_{1, {.width = 140, .height = 60}, 16}, dst_{0, {.width = 140, .height = 60}, 16};
    const int32_t levels_[5] = {0, 10, 20, 30, 40}, values_[5] = {4, 3, 2, 1, 0};
    const float floats_[5] = {0, 10, 20, 30, 40};
};

/// What comes before the number of levels and what behind it; nulls, sizes and steps are contracts_test's.
TEST_F(LutStatus, OneChannelChecksItsLevelsLast) {
    const auto status = [&](QorImageSize roi, int32_t step, int32_t count) {
        return call(qoriLUT_16u_C1R, src_.data<uint16_t>(), 280, dst_.data<uint16_t>(), step, roi, values_, levels_,
                    count);
    };
    for (int32_t count : {1, 0, -1, INT32_MIN}) {
        QORI_EXPECT_STATUS(QOR_ERR_LUT_LEVELS, dst_, status(kRoi, 280, count));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst_, status(kNone, 0, count));
        QORI_EXPECT_STATUS(QOR_ERR_STEP, dst_, status(kRoi, 0, count));
    }
    QORI_EXPECT_STATUS(
        QOR_ERR_LUT_LEVELS, dst_,
        call(qoriLUT_32f_C1R, src_.data<float>(), 560, dst_.data<float>(), 560, kRoi, floats_, floats_, 1));
}

TEST_F(LutStatus, SeveralChannelsCheckTheirLevelsFirst) {
    using Pointers = const float* const*;
    const auto status = [&](auto function, QorImageSize roi, int32_t step, std::vector<const float*> values,
                            std::vector<const float*> levels, std::vector<int32_t> counts) {
        return call(function, src_.data<float>(), 2'240, dst_.data<float>(), step, roi,
                    static_cast<Pointers>(values.data()), static_cast<Pointers>(levels.data()),
                    static_cast<const int32_t*>(counts.data()));
    };
    const float* const f = floats_;
    const auto three = [&](const std::vector<const float*>& values, const std::vector<const float*>& levels,
                           const std::vector<int32_t>& counts) {
        return status(qoriLUT_32f_C3R, kNone, 0, values, levels, counts);
    };
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst_, three({f, f, f}, {f, nullptr, f}, {5, 5, 1}));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst_, three({f, nullptr, f}, {f, f, f}, {5, 5, 1}));
    QORI_EXPECT_STATUS(QOR_ERR_LUT_LEVELS, dst_, three({f, nullptr, f}, {f, f, f}, {1, 5, 5}));
    QORI_EXPECT_STATUS(QOR_ERR_LUT_LEVELS, dst_, three({f, f, f}, {f, f, f}, {5, 5, 1}));
    QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst_, three({f, f, f}, {f, f, f}, {5, 5, 2}));
    QORI_EXPECT_STATUS(QOR_ERR_STEP, dst_,
                       status(qoriLUT_Cubic_32f_C4R, kRoi, 0, {f, f, f, f}, {f, f, f, f}, {5, 5, 5, 5}));
    QORI_EXPECT_STATUS(QOR_ERR_LUT_LEVELS, dst_,
                       status(qoriLUT_Linear_32f_C4R, kRoi, 0, {f, f, f, f}, {f, f, f, f}, {5, 5, 5, 1}));
    // The fourth channel of AC4 has no table.
    EXPECT_EQ(QOR_OK, status(qoriLUT_Linear_32f_AC4R, kRoi, 2'240, {f, f, f}, {f, f, f}, {5, 5, 5}));
}

/// Lets each allocation fail in turn: all that were made before are freed, and nothing is written.
template <class Call>
void failEach(const TestImage& dst, int allocations, Call callIt) {
    const int before = qorTestLiveBlocks();
    for (int n = 1; n <= allocations; ++n) {
        qorTestFailAllocation(n);
        QORI_EXPECT_STATUS(QOR_ERR_NO_MEMORY, dst, callIt());
        EXPECT_EQ(before, qorTestLiveBlocks()) << "allocation " << n;
    }
    qorTestFailAllocation(allocations + 1);
    EXPECT_EQ(QOR_OK, callIt());
    qorTestFailAllocation(0);
    EXPECT_EQ(before, qorTestLiveBlocks());
}

TEST_F(LutStatus, EachAllocationFails) {
    const int32_t* const levels[4] = {levels_, levels_, levels_, levels_};
    const int32_t* const values[4] = {values_, values_, values_, values_};
    const float* const floats[4] = {floats_, floats_, floats_, floats_};
    const int32_t counts[4] = {5, 5, 3, 5};
    const auto integers = [&](auto function, QorImageSize roi) {
        return [=, this] {
            using Pointer = uint16_t*;
            return call(function, static_cast<const uint16_t*>(src_.data<uint16_t>()), 1'120,
                        static_cast<Pointer>(dst_.data<uint16_t>()), 1'120, roi,
                        static_cast<const int32_t* const*>(values), static_cast<const int32_t* const*>(levels),
                        static_cast<const int32_t*>(counts));
        };
    };
    failEach(dst_, 3, integers(qoriLUT_Linear_16u_AC4R, kRoi));
    failEach(dst_, 4, integers(qoriLUT_Cubic_16u_C4R, kRoi));
    failEach(dst_, 0, integers(qoriLUT_Cubic_16u_C4R, QorImageSize{128, 60}));
    failEach(dst_, 0, integers(qoriLUT_16u_C3R, kRoi));  // few levels
    const auto real = [&](auto function) {
        return [=, this] {
            return call(function, static_cast<const float*>(src_.data<float>()), 2'240, dst_.data<float>(), 2'240, kRoi,
                        static_cast<const float* const*>(floats), static_cast<const float* const*>(floats),
                        static_cast<const int32_t*>(counts));
        };
    };
    failEach(dst_, 0, real(qoriLUT_32f_C3R));
    failEach(dst_, 3, real(qoriLUT_Linear_32f_C3R));
    failEach(dst_, 3 + 3 + 1, real(qoriLUT_Cubic_32f_AC4R));  // the third channel has three levels
    // Small calls of 16 bits take no memory, whatever the number of levels.
    std::vector<int32_t> many(2'000);
    std::iota(many.begin(), many.end(), 0);
    const int32_t* const all[3] = {many.data(), many.data(), many.data()};
    for (int32_t count : {129, 130, 257, 258, 1'025, 1'026, 2'000})
        for (const QorImageSize roi : {QorImageSize{4, 4}, QorImageSize{128, 32}}) {
            const int32_t several[3] = {count, 130, 2};
            for (auto function : {qoriLUT_Linear_16u_C1R, qoriLUT_Cubic_16u_C1R, qoriLUT_16u_C1R})
                failEach(dst_, 0, [&] {
                    return call(function, src_.data<uint16_t>(), 256, dst_.data<uint16_t>(), 256, roi, many.data(),
                                many.data(), count);
                });
            for (auto function : {qoriLUT_Linear_16s_C3R, qoriLUT_Cubic_16s_AC4R})
                failEach(dst_, 0, [&] {
                    return call(function, src_.data<int16_t>(), 1'024, dst_.data<int16_t>(), 1'024, roi, all, all,
                                several);
                });
        }
    failEach(dst_, 1, [&] {
        return call(qoriLUT_16s_C1R, src_.data<int16_t>(), 280, dst_.data<int16_t>(), 280, kRoi, many.data(),
                    many.data(), 40);
    });
    failEach(dst_, 0, [&] {
        return call(qoriLUT_Cubic_8u_C1R, src_.data<uint8_t>(), 140, dst_.data<uint8_t>(), 140, kRoi, many.data(),
                    many.data(), 40);
    });
}

}  // namespace
}  // namespace qori::test
