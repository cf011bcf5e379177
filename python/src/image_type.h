#ifndef QORI_PYTHON_IMAGE_TYPE_H
#define QORI_PYTHON_IMAGE_TYPE_H

#include "core.h"

#define EMPTY_DOC                                                                                                    \
    "empty(shape, dtype='uint8')\n--\n\nAn image of the library's memory, not initialised: rows begin at multiples " \
    "of 64 "                                                                                                         \
    "bytes.\n\nshape is (height, width) or (height, width, channels). Any buffer user can look at it: "              \
    "numpy.asarray(image)."                                                                                          \
    "\n\nC: qoriMalloc, qoriFree."

int make_image_type(PyObject* module);
PyObject* empty_image(PyObject* module, PyObject* arguments, PyObject* keywords);
/* dimensions 2 leaves out the channels, 1 the height too. */
PyObject* new_image(int element, int height, int width, int channels, int dimensions);
/* One channel, without gaps between the rows. */
PyObject* new_packed_image(int element, int height, int width, int dimensions);

#endif
