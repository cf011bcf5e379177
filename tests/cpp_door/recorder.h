// SPDX-License-Identifier: Apache-2.0
// A library that computes nothing and remembers its last call: which member, and with which arguments.
#pragma once

#include "qori.hpp"

#include <cstdio>
#include <cstring>
#include <initializer_list>

namespace recorder {

using Word = long long;
inline constexpr int kWords = 20;

struct Call {
    const char* name = "";
    Word words[kWords] = {};
    int count = 0;
};

/** The last call but those that release memory. */
extern Call last;
/** What every member that allocates returns, and its size. */
extern unsigned char memory[1 << 16];
inline constexpr int32_t kBytes = 4096;

inline Word word(const void* p) {
    Word w = 0;
    std::memcpy(&w, &p, sizeof p);
    return w;
}
inline Word word(double v) { return static_cast<Word>(v); }
inline Word word(int32_t v) { return v; }
inline Word word(uint32_t v) { return v; }
inline Word word(QorComplex16s v) { return v.re * 1000 + v.im; }
inline Word word(QorComplex32s v) { return Word(v.re) * 1000 + v.im; }
inline Word word(QorComplex32f v) { return Word(v.re) * 1000 + Word(v.im); }
inline Word word(QorImageSize v) { return Word(v.width) * 1000 + v.height; }
inline Word word(QorPoint2D v) { return Word(v.x) * 1000 + v.y; }
inline Word word(QorImageRect v) { return Word(v.x) * 1000 + v.y + v.width * 7 + v.height * 11; }
/** Elements of an array, each with a weight of its own. */
template <class T>
Word words(const T* values, int count) {
    Word all = 0;
    for (int i = 0; i < count; ++i) all += (i + 1) * word(values[i]);
    return all;
}

template <class... P>
void note(const char* name, P... arguments) {
    last = Call{name, {arguments...}, static_cast<int>(sizeof...(P))};
}

/** An address that means a place of a C call. */
template <class T>
T* at(int place) {
    T* p = nullptr;
    const std::size_t address = std::size_t(place + 1) << 16;
    std::memcpy(&p, &address, sizeof p);
    return p;
}
template <class T, class L = qori::C1>
qori::View<T, L> image(int place, int32_t width, int32_t height) {
    const int32_t step = 1000 + place;
    if constexpr (std::is_same_v<L, qori::P3>)
        return {{at<T>(place), at<T>(place + 40), at<T>(place + 80)}, step, {width, height}};
    else if constexpr (std::is_same_v<L, qori::P4>)
        return {{at<T>(place), at<T>(place + 40), at<T>(place + 80), at<T>(place + 120)}, step, {width, height}};
    else
        return {at<T>(place), step, {width, height}};
}
template <class T>
T element(int value) {
    if constexpr (std::is_arithmetic_v<T>)
        return static_cast<T>(value);
    else
        return {static_cast<decltype(T::re)>(value), static_cast<decltype(T::re)>(value + 1)};
}

extern int failures;
/** The last call was that of a member, with these arguments. */
void expect(const char* call, QorResult status, const char* name, std::initializer_list<Word> words);

}  // namespace recorder
