// SPDX-License-Identifier: Apache-2.0
#include "box_run.h"

namespace qori::filter {

template QorResult box(const BoxJob<float, Layout::C1>&, const BoxBuffer*);
template QorResult box(const BoxJob<float, Layout::C3>&, const BoxBuffer*);
template QorResult box(const BoxJob<float, Layout::C4>&, const BoxBuffer*);
template QorResult box(const BoxJob<float, Layout::AC4>&, const BoxBuffer*);
template QorResult box(const BoxJob<double, Layout::C1>&, const BoxBuffer*);

}  // namespace qori::filter
