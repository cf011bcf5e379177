// SPDX-License-Identifier: Apache-2.0
// The row window on its own, compiled into the test: what every pixel of every window is, for all rules, sides and
// places. Families test it again with their kernels.
#include "frame/row_window.h"

#include <string>
#include <vector>

#include "harness/sweep.h"

namespace qori::test {
namespace {

constexpr int32_t kMirror = 3;

struct Case {
    QorImageSize size;
    WindowNeeds needs;
    int32_t border;
    int pixelBytes;
};

/// Back and forth between closed sides, without repeating the edge.
int mirrored(int at, int count, bool openBefore, bool openBehind) {
    const bool beyond = (at < 0 && !openBefore) || (at >= count && !openBehind);
    if (!beyond) return at;
    if (count == 1 && !openBefore && !openBehind) return 0;
    return mirrored(at < 0 ? -at : 2 * (count - 1) - at, count, openBefore, openBehind);
}

/// What the source has at (x, y) by the rule, -1 for the constant.
ptrdiff_t sourceOffset(const Case& job, const BorderRule& rule, int x, int y) {
    const bool missingX = (x < 0 && !rule.open.left) || (x >= job.size.width && !rule.open.right);
    const bool missingY = (y < 0 && !rule.open.top) || (y >= job.size.height && !rule.open.bottom);
    if (rule.constant != nullptr && (missingX || missingY)) return -1;
    const Reach& reach = job.needs.reach;
    int column = missingX ? std::clamp(x, 0, job.size.width - 1) : x;
    int row = missingY ? std::clamp(y, 0, job.size.height - 1) : y;
    if (rule.mirrors) {
        column = mirrored(x, job.size.width, rule.open.left, rule.open.right);
        row = mirrored(y, job.size.height, rule.open.top, rule.open.bottom);
    }
    return ptrdiff_t{row + reach.top} * (job.size.width + reach.columns()) + column + reach.left;
}

/// An operation that compares every byte of every window, in memory of exactly the size, and writes over its rows.
void checkCase(const Case& job) {
    const Reach reach = job.needs.reach;
    const Shape seen{.width = job.size.width + reach.columns(), .height = job.size.height + reach.rows()};
    const TestImage image(0, seen, job.pixelBytes);
    image.fill<uint8_t>(job.pixelBytes, [] { return static_cast<uint8_t>(random().bits()); });
    const Snapshot before = image.snapshot();
    const uint8_t* const source = before.bytes.data() + before.originOffset;
    const uint8_t constant[] = {1, 2, 3, 4, 5, 6};
    const BorderRule rule = BorderRule::withMirror(Border::of(job.border), constant);
    auto* const origin =
        image.data<uint8_t>() + reach.top * ptrdiff_t{image.step()} + ptrdiff_t{reach.left} * job.pixelBytes;
    const BorderedImage bordered{origin, image.step(), job.size, job.pixelBytes, rule};

    const auto bytes = static_cast<int>(RowWindow::bytes(bordered, job.needs));
    const TestImage memory = block(1, std::max(bytes, 1));
    RowWindow window(bordered, job.needs, bytes > 0 ? memory.data<uint8_t>() : nullptr);
    int wrong = 0, rowsBegun = 0;
    std::vector<int> made(static_cast<size_t>(job.size.width * job.size.height));
    window.forEach([&](const WindowPart& part, int32_t y, int32_t rows) {
        EXPECT_LE(rowsBegun, y + 1);
        rowsBegun = y + 1;
        for (int32_t row = std::max(y - job.needs.above(), -reach.top); row < y + rows + reach.bottom; ++row)
            for (int32_t i = 0; i < part.width + reach.columns(); ++i)
                for (int b = 0; b < job.pixelBytes; ++b) {
                    const ptrdiff_t at = sourceOffset(job, rule, part.x - reach.left + i, row);
                    const uint8_t expected = at < 0 ? constant[b] : source[at * job.pixelBytes + b];
                    wrong += part.row(row)[ptrdiff_t{i} * job.pixelBytes + b] != expected;
                }
        for (int32_t row = y; row < y + rows; ++row)
            for (int32_t x = part.x; x < part.x + part.width; ++x)
                ++made[static_cast<size_t>(row * job.size.width + x)];
        if (job.needs.place == Place::apart) return;
        for (int32_t row = y; row < y + rows; ++row)
            std::memset(origin + row * ptrdiff_t{image.step()} + ptrdiff_t{part.x} * job.pixelBytes, 0xEE,
                        static_cast<size_t>(part.width * job.pixelBytes));
    });
    EXPECT_EQ(0, wrong);
    EXPECT_EQ(std::vector<int>(made.size(), 1), made) << "not every pixel was made once";
}

std::string describe(const Case& job) {
    const Reach& reach = job.needs.reach;
    std::string text;
    for (int value :
         {job.size.width, job.size.height, reach.left, reach.top, reach.right, reach.bottom, job.needs.rowsAtOnce,
          job.needs.rowsLeft, job.needs.partPixels, int(job.needs.place), job.border, job.pixelBytes})
        text += std::to_string(value) + " ";
    return text;
}

void checkAll(const Case& job) {
    for (int32_t sides = 0; sides < 256 && !testing::Test::HasFailure(); sides += 16)
        for (int32_t kind : {int32_t{borderConstant}, int32_t{borderReplicate}, int32_t{borderReadAll}, kMirror})
            for (Place place : {Place::apart, Place::inOrder, Place::anyOrder}) {
                if (kind == kMirror && place != Place::apart) continue;
                Case now = job;
                now.border = kind | sides;
                now.needs.place = place;
                if (kind == kMirror) {  // of regions smaller than that, the other side's neighbours are seen
                    now.needs.reach.right = now.needs.reach.left;
                    now.needs.reach.bottom = now.needs.reach.top;
                }
                SCOPED_TRACE(describe(now));
                checkCase(now);
            }
}

TEST(RowWindow, ShowsEveryPixelOfSmallRegions) {
    for (int width = 1; width <= 6; ++width)
        for (int height = 1; height <= 6; ++height)
            for (int rows : {1, 2, 4})
                for (int rowsLeft : {0, 1})
                    checkAll({{width, height}, {{1, 1, 1, 1}, rows, rowsLeft, 1 + rows / 2}, 0, 1});
}

TEST(RowWindow, ShowsEveryPixelOfDrawnWindows) {
    for (int i = 0; i < 150; ++i) {
        const auto below = [](int n) { return random().below(n); };
        const Reach reach{below(5), below(5), below(5), below(5)};
        checkAll({{1 + below(14), 1 + below(14)}, {reach, 1 + below(5), below(2), 1 + below(8)}, 0, 1 + below(6)});
    }
}

/// What a size query may report before it knows the rule.
TEST(RowWindow, NeedsMostWithConstantsOnClosedSides) {
    const uint8_t constant[4] = {};
    for (int i = 0; i < 200; ++i) {
        const auto below = [](int n) { return random().below(n); };
        const Reach reach{below(5), below(5), below(5), below(5)};
        const WindowNeeds needs{reach, 1 + below(4), below(2), 1, static_cast<Place>(below(3))};
        const QorImageSize size{1 + below(20), 1 + below(20)};
        const auto bytes = [&](int32_t border) {
            return RowWindow::bytes({nullptr, 0, size, 3, BorderRule::of(Border::of(border), constant)}, needs);
        };
        for (int32_t border : {0x10, 0x20, 0x40, 0x80, 0xF0, 0x01, 0xC1, 0x06})
            EXPECT_LE(bytes(border), bytes(borderConstant)) << border;
    }
}

}  // namespace
}  // namespace qori::test
