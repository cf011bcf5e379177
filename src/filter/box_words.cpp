// SPDX-License-Identifier: Apache-2.0
#include "box_run.h"

namespace qori::filter {

template QorResult box(const BoxJob<uint16_t, Layout::C1>&, const BoxBuffer*);
template QorResult box(const BoxJob<uint16_t, Layout::C3>&, const BoxBuffer*);
template QorResult box(const BoxJob<uint16_t, Layout::C4>&, const BoxBuffer*);
template QorResult box(const BoxJob<uint16_t, Layout::AC4>&, const BoxBuffer*);
template QorResult box(const BoxJob<int16_t, Layout::C1>&, const BoxBuffer*);
template QorResult box(const BoxJob<int16_t, Layout::C3>&, const BoxBuffer*);
template QorResult box(const BoxJob<int16_t, Layout::C4>&, const BoxBuffer*);
template QorResult box(const BoxJob<int16_t, Layout::AC4>&, const BoxBuffer*);

}  // namespace qori::filter
