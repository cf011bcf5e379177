// SPDX-License-Identifier: Apache-2.0
// Tables of transforms: factors of the length, twiddles, the order of frequencies, what blocks are convolved with.
#include <initializer_list>

#include "fourier.h"
#include "roots.h"

namespace qori::kernels {
namespace {

/// Lengths up to this one make every root anew and take no memory for it.
constexpr int64_t kMostWithoutMemory = 1024;

/// Convolutions up to this length, those of primes that could be summed, take none either.
constexpr int64_t kMostSmall = kMostPrimeFactor - 1;

constexpr int64_t inLines(int64_t bytes) { return (bytes + kLineBytes - 1) / kLineBytes * kLineBytes; }

constexpr bool isPrime(int64_t n) {
    for (int64_t i = 3; i * i <= n; i += 2)
        if (n % i == 0) return false;
    return true;
}

/// Calls each(prime) for the prime factors of n up to a bound, as often as they divide it; returns what is left.
template <class Each>
constexpr int64_t forPrimeFactors(int64_t n, int64_t bound, Each each) {
    for (int64_t prime = 2; prime <= bound; ++prime)
        for (; n % prime == 0; n /= prime) each(prime);
    return n;
}

/// Primes whose predecessor's factors without kernels of their own have a small sum are convolved: a stage of radix q
/// costs about 2 q a point, forth and back, a convolution with a chirp 200 to 300 points' worth of vector operations
/// for each of its own. Primes that could be summed, (p - 1)^2 / 2 operations, gain from 67 on where that sum is next
/// to nothing.
constexpr int64_t kLeastRotated = 67, kMostSum = 45, kMostSumOfSummed = 13;
constexpr bool isRotatable(int64_t n) {
    if (n < kLeastRotated) return false;
    const int64_t most = n <= kMostPrimeFactor ? kMostSumOfSummed : kMostSum;
    int64_t sum = 0;
    const int64_t left = forPrimeFactors(n - 1, most, [&](int64_t prime) { sum += prime > 7 ? prime : 0; });
    return left == 1 && sum <= most && isPrime(n);
}

struct Factors {
    int32_t radix[FourierTable::kMostStages];
    int32_t count = 0;
    int64_t convolved;

    /// Odd primes from the largest, then a 2 or 4s, then 8s, of which the last has no twiddles.
    explicit Factors(int64_t n) : convolved(n) {
        for (int32_t prime = kMostPrimeFactor; prime >= 3; prime -= 2)
            if (isPrime(prime))
                for (; convolved % prime == 0; convolved /= prime) radix[count++] = prime;
        int32_t twos = 0;
        for (; convolved % 2 == 0; convolved /= 2) ++twos;
        if (convolved == 1 && count > 0 && isRotatable(radix[0])) {
            convolved = radix[0];
            for (int32_t i = 1; i < count; ++i) radix[i - 1] = radix[i];
            --count;
        }
        if (twos == 1) radix[count++] = 2, twos = 0;
        for (; twos % 3 != 0; twos -= 2) radix[count++] = 4;
        for (; twos > 0; twos -= 3) radix[count++] = 8;
    }
};

/// The shortest cyclic convolution of small factors that holds a chirp's linear one; powers of two, of few stages, are
/// worth a twentieth. Its twos are 3 or more: the last stage is not of radix 2.
int64_t convolutionPoints(int64_t chirp) {
    const int64_t least = 2 * chirp - 1;
    const auto from = [=](int64_t n) {
        while (n < least) n *= 2;
        return n;
    };
    int64_t best = from(8);
    int64_t mostOdd = best - best / 20;
    for (int64_t odd : {3, 5, 9, 15, 25, 27, 45, 75})
        if (from(8 * odd) <= mostOdd) best = mostOdd = from(8 * odd);
    return best;
}

/// b of a b = 1 modulo a prime.
int32_t inverseOf(int64_t a, int32_t prime) {
    int32_t b = 1;
    while (a * b % prime != 1) ++b;
    return b;
}

/// The record's fields and its bytes. Offsets count only where the bytes are below 2^31.
struct FourierLayout {
    FourierTable table{};
    int64_t bytes = inLines(sizeof(FourierTable));
    int64_t convolution = 0;

