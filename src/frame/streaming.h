// SPDX-License-Identifier: Apache-2.0
// When a call stores past the cache. Streaming pays where the result would be evicted before anyone reads it, so the
// call's traffic is held against the largest cache; the choice never changes a result.
#pragma once
#include "image/image.h"

namespace qori {

struct StreamRule {
    enum class Limit { cache, aboveCache, halfCache, aboveHalfCache, quarterCache };
    int32_t queryAbove;  ///< Bytes of traffic up to which the cache size is not even asked for.
    Limit limit;         ///< What the traffic must reach (or exceed) to stream.
};

namespace streamRules {
/// Conversions to wider types, 32-bit copies between planar and packed, mirrors of C4, fills of 32-bit C4.
inline constexpr StreamRule widening{1'048'576, StreamRule::Limit::cache};
/// Column filters; traffic counts 16 bytes per pixel.
inline constexpr StreamRule columnFilter{INT32_MIN, StreamRule::Limit::cache};
/// 16u thresholds out of place.
inline constexpr StreamRule threshold16u{262'144, StreamRule::Limit::aboveHalfCache};
/// Copies that split or merge channels of 8- and 16-bit elements.
inline constexpr StreamRule channelSplit{524'288, StreamRule::Limit::aboveCache};
/// Zeroing and filling work buffers.
inline constexpr StreamRule workFill{2'097'152, StreamRule::Limit::aboveCache};
/// Fills of 8- and 16-bit images.
inline constexpr StreamRule constantFill{3'145'728, StreamRule::Limit::halfCache};
/// Every other copy and the arithmetic. Measured, streaming is faster from where the second-level cache ends, and from
/// a quarter of the largest on even where the source has just been written and the destination is read next.
inline constexpr StreamRule copy{1'048'576, StreamRule::Limit::quarterCache};
/// Binary patterns, which are bound by arithmetic too: measured, nothing is gained below.
inline constexpr StreamRule patterns{1'048'576, StreamRule::Limit::halfCache};
}  // namespace streamRules

/// Bytes that a call moves, in 32-bit arithmetic that wraps: a call too large to count does not stream.
constexpr int32_t traffic(QorImageSize roi, int bytesPerPixel) {
    return static_cast<int32_t>(static_cast<uint32_t>(bytesPerPixel) * static_cast<uint32_t>(roi.width) *
                                static_cast<uint32_t>(roi.height));
}

/// The same count where it does not wrap: copies that are too large to count stream as other large ones do.
constexpr int32_t wholeTraffic(QorImageSize roi, int bytesPerPixel) {
    return int64_t{roi.width} * roi.height > INT32_MAX / bytesPerPixel ? INT32_MAX : traffic(roi, bytesPerPixel);
}

/// Asks the companion for the cache size on every call above the rule's bound; false when it cannot tell.
bool streams(StreamRule rule, int32_t trafficBytes);

/// Whether the processor moves long rows fast by its string instructions. The state that the operating system enables
/// tells in some ten cycles what cpuid tells in microseconds where a hypervisor catches it, and nothing needs to be
/// kept from earlier calls: whatever has 512-bit registers (state bits 5 to 7) has enhanced string moves.
bool hasFastStrings();

/// Whether a call that does not stream moves or fills long rows by string instructions: from half a megabyte written
/// on, as vectors are as fast in the second-level cache.
inline bool usesStrings(QorImageSize roi, int pixelBytes) {
    constexpr int smallest = 524'288;
    return int64_t{roi.width} * roi.height >= smallest / pixelBytes && hasFastStrings();
}

}  // namespace qori
