// SPDX-License-Identifier: Apache-2.0
// check() with exceptions and without: built once with each, and once more of C++20.
#define min(a, b) ((a) < (b) ? (a) : (b))  // as <windows.h> has them
#define max(a, b) ((a) > (b) ? (a) : (b))
#include "qori.hpp"
#undef min
#undef max

#include <csetjmp>
#include <csignal>
#include <cstdio>
#include <cstring>

namespace {

#if defined(__cpp_exceptions)
bool refuses(QorResult status) {
    try {
        qori::check(status);
    } catch (const qori::Error& error) {
        return error.status() == status && std::strcmp(error.what(), "A width or height < 1.") == 0;
    }
    return false;
}
#else
std::jmp_buf back;
void caught(int) { std::longjmp(back, 1); }

/** The program would end. */
bool refuses(QorResult status) {
    std::signal(SIGABRT, caught);
    if (setjmp(back)) return true;
    qori::check(status);
    return false;
}
#endif

}  // namespace

int main() {
    qori::Image<uint8_t> image({4, 4});
    const bool passes = qori::check(qori::fill(7, image)) == QOR_OK && *image.at(3, 3) == 7 &&
                        qori::check(QOR_WARN_DIV_BY_ZERO) == QOR_WARN_DIV_BY_ZERO;
    uint8_t least = 0;
    const bool found = qori::min(image, least) == QOR_OK && least == 7;
    const bool works = passes && found && refuses(qori::fill(7, image.view().crop({0, 0, 0, 4})));
    std::puts(works ? "check: as it should be" : "check: wrong");
    return works ? 0 : 1;
}
