// SPDX-License-Identifier: Apache-2.0
#include "image.h"

#include <algorithm>
#include <sstream>

namespace qori::test {
namespace {

constexpr ptrdiff_t kMargin = 64;  // checked bytes on the side without a guard page
constexpr size_t kArena = size_t{16} << 20;
constexpr int kSlots = 8;
constexpr uint8_t kPoison = 0x99;

GuardedPages& arena(int slot) {
    static GuardedPages arenas[kSlots];
    GuardedPages& pages = arenas[slot];
    if (pages.begin == nullptr) pages = mapGuarded(kArena);
    return pages;
}

std::vector<Shape> makeSmallShapes() {
    std::vector<int> widths;
    for (int w = 1; w <= 67; ++w) widths.push_back(w);
    widths.insert(widths.end(), {95, 96, 97, 100, 127, 128, 129, 160, 200, 333, 1023});
    constexpr int heights[] = {1, 2, 5};
    std::vector<Shape> shapes;
    for (int w : widths) {
        const int h = heights[w % 3];
        shapes.push_back({.width = w, .height = h});
        shapes.push_back({.width = w, .height = h, .atBegin = true});
        shapes.push_back({.width = w, .height = h, .padding = 1 + w % 7, .atBegin = w % 2 == 0, .shift = w % 4});
        shapes.push_back({.width = w, .height = h, .padding = 32, .flipped = true, .atBegin = w % 2 == 1, .shift = 16});
    }
    // Columns of so many rows that gathering them takes several rounds.
    shapes.push_back({.width = 3, .height = 401, .padding = 5, .shift = 1});
    shapes.push_back({.width = 7, .height = 131, .padding = 50, .flipped = true, .atBegin = true});
    return shapes;
}

}  // namespace

std::string describe(const Shape& shape) {
    std::ostringstream text;
    text << shape.width << "x" << shape.height << ", padding " << shape.padding << (shape.flipped ? ", flipped" : "")
         << (shape.atBegin ? ", behind" : ", before") << " a guard page by " << shape.shift;
    return text.str();
}

const std::vector<Shape>& smallShapes() {
    static const std::vector<Shape> shapes = makeSmallShapes();
    return shapes;
}

const std::vector<Shape>& uprightShapes() {
    static const std::vector<Shape> shapes = [] {
        std::vector<Shape> all = makeSmallShapes();
        std::erase_if(all, [](const Shape& shape) { return shape.flipped; });
        return all;
    }();
    return shapes;
}

std::vector<Shape> largeShapes(int bytesPerPixel, int trafficBytes) {
    const auto tall = [=](int width) { return trafficBytes / (width * bytesPerPixel) + 1; };
    constexpr int wide = 1531;
    // Of few rows, four parts stream in turn: one number of them a call, as members call this by the hundred.
    constexpr struct { int height, padding; } fewRows[] = {{1, 0}, {6, 64}, {2, 32}, {3, 0}};
    static size_t turn = 0;
    const auto few = fewRows[turn++ % std::size(fewRows)];
    return {
        {.width = 512, .height = tall(512), .atBegin = true},
        {.width = wide, .height = tall(wide), .padding = 64 - wide * bytesPerPixel % 64, .atBegin = true, .shift = 4},
        {.width = 777, .height = tall(777), .padding = 3},
        {.width = 777, .height = tall(777), .padding = 3, .atBegin = true},
        {.width = tall(few.height), .height = few.height, .padding = few.padding, .atBegin = few.height % 2 == 0},
    };
}

TestImage::TestImage(int slot, const Shape& shape, int pixelBytes)
    : width_(shape.width), height_(shape.height), pixelBytes_(pixelBytes) {
    const GuardedPages& pages = arena(slot);
    const ptrdiff_t rowBytes = ptrdiff_t{shape.width} * pixelBytes;
    const ptrdiff_t pitch = rowBytes + shape.padding;
    const ptrdiff_t span = (shape.height - 1) * pitch + rowBytes;
    uint8_t* const first = shape.atBegin ? pages.begin + shape.shift : pages.begin + pages.size - shape.shift - span;
    begin_ = std::max(pages.begin, first - kMargin);
    end_ = std::min(pages.begin + pages.size, first + span + kMargin);
    step_ = shape.flipped ? -pitch : pitch;
    origin_ = shape.flipped ? first + (shape.height - 1) * pitch : first;
    std::fill(begin_, end_, kPoison);
}

Snapshot TestImage::snapshot() const { return {{begin_, end_}, origin_ - begin_, step_}; }

std::string TestImage::difference(const Snapshot& expected) const {
    const size_t size = expected.bytes.size();
    if (std::memcmp(begin_, expected.bytes.data(), size) == 0) return {};
    size_t at = 0;
    while (begin_[at] == expected.bytes[at]) ++at;
    std::ostringstream text;
    for (int y = 0; y < height_; ++y) {
        const ptrdiff_t inRow = begin_ + at - (origin_ + y * step_);
        if (inRow >= 0 && inRow < ptrdiff_t{width_} * pixelBytes_) {
            text << "pixel (" << inRow / pixelBytes_ << ", " << y << ") byte " << inRow % pixelBytes_;
            break;
        }
    }
    if (text.str().empty()) text << "outside the region, " << begin_ + at - origin_ << " bytes from its first pixel";
    text << ": " << int{begin_[at]} << " instead of " << int{expected.bytes[at]};
    return text.str();
}

}  // namespace qori::test
