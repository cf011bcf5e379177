/* Which pixels a call computes and which it reads around them. */
#ifndef QORI_PYTHON_GEOMETRY_H
#define QORI_PYTHON_GEOMETRY_H

#include "core.h"

int parameter_index(const Operation* operation, int kind, const char* name);
/* The two numbers of a parameter, read once: what is checked is what is passed on. */
int pair_of(Call* call, int index, int32_t* first, int32_t* second);
int word_of(Call* call, int index, int32_t* value);
int integer_of(Call* call, int index, int element, int32_t* value);
/* Region and margins, and the destination's size in *height and *width. */
int measure(Call* call, int32_t* height, int32_t* width);

#endif
