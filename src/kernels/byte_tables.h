// SPDX-License-Identifier: Apache-2.0
// Tables for moves within 16-byte halves. A row of packed pixels is seen in spans of `channels` halves, which hold
// 16 / element whole pixels; byte (pixel * channels + channel) * element + r of a span is byte r of that element.
#pragma once
#include <array>
#include <cstddef>
#include <cstdint>

#include "simd.h"

namespace qori::kernels {

struct alignas(kVectorBytes) ByteTable {
    uint8_t at[32];
};

inline constexpr uint8_t kNone = 0x80;  // the shuffle writes 0
inline constexpr uint8_t kAll = 0xFF;

/// fill(i) for both halves.
template <class Fill>
constexpr ByteTable bothHalves(Fill fill) {
    ByteTable table{};
    for (int i = 0; i < 16; ++i) table.at[i] = table.at[i + 16] = static_cast<uint8_t>(fill(i));
    return table;
}

/// Byte i of a plane's half comes from the byte of the span with this index.
constexpr int spanIndex(int i, int channels, int element, int channel) {
    return (i / element * channels + channel) * element + i % element;
}

/// Takes a channel out of a half in which the bytes of all halves that belong to it have been mixed.
template <int channels, int element>
constexpr ByteTable takeMixed(int channel) {
    return bothHalves([=](int i) { return spanIndex(i, channels, element, channel) % 16; });
}

/// Puts a plane's bytes where they go in the span, modulo 16: the inverse of takeMixed.
template <int channels, int element>
constexpr ByteTable putMixed(int channel) {
    ByteTable table{};
    for (int i = 0; i < 16; ++i) {
        const int at = spanIndex(i, channels, element, channel) % 16;
        table.at[at] = table.at[at + 16] = static_cast<uint8_t>(i);
    }
    return table;
}

/// Selects the bytes of a channel within half `half` of a span.
template <int channels, int element>
constexpr ByteTable selectChannel(int channel, int half) {
    return bothHalves([=](int i) { return (half * 16 + i) / element % channels == channel ? kAll : 0; });
}

/// Groups four interleaved channels into four 4-byte words, one per channel; its own inverse's inverse below.
template <int element>
constexpr ByteTable channelWords() {
    return bothHalves([](int i) {
        constexpr int pixels = 4 / element;
        const int channel = i / 4, pixel = i % 4 / element;
        return (pixel % pixels * 4 + channel) * element + i % element;
    });
}

template <int element>
constexpr ByteTable interleaveWords() {
    ByteTable table{};
    constexpr ByteTable forward = channelWords<element>();
    for (int i = 0; i < 16; ++i) table.at[forward.at[i]] = table.at[forward.at[i] + 16] = static_cast<uint8_t>(i);
    return table;
}

/// Where vector k of a row with pixels of `pixelBytes` finds the mask of each of its bytes: four words of the mask of
/// 32 pixels, for both halves, and an index into their bytes.
struct alignas(kVectorBytes) Window {
    int32_t words[8];
    ByteTable index;
};

template <int pixelBytes>
constexpr auto maskWindows() {
    std::array<Window, pixelBytes> all{};
    for (int k = 0; k < pixelBytes; ++k) {
        Window& window = all[static_cast<size_t>(k)];
        const int first = 32 * k / pixelBytes / 4, begin = first > 4 ? 4 : first;
        for (int i = 0; i < 8; ++i) window.words[i] = begin + i % 4;
        for (int i = 0; i < 32; ++i) window.index.at[i] = static_cast<uint8_t>((32 * k + i) / pixelBytes - 4 * begin);
    }
    return all;
}

/// Selects bytes by their position within the pixel, over a period of 96 bytes.
template <int pixelBytes>
constexpr std::array<uint8_t, 96> selectWithinPixel(int firstBytes) {
    std::array<uint8_t, 96> select{};
    for (int i = 0; i < 96; ++i) select[static_cast<size_t>(i)] = i % pixelBytes < firstBytes ? kAll : 0;
    return select;
}

}  // namespace qori::kernels
