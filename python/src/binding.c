/* Arguments to parameters, and arrays to images. */
#include <stdlib.h>
#include <string.h>

#include "steps.h"

static int too_many(const Call* call, Py_ssize_t count) {
    int accepted = call->operation->positional;
    for (int i = 0; i < call->operation->count; ++i) accepted -= call->operation->parameters[i].twin != 0;
    return refuse(PyExc_TypeError, call, NULL, "%zd positional arguments came; accepted are at most %d", count,
                  accepted);
}

static int keyword(Call* call, PyObject* name) {
    const Operation* operation = call->operation;
    PyObject* const* names = parameter_names + (operation->parameters - all_parameters);
    for (int i = 0; i < operation->count; ++i)
        if (names[i] == name) return i;
    for (int i = 0; i < operation->count; ++i)
        if (!PyUnicode_Compare(names[i], name)) return i;
    return refuse(PyExc_TypeError, call, NULL, "there is no argument %R; see help(qori.%s)", name, operation->name);
}

int bind(Call* call, PyObject* const* arguments, Py_ssize_t count, PyObject* names) {
    const Operation* operation = call->operation;
    const Parameter* parameters = operation->parameters;
    int parameter = 0;
    for (Py_ssize_t i = 0; i < count; ++i, ++parameter) {
        if (parameter && parameters[parameter - 1].twin == parameter) ++parameter;
        if (parameter >= operation->positional) return too_many(call, count);
        if (arguments[i] == Py_None) continue;
        call->arguments[parameter] = arguments[i];
        call->given |= 1u << parameter;
    }
    const int filled = parameter;
    const Py_ssize_t keywords = names ? PyTuple_Size(names) : 0;
    for (Py_ssize_t i = 0; i < keywords; ++i) {
        PyObject* name = PyTuple_GetItem(names, i);
        parameter = keyword(call, name);
        if (parameter < 0) return -1;
        if (parameter < filled || call->given >> parameter & 1)
            return refuse(PyExc_TypeError, call, parameters[parameter].name, "came twice");
        if (arguments[count + i] == Py_None) continue;
        call->arguments[parameter] = arguments[count + i];
        call->given |= 1u << parameter;
    }
    return 0;
}

/* Whether an operand is a number or one for each channel, and not an image. */
static int is_value(PyObject* object) {
    if (Py_TYPE(object) == shared.ndarray) return 0;
    if (PyFloat_Check(object) || PyLong_Check(object) || PyTuple_Check(object) || PyList_Check(object) ||
        !PyObject_CheckBuffer(object))
        return 1;
    Py_buffer view;
    if (PyObject_GetBuffer(object, &view, PyBUF_STRIDED_RO)) {
        PyErr_Clear();
        return 0;
    }
    const int scalar = view.ndim == 0;
    PyBuffer_Release(&view);
    return scalar;
}

static int small_integer(const Call* call, int i, int64_t low, int64_t high, int16_t* value) {
    int64_t number;
    if (read_integer(call, call->operation->parameters[i].name, call->arguments[i], low, high, &number)) return -1;
    *value = (int16_t)number;
    return 0;
}

/* Elements of palettes, by which forms are chosen; those of numbers say nothing. */
static int elements_of_tables(Call* call, PyObject* object) {
    PyObject* first = NULL;
    if (PyTuple_Check(object) || PyList_Check(object)) {
        first = PySequence_Size(object) > 0 ? PySequence_GetItem(object, 0) : NULL;
        object = first;
    }
    if (object && PyObject_CheckBuffer(object) && !is_value(object)) {
        Image image;
        image.held = 0;
        if (acquire(call, object, "table", &image, SRC)) {
            Py_XDECREF(first);
            return -1;
        }
        const int triples = !first && image.dimensions == 2 && image.width == 3 && image.height > 4;
        call->kernel_element = triples ? ELEMENTS : image.element;
        release(&image);
    }
    Py_XDECREF(first);
    return 0;
}

static int take_argument(Call* call, int i) {
    const Parameter* p = &call->operation->parameters[i];
    PyObject* object = call->arguments[i];
    int element;
    switch (p->kind) {
        case KIND_IMAGE: return acquire(call, object, p->name, &call->images[p->image], p->image);
        case KIND_OUT:
            if (call->operation->forms->extent == EXTENT_LEVELS || call->operation->forms->extent == EXTENT_BLOCKS)
                return 0;
            return acquire(call, object, p->name, &call->images[OUT], OUT);
        case KIND_PLAN: return (call->plan = plan_of(call, object)) ? 0 : -1;
        case KIND_KEEP_ALPHA:
            if (object != Py_True && object != Py_False)
                return refuse(PyExc_TypeError, call, p->name, "%.80R came; accepted are True and False", object);
            call->keep_alpha = object == Py_True;
            return 0;
        case KIND_CHANNEL: return small_integer(call, i, 0, 3, &call->channel);
        case KIND_CHANNELS: return small_integer(call, i, 1, 4, &call->channels);
        case KIND_DTYPE:
            if (!shared.empty && find_numpy(0) < 0) return -1;
            element = element_of_type(object);
            if (element < 0)
                return refuse(PyExc_TypeError, call, "dtype", "%.80R came; accepted are types of elements, as 'uint8'",
                              object);
            call->dtype = (int16_t)element;
            return 0;
        case KIND_KERNEL:
            if (read_kernel(call, p->name, object, &element, &call->kernel_height, &call->kernel_width, &call->kernel))
                return -1;
            call->kernel_element = (int16_t)element;
            return 0;
        case KIND_LISTS: return strcmp(p->name, "table") ? 0 : elements_of_tables(call, object);
        default: return 0;
    }
}

int take_arguments(Call* call) {
    const Operation* operation = call->operation;
    for (int i = 0; i < operation->count; ++i) {
        const Parameter* p = &operation->parameters[i];
        if (!(call->given >> i & 1)) {
            if (p->required && !(i && p[-1].twin == i) && !p->twin)
                return refuse(PyExc_TypeError, call, p->name, "is missing");
            if (p->twin && !(call->given >> p->twin & 1)) return refuse(PyExc_TypeError, call, p->name, "is missing");
            continue;
        }
        if (p->twin && is_value(call->arguments[i])) {
            call->arguments[p->twin] = call->arguments[i];
            call->given ^= 1u << i | 1u << p->twin;
            continue;
        }
        if (take_argument(call, i)) return -1;
    }
    return 0;
}
