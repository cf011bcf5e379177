// SPDX-License-Identifier: Apache-2.0
// Codes straight from the image, without rows of keys: several rows at a time. Bytes become keys when they are loaded
// and wait in registers for the rows below that see them: eight rows of codes take ten rows of keys, 3.75 loads and as
// many changes of sign a block instead of 9. Floats need no keys, and their comparisons load them.
//
// Codes are made of columns begin to end, at least a block, in whole blocks: the first at begin, the last before end,
// over some of the one before it.
#pragma once
#include <algorithm>

#include "kernels/streamed_lines.h"
#include "patterns.h"

namespace qori::kernels {

namespace lbp {

/// Whether rows of codes share their keys in registers.
template <class T>
constexpr bool sharesKeys = sizeof(T) == 1;

/// Rows of codes that share their keys.
inline constexpr int kTileRows = 8;

/// Rows of codes made together, a piece of each in turn: windows find the rows that they share in the first-level
/// cache, and the processor fetches several new rows ahead at a time. Floats of 3840 x 2160 take 0.7 of the time that
/// row by row takes.
template <class T, int reach>
constexpr int kRowsTogether = sharesKeys<T> ? kTileRows* reach : 4;

/// Pixels of a piece. Rows that share their keys are one piece where they do not stream.
template <class T>
constexpr ptrdiff_t kPiece = 1024 / static_cast<ptrdiff_t>(sizeof(T));

/// Bytes of codes that leave together.
template <class T>
constexpr ptrdiff_t kSent = sharesKeys<T> ? kTileRows* kPatternBlock : kCacheLine;

/// makeBlock(x) for each block: the blocks behind the first one lie on multiples of a block, or follow on it.
template <bool followFirst, class MakeBlock>
QORI_INLINE void forBlocksBetween(ptrdiff_t begin, ptrdiff_t end, MakeBlock makeBlock) {
    const ptrdiff_t last = end - kPatternBlock;
    for (ptrdiff_t x = begin;;) {
        makeBlock(x);
        if (x == last) return;
        x = (followFirst ? x : x & ~ptrdiff_t{kPatternBlock - 1}) + kPatternBlock;
        if (x > last) x = last;
    }
}

/// Codes of a piece that wait in the first-level cache, and go past it while those of the next piece are made. In whole
/// lines: of a line that comes in two halves the first is often sent alone. A few at a time: lines that come all at
/// once keep what is to be read waiting. Patterns of half a gigabyte of bytes take 0.75 of the time of either way.
class WaitingCodes {
public:
    WaitingCodes() = default;
    WaitingCodes(const void* codes, int rows, ptrdiff_t rowBytes, void* dst, ptrdiff_t step)
        : from_(static_cast<const uint8_t*>(codes)),
          to_(static_cast<uint8_t*>(dst)),
          step_(step),
          rowBytes_(rowBytes),
          left_(rows * rowBytes) {}

    /// So many bytes of what waits, if anything does: whole lines that are a divisor of a row.
    template <ptrdiff_t bytes>
    QORI_INLINE void send() {
        if (left_ == 0) return;
        for (ptrdiff_t i = 0; i < bytes; i += kVectorBytes) stream(to_ + inRow_ + i, load(from_ + i));
        from_ += bytes;
        left_ -= bytes;
        inRow_ += bytes;
        if (inRow_ < rowBytes_) return;
        inRow_ = 0;
        to_ += step_;
    }
    void sendAll() {
        while (left_ > 0) send<kCacheLine>();
    }

private:
    const uint8_t* from_ = nullptr;
    uint8_t* to_ = nullptr;
    ptrdiff_t step_ = 0;
    ptrdiff_t rowBytes_ = 0, inRow_ = 0, left_ = 0;
};

/// The keys of a row that a window of eight neighbours sees: to the left, in the middle, to the right.
struct KeyTriple {
    Vec<int8_t> at[3];

