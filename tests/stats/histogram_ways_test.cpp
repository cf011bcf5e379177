// SPDX-License-Identifier: Apache-2.0
// Counts do not depend on the way of counting, which the number of pixels and the levels choose.
#include <algorithm>
#include <cmath>

#include "harness/sweep.h"

namespace qori::test {
namespace {

template <class T>
using Level = std::conditional_t<std::is_floating_point_v<T>, float, int32_t>;

/// Bins of sorted elements: a bin is what lies below its upper level, less what
/// lies below its lower one.
template <class T, class L>
std::vector<int32_t> countSorted(const std::vector<T>& elements, const std::vector<L>& levels) {
    const auto below = [&](L level) {
        return std::partition_point(elements.begin(), elements.end(), [=](T v) { return static_cast<L>(v) < level; }) -
               elements.begin();
    };
    std::vector<int32_t> bins;
    for (size_t k = 0; k + 1 < levels.size(); ++k)
        bins.push_back(levels[k] < levels[k + 1] ? static_cast<int32_t>(below(levels[k + 1]) - below(levels[k])) : 0);
    return bins;
}

/// Levels that repeat, lie on multiples of a power of two, follow each other by one, reach beyond the type's range, or
/// have no order.
template <class T>
std::vector<std::vector<Level<T>>> kindsOfLevels() {
    using L = Level<T>;
    constexpr L lowest = std::is_floating_point_v<T> ? L{-100} : static_cast<L>(std::numeric_limits<T>::lowest());
    constexpr L unit = std::is_floating_point_v<T> ? L(1) / 256 : L{1};
    std::vector<std::vector<L>> kinds;
    const auto add = [&](int count, auto level) {
        auto& levels = kinds.emplace_back();
        for (int k = 0; k < count; ++k) levels.push_back(lowest + static_cast<L>(level(k)) * unit);
    };
    for (int count : {2, 33, 65, 300, 1'030, 2'047, 2'048, 5'000}) {
        add(count, [&](int k) { return k * (65'536 / count) + 3; });
        add(count, [](int k) { return 5'000 + k / 7 * 5; });
        add(count, [](int k) { return 20'000 + k; });
        add(count, [](int k) { return static_cast<int>(k * 40'503u % 70'000u) - 2'000; });
    }
    for (int shift : {5, 6, 8}) {
        add((65'536 >> shift) + 1, [=](int k) { return k << shift; });
        add(65'536 >> shift, [=](int k) { return (k << shift) - 3 * (1 << shift); });
    }
    add(65'537, [](int k) { return k; });
    add(70'000, [](int k) { return k - 2'000; });
    add(70'000, [](int k) { return k - 2'000 + (k > 4 ? 1 : 0); });
    add(9'000, [](int k) { return k < 4'000 ? -50 : k < 6'000 ? k : 65'536; });
    return kinds;
}

/// Noise over the levels' range, every fifth pixel the same; floats have NaN of both signs among them.
template <class T>
T element(size_t i) {
    const auto bits = static_cast<uint16_t>(i / 3 % 5 == 0 ? 21'000 : i * 40'503u >> 3);
    if constexpr (std::is_integral_v<T>) return static_cast<T>(bits);
    if (i % 101 == 7) return i % 2 == 0 ? NAN : -NAN;
    return static_cast<T>(bits) / 256 - 100;
}

template <class T, class Function>
void compareWays(Function function) {
    const auto kinds = kindsOfLevels<T>();
    for (QorImageSize roi : {QorImageSize{1, 1}, {13, 5}, {40, 30}, {1'100, 3}, {300, 200}}) {
        std::vector<T> image, sorted[3];
        for (size_t i = 0; i < static_cast<size_t>(3 * roi.width * roi.height); ++i) {
            image.push_back(element<T>(i));
            if (image[i] == image[i]) sorted[i % 3].push_back(image[i]);
        }
        for (auto& channel : sorted) std::sort(channel.begin(), channel.end());
        for (const auto& levels : kinds) {
            SCOPED_TRACE(::testing::Message() << roi.width << "x" << roi.height << ", " << levels.size()
                                              << " levels from " << levels[0] << ", " << levels[1]);
            std::vector<int32_t> bins[3];
            for (auto& b : bins) b.assign(levels.size(), -7);
            int32_t* const binPointers[3] = {bins[0].data(), bins[1].data(), bins[2].data()};
            const Level<T>* const levelPointers[3] = {levels.data(), levels.data(), levels.data()};
            const auto n = static_cast<int32_t>(levels.size());
            const int32_t counts[3] = {n, n, n};
            ASSERT_EQ(QOR_OK,
                      call(function, static_cast<const T*>(image.data()),
                           roi.width * 3 * static_cast<int32_t>(sizeof(T)), roi, binPointers, levelPointers, counts));
            for (int c = 0; c < 3; ++c) {
                auto expected = countSorted(sorted[c], levels);
                expected.push_back(-7);
                ASSERT_EQ(expected, bins[c]);
            }
        }
    }
}

TEST(HistogramWays, Agree) {
    compareWays<uint16_t>(qoriHistogramRange_16u_C3R);
    compareWays<int16_t>(qoriHistogramRange_16s_C3R);
    compareWays<float>(qoriHistogramRange_32f_C3R);
}

}  // namespace
}  // namespace qori::test
