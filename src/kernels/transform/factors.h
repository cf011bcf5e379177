// SPDX-License-Identifier: Apache-2.0
// How lengths are transformed: by stages of their factors, by convolutions, whichever costs less.
#pragma once
#include "passes.h"

namespace qori::kernels::line {

/// What the transforms of a table are for: by themselves, or for the convolution of a prime or of a chirp.
enum class TableUse { alone, prime, chirp };

/// A length as a product of radices and of what is convolved.
struct Factors {
    int32_t radix[FourierTable::kMostStages];
    int32_t count = 0;
    int64_t convolved;

    /// The cheapest way for a use; what is convolved is 1, a prime, or for a prime's convolution a product of primes.
    Factors(int64_t n, TableUse use);

    /// Of all stages, a point.
    int64_t cost() const;

private:
    /// Odd primes from the largest, then a 2 or 4s, then 8s, of which the last has no twiddles. An 8, a 4 or a 2 goes
    /// before all where points are padded, whose first ones that stage then reads in order, and where behind the
    /// stages parts of a prime's convolution are left.
    Factors(int64_t n, TableUse use, int64_t left);

    /// The largest primes become parts of a convolution, padded, as long as that costs less than their stages.
    void convolveLargePrimes(int64_t n);
};

/// The cyclic convolution of small factors that makes a linear one of so many points at the least cost, what it lacks
/// (missingLags) included. It has three twos or more: the first stage is of radix 4 or 8, the last one of 2, 4 or 8.
int64_t convolutionPoints(int64_t linear);

/// Whether a prime costs least as a convolution of one point fewer. Below 67 sums have the smaller errors, and
/// where there are sums at all nothing is padded.
bool isRotatable(int64_t n);

}  // namespace qori::kernels::line
