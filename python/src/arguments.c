/* Numbers, words, pairs, kernels and lists as C arguments. Nothing is converted that would lose something. */
#include <math.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include "core.h"

/* Memory of a call, freed at its end. */
void* allocate(Call* call, size_t bytes) {
    if (bytes <= sizeof call->small - (size_t)call->small_used) {
        void* small = call->small + call->small_used;
        call->small_used += (int)(bytes + 63) & ~63;
        return small;
    }
    if (call->block_count == (int)(sizeof call->blocks / sizeof *call->blocks)) {
        refuse(PyExc_ValueError, call, NULL, "more lists came than a call keeps");
        return NULL;
    }
    void* block = malloc(bytes ? bytes : 1);
    if (!block)
        PyErr_NoMemory();
    else
        call->blocks[call->block_count++] = block;
    return block;
}

static int wrong_type(const Call* call, const char* name, PyObject* object, const char* accepted) {
    PyObject* type = PyType_GetName(Py_TYPE(object));
    if (!type) return -1;
    if (PyObject_CheckBuffer(object)) /* whose text may be long */
        refuse(PyExc_TypeError, call, name, "an object of type %U came; accepted is %s", type, accepted);
    else
        refuse(PyExc_TypeError, call, name, "%.80R of type %U came; accepted is %s", object, type, accepted);
    Py_DECREF(type);
    return -1;
}

int read_integer(const Call* call, const char* name, PyObject* object, int64_t low, int64_t high, int64_t* value) {
    PyObject* integer = PyLong_Check(object) ? Py_NewRef(object) : PyNumber_Index(object);
    if (!integer) {
        if (!PyErr_ExceptionMatches(PyExc_TypeError)) return -1;
        PyErr_Clear();
        return wrong_type(call, name, object, "an integer");
    }
    int overflow = 0;
    *value = PyLong_AsLongLongAndOverflow(integer, &overflow);
    Py_DECREF(integer);
    if (*value == -1 && PyErr_Occurred()) return -1;
    if (overflow || *value < low || *value > high)
        return refuse(PyExc_ValueError, call, name, "%.80R came; accepted are integers from %lld to %lld", object,
                      (long long)low, (long long)high);
    return 0;
}

static int read_real(const Call* call, const char* name, PyObject* object, double* value) {
    *value = PyFloat_AsDouble(object);
    if (*value == -1.0 && PyErr_Occurred()) {
        if (PyErr_ExceptionMatches(PyExc_OverflowError)) {
            PyErr_Clear();
            return refuse(PyExc_ValueError, call, name, "%.80R came; accepted are numbers in the range of float64",
                          object);
        }
        if (!PyErr_ExceptionMatches(PyExc_TypeError)) return -1;
        PyErr_Clear();
        return wrong_type(call, name, object, "a number");
    }
    return 0;
}

static int as_float(const Call* call, const char* name, PyObject* object, double value, float* into) {
    *into = (float)value;
    if (isinf(*into) && isfinite(value))
        return refuse(PyExc_ValueError, call, name, "%.80R came; accepted are numbers in the range of float32", object);
    return 0;
}

static int read_complex(const Call* call, const char* name, PyObject* object, int element, void* into) {
    if (PyUnicode_Check(object)) return wrong_type(call, name, object, "a complex number");
    PyObject* number = PyObject_CallFunctionObjArgs((PyObject*)&PyComplex_Type, object, NULL);
    if (!number) {
        if (!PyErr_ExceptionMatches(PyExc_TypeError)) return -1;
        PyErr_Clear();
        return wrong_type(call, name, object, "a complex number");
    }
    const double parts[2] = {PyComplex_RealAsDouble(number), PyComplex_ImagAsDouble(number)};
    Py_DECREF(number);
    for (int i = 0; i < 2; ++i) {
        if (element == CF) {
            if (as_float(call, name, object, parts[i], (float*)into + i)) return -1;
            continue;
        }
        const double limit = element == C16 ? 32768.0 : 2147483648.0;
        if (!(parts[i] >= -limit && parts[i] < limit && parts[i] == floor(parts[i])))
            return refuse(PyExc_ValueError, call, name,
                          "%.80R came; accepted are complex numbers of integers of %d bits", object,
                          element == C16 ? 16 : 32);
        if (element == C16)
            ((int16_t*)into)[i] = (int16_t)parts[i];
        else
            ((int32_t*)into)[i] = (int32_t)parts[i];
    }
    return 0;
}

