// SPDX-License-Identifier: Apache-2.0
// Tables of transforms: twiddles, the order of frequencies, what blocks are convolved with.
#include "factors.h"
#include "roots.h"

namespace qori::kernels {
namespace {

using line::Factors, line::TableUse;

/// Lengths up to this one make every root anew and take no memory for it.
constexpr int64_t kMostWithoutMemory = 1024;

/// Convolutions up to this length, those of primes that could be summed, take none either.
constexpr int64_t kMostSmall = kMostPrimeFactor - 1;

constexpr int64_t inLines(int64_t bytes) { return (bytes + kLineBytes - 1) / kLineBytes * kLineBytes; }

/// b of a b = 1 modulo a number that has no factor in common with a.
int32_t inverseOf(int64_t a, int32_t n) {
    int32_t b = 1;
    while (a * b % n != 1) ++b;
    return b;
}

/// Twiddles are spared a stage of odd radix, and the first one of a prime's convolution, whose points are not in order
/// anyway.
constexpr bool isStageRotated(int64_t radix, int64_t part, bool isFirstOfPrime) {
    if (part == 1) return false;
    return radix % 2 == 1 ? part % radix != 0 : isFirstOfPrime && part % 2 == 1;
}

/// The record's fields and its bytes. Offsets count only where the bytes are below 2^31.
struct FourierLayout {
    FourierTable table{};
    int64_t bytes = inLines(sizeof(FourierTable));
    int64_t convolution = 0;  ///< Points of the inner table's transform,
    int64_t padded = 0;       ///< and of its own inner one's.
    int64_t ends = 0;         ///< Points of a padded block that lags are missing between, as many as factors of these.

