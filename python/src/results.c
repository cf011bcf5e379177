/* What a call returns. */
#include <stdlib.h>
#include <string.h>

#include "steps.h"

static PyObject* number_object(int element, const void* value) {
    switch (element) {
        case U8: return PyLong_FromLong(*(const uint8_t*)value);
        case I8: return PyLong_FromLong(*(const int8_t*)value);
        case U16: return PyLong_FromLong(*(const uint16_t*)value);
        case I16: return PyLong_FromLong(*(const int16_t*)value);
        case U32: return PyLong_FromUnsignedLong(*(const uint32_t*)value);
        case I32: return PyLong_FromLong(*(const int32_t*)value);
        case F32: return PyFloat_FromDouble((double)*(const float*)value);
        default: return PyFloat_FromDouble(*(const double*)value);
    }
}

/* A number, or a tuple of one for each channel. */
static PyObject* result_object(const Result* result, const uint8_t* bytes) {
    if (result->channels < 2) return number_object(result->element, bytes);
    PyObject* tuple = PyTuple_New(result->channels);
    for (int i = 0; tuple && i < result->channels; ++i) {
        PyObject* item = number_object(result->element, bytes + i * element_bytes[result->element]);
        if (!item)
            Py_CLEAR(tuple);
        else
            PyTuple_SetItem(tuple, i, item);
    }
    return tuple;
}

/* (row, column), or a tuple of one such pair for each channel; the column stands first in C. */
static PyObject* position_object(const Result* result, const int32_t* columns, const int32_t* rows) {
    if (result->channels < 2) return Py_BuildValue("(ii)", rows[0], columns[0]);
    PyObject* tuple = PyTuple_New(result->channels);
    for (int i = 0; tuple && i < result->channels; ++i) {
        PyObject* item = Py_BuildValue("(ii)", rows[i], columns[i]);
        if (!item)
            Py_CLEAR(tuple);
        else
            PyTuple_SetItem(tuple, i, item);
    }
    return tuple;
}

static PyObject* results_object(Call* call) {
    PyObject* found[8];
    int count = 0;
    const Result* result = all_results[call->form->results];
    if (call->lists && call->form->extent == EXTENT_BLOCKS)
        for (int i = 0; i < 2; ++i) found[count++] = Py_NewRef(PyTuple_GetItem(call->lists, i));
    for (int i = 0; result->kind != RESULT_END; ++result, ++i) {
        if (result->kind == RESULT_ROW) continue;
        found[count++] = result->kind == RESULT_COLUMN ? position_object(result, (int32_t*)call->results[i].bytes,
                                                                         (int32_t*)call->results[i + 1].bytes)
                                                       : result_object(result, call->results[i].bytes);
    }
    PyObject* tuple = NULL;
    int failed = 0;
    for (int i = 0; i < count; ++i) failed |= !found[i];
    if (count == 1 && !failed) return found[0];
    if (!failed && (tuple = PyTuple_New(count)))
        for (int i = 0; i < count; ++i) PyTuple_SetItem(tuple, i, found[i]);
    else
        for (int i = 0; i < count; ++i) Py_XDECREF(found[i]);
    return tuple;
}

PyObject* result_of(Call* call) {
    if (all_results[call->form->results]->kind != RESULT_END) return results_object(call);
    if (call->lists) return Py_NewRef(call->lists);
    if (call->made) return Py_NewRef(call->made);
    const int out = call->operation->has[HAS_OUT];
    return Py_NewRef(call->arguments[out]);
}
