// SPDX-License-Identifier: Apache-2.0
// Test images in guarded memory: flush against a no-access page at one end, poisoned bytes around and between the rows.
#pragma once
#include <cstring>
#include <string>
#include <vector>

#include "guarded_memory.h"
#include "qori.h"
#include "random.h"

namespace qori::test {

enum class Layout { C1, C2, C3, C4, AC4, P2, P3, P4, C3C, C4C };
enum class Kind { none, R, IR, MR };

constexpr int channels(Layout layout) {
    switch (layout) {
        case Layout::C1: return 1;
        case Layout::C2:
        case Layout::P2: return 2;
        case Layout::C3:
        case Layout::P3:
        case Layout::C3C: return 3;
        default: return 4;
    }
}
constexpr bool isPlanar(Layout layout) { return layout == Layout::P2 || layout == Layout::P3 || layout == Layout::P4; }
constexpr bool isChannelOfInterest(Layout layout) { return layout == Layout::C3C || layout == Layout::C4C; }

/// Where an image lies and how its rows follow each other. `shift` moves it from the guard page by some bytes.
struct Shape {
    int width = 1, height = 1;
    int padding = 0;       ///< Bytes between the end of a row and the next.
    bool flipped = false;  ///< Negative step.
    bool atBegin = false;  ///< Flush against the page before, else against the page behind.
    int shift = 0;

    QorImageSize roi() const { return {width, height}; }
};

std::string describe(const Shape& shape);

/// Every width around the vector sizes and a few larger ones, each packed and padded, at both guards, some flipped.
const std::vector<Shape>& smallShapes();
/// Those without negative steps, for families that check them.
const std::vector<Shape>& uprightShapes();
/// Regions whose traffic, at so many bytes per pixel, is a little more than `trafficBytes`; at alignments where stores
/// can stream and where they cannot. Of elements that lie at a multiple of their size, some row begins with a cache
/// line and some row in the middle of one.
std::vector<Shape> largeShapes(int bytesPerPixel, int trafficBytes);

/// Pixels seen through a pointer and a step, any alignment.
template <class T>
struct View {
    uint8_t* origin;
    ptrdiff_t step;
    int channels;

    T get(int x, int y, int c = 0) const {
        T value;
        std::memcpy(&value, at(x, y, c), sizeof value);
        return value;
    }
    void set(int x, int y, int c, T value) const { std::memcpy(at(x, y, c), &value, sizeof value); }

private:
    uint8_t* at(int x, int y, int c) const {
        return origin + y * step + static_cast<ptrdiff_t>(sizeof(T)) * (ptrdiff_t{x} * channels + c);
    }
};

/// A copy of an image and everything around it, for the expected result or to show that nothing changed.
struct Snapshot {
    std::vector<uint8_t> bytes;
    ptrdiff_t originOffset;
    ptrdiff_t step;

    template <class T>
    View<T> view(int channels) {
        return {bytes.data() + originOffset, step, channels};
    }
};

class TestImage {
public:
    /// Slots keep images of one call apart; a slot's memory is reused by the next image in it.
    TestImage(int slot, const Shape& shape, int pixelBytes);

    template <class T>
    T* data() const {
        return reinterpret_cast<T*>(origin_);
    }
    int32_t step() const { return static_cast<int32_t>(step_); }

    template <class T>
    View<T> view(int channels) const {
        return {origin_, step_, channels};
    }

    /// Calls next() for each element of the region, row by row.
    template <class T, class Next>
    void fill(int channels, Next next) const {
        const View<T> pixels = view<T>(channels);
        for (int y = 0; y < height_; ++y)
            for (int x = 0; x < width_; ++x)
                for (int c = 0; c < channels; ++c) pixels.set(x, y, c, next());
    }

    /// Calls each(x, y) for each pixel of the region, row by row.
    template <class Each>
    void forEach(Each each) const {
        for (int y = 0; y < height_; ++y)
            for (int x = 0; x < width_; ++x) each(x, y);
    }

    Snapshot snapshot() const;
    /// Empty when every byte, around the image too, is the snapshot's; else where the first difference is.
    std::string difference(const Snapshot& expected) const;

private:
    uint8_t* begin_;  // everything that is checked
    uint8_t* end_;
    uint8_t* origin_;  // pixel (0, 0)
    ptrdiff_t step_;
    int width_, height_, pixelBytes_;
};

/// A block of bytes that ends at a guard page, at whatever alignment that gives.
inline TestImage block(int slot, int bytes, int shift = 0) {
    return {slot, {.width = bytes, .height = 1, .shift = shift}, 1};
}

}  // namespace qori::test