    explicit FourierLayout(int64_t n) {
        const Factors factors(n);
        table.points = static_cast<int32_t>(n);
        table.stageCount = factors.count;
        table.convolvedPoints = static_cast<int32_t>(factors.convolved);
        table.isRotated = isRotatable(factors.convolved);
        int64_t length = n;
        for (int32_t i = 0; i < factors.count; ++i) {
            const int32_t radix = factors.radix[i];
            FourierTable::Stage& stage = table.stages[i];
            stage.radix = radix;
            stage.length = static_cast<int32_t>(length);
            stage.turns = radix % 2 == 1 ? add((radix / 2) * (radix / 2) * 8) : 0;
            const int64_t part = length / radix;
            if (part > 1 && radix % 2 == 1 && part % radix != 0)
                stage.rotation = inverseOf(part % radix, radix);
            else if (part > 1)
                stage.twiddles = add(part * (radix - 1) * 8);
            length /= radix;
        }
        table.positionsAt = add(4 * n);
        if (factors.convolved == 1) return;
        convolution = table.isRotated ? factors.convolved - 1 : convolutionPoints(factors.convolved);
        table.factorsAt = add(8 * factors.convolved);
        table.spectrumAt = add(8 * convolution);
        table.inner = add(FourierLayout(convolution).bytes);
    }

private:
    int32_t add(int64_t size) {
        const int64_t offset = bytes;
        bytes += inLines(size);
        return static_cast<int32_t>(offset);
    }
};

void storeRoot(float* p, Root root) {
    p[0] = static_cast<float>(root.re);
    p[1] = static_cast<float>(root.im);
}

/// Frequencies that start alike are apart by the radices so far; their lines lie together.
void fillPositions(FourierTable* table) {
    auto* const positions = table->at<int32_t>(table->positionsAt);
    int32_t parts[FourierTable::kMostStages], shifts[FourierTable::kMostStages];
    for (int32_t i = 0; i < table->stageCount; ++i) {
        parts[i] = table->stages[i].part();
        shifts[i] = table->stages[i].rotation == 0 ? 0 : table->stages[i].shift();
    }
    for (int32_t k = 0; k < table->points; ++k) {
        int32_t rest = k, position = 0;
        for (int32_t i = 0; i < table->stageCount; ++i) {
            const int32_t remainder = rest % table->stages[i].radix;
            position += remainder * parts[i];
            rest /= table->stages[i].radix;
            if (shifts[i] != 0) rest = (rest + remainder * shifts[i]) % parts[i];  // below radix * part before
        }
        positions[k] = position + rest;
    }
}

void fillStages(FourierTable* table, const Roots& roots) {
    for (int32_t i = 0; i < table->stageCount; ++i) {
        const FourierTable::Stage& stage = table->stages[i];
        if (stage.turns != 0) {
            auto* turn = table->at<float>(stage.turns);
            for (int32_t q = 1; q <= stage.radix / 2; ++q)
                for (int32_t m = 1; m <= stage.radix / 2; ++m, turn += 2) {
                    const Root root = rootOfUnity(q * m % stage.radix, stage.radix);
                    storeRoot(turn, {root.re, -root.im});
                }
        }
        if (stage.twiddles == 0) continue;
        auto* out = table->at<float>(stage.twiddles);
        const int64_t ratio = table->points / stage.length;
        for (int64_t j = 0; j < stage.length / stage.radix; ++j)
            for (int32_t p = 1; p < stage.radix; ++p, out += 2) storeRoot(out, roots(j * p * ratio));
    }
}

/// A transform in double precision, by the factors of n one after the other.
void transformDoubles(const Root* in, int64_t stride, Root* out, int64_t n, const Roots& roots, int64_t ratio) {
    if (n == 1) {
        *out = *in;
        return;
    }
    int64_t radix = 2;
    while (n % radix != 0) ++radix;
    const int64_t part = n / radix;
    for (int64_t q = 0; q < radix; ++q)
        transformDoubles(in + q * stride, stride * radix, out + q * part, part, roots, ratio * radix);
    for (int64_t k = 0; k < part; ++k) {
        Root sum[kMostSum] = {};
        for (int64_t p = 0; p < radix; ++p)
            for (int64_t q = 0; q < radix; ++q) {
                const Root term = out[q * part + k] * roots(q * (k + p * part) * ratio);
                sum[p] = {sum[p].re + term.re, sum[p].im + term.im};
            }
        for (int64_t p = 0; p < radix; ++p) out[p * part + k] = sum[p];
    }
}

/// The transform of a wave of the convolution's length, in the order that the inner transform leaves. Behind the wave
/// is memory for the transform, and unless each root is to be made anew, for roots.
void fillSpectrum(FourierTable* table, int64_t convolution, Root* wave) {
    Root* const spectrum = wave + convolution;
    const Roots roots(convolution, convolution > kMostSmall ? spectrum + convolution : nullptr);
    transformDoubles(wave, 1, spectrum, convolution, roots, 1);
    const int32_t* const positions = table->at<FourierTable>(table->inner)->positions();
    for (int64_t k = 0; k < convolution; ++k)
        storeRoot(table->at<float>(table->spectrumAt) + 2 * ptrdiff_t{positions[k]}, spectrum[k]);
}

/// The chirp e^(-i pi j^2 / n), and of the convolution its conjugate around 0.
void fillChirp(FourierTable* table, int64_t convolution, Root* wave) {
    const int64_t n = table->convolvedPoints;
    auto* const chirp = table->at<float>(table->factorsAt);
    const auto scale = 1 / static_cast<double>(convolution);
    for (int64_t j = 0; j < convolution; ++j) wave[j] = {};
    for (int64_t j = 0; j < n; ++j) {
        const Root root = rootOfUnity(j * j % (2 * n), 2 * n);
        storeRoot(chirp + 2 * j, root);
        const Root back = {root.re * scale, -root.im * scale};
        wave[j] = back;
        if (j > 0) wave[convolution - j] = back;
    }
    fillSpectrum(table, convolution, wave);
}

/// A number whose powers modulo a rotatable prime are all but 0: none of its powers by a factor less than p - 1 is 1.
int64_t generatorOf(int64_t p) {
    const auto isOne = [=](int64_t base, int64_t exponent) {
        int64_t product = 1;
        for (; exponent > 0; exponent /= 2, base = base * base % p)
            if (exponent % 2 == 1) product = product * base % p;
        return product == 1;
    };
    for (int64_t g = 2;; ++g) {
        bool generates = true;
        forPrimeFactors(p - 1, kMostSum, [&](int64_t prime) { generates &= !isOne(g, (p - 1) / prime); });
        if (generates) return g;
    }
}

/// The powers of a generator, which say where points come from, their inverses, where frequencies go, and of the
/// convolution the roots of unity in the inverses' order.
void fillRotation(FourierTable* table, Root* wave) {
    const int64_t p = table->convolvedPoints, generator = generatorOf(p);
    auto* const powers = table->at<int32_t>(table->factorsAt);
    auto* const inverses = powers + (p - 1);
    const auto scale = 1 / static_cast<double>(p - 1);
    int64_t power = 1;
    for (int64_t k = 0; k < p - 1; ++k, power = power * generator % p) {
        const int64_t back = k == 0 ? 0 : p - 1 - k;
        powers[k] = static_cast<int32_t>(power);
        inverses[back] = static_cast<int32_t>(power);
        const Root root = rootOfUnity(power, p);
        wave[back] = {root.re * scale, root.im * scale};
    }
    fillSpectrum(table, p - 1, wave);
}

}  // namespace

int64_t fourierTableBytes(int64_t n) { return FourierLayout(n).bytes; }

int64_t fourierInitBytes(int64_t n) {
    const int64_t convolution = FourierLayout(n).convolution;
    const int64_t own = n > kMostWithoutMemory ? Roots::bytes(n) : 0;
    const int64_t ofConvolution =
        convolution <= kMostSmall ? 0
                                  : 2 * convolution * static_cast<int64_t>(sizeof(Root)) + Roots::bytes(convolution);
    return own > ofConvolution ? own : ofConvolution;
}

int64_t fourierWorkBytes(int64_t n) { return kLineBytes * FourierLayout(n).convolution; }

void makeFourierTable(FourierTable* table, int32_t n, void* init) {
    const FourierLayout layout(n);
    *table = layout.table;
    fillStages(table, Roots(n, n > kMostWithoutMemory ? init : nullptr));
    fillPositions(table);
    if (layout.convolution == 0) return;
    auto* const inner = table->at<FourierTable>(table->inner);
    *inner = FourierLayout(layout.convolution).table;
    const auto points = layout.convolution;
    fillStages(inner, Roots(points, points > kMostWithoutMemory ? init : nullptr));
    fillPositions(inner);
    Root small[2 * kMostSmall];
    Root* const wave = points > kMostSmall ? static_cast<Root*>(init) : small;
    if (table->isRotated)
        fillRotation(table, wave);
    else
        fillChirp(table, points, wave);
}

int64_t halfRootsInitBytes(int64_t n) { return n > kMostWithoutMemory ? Roots::bytes(n) : 0; }

void makeHalfRoots(float* roots, int32_t n, void* init) {
    const Roots ofTurn(n, n > kMostWithoutMemory ? init : nullptr);
    for (int32_t k = 0; k <= n / 4; ++k, roots += kHalfRootFloats) {
        const Root root = ofTurn(k);
        storeRoot(roots, {root.re / 2, root.im / 2});
        storeRoot(roots + 2, {(1 + root.im) / 2, (1 - root.im) / 2});
    }
}

}  // namespace qori::kernels
