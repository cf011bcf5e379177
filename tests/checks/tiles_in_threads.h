// SPDX-License-Identifier: Apache-2.0
// Threads that take the tiles of a destination as they come.
#pragma once
#include <atomic>
#include <cstdint>
#include <thread>
#include <vector>

#include "qori.h"

using Bytes = std::vector<uint8_t>;

inline void fillBytes(Bytes& bytes) {
    uint32_t state = 1;
    for (uint8_t& byte : bytes) byte = static_cast<uint8_t>((state = state * 1664525u + 1013904223u) >> 24);
}

/// makeTile(corner, size) of every tile, which may reach beyond the destination; false if any of them is.
template <class MakeTile>
bool makeTilesInThreads(QorImageSize dst, int tile, MakeTile makeTile) {
    constexpr int kThreads = 4;
    const int columns = (dst.width + tile - 1) / tile, rows = (dst.height + tile - 1) / tile;
    std::atomic<int> next{0};
    std::atomic<bool> succeeded{true};
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t)
        threads.emplace_back([&] {
            for (int i = next++; i < columns * rows; i = next++)
                if (!makeTile(QorPoint2D{i % columns * tile, i / columns * tile}, QorImageSize{tile, tile}))
                    succeeded = false;
        });
    for (std::thread& thread : threads) thread.join();
    return succeeded;
}
