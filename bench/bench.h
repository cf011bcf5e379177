// SPDX-License-Identifier: Apache-2.0
// A benchmark row is an operation at a size. Its contenders run in turn, round after round, in one process: ours, the
// plain loop as the compiler makes it, a peer where there is one, and the roofline, which moves the same bytes and
// does nothing else. Rates and ratios come from the medians of the rounds.
#pragma once
#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "qori.h"

namespace qori::bench {

struct Size {
    int width, height;

    int64_t pixels() const { return int64_t{width} * height; }
    QorImageSize roi() const { return {width, height}; }
};

/// In L1, in L2, beyond L2, and a narrow region where calls and tails show.
inline constexpr Size kL1{64, 64}, kL2{512, 512}, kFrame{3840, 2160}, kNarrow{13, 4096}, kSmall{16, 16};
inline const std::vector<Size> kSizes = {kL1, kL2, kFrame, kNarrow};
/// Whole-image copies, by bytes of 8u C1: 64 KiB, 4 MiB, 256 MiB.
inline const std::vector<Size> kContiguous = {{256, 256}, {2048, 2048}, {16384, 16384}};

/// An image with rows on 64-byte boundaries, or packed. Filled with noise of the given range.
template <class T>
class Image {
public:
    Image(Size size, int channels, bool packed = false)
        : step_(static_cast<int32_t>(packed ? size.width * channels * sizeof(T)
                                            : (size.width * channels * sizeof(T) + 63) / 64 * 64)),
          size_(size),
          channels_(channels),
          memory_(static_cast<uint8_t*>(std::aligned_alloc(
                      64, (static_cast<size_t>(step_) * static_cast<size_t>(size.height) + 63) / 64 * 64)),
                  std::free) {
        uint32_t state = 1;
        for (int y = 0; y < size.height; ++y)
            for (int i = 0; i < size.width * channels; ++i)
                row(y)[i] = static_cast<T>((state = state * 1664525u + 1013904223u) >> 24);
    }
    T* data() const { return reinterpret_cast<T*>(memory_.get()); }
    T* row(int y) const { return reinterpret_cast<T*>(memory_.get() + ptrdiff_t{step_} * y); }
    int32_t step() const { return step_; }
    int elements() const { return size_.width * channels_; }
    int height() const { return size_.height; }

private:
    int32_t step_;
    Size size_;
    int channels_;
    std::shared_ptr<uint8_t> memory_;
};

/// An image that ours and the plain loop write alike: compared once, before anything is timed.
struct Output {
    std::function<std::vector<double>()> elements = {};
    std::function<void()> spoil = {};
    double within = 0;  ///< How far elements may differ, relative to those above 1.
};

template <class T>
Output outputOf(const Image<T>& image, double within = 0) {
    return {[=] {
                std::vector<double> all;
                for (int y = 0; y < image.height(); ++y)
                    all.insert(all.end(), image.row(y), image.row(y) + image.elements());
                return all;
            },
            [=] {
                for (int y = 0; y < image.height(); ++y) std::fill_n(image.row(y), image.elements(), T{77});
            },
            within};
}

/// What a row runs; closures keep their images alive. Empty ones are left out.
struct Contenders {
    std::function<void()> ours;
    std::function<void()> plain;
    std::function<void()> peer;
    Output output = {};
};

/// Around every call of the library: a benchmark of a refusal says nothing.
inline void must(QorResult status) {
    if (status >= QOR_OK) [[likely]]
        return;
    std::fprintf(stderr, "a call that is measured failed: status %d\n", status);
    std::exit(1);
}

enum class Roofline {
    copy,  ///< memcpy of as many bytes read and written
    set,   ///< memset of as many bytes written
    read   ///< vector loads of as many bytes read
};

struct Row {
    std::string operation;  ///< For example "copy 8u C3".
    double bytesPerPixel;   ///< Read plus written.
    std::vector<Size> sizes;
    std::function<Contenders(Size)> make;
    Roofline roofline = Roofline::copy;
    /// Best known rates in Mpix/s at 512x512 and 3840x2160, from a machine on which memcpy of 8u C1 ran at 51,853 and
    /// 15,345; 0 where none is known.
    double bestAtL2 = 0, bestAtFrame = 0;
    std::string peerName = {};
    /// Best known rate at the row's own size, held against memcpy at 3840x2160 like bestAtFrame.
    double best = 0;
};

/// Registers rows before main.
struct Rows {
    explicit Rows(std::vector<Row> rows);
};

using Block = std::shared_ptr<uint8_t>;

inline Block allocate(size_t bytes) {
    return {static_cast<uint8_t*>(std::aligned_alloc(64, (bytes + 63) / 64 * 64)), std::free};
}

/// One step of a ladder: neighbours differ a little in one parameter.
struct Step {
    std::string name;
    double units;  ///< What the work should grow with.
    std::function<void()> work;
};

/// An operation over a range of one parameter. Between neighbours, the one with more units should take no longer than
/// in proportion, and the one with fewer no longer than the other; by how much they do is the size of the step.
struct Ladder {
    std::string operation;
    std::function<std::vector<Step>()> make;
    std::string reason = {};  ///< Why a step above 2 has to be.
};

/// Registers ladders before main.
struct Ladders {
    explicit Ladders(std::vector<Ladder> ladders);
};

/// Plain loops must not turn into memcpy or be moved out of the timing: keeps the compiler from looking through.
inline void keep(const void* p) { __asm__ volatile("" : : "g"(p) : "memory"); }

}  // namespace qori::bench