/* One element of its type. */
int read_number(const Call* call, const char* name, PyObject* object, int element, void* into) {
    static const int64_t low[] = {0, INT8_MIN, 0, INT16_MIN, 0, INT32_MIN, INT64_MIN};
    static const int64_t high[] = {UINT8_MAX, INT8_MAX, UINT16_MAX, INT16_MAX, UINT32_MAX, INT32_MAX, INT64_MAX};
    if (element >= C16) return read_complex(call, name, object, element, into);
    if (element >= F32) {
        double value;
        if (read_real(call, name, object, &value)) return -1;
        if (element == F32) return as_float(call, name, object, value, into);
        memcpy(into, &value, sizeof value);
        return 0;
    }
    int64_t value;
    if (read_integer(call, name, object, low[element], high[element], &value)) return -1;
    memcpy(into, &value, element_bytes[element]); /* little-endian: the low bytes are the value */
    return 0;
}

/* One element for each channel: of a number for all of them, or of as many numbers. */
int read_values(const Call* call, const char* name, PyObject* object, int element, int channels, void* into) {
    const int sequence = PyTuple_Check(object) || PyList_Check(object) ||
                         (PySequence_Check(object) && !PyUnicode_Check(object) && !PyBytes_Check(object));
    const int count = channels ? channels : 1;
    Py_ssize_t given = sequence ? PySequence_Size(object) : -1;
    if (sequence && given < 0) { /* scalars of NumPy look like sequences and have no length */
        PyErr_Clear();
        given = -1;
    }
    if (given < 0) {
        if (read_number(call, name, object, element, into)) return -1;
        for (int i = 1; i < count; ++i)
            memcpy((uint8_t*)into + i * element_bytes[element], into, element_bytes[element]);
        return 0;
    }
    if (given != count)
        return refuse(PyExc_ValueError, call, name,
                      "%zd values came; accepted are %d, one for each channel, or one number for all", given, count);
    for (int i = 0; i < count; ++i) {
        PyObject* item = PySequence_GetItem(object, i);
        if (!item) return -1;
        const int failed = read_number(call, name, item, element, (uint8_t*)into + i * element_bytes[element]);
        Py_DECREF(item);
        if (failed) return -1;
    }
    return 0;
}

/* One of several objects of a sequence: a new reference. */
PyObject* item_of(const Call* call, const char* name, PyObject* object, int index, int count) {
    const Py_ssize_t n = PySequence_Check(object) && !PyUnicode_Check(object) ? PySequence_Size(object) : -1;
    if (n == count) return PySequence_GetItem(object, index);
    PyErr_Clear();
    refuse(PyExc_TypeError, call, name, "%.80R came; accepted is a sequence of %d arrays", object, count);
    return NULL;
}

/* (rows, columns), or one number for both. */
int read_pair(const Call* call, const char* name, PyObject* object, int32_t* rows, int32_t* columns) {
    int64_t values[2];
    if (PyLong_Check(object) || (PyIndex_Check(object) && !PySequence_Check(object))) {
        if (read_integer(call, name, object, INT32_MIN, INT32_MAX, &values[0])) return -1;
        *rows = *columns = (int32_t)values[0];
        return 0;
    }
    if (!PySequence_Check(object) || PyUnicode_Check(object) || PySequence_Size(object) != 2) {
        PyErr_Clear();
        return wrong_type(call, name, object, "a pair (rows, columns) of integers");
    }
    for (int i = 0; i < 2; ++i) {
        PyObject* item = PySequence_GetItem(object, i);
        if (!item) return -1;
        const int failed = read_integer(call, name, item, INT32_MIN, INT32_MAX, &values[i]);
        Py_DECREF(item);
        if (failed) return -1;
    }
    *rows = (int32_t)values[0];
    *columns = (int32_t)values[1];
    return 0;
}

