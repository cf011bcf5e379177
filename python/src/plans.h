/* Plans: memory that an initialiser of the library filled, and what calls need to know of it. */
#ifndef QORI_PYTHON_PLANS_H
#define QORI_PYTHON_PLANS_H

#include "core.h"

enum {
    RESIZE_PLAN,
    WARP_PLAN,
    DCT_PLAN,
    DFT_PLAN,
    FFT_PLAN,
    HISTOGRAM_PLAN,
    LINEAR_FILTER_PLAN,
    ADAPTIVE_PLAN,
    HOG_PLAN,
    PLAN_TYPES
};

/* Immutable once it has been made; any number of threads may use it. */
typedef struct Plan {
    PyObject base;
    PyObject* (*vectorcall)(PyObject* plan, PyObject* const* arguments, size_t count, PyObject* names);
    uint8_t kind, variant, element, target; /* elements of source and destination */
    int32_t channels;                       /* 0: any */
    int32_t source_height, source_width, height, width;
    int32_t top, left, bottom, right; /* what the operation may read around the source */
    int32_t buffer_bytes;             /* where it does not depend on the call */
    int32_t whole_bytes[5];           /* resize, by channels: of the whole destination; 0: unknown */
    const Form* usual[5];             /* resize, by channels: what plan(src, out=...) takes; null: nothing */
    int32_t counts[4];                /* histograms: levels of each channel */
    int32_t kernel_height, kernel_width, kernel_type;
    int32_t descriptor; /* elements of one descriptor */
    int32_t antialias;
    void* memory;
    void (*free_memory)(void*);
    PyObject* text; /* what repr says */
} Plan;

/* plan_calls.c */
void find_plan_functions(void);
const Form* usual_form(const Plan* plan, int channels);
int prepare_straight(Call* call, PyObject* const* arguments, Py_ssize_t count, PyObject* names);
PyObject* call_plan_directly(PyObject* self, PyObject* const* arguments, size_t flags, PyObject* names);
PyObject* call_plan(PyObject* self, PyObject* arguments, PyObject* keywords);
PyObject* plan_forward(PyObject* self, PyObject* const* arguments, Py_ssize_t count, PyObject* names);
PyObject* plan_inverse(PyObject* self, PyObject* const* arguments, Py_ssize_t count, PyObject* names);

/* plans.c */
int make_plan_types(PyObject* module);
/* The plan of an argument, or null with an exception set. */
const Plan* plan_of(const Call* call, PyObject* object);
PyObject* plan_address(PyObject* module, PyObject* object);
/* Bytes of work memory of a call whose images and region are known; -1 with an exception set. */
int64_t work_bytes(Call* call);

#endif
