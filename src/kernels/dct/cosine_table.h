// SPDX-License-Identifier: Apache-2.0
// One-dimensional cosine transforms of any length, by a Fourier transform of the elements in the order of Makhoul (A
// fast cosine transform in one and two dimensions, IEEE Trans. ASSP 28, 1980): those of even index upwards, then those
// of odd index downwards. Its frequency k, turned by k / 4 n of a turn, has the cosine coefficients k and n - k for
// parts.
#pragma once
#include "kernels/transform/fourier.h"

namespace qori::kernels {

/// Tables of one length; no addresses. At a multiple of 64.
struct CosineTable {
    int32_t n;
    int32_t fourierAt;  ///< Of n / 2 points where n is even, of n where it is odd.
    int32_t rootsAt;    ///< e^(-2 pi i k / n) for k <= n / 4, of even n.
    int32_t turnsAt;    ///< e^(-i pi k / 2 n) / sqrt(2 n) for k <= n / 2.
    float scale;        ///< 1 / sqrt(n)

    bool isOdd() const { return n % 2 != 0; }
    const FourierTable* fourier() const { return at<FourierTable>(fourierAt); }
    const float* roots() const { return at<float>(rootsAt); }
    const float* turns() const { return at<float>(turnsAt); }

    template <class T>
    const T* at(int32_t offset) const {
        return reinterpret_cast<const T*>(reinterpret_cast<const uint8_t*>(this) + offset);
    }
};

int64_t cosineTableBytes(int32_t n);
/// Memory of makeCosineTable, 0 for most n.
int64_t cosineInitBytes(int32_t n);
/// Memory of a transform beside its lines, 0 for most n.
int64_t cosineWorkBytes(int32_t n);
/// Under the default control register.
void makeCosineTable(CosineTable* table, int32_t n, void* init);

}  // namespace qori::kernels