static int refuse_word(const Call* call, const char* name, PyObject* object, const Enumeration* enumeration,
                       int combine) {
    char words[400];
    size_t used = 0;
    for (const Word* w = enumeration->words; w->text && used + 40 < sizeof words; ++w)
        used +=
            (size_t)snprintf(words + used, sizeof words - used, "%s'%s'", w == enumeration->words ? "" : ", ", w->text);
    return refuse(PyExc_ValueError, call, name, "%.80R came; accepted are %s%s", object, words,
                  combine ? ", combined by '|'" : "");
}

/* A word of an enumeration, several of them joined by |, or its number. */
int read_word(const Call* call, const char* name, PyObject* object, const Enumeration* enumeration, int combine,
              int32_t* value) {
    if (!PyUnicode_Check(object)) {
        int64_t number;
        if (!PyIndex_Check(object)) return wrong_type(call, name, object, "a word or a number");
        if (read_integer(call, name, object, INT32_MIN, INT32_MAX, &number)) return -1;
        *value = (int32_t)number;
        return 0;
    }
    Py_ssize_t length;
    const char* text = PyUnicode_AsUTF8AndSize(object, &length);
    if (!text) return -1;
    int32_t combined = 0;
    for (;;) {
        const char* end = combine ? strchr(text, '|') : NULL;
        size_t n = end ? (size_t)(end - text) : strlen(text);
        const char* start = text;
        while (n && *start == ' ') ++start, --n;
        while (n && start[n - 1] == ' ') --n;
        const Word* w = enumeration->words;
        while (w->text && (strncmp(w->text, start, n) || w->text[n])) ++w;
        if (!w->text) return refuse_word(call, name, object, enumeration, combine);
        combined |= w->value;
        if (!end) break;
        text = end + 1;
    }
    *value = combined;
    return 0;
}

/* Room for another array of the call, or null with an exception set. */
Image* next_array(Call* call, const char* name) {
    if (call->array_count == (int)(sizeof call->arrays / sizeof *call->arrays)) {
        refuse(PyExc_ValueError, call, name, "more arrays came than a call holds");
        return NULL;
    }
    Image* image = &call->arrays[call->array_count];
    image->held = 0;
    return image;
}

/* A buffer that the call holds to its end; its element type, or -1. */
static int hold(Call* call, const char* name, PyObject* object, int dimensions, Py_buffer** held) {
    /* In its place from the first: the shape of a buffer may be a part of the buffer itself. */
    Image* image = next_array(call, name);
    if (!image || acquire(call, object, name, image, SRC)) return -1;
    ++call->array_count;
    Py_buffer* view = &image->view;
    if (view->ndim > dimensions)
        return refuse(PyExc_ValueError, call, name, "an array of %d dimensions came; accepted are %d", view->ndim,
                      dimensions);
    if (!PyBuffer_IsContiguous(view, 'C'))
        return refuse(PyExc_ValueError, call, name,
                      "an array that is not contiguous came; numpy.ascontiguousarray copies it");
    *held = view;
    return image->element;
}

static int wrong_elements(const Call* call, const char* name, int came, int wanted) {
    return refuse(PyExc_TypeError, call, name, "elements of %s came; accepted is %s: convert them with .astype('%s')",
                  element_names[came], element_names[wanted], element_names[wanted]);
}

int read_kernel(Call* call, const char* name, PyObject* object, int* element, int32_t* height, int32_t* width,
                void** data) {
    Py_buffer* view = NULL;
    const int found = hold(call, name, object, 2, &view);
    if (found < 0) return -1;
    if (view->ndim != 2)
        return refuse(PyExc_ValueError, call, name, "an array of one dimension came; accepted are (rows, columns)");
    *element = found;
    *height = (int32_t)view->shape[0];
    *width = (int32_t)view->shape[1];
    *data = view->buf;
    return 0;
}

/* A list from an array of one dimension or from numbers. */
static int read_list(Call* call, const char* name, PyObject* object, int element, void** list, int32_t* count) {
    if (PyTuple_Check(object) || PyList_Check(object)) {
        const Py_ssize_t n = PySequence_Size(object);
        if (n < 0) return -1;
        if (n > 1 << 24) return refuse(PyExc_ValueError, call, name, "%zd numbers came; pass an array", n);
        uint8_t* block = allocate(call, (size_t)n * element_bytes[element]);
        if (!block) return -1;
        for (Py_ssize_t i = 0; i < n; ++i) {
            PyObject* item = PySequence_GetItem(object, i);
            if (!item) return -1;
            const int failed = read_number(call, name, item, element, block + i * element_bytes[element]);
            Py_DECREF(item);
            if (failed) return -1;
        }
        *list = block;
        *count = (int32_t)n;
        return 0;
    }
    Py_buffer* view = NULL;
    const int found = hold(call, name, object, 1, &view);
    if (found < 0) return -1;
    if (found != element) return wrong_elements(call, name, found, element);
    *list = view->buf;
    *count = (int32_t)view->shape[0];
    return 0;
}

