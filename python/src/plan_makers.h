/* Constructors of plans, their texts, and what some plans can be asked. */
#ifndef QORI_PYTHON_PLAN_MAKERS_H
#define QORI_PYTHON_PLAN_MAKERS_H

#include "geometry.h"
#include "plans.h"

#define SHAPES "Shapes are (height, width)."
#define RESIZE_DOC                                                                                                   \
    "ResizePlan(src_shape, dst_shape, interpolation='linear', dtype='uint8', *, antialias=False, b=0.0, c=0.5, "     \
    "lobes=3)\n"                                                                                                     \
    "--\n\nTables of a resize; plan(src, out=None) is qori.resize(src, plan, out). " SHAPES                          \
    "\n\n"                                                                                                           \
    "interpolation: 'nearest', 'linear', 'cubic' (b and c choose the filter), 'lanczos' ('lanczos2', 'lanczos3'),\n" \
    "'super' (reductions). antialias widens linear, cubic and lanczos filters with the reduction.\n"                 \
    "Immutable: any number of threads may use one plan.\n\nC: qoriResizeGetSize, qoriResizeLinearInit and the like."
#define WARP_DOC                                                                                                      \
    "WarpAffinePlan(src_shape, dst_shape, matrix, interpolation='linear', dtype='uint8', channels=1, *, "             \
    "inverse=False,\n"                                                                                                \
    "    border='constant', border_value=0, b=0.0, c=0.5)\n--\n\n"                                                    \
    "An affine warp; plan(src, out=None) is qori.warp_affine(src, plan, out). " SHAPES                                \
    "\n\n"                                                                                                            \
    "matrix: ((a, b, c), (d, e, f)) takes (row, column) to (a row + b column + c, d row + e column + f), pixels of "  \
    "the\n"                                                                                                           \
    "source to pixels of the destination, or the other way with inverse=True. The C function takes (x, y) instead.\n" \
    "\nC: qoriWarpAffineGetSize, qoriWarpAffineNearestInit, qoriWarpAffineLinearInit, qoriWarpAffineCubicInit."
#define DCT_DOC                                                                                                      \
    "DctPlan(shape, *, hint='fast')\n--\n\nA cosine transform of float32 images; forward(src) and inverse(src).\n\n" \
    "C: qoriDCTFwdGetSize_32f, qoriDCTFwdInit_32f."
#define FOURIER_DOC(name, sizes)                                                 \
    name "(shape, dtype='float32', *, norm='div_inv_by_n', hint='fast')\n--\n\n" \
         "A Fourier transform of images of " sizes                               \
         "; forward(src) and inverse(src).\n\n"                                  \
         "dtype: 'float32' (packed spectra), 'complex64', or 'uint8' (packed spectra of int32).\n\n"
#define DFT_DOC FOURIER_DOC("DftPlan", "any size") "C: qoriDFTGetSize_R_32f, qoriDFTInit_R_32f and the like."
#define FFT_DOC FOURIER_DOC("FftPlan", "powers of two") "C: qoriFFTGetSize_R_32f, qoriFFTInit_R_32f and the like."
#define HISTOGRAM_DOC                                                                                                \
    "HistogramPlan(levels, dtype='uint8', channels=1, *, lower=None, upper=None)\n--\n\n"                            \
    "Levels of a histogram; plan(src) is qori.histogram(src, plan).\n\n"                                             \
    "levels: increasing float32 levels, a list or one list for each channel; or with lower and upper their number, " \
    "and\n"                                                                                                          \
    "they are spaced uniformly.\n\nC: qoriHistogramGetBufferSize, qoriHistogramInit, qoriHistogramUniformInit."
#define LINEAR_FILTER_DOC                                                                                          \
    "LinearFilterPlan(kernel, dtype='uint8', channels=1, *, divisor=1, rounding='nearest_even')\n--\n\n"           \
    "A kernel of int16 or float32 prepared; plan(src, out=None) is qori.filter_linear_border(src, plan, out).\n\n" \
    "C: qoriFilterBorderGetSize, qoriFilterBorderInit_16s, qoriFilterBorderInit_32f."
#define ADAPTIVE_DOC                                                                                            \
    "AdaptiveGaussPlan(size, *, sigma=0.0)\n--\n\n"                                                             \
    "Weights of an adaptive threshold; plan(src, delta, out=None) is qori.threshold_adaptive_gauss(src, plan, " \
    "delta).\n\n"                                                                                               \
    "size: an odd side or a pair of equal ones.\n\nC: qoriThresholdAdaptiveGaussGetBufferSize, "                \
    "qoriThresholdAdaptiveGaussInit."
#define HOG_DOC                                                                                                \
    "HogPlan(window=(128, 64), *, cell=8, block=16, stride=8, bins=9, sigma=8.0, limit=0.2, "                  \
    "columns_first=False)\n--\n\n"                                                                             \
    "Descriptors of oriented gradients; plan(src, locations=None) is qori.hog(src, plan). window is (height, " \
    "width).\n\n"                                                                                              \
    "C: qoriHOGGetSize, qoriHOGInit, qoriHOGGetDescriptorSize."

int32_t type_code(int element);
int plan_serves(const Plan* plan, const Form* form);
int offset_source(Call* call);

/* plan_parts.c: a call that only names the constructor, for refusals; then what fills a plan. Deallocation returns what
 * a constructor has filled so far. */
Call* named(Call* call, Operation* operation, const char* name);
/* PyArg_ParseTupleAndKeywords whose refusals of integers are those of every function. */
int parse(const Call* call, PyObject* arguments, PyObject* keywords, const char* format, char** names, ...);
/* The status of a query for a plan's sizes: without sizes there is no plan, whatever the reason. */
int sizes_known(const Call* call, const char* member, int status);
int shape_of(const Call* call, const char* name, PyObject* object, QorImageSize* size);
int element_from(const Call* call, PyObject* dtype, const char* accepted, uint32_t elements, int* element);
Plan* new_plan(PyTypeObject* type, int kind, int variant, int element);
int take_memory(Plan* plan, int32_t bytes);
PyObject* finish(Plan* plan, Call* call, const char* member, int status);
void set_shapes(Plan* plan, QorImageSize source, QorImageSize target);
void set_border(Plan* plan, QorBorderExtent border);

PyObject* make_resize(PyTypeObject* type, PyObject* arguments, PyObject* keywords);
PyObject* make_warp(PyTypeObject* type, PyObject* arguments, PyObject* keywords);
PyObject* make_dct(PyTypeObject* type, PyObject* arguments, PyObject* keywords);
PyObject* make_dft(PyTypeObject* type, PyObject* arguments, PyObject* keywords);
PyObject* make_fft(PyTypeObject* type, PyObject* arguments, PyObject* keywords);
PyObject* make_histogram(PyTypeObject* type, PyObject* arguments, PyObject* keywords);
PyObject* make_linear_filter(PyTypeObject* type, PyObject* arguments, PyObject* keywords);
PyObject* make_adaptive(PyTypeObject* type, PyObject* arguments, PyObject* keywords);
PyObject* make_hog(PyTypeObject* type, PyObject* arguments, PyObject* keywords);
PyObject* histogram_levels(PyObject* self, void* unused);
PyObject* resize_src_offset(PyObject* self, PyObject* offset);
PyObject* resize_src_roi(PyObject* self, PyObject* rect);

#endif
