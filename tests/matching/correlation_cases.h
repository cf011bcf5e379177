// SPDX-License-Identifier: Apache-2.0
// Correlations to be called and compared with their reference.
#pragma once
#include <string_view>

#include "harness/sweep.h"
#include "reference/correlation.h"

namespace qori::test {

using reference::Normaliser;
using reference::Placement;

struct Job {
    QorImageSize src, tpl;
    Placement placement = Placement::valid;
    Normaliser normaliser = Normaliser::centred;
    int padding = 0;
    bool atBegin = false;
    int32_t scale = 0;

    QorImageSize dst() const {
        return {reference::axis(placement, src.width, tpl.width).count,
                reference::axis(placement, src.height, tpl.height).count};
    }
    int32_t algorithm(int32_t hint) const {
        constexpr int32_t kPlacements[] = {corrFull, corrValid, corrSame};
        return static_cast<int32_t>(normaliser) | kPlacements[static_cast<int>(placement)] | hint;
    }
    /// Steps of images differ, and are whole elements or not.
    Shape shape(QorImageSize size, int bytes) const {
        return {.width = size.width,
                .height = size.height,
                .padding = padding * bytes,
                .atBegin = atBegin,
                .shift = padding % 2};
    }
};

inline std::string describe(const Job& job) {
    const auto size = [](QorImageSize s) { return std::to_string(s.width) + " x " + std::to_string(s.height); };
    return size(job.tpl) + " in " + size(job.src) + ", placement " + std::to_string(static_cast<int>(job.placement)) +
           ", normaliser " + std::to_string(static_cast<int>(job.normaliser)) + ", padding " +
           std::to_string(job.padding);
}

/// Images of a job.
template <class S, class D>
struct Scene {
    const Job& job;
    int channels;
    TestImage src, tpl, dst;

    Scene(const Job& j, int n)
        : job(j),
          channels(n),
          src(0, j.shape(j.src, 1), n * static_cast<int>(sizeof(S))),
          tpl(1, j.shape(j.tpl, 3), n * static_cast<int>(sizeof(S))),
          dst(2, j.shape(j.dst(), 5), n * static_cast<int>(sizeof(D))) {
        dst.template fill<D>(n, [] { return static_cast<D>(77); });
    }

    /// Compares the channels with the reference and leaves the rest as it was. `tolerance` is absolute; of plain
    /// correlations it is relative to the sum of magnitudes that the largest elements could give.
    void compare(int processed, double tolerance, Snapshot before) const {
        const View<D> written = dst.template view<D>(channels), kept = before.template view<D>(channels);
        const QorImageSize size = job.dst();
        const int left = reference::axis(job.placement, job.src.width, job.tpl.width).first;
        const int top = reference::axis(job.placement, job.src.height, job.tpl.height).first;
        for (int c = 0; c < processed; ++c) {
            const reference::Correlation correlation(reference::plane(src.template view<S>(channels), job.src, c),
                                                     reference::plane(tpl.template view<S>(channels), job.tpl, c),
                                                     job.normaliser);
            for (int y = 0; y < size.height; ++y)
                for (int x = 0; x < size.width; ++x) {
                    const reference::Score expected = correlation.at(left + x, top + y);
                    const D result = written.get(x, y, c);
                    ASSERT_TRUE(isClose(result, expected, tolerance))
                        << "(" << x << ", " << y << ", " << c << "): " << +result << ", expected " << expected.value;
                    kept.set(x, y, c, result);
                }
        }
        QORI_EXPECT_UNCHANGED(dst, before);
    }

private:
    bool isClose(D result, reference::Score score, double tolerance) const {
        const double expected = score.value;
        if (job.normaliser == Normaliser::none) tolerance *= std::fabs(expected);
        if constexpr (std::is_floating_point_v<S>) tolerance += 1e-15 * score.condition;
        if constexpr (std::is_same_v<D, uint8_t>) {
            const double scaled = std::ldexp(expected, -job.scale), slack = std::ldexp(tolerance, -job.scale);
            const auto rounded = [](double v) { return std::nearbyint(std::fmin(std::fmax(v, 0), 255)); };
            return result >= rounded(scaled - slack) && result <= rounded(scaled + slack);
        } else {
            return std::fabs(static_cast<double>(result) - expected) <= tolerance;
        }
    }
};

}  // namespace qori::test
