// SPDX-License-Identifier: Apache-2.0
// What happens when the loader brings the library in. The runtime's allocator is never used (memory comes from the
// companion), so there is nothing to hook.
#include "qorcore.h"

namespace {

constexpr uint64_t kFma = 0x10;
constexpr uint64_t kAvx2 = 0x20;

// A recorded start-up fact, not a dispatch switch: nothing reads it. Kept volatile so that it is there in a debugger.
volatile int32_t processorHasAvx2AndFma;

void attach() {
    constexpr uint64_t needed = kFma | kAvx2;
    processorHasAvx2AndFma = (qorGetEnabledCpuFeatures() & needed) == needed;
}

}  // namespace

#ifdef _WIN32
extern "C" int __stdcall DllMain(void* /*module*/, unsigned long reason, void* /*reserved*/) {
    constexpr unsigned long processAttach = 1;
    if (reason == processAttach) attach();
    return 1;
}
#else
__attribute__((constructor)) static void onLoad() { attach(); }
#endif
