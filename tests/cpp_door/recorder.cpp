// SPDX-License-Identifier: Apache-2.0
#include "recorder.h"

namespace recorder {

Call last;
alignas(64) unsigned char memory[1 << 16];
int failures = 0;

void expect(const char* call, QorResult status, const char* name, std::initializer_list<Word> words) {
    bool same = status == QOR_OK && std::strcmp(last.name, name) == 0 && last.count == static_cast<int>(words.size());
    int place = 0;
    for (Word w : words) same = same && last.words[place++] == w;
    if (same) return;
    ++failures;
    std::fprintf(stderr, "%s: status %d, called %s\n  wanted %s:", call, status, last.name, name);
    for (Word w : words) std::fprintf(stderr, " %llx", static_cast<unsigned long long>(w));
    std::fprintf(stderr, "\n  got:");
    for (int i = 0; i < last.count; ++i) std::fprintf(stderr, " %llx", static_cast<unsigned long long>(last.words[i]));
    std::fprintf(stderr, "\n");
    last = Call{};
}

}  // namespace recorder
