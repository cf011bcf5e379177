/* What constructors of plans share. */
#include "plan_makers.h"

#include <stdarg.h>
#include <stdlib.h>
#include <string.h>

/* A call that only names the constructor, for refusals. */
Call* named(Call* call, Operation* operation, const char* name) {
    memset(operation, 0, sizeof *operation);
    operation->name = name;
    return start_call(call, operation);
}

/* An integer that does not fit is a wrong value, as everywhere. */
static void name_overflow(const Call* call) {
    if (!PyErr_ExceptionMatches(PyExc_OverflowError)) return;
    PyErr_Clear();
    refuse(PyExc_ValueError, call, NULL, "an integer came that 32 bits do not hold");
}

int parse(const Call* call, PyObject* arguments, PyObject* keywords, const char* format, char** names, ...) {
    va_list list;
    va_start(list, names);
    const int parsed = names ? PyArg_VaParseTupleAndKeywords(arguments, keywords, format, names, list)
                             : PyArg_VaParse(arguments, format, list);
    va_end(list);
    if (!parsed) name_overflow(call);
    return parsed;
}

int sizes_known(const Call* call, const char* member, int status) {
    if (status > 0) return refuse(shared.error, call, NULL, "shapes without pixels came; accepted are sides from 1 on");
    return status_result(call, member, status);
}

/* The shape of an array of several channels serves as it is: these stand last, and no size depends on them. */
int shape_of(const Call* call, const char* name, PyObject* object, QorImageSize* size) {
    PyObject* pair = NULL;
    if (PyTuple_Check(object) && PyTuple_Size(object) == 3) {
        int64_t channels;
        if (read_integer(call, name, PyTuple_GetItem(object, 2), 1, 4, &channels)) return -1;
        if (!(pair = PyTuple_GetSlice(object, 0, 2))) return -1;
    }
    const int failed = read_pair(call, name, pair ? pair : object, &size->height, &size->width);
    Py_XDECREF(pair);
    return failed;
}

int element_from(const Call* call, PyObject* dtype, const char* accepted, uint32_t elements, int* element) {
    *element = dtype ? element_of_type(dtype) : elements & 1u << U8 ? U8 : F32;
    if (*element >= 0 && elements >> *element & 1) return 0;
    return refuse(PyExc_TypeError, call, "dtype", "%.80R came; accepted are %s", dtype, accepted);
}

/* Deallocation returns what a constructor has filled so far. */
Plan* new_plan(PyTypeObject* type, int kind, int variant, int element) {
    Plan* plan = (Plan*)((allocfunc)PyType_GetSlot(type, Py_tp_alloc))(type, 0);
    if (!plan) return NULL;
    plan->kind = (uint8_t)kind;
    plan->variant = (uint8_t)variant;
    plan->element = (uint8_t)element;
    plan->target = NO_ELEMENT;
    plan->free_memory = free;
    plan->vectorcall = call_plan_directly;
    return plan;
}

int take_memory(Plan* plan, int32_t bytes) {
    plan->memory = calloc(bytes > 0 ? (size_t)bytes : 1, 1);
    if (!plan->memory) PyErr_NoMemory();
    return plan->memory ? 0 : -1;
}

PyObject* finish(Plan* plan, Call* call, const char* member, int status) {
    free_call(call);
    if (!PyErr_Occurred() && (!status || !status_result(call, member, status)) && plan->text) return (PyObject*)plan;
    Py_DECREF((PyObject*)plan);
    return NULL;
}

void set_shapes(Plan* plan, QorImageSize source, QorImageSize target) {
    plan->source_height = source.height;
    plan->source_width = source.width;
    plan->height = target.height;
    plan->width = target.width;
}

void set_border(Plan* plan, QorBorderExtent border) {
    plan->top = border.top;
    plan->left = border.left;
    plan->bottom = border.bottom;
    plan->right = border.right;
}