    template <int reach>
    QORI_INLINE static KeyTriple from(const uint8_t* p) {
        const auto keys = [=](ptrdiff_t dx) { return Vec<int8_t>{(load(p + dx) ^ splat<uint8_t>(128)).v}; };
        return {{keys(-reach), keys(0), keys(reach)}};
    }
};

template <int reach, int mode>
QORI_INLINE Bytes codesOf(const KeyTriple& above, const KeyTriple& row, const KeyTriple& below) {
    return joinBits<int8_t>([&]<int bit>() __attribute__((always_inline)) {
        constexpr Place place = placeOfBit(bit, 8, reach, mode);
        const KeyTriple& seen = place.dy < 0 ? above : place.dy > 0 ? below : row;
        return Bytes{isLess(seen.at[1 + place.dx / reach], row.at[1]).v};
    });
}

/// Rows of codes that are `reach` rows apart, as those they are made of, by as many as `made`.
template <int reach, int mode, bool sends, int made>
QORI_NOINLINE void patternTile(const uint8_t* const* rowsAround, uint8_t* dst, ptrdiff_t step, ptrdiff_t begin,
                               ptrdiff_t end, WaitingCodes& waiting) {
    const uint8_t* rows[made + 2];  // stores of codes cannot alias these copies
    for (int i = 0; i < made + 2; ++i) rows[i] = rowsAround[i * reach];
    WaitingCodes others = sends ? waiting : WaitingCodes{};
    forBlocksBetween<sends>(
        begin, end, [&](ptrdiff_t x) __attribute__((always_inline)) {
            KeyTriple above = KeyTriple::from<reach>(rows[0] + x), row = KeyTriple::from<reach>(rows[1] + x);
#pragma GCC unroll 8
            for (int i = 0; i < made; ++i) {
                const KeyTriple below = KeyTriple::from<reach>(rows[i + 2] + x);
                store(dst + i * reach * step + x, codesOf<reach, mode>(above, row, below));
                above = row;
                row = below;
            }
            if constexpr (sends) others.send<kSent<uint8_t>>();
        });
    if (sends) waiting = others;
}

/// Fetches the pixels of a block, which are some lines.
template <class T>
QORI_INLINE void fetchBlock(const T* p) {
    constexpr ptrdiff_t bytes = kPatternBlock * sizeof(T);
    for (ptrdiff_t at = 0; at < bytes; at += kCacheLine)
        _mm_prefetch(reinterpret_cast<const char*>(p) + at, _MM_HINT_T0);
}

template <int reach, int mode, bool sends, class T, class D>
QORI_NOINLINE void patternPiece(const T* const* rowsAround, D* dst, ptrdiff_t begin, ptrdiff_t end,
                                WaitingCodes& waiting) {
    constexpr bool isLine = kPatternBlock * sizeof(D) == kCacheLine;
    const RowsAround<T, reach> rows(rowsAround);
    WaitingCodes others = sends ? waiting : WaitingCodes{};
    forBlocksBetween<sends>(
        begin, end, [&](ptrdiff_t x) __attribute__((always_inline)) {
            fetchBlock(rows.at[2 * reach] + x + kPiece<T>);
            patternBlock<D, reach, mode, false>(rows, dst + x, x, kPatternBlock);
            if (sends && (isLine || (x - begin) % (2 * kPatternBlock) != 0)) others.send<kSent<T>>();
        });
    if (sends) waiting = others;
}

/// A piece of `count` rows of codes, up to as many as are made together; what waits is sent meanwhile.
template <int reach, int mode, bool sends, class T, class D>
void patternPieces(const T* const* rows, D* dst, ptrdiff_t step, int count, ptrdiff_t begin, ptrdiff_t end,
                   WaitingCodes& waiting) {
    const auto rowOf = [=](int y) { return reinterpret_cast<D*>(reinterpret_cast<uint8_t*>(dst) + y * step); };
    if constexpr (!sharesKeys<T>) {
        for (int y = 0; y < count; ++y) patternPiece<reach, mode, sends>(rows + y, rowOf(y), begin, end, waiting);
    } else if (sends || count == kRowsTogether<T, reach>) {
        for (int y = 0; y < reach; ++y)
            patternTile<reach, mode, sends, kTileRows>(rows + y, rowOf(y), step, begin, end, waiting);
    } else {
        for (int y = 0; y < count; ++y)
            patternTile<reach, mode, false, 1>(rows + y, rowOf(y), step, begin, end, waiting);
    }
}

/// The first column, begin or at least a block behind it, whose code begins a cache line; end where no lines stream.
template <class D>
ptrdiff_t columnOfLines(const D* dst, ptrdiff_t begin, ptrdiff_t end) {
    constexpr ptrdiff_t size = sizeof(D), line = kCacheLine / size;
    const auto [head, lines] =
        StreamedLines::ofBytes(reinterpret_cast<const uint8_t*>(dst + begin), (end - begin) * size);
    const ptrdiff_t ahead = head / size;
    return lines == 0 ? end : begin + ahead + (ahead > 0 && ahead < kPatternBlock ? line : 0);
}

}  // namespace lbp

/// `count` rows of codes. rows: at column 0, from `reach` rows above the first one to `reach` below the last; read from
/// `reach` columns before begin to `reach` behind end. Streaming: dst lies on elements and step is a multiple of half
/// a line. Rows have their lines where the first of those made together has them; what is no whole line of it, or too
/// few rows, goes through the cache.
template <int reach, int mode, class T, class D>
void patternRows(const T* const* rows, D* dst, ptrdiff_t step, int count, ptrdiff_t begin, ptrdiff_t end,
                 bool streaming) {
    using namespace lbp;
    constexpr int together = kRowsTogether<T, reach>;
    constexpr ptrdiff_t sent = kSent<T> / static_cast<ptrdiff_t>(sizeof(D));
    alignas(kCacheLine) D codes[2][together * kPiece<T>];
    WaitingCodes waiting, none;
    int turn = 0;
    for (int y = 0; y < count; y += together) {
        const int made = std::min(together, count - y);
        D* const to = reinterpret_cast<D*>(reinterpret_cast<uint8_t*>(dst) + y * step);
        const ptrdiff_t lines = streaming && made == together ? columnOfLines(to, begin, end) : end;
        for (ptrdiff_t x = begin, next; x < end; x = next) {
            ptrdiff_t inLines = x < lines ? 0 : std::min(kPiece<T>, (end - x) / sent * sent);
            if (const ptrdiff_t rest = end - x - inLines; rest > 0 && rest < kPatternBlock && inLines > 0)
                inLines -= sent;
            if (inLines > 0) {
                D* const room = codes[turn];
                const ptrdiff_t bytes = inLines * static_cast<ptrdiff_t>(sizeof(D));
                next = x + inLines;
                patternPieces<reach, mode, true>(rows + y, room - x, bytes, made, x, next, waiting);
                waiting.sendAll();
                waiting = {room, made, bytes, to + x, step};
                turn ^= 1;
            } else {
                const ptrdiff_t most = x < lines ? lines : end;
                next = sharesKeys<T> ? most : (x & ~ptrdiff_t{kPatternBlock - 1}) + kPiece<T>;
                if (most - next < kPatternBlock) next = most;
                patternPieces<reach, mode, false>(rows + y, to, step, made, x, next, none);
            }
        }
    }
    waiting.sendAll();
}

/// A block of codes of each of `reach` columns: columns of keys, from `reach` to the left of the first one to `reach`
/// to the right of the last, at the first pixel.
template <int reach, int mode, class Key, class D>
void patternColumns(const Key* const* columns, D (*codes)[kPatternBlock]) {
    for (int i = 0; i < reach; ++i)
        lbp::patternBlock<D, reach, mode, false, true>(lbp::RowsAround<Key, reach>(columns + i), codes[i], 0,
                                                       kPatternBlock);
}

/// What makes the codes of a mode.
template <class T, class D>
struct PatternMakers {
    void (*rows)(const T* const* rows, D* dst, ptrdiff_t step, int count, ptrdiff_t begin, ptrdiff_t end,
                 bool streaming);
    void (*columns)(const PatternKey<T>* const* columns, D (*codes)[kPatternBlock]);
};
template <int reach, int mode, class T, class D>
inline constexpr PatternMakers<T, D> patternMakers{patternRows<reach, mode, T, D>,
                                                   patternColumns<reach, mode, PatternKey<T>, D>};

}  // namespace qori::kernels