static int is_number(PyObject* object) {
    return PyFloat_Check(object) || PyLong_Check(object) || (PyIndex_Check(object) && !PySequence_Check(object));
}

/* One list for each channel: a list of lists, an array of rows, or one list for all. channels 0: the list itself, and
 * 9: an array of triples. */
int read_lists(Call* call, const char* name, PyObject* object, int element, int channels, void** lists,
               int32_t* counts) {
    if (channels == 9) {
        Py_buffer* view = NULL;
        const int found = hold(call, name, object, 2, &view);
        if (found < 0) return -1;
        if (found != element) return wrong_elements(call, name, found, element);
        if (view->ndim != 2 || view->shape[1] != 3)
            return refuse(PyExc_ValueError, call, name, "an array of another shape came; accepted is (entries, 3)");
        lists[0] = view->buf;
        counts[0] = (int32_t)view->shape[0];
        return 0;
    }
    const int n = channels ? channels : 1;
    if (PyTuple_Check(object) || PyList_Check(object)) {
        PyObject* first = PySequence_Size(object) > 0 ? PySequence_GetItem(object, 0) : NULL;
        const int numbers = !first || is_number(first);
        Py_XDECREF(first);
        if (!numbers) {
            if (PySequence_Size(object) != n)
                return refuse(PyExc_ValueError, call, name, "%zd lists came; accepted are %d, one for each channel",
                              PySequence_Size(object), n);
            for (int i = 0; i < n; ++i) {
                PyObject* item = PySequence_GetItem(object, i);
                if (!item) return -1;
                const int failed = read_list(call, name, item, element, &lists[i], &counts[i]);
                Py_DECREF(item); /* the sequence keeps it, and the call holds its buffer */
                if (failed) return -1;
            }
            return 0;
        }
    } else if (PyObject_CheckBuffer(object)) {
        Py_buffer* view = NULL;
        const int found = hold(call, name, object, 2, &view);
        if (found < 0) return -1;
        if (found != element) return wrong_elements(call, name, found, element);
        const int rows = view->ndim == 2;
        if (rows && view->shape[0] != n)
            return refuse(PyExc_ValueError, call, name, "%zd rows came; accepted are %d, one for each channel",
                          view->shape[0], n);
        for (int i = 0; i < n; ++i) {
            counts[i] = (int32_t)view->shape[rows];
            lists[i] = (uint8_t*)view->buf + (rows ? i * view->shape[1] * view->itemsize : 0);
        }
        return 0;
    }
    if (read_list(call, name, object, element, &lists[0], &counts[0])) return -1;
    for (int i = 1; i < n; ++i) lists[i] = lists[0], counts[i] = counts[0];
    return 0;
}

/* (row, column) pairs as points of x and y. */
int read_points(Call* call, const char* name, PyObject* object, void** data, int32_t* count) {
    const Py_ssize_t n = PySequence_Check(object) && !PyUnicode_Check(object) ? PySequence_Size(object) : -1;
    if (n < 0) {
        PyErr_Clear();
        return wrong_type(call, name, object, "a list of pairs (row, column)");
    }
    if (n > 1 << 26) return refuse(PyExc_ValueError, call, name, "%zd points came; accepted are 67108864", n);
    QorPoint2D* points = allocate(call, (size_t)n * sizeof *points);
    if (!points) return -1;
    for (Py_ssize_t i = 0; i < n; ++i) {
        PyObject* item = PySequence_GetItem(object, i);
        if (!item) return -1;
        const int failed = read_pair(call, name, item, &points[i].y, &points[i].x);
        Py_DECREF(item);
        if (failed) return -1;
    }
    *data = points;
    *count = (int32_t)n;
    return 0;
}
