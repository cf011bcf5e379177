// SPDX-License-Identifier: Apache-2.0
// The tests' stand-in for the companion: the same four functions, and control over how they behave.
#pragma once
#include "qorcore.h"

extern "C" {
/// Makes the n-th allocation from now on fail (1 = the next one); 0 lets all succeed.
QORCORE_API void qorTestFailAllocation(int n);
/// Reports this cache size; 0 restores the default of 32 MiB, a negative size makes the query fail.
QORCORE_API void qorTestSetCacheSize(int32_t bytes);
/// Calls of qorGetMaxCacheSizeB so far.
QORCORE_API int qorTestCacheQueries(void);
/// Calls of qorGetEnabledCpuFeatures so far.
QORCORE_API int qorTestFeatureQueries(void);
/// Blocks not yet freed.
QORCORE_API int qorTestLiveBlocks(void);
/// Unmaps the blocks of calls that were abandoned.
QORCORE_API void qorTestForgetBlocks(void);
/// Blocks that were written beyond their length, found when they were freed.
QORCORE_API int qorTestDamagedBlocks(void);
}
