/* The steps of a call, in their order; those that can fail return 0, or -1 with an exception set. */
#ifndef QORI_PYTHON_STEPS_H
#define QORI_PYTHON_STEPS_H

#include "geometry.h"
#include "plan_makers.h"
#include "plans.h"

/* binding.c: the arguments given, by parameter, and what they are. */
int bind(Call* call, PyObject* const* arguments, Py_ssize_t count, PyObject* names);
int take_arguments(Call* call);

/* forms.c */
int choose(Call* call);
int packed_rows(const Image* image);

/* destination.c: the destination's size, memory and overlaps; the sources moved to the first pixel of the region. */
int lay_destination(Call* call);
Py_ssize_t pixel_bytes(const Image* image);
int check_writable(const Call* call, const Image* image, const char* name);
/* Whether an input is the destination itself: 1 exactly, 0 apart, -1 refused. */
int meets(const Call* call, int which, const char* name);

/* outputs.c: what is written and is no image of the call. */
int special_outputs(Call* call);
int descriptors(Call* call);
int lists_out(Call* call, int which, int channels, Slot* slot);

/* program.c: fills the slots of the C call. */
int execute(Call* call, const Step* step);

/* results.c */
PyObject* result_of(Call* call);

#endif
