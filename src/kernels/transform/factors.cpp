// SPDX-License-Identifier: Apache-2.0
#include "factors.h"

#include <initializer_list>

namespace qori::kernels::line {
namespace {

constexpr bool isPrime(int64_t n) {
    for (int64_t i = 3; i * i <= n; i += 2)
        if (n % i == 0) return false;
    return true;
}

/// What is left of n without prime factors that have kernels.
constexpr int64_t withoutSummed(int64_t n) {
    for (int64_t prime = 2; prime <= kMostPrimeFactor && n > 1; ++prime)
        while (n % prime == 0) n /= prime;
    return n;
}

/// The largest prime with a kernel for any that divides n, or 1.
constexpr int64_t largestSummed(int64_t n) {
    for (int64_t small : {2, 3, 5, 7})
        while (n % small == 0) n /= small;
    for (int64_t prime = kMostPrimeFactor; prime > 7 && n > 1; prime -= 2)
        if (n % prime == 0 && isPrime(prime)) return prime;
    return 1;
}

/// What a stage costs a point, whose blocks become blocks of `part`. Costs are hundredths of a nanosecond, measured on
/// one machine; only their proportions matter. Sums over many sizes are within 7 % of what was measured.
constexpr int64_t stageCost(int64_t radix, int64_t part) {
    const int64_t beyondCache = radix * part > kPointsAtOnce ? 32 : 0;
    switch (radix) {
        case 2: return 50 + beyondCache;
        case 3: return (part % 3 == 0 ? 115 : 98) + beyondCache;
        case 4: return (part == 1 ? 88 : 109) + beyondCache;
        case 5: return (part % 5 == 0 ? 160 : 140) + beyondCache;
        case 7: return (part % 7 == 0 ? 245 : 225) + beyondCache;
        case 8: return (part == 1 ? 124 : 164) + beyondCache;
        default: return 119 + 18 * radix + beyondCache;
    }
}

/// What points cost beside their stages, with those of so many lines: next to as many as a first-level cache holds
/// there is no room for the points of the whole, and beyond the cache a first stage of radix 8 waits for memory.
int64_t placeCost(int64_t lines, const Factors& factors) {
    constexpr int64_t most = kPointsAtOnce;
    if (lines > most) return factors.radix[0] == 8 ? 120 : 40;
    return lines > most - most / 4 ? 160 : 0;
}

int64_t paddedCost(int64_t n, int64_t points);

/// Of all points of a convolution, forth and back, with those of the parts that are left; `ends` lines are beside them.
int64_t convolutionCost(int64_t points, const Factors& factors, int64_t ends = 0) {
    const int64_t ofStages = (2 * factors.cost() + placeCost(points + ends, factors)) * points,
                  part = factors.convolved;
    if (part == 1) return ofStages;
    return ofStages + points / part * paddedCost(part, convolutionPoints(part));
}

/// Of a block in a longer convolution, with the sums of what that one lacks; short ones are hardly more than calls.
int64_t paddedCost(int64_t n, int64_t points) {
    constexpr int64_t ofCalls = 6000, ofEnd = 60, ofProduct = 70;
    const int64_t missing = missingLags(n, points);
    const int64_t whole = convolutionCost(points, Factors(points, TableUse::chirp), 2 * missing);
    return whole + ofCalls + missing * (ofEnd + (missing + 1) * ofProduct);
}

}  // namespace

Factors::Factors(int64_t n, TableUse use, int64_t left) : convolved(left) {
    const auto addAll = [this](int64_t prime, int64_t& of) {
        for (; of % prime == 0; of /= prime) radix[count++] = static_cast<int32_t>(prime);
    };
    n /= left;
    int32_t twos = 0;
    for (; n % 2 == 0; n /= 2) ++twos;
    if (use == TableUse::chirp || (use == TableUse::prime && convolved > 1)) {
        const bool isEight = twos % 3 == 0 && (twos > 3 || use == TableUse::prime);
        const int32_t first = isEight ? 3 : twos == 1 ? 1 : 2;
        radix[count++] = 1 << first;
        twos -= first;
    }
    for (int64_t prime = largestSummed(n); prime > 1; prime = largestSummed(n)) addAll(prime, n);
    for (int64_t prime : {7, 5, 3}) addAll(prime, n);
    if (twos == 1) radix[count++] = 2, twos = 0;
    for (; twos % 3 != 0; twos -= 2) radix[count++] = 4;
    for (; twos > 0; twos -= 3) radix[count++] = 8;
}

Factors::Factors(int64_t n, TableUse use) : Factors(n, use, use == TableUse::chirp ? 1 : withoutSummed(n)) {
    if (use == TableUse::alone && convolved == 1 && count > 0 && isRotatable(radix[0])) {
        convolved = radix[0];
        for (int32_t i = 1; i < count; ++i) radix[i - 1] = radix[i];
        --count;
    }
    if (use == TableUse::prime) convolveLargePrimes(n);
}

int64_t Factors::cost() const {
    int64_t sum = 0, part = convolved;
    for (int32_t i = count - 1; i >= 0; --i) {
        sum += stageCost(radix[i], part);
        part *= radix[i];
    }
    return sum;
}

void Factors::convolveLargePrimes(int64_t n) {
    Factors next = *this;
    for (int64_t least = convolutionCost(n, *this);;) {
        const int64_t prime = largestSummed(n / next.convolved);
        if (prime == 1) return;
        next = Factors(n, TableUse::prime, next.convolved * prime);
        const int64_t cost = convolutionCost(n, next);
        if (cost < least) {
            least = cost;
            *this = next;
        }
    }
}

int64_t convolutionPoints(int64_t linear) {
    constexpr int64_t mostOdd = 135;
    int64_t best = 0, least = INT64_MAX;
    const auto consider = [&](int64_t points) {
        const int64_t cost = paddedCost(linear, points);
        if (cost >= least) return;
        least = cost;
        best = points;
    };
    for (int64_t threes = 1; threes <= mostOdd; threes *= 3)
        for (int64_t fives = threes; fives <= mostOdd; fives *= 5)
            for (int64_t odd = fives; odd <= mostOdd; odd *= 7) {
                int64_t points = 8 * odd;
                while (points < 2 * linear - 1) {
                    if (mayLackLags(linear, points)) consider(points);
                    points *= 2;
                }
                consider(points);
            }
    return best;
}

constexpr int64_t kLeastRotated = 67;
bool isRotatable(int64_t n) {
    if (n < kLeastRotated || !isPrime(n)) return false;
    const Factors factors(n - 1, TableUse::prime);
    const int64_t cost = convolutionCost(n - 1, factors);
    if (n <= kMostPrimeFactor) return factors.convolved == 1 && cost < stageCost(n, 1) * n;
    return cost < paddedCost(n, convolutionPoints(n));
}

}  // namespace qori::kernels::line
