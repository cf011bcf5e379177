/* SPDX-License-Identifier: Apache-2.0
 *
 * The companion of the library: memory and facts about the processor. The library imports these four functions
 * dynamically, so that another companion with the same file name can stand in.
 */
#ifndef QORCORE_H
#define QORCORE_H

#include <stdint.h>

#if defined(_WIN32) && !defined(_WIN64)
#define QORCORE_CALL __stdcall
#else
#define QORCORE_CALL
#endif

#if defined(QORCORE_BUILDING)
#if defined(_WIN32)
#define QORCORE_API
#else
#define QORCORE_API __attribute__((visibility("default")))
#endif
#elif defined(_WIN32)
#define QORCORE_API __declspec(dllimport)
#else
#define QORCORE_API
#endif

#ifdef __cplusplus
extern "C" {
#endif

/** Allocates length bytes on a 64-byte boundary. Null when length is below 1 or the memory is not to be had. */
QORCORE_API void* QORCORE_CALL qorMalloc(int32_t length);

/** Releases a block of qorMalloc; null is allowed. */
QORCORE_API void QORCORE_CALL qorFree(void* block);

/** Processor features that the processor has and the operating system enables, as bits:
 *  0x1 MMX, 0x2 SSE, 0x4 SSE2, 0x8 SSE3, 0x10 FMA3, 0x20 AVX2, 0x40 SSSE3, 0x80 SSE4.1, 0x100 SSE4.2, 0x200 AVX. */
QORCORE_API uint64_t QORCORE_CALL qorGetEnabledCpuFeatures(void);

/** Stores the size in bytes of the processor's largest data or unified cache in *pSize and returns 0; returns -8 when
 *  pSize is null and -9999 when the processor does not tell (*pSize is then 0). */
QORCORE_API int32_t QORCORE_CALL qorGetMaxCacheSizeB(int32_t* pSize);

#ifdef __cplusplus
}
#endif

#endif
