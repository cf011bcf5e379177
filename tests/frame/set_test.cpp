// SPDX-License-Identifier: Apache-2.0
#include "frame/mask.h"
#include "harness/sweep.h"
#include "reference/move.h"

namespace qori::test {
namespace {

constexpr int kAboveEveryBound = (3 << 20) + (1 << 16);
constexpr int kDstSlot = 0, kMaskSlot = 1;

template <class T, Layout L, Kind kind, class Function>
void check(Function function, const Shape& shape) {
    constexpr int element = sizeof(T);
    constexpr bool oneChannel = isChannelOfInterest(L);
    const int channel = oneChannel ? shape.width % channels(L) : 0;
    const int count = oneChannel ? 1 : L == Layout::AC4 ? 3 : channels(L);
    TestImage dst(kDstSlot, shape, element * channels(L)), mask(kMaskSlot, shape, 1);
    dst.fill<T>(channels(L), [] { return static_cast<T>(random().value<T>()); });
    if (kind == Kind::MR) fillMask(mask, shape);
    T values[4];
    for (T& value : values) value = random().value<T>();
    Snapshot expected = dst.snapshot();
    const View<uint8_t> maskView = mask.view<uint8_t>(1);
    auto to = expected.view<T>(channels(L));
    to.origin += element * channel;
    reference::set(values, count, to, shape.roi(), kind == Kind::MR ? &maskView : nullptr);
    const auto run = [&](auto value) {
        if constexpr (kind == Kind::MR)
            return call(function, value, dst.data<T>(), dst.step(), shape.roi(), mask.data<uint8_t>(), mask.step());
        else
            return call(function, value, dst.data<T>() + channel, dst.step(), shape.roi());
    };
    QorResult result;
    if constexpr (L == Layout::C1 || oneChannel)
        result = run(values[0]);
    else
        result = run(static_cast<const T*>(values));
    ASSERT_EQ(QOR_OK, result);
    QORI_EXPECT_UNCHANGED(dst, expected);
}

template <class T, Layout L, Kind kind, class Function>
void sweep(const char* name, Function function) {
    forShapes(smallShapes(), [&](const Shape& shape) { check<T, L, kind>(function, shape); });
    forStreamingChoices(static_cast<int>(sizeof(T)) * channels(L), kAboveEveryBound,
                        [&](const Shape& shape) { check<T, L, kind>(function, shape); });
    markSwept(name);
}

#define QORI_MEMBER(name, operation, S, D, SL, DL, kind, suffix) \
    TEST(SetSweep, name) { sweep<D, Layout::DL, Kind::kind>(#name, &name); }
#include "members/set.inc"
#undef QORI_MEMBER

TEST(Set, LongRowsAreFilledWhateverTheirAlignment) {
    const uint8_t values[4] = {1, 2, 3, 4}, same[4] = {5, 5, 5, 5};
    for (int width : {2047, 2048, 2049, 3075}) {
        for (int shift : {0, 1, 33, 62}) {
            const Shape shape{
                .width = width, .height = 65, .padding = 64 + shift, .flipped = shift == 1, .shift = shift};
            SCOPED_TRACE(describe(shape));
            TestImage dst(kDstSlot, shape, 4);
            Snapshot expected = dst.snapshot();
            for (const uint8_t* value : {values, same}) {
                reference::set(value, 4, expected.view<uint8_t>(4), shape.roi(), nullptr);
                EXPECT_EQ(QOR_OK, qoriSet_8u_C4R(value, dst.data<uint8_t>(), dst.step(), shape.roi()));
                QORI_EXPECT_UNCHANGED(dst, expected);
            }
        }
    }
}

TEST(Set, AsksForTheCacheOnlyAboveEachBound) {
    std::vector<uint8_t> memory((3 << 20) + 64);
    const auto queriesOf = [](auto set) {
        const int before = qorTestCacheQueries();
        EXPECT_EQ(QOR_OK, set());
        return qorTestCacheQueries() - before;
    };
    uint8_t* p = memory.data();
    EXPECT_EQ(0, queriesOf([&] { return qoriSet_8u_C1R(1, p, 3 << 20, {3 << 20, 1}); }));
    EXPECT_EQ(1, queriesOf([&] { return qoriSet_8u_C1R(1, p, (3 << 20) + 1, {(3 << 20) + 1, 1}); }));
    const float values[4] = {1, 2, 3, 4};
    auto* floats = reinterpret_cast<float*>(p);
    EXPECT_EQ(0, queriesOf([&] { return qoriSet_32f_C4R(values, floats, 1 << 20, {1 << 16, 1}); }));
    EXPECT_EQ(1, queriesOf([&] { return qoriSet_32f_C4R(values, floats, 1 << 20, {(1 << 16) + 1, 1}); }));
}

TEST(Set, ChecksPointersThenSizes) {
    const Shape shape{.width = 4, .height = 2};
    TestImage dst(kDstSlot, shape, 4), mask(kMaskSlot, shape, 1);
    auto *d = dst.data<uint8_t>(), *m = mask.data<uint8_t>();
    const uint8_t values[4] = {1, 2, 3, 4};
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriSet_8u_C1R(1, nullptr, 4, {0, 0}));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriSet_8u_C3R(nullptr, d, 4, {0, 0}));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriSet_8u_AC4R(values, nullptr, 4, {0, 0}));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriSet_8u_C4CR(1, nullptr, 4, {0, 0}));
    QORI_EXPECT_STATUS(QOR_ERR_NULL_PTR, dst, qoriSet_8u_C4MR(values, d, 16, {0, 0}, nullptr, 4));
    for (QorImageSize bad : {QorImageSize{0, 2}, QorImageSize{4, 0}, QorImageSize{-3, 2}}) {
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriSet_8u_C1R(1, d, -4, bad));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriSet_8u_AC4R(values, d, 16, bad));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriSet_8u_C3CR(1, d, 16, bad));
        QORI_EXPECT_STATUS(QOR_ERR_SIZE, dst, qoriSet_8u_C1MR(1, d, 16, bad, m, 4));
    }
}

}  // namespace
}  // namespace qori::test