    QORI_NOINLINE explicit FourierLayout(int64_t n, TableUse use = TableUse::alone) {
        const Factors factors(n, use);
        table.points = static_cast<int32_t>(n);
        table.stageCount = factors.count;
        table.convolvedPoints = static_cast<int32_t>(factors.convolved);
        table.isRotated = use == TableUse::alone && line::isRotatable(factors.convolved);
        int64_t length = n;
        for (int32_t i = 0; i < factors.count; ++i) {
            const int32_t radix = factors.radix[i];
            FourierTable::Stage& stage = table.stages[i];
            stage.radix = radix;
            stage.length = static_cast<int32_t>(length);
            stage.turns = radix % 2 == 1 ? add((radix / 2) * (radix / 2) * 8) : 0;
            const int64_t part = length / radix;
            if (isStageRotated(radix, part, use == TableUse::prime && i == 0))
                stage.rotation = inverseOf(part % radix, radix);
            else if (part > 1)
                stage.twiddles = add(part * (radix - 1) * 8);
            length /= radix;
        }
        if (use == TableUse::alone) table.positionsAt = add(4 * n);
        if (factors.convolved == 1) return;
        convolution = table.isRotated ? factors.convolved - 1 : line::convolutionPoints(factors.convolved);
        const FourierLayout inner = ofConvolution();
        padded = inner.convolution;
        ends = table.isRotated ? inner.ends : 2 * line::missingLags(factors.convolved, convolution);
        if (use == TableUse::alone) table.factorsAt = add(8 * factors.convolved);
        const int64_t parts = use == TableUse::prime ? n / factors.convolved : 1;
        if (padded == 0) table.spectrumAt = add(8 * (convolution + ends) * parts);
        table.inner = add(inner.bytes);
    }
    FourierLayout ofConvolution() const {
        return FourierLayout(convolution, table.isRotated ? TableUse::prime : TableUse::chirp);
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

/// The stages of a table in double precision: points come to lie as lines do.
QORI_NOINLINE void runStages(const FourierTable& table, Root* points, const Roots& roots) {
    for (int32_t i = 0; i < table.stageCount; ++i) {
        const FourierTable::Stage& stage = table.stages[i];
        const int32_t radix = stage.radix, part = stage.part();
        const int64_t ratio = table.points / stage.length;
        Root turns[kMostPrimeFactor], in[kMostPrimeFactor];
        for (int32_t q = 0; q < radix; ++q) turns[q] = rootOfUnity(q, radix);
        for (int32_t block = 0; block < table.points; block += stage.length)
            for (int32_t j = 0, start = 0; j < part; ++j) {
                Root* const at = points + block + j;
                for (int32_t q = 0; q < radix; ++q) in[q] = at[ptrdiff_t{(start + q) % radix} * part];
                for (int32_t p = 0; p < radix; ++p) {
                    Root sum = {};
                    for (int32_t q = 0; q < radix; ++q) {
                        const Root term = in[q] * turns[p * q % radix];
                        sum = {sum.re + term.re, sum.im + term.im};
                    }
                    at[ptrdiff_t{p} * part] = stage.twiddles == 0 ? sum : sum * roots(j * p * ratio);
                }
                start = (start + radix - stage.rotation) % radix;
            }
    }
}

/// Memory of the steps that make spectra.
struct SpectrumMemory {
    Root *wave, *padded;
    void* roots;  ///< Null: each is made anew.
};

void storeSpectrum(const FourierTable& inner, Root* wave, void* memory, float* out) {
    runStages(inner, wave, Roots(inner.points, memory));
    for (int32_t k = 0; k < inner.points; ++k) storeRoot(out + 2 * ptrdiff_t{k}, wave[k]);
}

/// Behind a spectrum: what missing lags are multiplied with, less what is in their places among those of the wave.
template <class Factor>
void storeMissing(int64_t n, int64_t points, const Root* wave, Factor factor, float* out) {
    const int64_t missing = line::missingLags(n, points);
    const auto store = [=](float* at, int64_t lag) {
        const Root is = wave[lag < 0 ? points + lag : lag], be = factor(lag);
        const auto scale = static_cast<double>(points);
        storeRoot(at, {(be.re - is.re) * scale, (be.im - is.im) * scale});
    };
    out += 2 * points;
    for (int64_t i = 0; i < missing; ++i, out += 2) {
        store(out, i + 1 - n);
        store(out + 2 * missing, n - 1 - i);
    }
}

/// What the frequencies of a convolution are multiplied with, in the order that its stages leave. Where they leave
/// parts, what each of these is convolved with goes around on both sides of point 0.
void fillSpectrum(FourierTable* table, const SpectrumMemory& memory) {
    auto* const inner = table->at<FourierTable>(table->inner);
    const int32_t part = inner->convolvedPoints;
    if (part == 1) return storeSpectrum(*inner, memory.wave, memory.roots, table->at<float>(table->spectrumAt));
    runStages(*inner, memory.wave, Roots(inner->points, memory.roots));
    const FourierTable& ofPart = *inner->at<FourierTable>(inner->inner);
    auto* out = inner->at<float>(inner->spectrumAt);
    for (const Root* wave = memory.wave; wave < memory.wave + inner->points; wave += part) {
        for (int32_t j = 0; j < ofPart.points; ++j) {
            const int32_t before = ofPart.points - j;
            memory.padded[j] = j < part && j <= before ? wave[j] : before < part ? wave[part - before] : Root{};
        }
        const auto factor = [=](int64_t lag) { return wave[lag < 0 ? part + lag : lag]; };
        storeMissing(part, ofPart.points, memory.padded, factor, out);
        storeSpectrum(ofPart, memory.padded, memory.roots, out);
        out += 2 * (ofPart.points + 2 * line::missingLags(part, ofPart.points));
    }
}

/// The chirp e^(-i pi j^2 / n), and of the convolution its conjugate around 0.
void fillChirp(FourierTable* table, int64_t convolution, const SpectrumMemory& memory) {
    Root* const wave = memory.wave;
    const int64_t n = table->convolvedPoints;
    auto* const chirp = table->at<float>(table->factorsAt);
    const auto scale = 1 / static_cast<double>(convolution);
    const auto rootAt = [=](int64_t j) { return rootOfUnity(j * j % (2 * n), 2 * n); };
    const auto back = [=](Root root) { return Root{root.re * scale, -root.im * scale}; };
    for (int64_t j = 0; j < convolution; ++j) wave[j] = {};
    for (int64_t j = 0; j < n; ++j) {
        const Root root = rootAt(j);
        storeRoot(chirp + 2 * j, root);
        if (2 * j <= convolution) wave[j] = wave[(convolution - j) % convolution] = back(root);
    }
    const auto factor = [=](int64_t lag) { return back(rootAt(lag)); };
    storeMissing(n, convolution, wave, factor, table->at<float>(table->spectrumAt));
    fillSpectrum(table, memory);
}

/// A number whose powers modulo a prime are all but 0: none of its powers by a factor less than p - 1 is 1.
int64_t generatorOf(int64_t p) {
    const auto isOne = [=](int64_t base, int64_t exponent) {
        int64_t product = 1;
        for (; exponent > 0; exponent /= 2, base = base * base % p)
            if (exponent % 2 == 1) product = product * base % p;
        return product == 1;
    };
    const auto generates = [=](int64_t g) {
        int64_t left = p - 1;
        for (int64_t prime = 2; prime * prime <= left; ++prime) {
            if (left % prime != 0) continue;
            if (isOne(g, (p - 1) / prime)) return false;
            while (left % prime == 0) left /= prime;
        }
        return left == 1 || !isOne(g, (p - 1) / left);
    };
    int64_t g = 2;
    while (!generates(g)) ++g;
    return g;
}

/// The powers of a generator, which say where points come from, their inverses, where frequencies go, and of the
/// convolution the roots of unity in the inverses' order.
void fillRotation(FourierTable* table, const SpectrumMemory& memory) {
    const FourierTable& inner = *table->at<FourierTable>(table->inner);
    const int64_t p = table->convolvedPoints, generator = generatorOf(p);
    auto* const powers = table->at<int32_t>(table->factorsAt);
    auto* const inverses = powers + (p - 1);
    const bool isPadded = inner.convolvedPoints > 1;
    const int64_t parts = isPadded ? (p - 1) / inner.convolvedPoints : p - 1;
    const int64_t padded = isPadded ? inner.at<FourierTable>(inner.inner)->points : 1;
    const auto scale = 1 / static_cast<double>(parts * padded);
    int64_t power = 1;
    for (int64_t k = 0; k < p - 1; ++k, power = power * generator % p) {
        const int64_t back = k == 0 ? 0 : p - 1 - k;
        powers[k] = static_cast<int32_t>(power);
        inverses[back] = static_cast<int32_t>(power);
        const Root root = rootOfUnity(power, p);
        memory.wave[back] = {root.re * scale, root.im * scale};
    }
    fillSpectrum(table, memory);
}

}  // namespace

int64_t fourierTableBytes(int64_t n) { return FourierLayout(n).bytes; }

int64_t fourierInitBytes(int64_t n) {
    const FourierLayout layout(n);
    const int64_t own = n > kMostWithoutMemory ? Roots::bytes(n) : 0;
    if (layout.convolution <= kMostSmall) return own;
    const int64_t longest = layout.convolution > layout.padded ? layout.convolution : layout.padded;
    const int64_t ofConvolution =
        (layout.convolution + layout.padded) * static_cast<int64_t>(sizeof(Root)) + Roots::bytes(longest);
    return own > ofConvolution ? own : ofConvolution;
}

int64_t fourierWorkBytes(int64_t n) {
    const FourierLayout layout(n);
    return kLineBytes * (layout.convolution + layout.padded + layout.ends);
}

void makeFourierTable(FourierTable* table, int32_t n, void* init) {
    const FourierLayout layout(n);
    *table = layout.table;
    const auto fill = [=](FourierTable* of) {
        fillStages(of, Roots(of->points, of->points > kMostWithoutMemory ? init : nullptr));
    };
    fill(table);
    fillPositions(table);
    if (layout.convolution == 0) return;
    auto* const inner = table->at<FourierTable>(table->inner);
    const FourierLayout ofConvolution = layout.ofConvolution();
    *inner = ofConvolution.table;
    fill(inner);
    if (layout.padded > 0) {
        auto* const ofPart = inner->at<FourierTable>(inner->inner);
        *ofPart = ofConvolution.ofConvolution().table;
        fill(ofPart);
    }
    Root small[kMostSmall];
    const bool isSmall = layout.convolution <= kMostSmall;
    Root *const wave = isSmall ? small : static_cast<Root*>(init), *const padded = wave + layout.convolution;
    const SpectrumMemory memory{wave, padded, isSmall ? nullptr : padded + layout.padded};
    if (table->isRotated)
        fillRotation(table, memory);
    else
        fillChirp(table, layout.convolution, memory);
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
