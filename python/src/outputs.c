/* Lists, blocks and descriptors that a call writes. */
#include <stdlib.h>
#include <string.h>

#include "steps.h"

/* Whether a list to be written lies among what is read or what else is written; with an exception set. */
static int shares_memory(const Call* call, Image* list) {
    int shared_with = call->images[SRC].held && overlapping(list, &call->images[SRC]);
    for (int i = 0; i < call->array_count && !shared_with; ++i) shared_with = overlapping(list, &call->arrays[i]);
    if (!shared_with) return 0;
    release(list);
    return refuse(PyExc_ValueError, call, "out",
                  "an array that shares memory with another argument came; accepted are arrays apart: pass a copy");
}

/* An array of the call's own, or the one given, as memory for `count` int32 or elements. */
static int list_memory(Call* call, PyObject* given, int element, int count, PyObject** array, void** data) {
    Image* image = next_array(call, "out");
    if (!image) return -1;
    *array = given ? Py_NewRef(given) : make_array(element, 1, count, 1, 1);
    if (!*array) return -1;
    if (acquire(call, *array, "out", image, OUT)) return -1;
    if (given && shares_memory(call, image)) return -1;
    ++call->array_count;
    if (image->view.readonly) return check_writable(call, image, "out");
    if (image->element != element || image->dimensions != 1 || image->width != count)
        return refuse(PyExc_ValueError, call, "out",
                      "an array of another type or length came; accepted is %s (%d,), contiguous",
                      element_names[element], count);
    *data = image->data;
    return 0;
}

/* which 0: bins of the levels' intervals; 1: levels. Of one channel the list itself is the argument. */
int lists_out(Call* call, int which, int channels, Slot* slot) {
    void** pointers = (void**)call->values[call->value_count++].bytes;
    const int n = channels ? channels : 1;
    const int index = call->operation->has[HAS_OUT];
    PyObject* given = !which && call->given >> index & 1 ? call->arguments[index] : NULL;
    PyObject* made = PyTuple_New(n);
    if (!made) return -1;
    const int32_t* counts = call->plan ? call->plan->counts : call->counts;
    for (int i = 0; i < n; ++i) {
        PyObject *array = NULL, *one = given;
        if (given && channels) {
            one = item_of(call, "out", given, i, n);
            if (!one) goto failed;
        }
        const int failed = list_memory(call, one, I32, counts[i] - !which, &array, &pointers[i]);
        if (given && channels) Py_DECREF(one);
        if (array) PyTuple_SetItem(made, i, array);
        if (failed) goto failed;
    }
    slot->p = channels ? (void*)pointers : pointers[0];
    PyObject* result = channels ? made : Py_NewRef(PyTuple_GetItem(made, 0));
    if (!channels) Py_DECREF(made);
    if (!call->lists) {
        call->lists = result;
    } else {
        PyObject* both = PyTuple_Pack(2, call->lists, result);
        Py_DECREF(result);
        if (!both) return -1;
        Py_DECREF(call->lists);
        call->lists = both;
    }
    return 0;
failed:
    Py_DECREF(made);
    return -1;
}

/* The two images of smallest and largest elements of blocks. */
int special_outputs(Call* call) {
    int32_t height, width;
    const int index = call->operation->has[HAS_OUT];
    PyObject* given = index >= 0 && call->given >> index & 1 ? call->arguments[index] : NULL;
    if (call->form->extent == EXTENT_BLOCKS) {
        if (measure(call, &height, &width)) return -1;
        call->lists = PyTuple_New(2);
        for (int i = 0; call->lists && i < 2; ++i) {
            PyObject* array =
                given ? item_of(call, "out", given, i, 2) : make_array(call->form->target, height, width, 1, 2);
            if (!array) return -1;
            PyTuple_SetItem(call->lists, i, array);
            Image* image = &call->images[i ? OUT2 : OUT];
            if (acquire(call, array, "out", image, OUT) || check_writable(call, image, "out")) return -1;
            if (image->element != call->form->target || image->layout != 1 || image->height != height ||
                image->width != width)
                return refuse(PyExc_ValueError, call, "out",
                              "an array of another type or shape came; accepted are two of %s (%d, %d)",
                              element_names[call->form->target], height, width);
            if (overlapping(image, &call->images[SRC]) || (i && overlapping(image, &call->images[OUT])))
                return refuse(PyExc_ValueError, call, "out",
                              "arrays that share memory came; accepted are arrays apart");
        }
        return call->lists ? 0 : -1;
    }
    return 0;
}

/* Descriptors: one row for each location. */
int descriptors(Call* call) {
    const int i = parameter_index(call->operation, KIND_POINTS, NULL);
    int32_t count = 1;
    call->kernel = NULL;
    if (call->given >> i & 1 && read_points(call, "locations", call->arguments[i], &call->kernel, &count)) return -1;
    call->counts[0] = count;
    Image* out = &call->images[OUT];
    if (!out->held) {
        if (count < 1) return refuse(PyExc_ValueError, call, "locations", "none came; accepted is one or more");
        call->made = make_packed(F32, count, call->plan->descriptor, 2);
        if (!call->made || acquire(call, call->made, "out", out, OUT)) return -1;
        memset(out->data, 0, (size_t)count * (size_t)call->plan->descriptor * sizeof(float));
        return 0;
    }
    char text[96];
    if (check_writable(call, out, "out")) return -1;
    if (out->element != F32 || out->layout != 1 || out->height != count || out->width != call->plan->descriptor ||
        !packed_rows(out))
        return refuse(PyExc_ValueError, call, "out", "%s came; accepted is float32 (%d, %d), contiguous",
                      describe(out, text), count, call->plan->descriptor);
    return meets(call, SRC, "src") ? -1 : 0;
}
