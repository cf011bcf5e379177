// SPDX-License-Identifier: Apache-2.0
#include "streaming.h"

#include "qorcore.h"

namespace qori {

bool hasFastStrings() {
    constexpr unsigned wideState = 0xE0;
    unsigned low = 0, high = 0;
    __asm__ volatile("xgetbv" : "=a"(low), "=d"(high) : "c"(0));
    return (low & wideState) == wideState;
}

bool streams(StreamRule rule, int32_t trafficBytes) {
    if (trafficBytes <= rule.queryAbove) return false;
    int32_t cache = 0;
    if (qorGetMaxCacheSizeB(&cache) != 0 || cache <= 0) return false;
    switch (rule.limit) {
        case StreamRule::Limit::cache: return trafficBytes >= cache;
        case StreamRule::Limit::aboveCache: return trafficBytes > cache;
        case StreamRule::Limit::halfCache: return trafficBytes >= cache / 2;
        case StreamRule::Limit::aboveHalfCache: return trafficBytes > cache / 2;
        case StreamRule::Limit::quarterCache: return trafficBytes >= cache / 4;
    }
    return false;
}

}  // namespace qori
