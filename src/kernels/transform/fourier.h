// SPDX-License-Identifier: Apache-2.0
// One-dimensional discrete Fourier transforms of eight columns at once, of any length, in place.
//
// Points are lines (butterflies.h): point k of eight sequences is 16 floats at lines + 16 k, aligned to 64 bytes, eight
// real parts and then eight imaginary ones. A transform is the forward one, sum x(j) e^(-2 pi i j k / n), not scaled.
// It leaves frequency k at line positions()[k]: decimation in frequency without the reordering, which is free for
// whoever reads the lines next.
//
// The inverse is the same transform between exchanged parts: store the imaginary part where the real one belongs and
// the other way round, transform, and read the parts exchanged again.
//
//     int64_t fourierTableBytes(n)       the record with its tables; below 1: larger than 2^31 - 1
//     int64_t fourierInitBytes(n)        memory of makeFourierTable, 0 for most n
//     int64_t fourierWorkBytes(n)        memory of a transform beside its lines, 0 for most n
//     makeFourierTable(record, n, init)  under the default control register, as everything here
//     transformLines(record, lines, work)
//
// Real sequences, n even: transform n / 2 points whose real parts are the even elements, which is n rows of eight
// floats one behind the other as they are, then splitHalves. n odd: transform n points of two real sequences, one in
// the real parts, one in the imaginary ones, then splitPairs. Their inverses are joinHalves and joinPairs, then
// transformLines.
//
// A record holds no addresses: it may be copied to memory of the same alignment (64), and is only read by transforms.
#pragma once
#include <cstdint>

#include "butterflies.h"

namespace qori::kernels {

/// Primes up to this one are summed as they stand; beyond, a convolution costs less.
inline constexpr int kMostPrimeFactor = 97;

struct FourierTable {
    static constexpr int kMostStages = 20;  ///< 3^20 is above 2^31.

    /// Blocks of `length` points become `radix` blocks, one for each remainder of frequencies.
    struct Stage {
        int32_t radix, length;
        int32_t turns;  ///< Where cosines and sines of 2 pi m q / radix are, of an odd radix, for q and m to its half.
        int32_t twiddles;  ///< Where (radix - 1) complex factors for each of length / radix points are, or 0.
        /// Of an odd radix r that has no factor in common with the part m = length / r, instead of twiddles: the
        /// inverse of m modulo r. With 1 = r s + m t a twiddle e^(-2 pi i p j / length) is e^(-2 pi i p j t / r), which
        /// moves point q of the butterfly to q + j t, times e^(-2 pi i p j s / m), which moves frequency k of the part
        /// to k + p s (Good: The interaction algorithm and practical Fourier analysis, 1958).
        int32_t rotation;

        int32_t part() const { return length / radix; }
        /// s of the above, where there is a rotation.
        int32_t shift() const { return static_cast<int32_t>((1 + int64_t{part()} * (radix - rotation)) / radix); }
    };

    int32_t points, stageCount;
    /// The length of the blocks that the stages leave; above 1 it is a prime, or a product of large primes. Each block
    /// is convolved, with roots of unity in the order of a generator's powers (isRotated) or with a chirp, by
    /// transforms of the table at `inner`. Where the stages of that one leave blocks again, they are parts of the
    /// convolution, each cyclic, and go through longer ones by transforms of its own inner table.
    int32_t convolvedPoints;
    bool isRotated;
    int32_t positionsAt, factorsAt, spectrumAt, inner;
    Stage stages[kMostStages];

    /// Of tables that are not inner ones.
    const int32_t* positions() const { return at<int32_t>(positionsAt); }
    template <class T>
    const T* at(int32_t offset) const {
        return reinterpret_cast<const T*>(reinterpret_cast<const uint8_t*>(this) + offset);
    }
    template <class T>
    T* at(int32_t offset) {
        return reinterpret_cast<T*>(reinterpret_cast<uint8_t*>(this) + offset);
    }
};

int64_t fourierTableBytes(int64_t n);
int64_t fourierInitBytes(int64_t n);
int64_t fourierWorkBytes(int64_t n);
void makeFourierTable(FourierTable* table, int32_t n, void* init);
void transformLines(const FourierTable* table, float* lines, float* work);

/// Factors that splitHalves and joinHalves take for n / 2 points, for each k to n / 4: the parts of e^(-2 pi i k / n) /
/// 2, and 1/2 plus and minus the imaginary one.
inline constexpr int kHalfRootFloats = 4;
constexpr int64_t halfRootsBytes(int64_t n) { return (n / 4 + 1) * kHalfRootFloats * 4; }
/// init: memory of halfRootsInitBytes(n), or none, and each root takes longer.
int64_t halfRootsInitBytes(int64_t n);
void makeHalfRoots(float* roots, int32_t n, void* init = nullptr);

/// From the transform of n / 2 points to the spectra of eight real sequences of n: frequency k at positions[k] for
/// 0 < k < n / 2; at positions[0] the real frequencies 0 and n / 2 in the places of the parts.
void splitHalves(float* lines, int32_t n, const int32_t* positions, const float* roots);
/// From such spectra in natural order to the points whose transform is the sequences, parts exchanged
/// (element 2 k of a sequence comes out in the place of the imaginary part). Not scaled: n times the sequence.
void joinHalves(float* lines, int32_t n, const float* roots);

/// From the transform of n points to the spectra of two times eight real sequences: for 0 < k < n - k, frequency k of
/// those in the real parts at positions[k], of the others at positions[n - k]. At positions[0], and [n / 2] of an even
/// n, the real frequencies of both.
void splitPairs(float* lines, int32_t n, const int32_t* positions);
/// From such spectra in natural order to points whose transform is the sequences, parts exchanged. Not scaled.
void joinPairs(float* lines, int32_t n);

}  // namespace qori::kernels
