// SPDX-License-Identifier: Apache-2.0
// Warps as their callers set them up: queries, plan, buffers of exactly the reported sizes against guard pages.
#pragma once
#ifndef _WIN32
#include <sys/mman.h>
#endif

#include <cmath>
#include <numbers>

#include "harness/sweep.h"
#include "reference/warp.h"

namespace qori::test {

using reference::Coefficients;
using reference::Method;

template <class T>
constexpr int32_t kTypeCode = std::is_same_v<T, uint8_t>    ? qor8u
                              : std::is_same_v<T, uint16_t> ? qor16u
                              : std::is_same_v<T, int16_t>  ? qor16s
                              : std::is_same_v<T, float>    ? qor32f
                                                            : qor64f;

enum WarpSlot { kWarpSrc, kWarpDst, kWarpPlan, kWarpInit, kWarpBuffer, kWarpOther };

struct WarpJob {
    Method method;
    Coefficients coeffs;
    bool isBackward;
    QorImageSize src, dst;
    int32_t border = borderConstant;
    std::array<double, 4> borderValue = {};

    bool readsAll() const { return (border & 7) >= borderReadAll; }
    bool isCubic() const { return method.interpolation == interpCubic; }
    int32_t direction() const { return isBackward ? 1 : 0; }
};

inline std::string describe(const WarpJob& j) {
    std::string text = "interpolation " + std::to_string(j.method.interpolation) + ", B " + std::to_string(j.method.b) +
                       ", C " + std::to_string(j.method.c) + ", border " + std::to_string(j.border) + ", " +
                       std::to_string(j.src.width) + "x" + std::to_string(j.src.height) + " to " +
                       std::to_string(j.dst.width) + "x" + std::to_string(j.dst.height) +
                       (j.isBackward ? ", backward" : ", forward");
    char number[40];
    for (double c : j.coeffs) {
        std::snprintf(number, sizeof number, " %.17g", c);
        text += number;
    }
    return text;
}

/// Calls the initialiser of the job's interpolation.
inline QorResult initWarp(const WarpJob& j, int32_t dataType, int32_t channels, QorWarpPlan* plan, uint8_t* init) {
    const double *c = j.coeffs.data(), *value = j.border == borderConstant ? j.borderValue.data() : nullptr;
    switch (j.method.interpolation) {
        case interpNearest:
            return call(qoriWarpAffineNearestInit, j.src, j.dst, dataType, c, j.direction(), channels, j.border, value,
                        int32_t{0}, plan);
        case interpLinear:
            return call(qoriWarpAffineLinearInit, j.src, j.dst, dataType, c, j.direction(), channels, j.border, value,
                        int32_t{0}, plan);
        default:
            return call(qoriWarpAffineCubicInit, j.src, j.dst, dataType, c, j.direction(), channels, double{j.method.b},
                        double{j.method.c}, j.border, value, int32_t{0}, plan, init);
    }
}

struct WarpPlanMade {
    QorWarpPlan* plan;
    QorResult status;
};

/// A filled plan; what lies around its block must have stayed as it was.
inline WarpPlanMade makeWarpPlan(const WarpJob& j, int32_t dataType, int32_t channels) {
    int32_t planBytes = -1, initBytes = -1;
    EXPECT_EQ(QOR_OK, call(qoriWarpAffineGetSize, j.src, j.dst, dataType, static_cast<const double*>(j.coeffs.data()),
                           j.method.interpolation, j.direction(), j.border, &planBytes, &initBytes));
    const TestImage plan = block(kWarpPlan, planBytes, random().below(64)), init = block(kWarpInit, initBytes + 1);
    Snapshot around = plan.snapshot();
    const QorResult status = initWarp(j, dataType, channels, plan.data<QorWarpPlan>(), init.data<uint8_t>());
    const Snapshot now = plan.snapshot();
    std::copy_n(now.bytes.begin() + around.originOffset, planBytes, around.bytes.begin() + around.originOffset);
    QORI_EXPECT_UNCHANGED(plan, around);
    return {plan.data<QorWarpPlan>(), status};
}

inline uint8_t* makeWarpBuffer(const QorWarpPlan* plan, QorImageSize size) {
    int32_t bytes = -1;
    EXPECT_EQ(QOR_OK, call(qoriWarpGetBufferSize, plan, size, &bytes));
    EXPECT_GE(bytes, 64);
    return block(kWarpBuffer, bytes, random().below(64)).data<uint8_t>();
}

/// A source with memory beyond it only where the warp may read it.
template <class T, int channels>
struct WarpSource {
    QorImageSize size;
    int before, behind;
    TestImage image;

    explicit WarpSource(const WarpJob& j)
        : size(j.src),
          before(j.readsAll() && j.isCubic() ? 1 : 0),
          behind(2 * before),
          image(kWarpSrc,
                {.width = size.width + before + behind,
                 .height = size.height + before + behind,
                 .padding = padding(),
                 .flipped = random().oneIn(3),
                 .atBegin = random().oneIn(2),
                 .shift = std::is_same_v<T, double> ? 0 : random().below(3)},
                channels * int{sizeof(T)}) {
        image.fill<T>(channels, drawPixel<T>);
    }
    static int padding() {
        const int bytes = random().below(3) * random().below(40);
        return std::is_same_v<T, double> ? bytes * 8 : bytes;
    }
    const T* origin() const {
        return reinterpret_cast<const T*>(image.data<uint8_t>() + ptrdiff_t{image.step()} * before +
                                          ptrdiff_t{int{sizeof(T)} * channels} * before);
    }
    T get(int x, int y, int c) const {
        x = std::clamp(x, -before, size.width - 1 + behind);
        y = std::clamp(y, -before, size.height - 1 + behind);
        return image.view<T>(channels).get(before + x, before + y, c);
    }
};

/// Where a warp reads.
template <class T>
struct ReadAt {
    const T* origin;
    int32_t step;
};

#ifndef _WIN32
/// The rows of a source half a gigabyte apart, in memory that is there where it is touched: from the fifth row on, byte
/// offsets leave 32 bits.
class FarRows {
public:
    static constexpr int32_t kStep = (1 << 29) + 64;

    FarRows(const uint8_t* first, ptrdiff_t step, int rows, size_t rowBytes)
        : size_(static_cast<size_t>(rows) * kStep),
          begin_(mmap(nullptr, size_, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0)) {
        if (exists())
            for (int y = 0; y < rows; ++y) std::memcpy(row(y), first + y * step, rowBytes);
    }
    ~FarRows() {
        if (exists()) munmap(begin_, size_);
    }
    FarRows(const FarRows&) = delete;
    FarRows& operator=(const FarRows&) = delete;

    bool exists() const { return begin_ != MAP_FAILED; }
    uint8_t* row(int y) const { return static_cast<uint8_t*>(begin_) + ptrdiff_t{y} * kStep; }

private:
    size_t size_;
    void* begin_;
};
#endif

}  // namespace qori::test
