// SPDX-License-Identifier: Apache-2.0
// Tables of transforms: factors of the length, twiddles, the order of frequencies, chirps.
#include <initializer_list>

#include "fourier.h"
#include "roots.h"

namespace qori::kernels {
namespace {

/// Primes up to this one are summed as they stand; beyond, a convolution with a chirp costs less.
constexpr int32_t kMostPrime = 61;
/// Lengths up to this one make every root anew and take no memory for it.
constexpr int64_t kMostWithoutMemory = 1024;

constexpr int64_t inLines(int64_t bytes) { return (bytes + kLineBytes - 1) / kLineBytes * kLineBytes; }

struct Factors {
    int32_t radix[FourierTable::kMostStages];
    int32_t count = 0;
    int64_t chirp;

    /// Odd primes from the largest, then a 2 or 4s, then 8s, of which the last has no twiddles.
    explicit Factors(int64_t n) : chirp(n) {
        for (int32_t prime = kMostPrime; prime >= 3; prime -= 2)
            if (isPrime(prime))
                for (; chirp % prime == 0; chirp /= prime) radix[count++] = prime;
        int32_t twos = 0;
        for (; chirp % 2 == 0; chirp /= 2) ++twos;
        if (twos == 1) radix[count++] = 2, twos = 0;
        for (; twos % 3 != 0; twos -= 2) radix[count++] = 4;
        for (; twos > 0; twos -= 3) radix[count++] = 8;
    }

private:
    static constexpr bool isPrime(int32_t n) {
        for (int32_t i = 3; i * i <= n; i += 2)
            if (n % i == 0) return false;
        return true;
    }
};

/// The shortest cyclic convolution of small factors that holds a chirp's linear one; powers of two are worth a tenth.
int64_t convolutionPoints(int64_t chirp) {
    const int64_t least = 2 * chirp - 1;
    const auto from = [=](int64_t n) {
        while (n < least) n *= 2;
        return n;
    };
    int64_t best = from(1);
    for (int64_t odd : {3, 5, 9, 15})
        if (from(odd) < best - best / 10) best = from(odd);
    return best;
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
        table.chirpPoints = static_cast<int32_t>(factors.chirp);
        int64_t length = n;
        for (int32_t i = 0; i < factors.count; ++i) {
            const int32_t radix = factors.radix[i];
            FourierTable::Stage& stage = table.stages[i];
            stage.radix = radix;
            stage.length = static_cast<int32_t>(length);
            stage.turns = radix % 2 == 1 ? add((radix - 1) * 4) : 0;
            stage.twiddles = length > radix ? add(length / radix * (radix - 1) * 8) : 0;
            length /= radix;
        }
        table.positionsAt = add(4 * n);
        if (factors.chirp == 1) return;
        convolution = convolutionPoints(factors.chirp);
        table.chirpAt = add(8 * factors.chirp);
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
    for (int32_t k = 0; k < table->points; ++k) {
        int32_t rest = k, position = 0;
        for (int32_t i = 0; i < table->stageCount; ++i) {
            const FourierTable::Stage& stage = table->stages[i];
            position += rest % stage.radix * (stage.length / stage.radix);
            rest /= stage.radix;
        }
        positions[k] = position + rest;
    }
}

void fillStages(FourierTable* table, const Roots& roots) {
    for (int32_t i = 0; i < table->stageCount; ++i) {
        const FourierTable::Stage& stage = table->stages[i];
        if (stage.turns != 0)
            for (int32_t k = 1; k <= stage.radix / 2; ++k) {
                const Root root = rootOfUnity(k, stage.radix);
                storeRoot(table->at<float>(stage.turns) + 2 * k - 2, {root.re, -root.im});
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
    const int64_t radix = n % 2 == 0 ? 2 : n % 3 == 0 ? 3 : 5, part = n / radix;
    for (int64_t q = 0; q < radix; ++q)
        transformDoubles(in + q * stride, stride * radix, out + q * part, part, roots, ratio * radix);
    for (int64_t k = 0; k < part; ++k) {
        Root sum[5] = {};
        for (int64_t p = 0; p < radix; ++p)
            for (int64_t q = 0; q < radix; ++q) {
                const Root term = out[q * part + k] * roots(q * (k + p * part) * ratio);
                sum[p] = {sum[p].re + term.re, sum[p].im + term.im};
            }
        for (int64_t p = 0; p < radix; ++p) out[p * part + k] = sum[p];
    }
}

/// The chirp e^(-i pi j^2 / n), and the transform of its conjugate around 0, over the convolution's length.
void fillChirp(FourierTable* table, int64_t convolution, uint8_t* init) {
    const int64_t n = table->chirpPoints;
    auto* const wave = reinterpret_cast<Root*>(init);
    Root* const spectrum = wave + convolution;
    auto* const chirp = table->at<float>(table->chirpAt);
    const auto scale = 1 / static_cast<double>(convolution);
    for (int64_t j = 0; j < convolution; ++j) wave[j] = {};
    for (int64_t j = 0; j < n; ++j) {
        const Root root = rootOfUnity(j * j % (2 * n), 2 * n);
        storeRoot(chirp + 2 * j, root);
        const Root back = {root.re * scale, -root.im * scale};
        wave[j] = back;
        if (j > 0) wave[convolution - j] = back;
    }
    const Roots roots(convolution, spectrum + convolution);
    transformDoubles(wave, 1, spectrum, convolution, roots, 1);
    for (int64_t k = 0; k < convolution; ++k) storeRoot(table->at<float>(table->spectrumAt) + 2 * k, spectrum[k]);
}

}  // namespace

int64_t fourierTableBytes(int64_t n) { return FourierLayout(n).bytes; }

int64_t fourierInitBytes(int64_t n) {
    const int64_t convolution = FourierLayout(n).convolution;
    const int64_t own = n > kMostWithoutMemory ? Roots::bytes(n) : 0;
    const int64_t ofChirp =
        convolution == 0 ? 0 : 2 * convolution * static_cast<int64_t>(sizeof(Root)) + Roots::bytes(convolution);
    return own > ofChirp ? own : ofChirp;
}

int64_t fourierWorkBytes(int64_t n) { return 2 * kLineBytes * FourierLayout(n).convolution; }

void makeFourierTable(FourierTable* table, int32_t n, void* init) {
    const FourierLayout layout(n);
    *table = layout.table;
    fillStages(table, Roots(n, n > kMostWithoutMemory ? init : nullptr));
    fillPositions(table);
    if (layout.convolution == 0) return;
    fillChirp(table, layout.convolution, static_cast<uint8_t*>(init));
    auto* const inner = table->at<FourierTable>(table->inner);
    *inner = FourierLayout(layout.convolution).table;
    const auto points = layout.convolution;
    fillStages(inner, Roots(points, points > kMostWithoutMemory ? init : nullptr));
    fillPositions(inner);
}

int64_t halfRootsInitBytes(int64_t n) { return n > kMostWithoutMemory ? Roots::bytes(n) : 0; }

void makeHalfRoots(float* roots, int32_t n, void* init) {
    const Roots ofTurn(n, n > kMostWithoutMemory ? init : nullptr);
    for (int32_t k = 0; k <= n / 4; ++k) {
        const Root root = ofTurn(k);
        storeRoot(roots + 2 * k, {root.re / 2, root.im / 2});
    }
}

}  // namespace qori::kernels
