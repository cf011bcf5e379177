// SPDX-License-Identifier: Apache-2.0
#include "cosine_table.h"

#include "kernels/transform/roots.h"

namespace qori::kernels {
namespace {

int32_t pointsOf(int32_t n) { return n % 2 == 0 ? n / 2 : n; }

constexpr int64_t inWholeLines(int64_t bytes) { return (bytes + kLineBytes - 1) / kLineBytes * kLineBytes; }

struct CosineLayout {
    int64_t roots = inWholeLines(sizeof(CosineTable)), turns, fourier, bytes;

    explicit CosineLayout(int32_t n)
        : turns(roots + (n % 2 == 0 ? inWholeLines(8 * (n / 4 + int64_t{1})) : 0)),
          fourier(turns + inWholeLines(8 * (n / 2 + int64_t{1}))),
          bytes(fourier + fourierTableBytes(pointsOf(n))) {}
};

void storeScaled(float* p, Root root, double scale) {
    p[0] = static_cast<float>(root.re * scale);
    p[1] = static_cast<float>(root.im * scale);
}

}  // namespace

int64_t cosineTableBytes(int32_t n) { return CosineLayout(n).bytes; }
int64_t cosineInitBytes(int32_t n) { return fourierInitBytes(pointsOf(n)); }
int64_t cosineWorkBytes(int32_t n) { return fourierWorkBytes(pointsOf(n)); }

void makeCosineTable(CosineTable* table, int32_t n, void* init) {
    const CosineLayout layout(n);
    auto* const bytes = reinterpret_cast<uint8_t*>(table);
    const double scale = 1 / __builtin_sqrt(static_cast<double>(n)), turnScale = scale * 0.70710678118654752440;
    *table = {n, static_cast<int32_t>(layout.fourier), static_cast<int32_t>(layout.roots),
              static_cast<int32_t>(layout.turns), static_cast<float>(scale)};
    auto* const roots = reinterpret_cast<float*>(bytes + layout.roots);
    auto* const turns = reinterpret_cast<float*>(bytes + layout.turns);
    for (int32_t k = 0; k <= n / 4 && n % 2 == 0; ++k) storeScaled(roots + 2 * k, rootOfUnity(k, n), 1);
    for (int32_t k = 0; k <= n / 2; ++k) storeScaled(turns + 2 * k, rootOfUnity(k, 4 * int64_t{n}), turnScale);
    makeFourierTable(reinterpret_cast<FourierTable*>(bytes + layout.fourier), pointsOf(n), init);
}

}  // namespace qori::kernels
