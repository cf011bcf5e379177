/* Arrays as images: element type, shape, steps, and whether two of them share bytes. */
#include <stdio.h>
#include <string.h>

#include "image_type.h"

const uint8_t element_bytes[ELEMENTS] = {1, 1, 2, 2, 4, 4, 8, 4, 8, 4, 8, 8};
const char* const element_names[ELEMENTS] = {"uint8", "int8",    "uint16",  "int16",      "uint32",     "int32",
                                             "int64", "float32", "float64", "complex16s", "complex32s", "complex64"};

/* An integer code of the struct module by its size; the letters of long and long long depend on the system. */
static int integer_element(char letter, Py_ssize_t bytes) {
    static const char signed_letters[] = "bhilqn", unsigned_letters[] = "BHILQN";
    if (strchr(unsigned_letters, letter)) return bytes == 1 ? U8 : bytes == 2 ? U16 : bytes == 4 ? U32 : NO_ELEMENT;
    if (!strchr(signed_letters, letter)) return NO_ELEMENT;
    return bytes == 1 ? I8 : bytes == 2 ? I16 : bytes == 4 ? I32 : bytes == 8 ? I64 : NO_ELEMENT;
}

/* The element type of a format of the buffer protocol; structures of re and im are complex integers. */
static int element_of_format(const char* format, Py_ssize_t bytes) {
    if (!format) return U8;
    char plain[32];
    size_t n = 0;
    for (const char* c = format; *c && n < sizeof plain - 1; ++c) {
        if (*c == '>' || *c == '!') {
            if (bytes > 1) return NO_ELEMENT;
        } else if (*c != '@' && *c != '=' && *c != '<' && *c != '^') {
            plain[n++] = *c;
        }
    }
    plain[n] = 0;
    if (n == 1) {
        if (*plain == 'f' && bytes == 4) return F32;
        if (*plain == 'd' && bytes == 8) return F64;
        if (*plain == 'c') return U8;
        return integer_element(*plain, bytes);
    }
    if (!strcmp(plain, "Zf")) return CF;
    if (!strcmp(plain, "T{h:re:h:im:}")) return C16;
    if (!strcmp(plain, "T{i:re:i:im:}") || !strcmp(plain, "T{l:re:l:im:}")) return bytes == 8 ? C32 : NO_ELEMENT;
    return NO_ELEMENT;
}

const char* describe(const Image* image, char text[96]) {
    const char* element = image->element < ELEMENTS ? element_names[image->element] : "?";
    if (image->dimensions == 1)
        snprintf(text, 96, "%s (%d,)", element, image->width);
    else if (image->dimensions == 2)
        snprintf(text, 96, "%s (%d, %d)", element, image->height, image->width);
    else
        snprintf(text, 96, "%s (%d, %d, %d)%s", element, image->height, image->width, image->layout & CHANNELS,
                 image->layout & PLANAR ? " in planes" : "");
    return text;
}

static int refuse_format(const Call* call, PyObject* object, const char* name) {
    Py_buffer view;
    char format[40] = "?";
    if (!PyObject_GetBuffer(object, &view, PyBUF_RECORDS_RO)) {
        snprintf(format, sizeof format, "%s", view.format ? view.format : "B");
        PyBuffer_Release(&view);
    } else {
        PyErr_Clear();
    }
    const char* why = !strncmp(format, "T{", 2)                    ? "structures as elements"
                      : strchr(format, '>') || strchr(format, '!') ? "big-endian elements"
                      : strchr(format, 'e')                        ? "float16 elements"
                      : strchr(format, 'O')                        ? "Python objects as elements"
                      : strchr(format, '?')                        ? "boolean elements"
                                                                   : "elements of another type";
    return refuse(
        PyExc_TypeError, call, name,
        "an array with %s (format '%s') came; accepted are uint8, int8, uint16, int16, uint32, int32, float32, "
        "float64, complex64 and structures of re and im in native byte order: convert it with .astype(...)",
        why, format);
}

/* Strides and shape of a buffer as height, width, channels and step. */
static int lay_out(const Call* call, const char* name, Image* image) {
    const Py_buffer* v = &image->view;
    const Py_ssize_t item = v->itemsize;
    Py_ssize_t packed[3];
    const Py_ssize_t* strides = v->strides;
    static const char* const steps =
        "steps of %zd bytes between %s came; accepted are contiguous pixels "
        "(numpy.ascontiguousarray makes a copy)%s";
    image->data = v->buf;
    image->dimensions = (uint8_t)v->ndim;
    if (v->ndim < 1 || v->ndim > 3)
        return refuse(PyExc_ValueError, call, name,
                      "an array of %d dimensions came; accepted are (height, width) and (height, width, channels)",
                      v->ndim);
    if (!strides) { /* ctypes leaves out those of contiguous arrays */
        Py_ssize_t bytes = item;
        for (int i = v->ndim; i-- > 0; bytes *= v->shape[i]) packed[i] = bytes;
        strides = packed;
    }
    const int flat = v->ndim == 1;
    const Py_ssize_t height = flat ? 1 : v->shape[0], width = v->shape[flat ? 0 : 1],
                     channels = v->ndim == 3 ? v->shape[2] : 1;
    if (height > INT32_MAX || width > INT32_MAX)
        return refuse(PyExc_ValueError, call, name, "a side of %zd pixels came; accepted are sides below 2147483648",
                      height > width ? height : width);
    if (channels < 1 || channels > 4)
        return refuse(PyExc_ValueError, call, name,
                      "%zd channels came; accepted are (height, width) and 1, 3 or 4 channels, last", channels);
    image->height = (int32_t)height;
    image->width = (int32_t)width;
    image->layout = (uint8_t)channels;
    Py_ssize_t pixel = item * channels;
    const Py_ssize_t across = strides[flat ? 0 : 1];
    if (channels > 1 && strides[2] != item) {
        if (width > 1 && across != item)
            return refuse(PyExc_ValueError, call, name, steps, strides[2], "channels",
                          "; planes are taken too: (height, width, channels) views of contiguous rows");
        image->layout |= PLANAR;
        image->plane = strides[2];
        pixel = item;
    } else if (width > 1 && across != pixel) {
        return refuse(PyExc_ValueError, call, name, steps, across, "pixels",
                      across > pixel && channels == 1   ? ", or the whole array with channel="
                      : across > pixel && channels == 3 ? ", or the array of four channels with keep_alpha=True"
                                                        : "");
    }
    const Py_ssize_t row = width * pixel;
    image->step = height > 1 ? strides[0] : row ? row : 1;
    if (image->step > INT32_MAX || image->step < INT32_MIN)
        return refuse(
            PyExc_ValueError, call, name,
            "rows %zd bytes apart came; accepted are steps of 32 bits: copy the array, or work on parts of it",
            image->step);
    return 0;
}

/* Takes hold of an array; `which` is one of the call's images. */
int acquire(const Call* call, PyObject* object, const char* name, Image* image, int which) {
    int element = NO_ELEMENT;
    if (Py_TYPE(object) == shared.ndarray) {
        /* The dtypes of plain elements are singletons, faster to compare than a format is to write. */
        if (PyObject_GetBuffer(object, &image->view, PyBUF_STRIDED_RO)) return -1;
        PyObject* dtype = PyObject_GetAttr(object, shared.name_dtype);
        if (dtype) {
            for (int e = 0; e < ELEMENTS; ++e)
                if (shared.dtypes[e] == dtype) {
                    element = e;
                    break;
                }
            Py_DECREF(dtype);
        } else {
            PyErr_Clear();
        }
        if (element == NO_ELEMENT) PyBuffer_Release(&image->view);
    } else if (!PyObject_CheckBuffer(object)) {
        PyObject* type = PyType_GetName(Py_TYPE(object));
        if (!type) return -1;
        refuse(PyExc_TypeError, call, name,
               "an object of type %U came; accepted are arrays, of NumPy or of any other buffer: numpy.asarray(...) "
               "makes one",
               type);
        Py_DECREF(type);
        return -1;
    }
    if (element == NO_ELEMENT) {
        if (PyObject_GetBuffer(object, &image->view, PyBUF_RECORDS_RO)) {
            if (PyErr_ExceptionMatches(PyExc_MemoryError)) return -1;
            PyErr_Clear();
            return refuse(
                PyExc_TypeError, call, name,
                "an array that has no plain memory came; accepted are arrays of numbers: convert it with .astype(...)");
        }
        const char* format = image->view.format;
        if (which == MASK && format && !strcmp(format, "?"))
            element = U8;
        else
            element = element_of_format(format, image->view.itemsize);
        if (element == NO_ELEMENT) {
            PyBuffer_Release(&image->view);
            return refuse_format(call, object, name);
        }
        if (!shared.ndarray && find_numpy(0)) PyErr_Clear(); /* a NumPy that does not load is none */
    }
    image->element = (uint8_t)element;
    if (lay_out(call, name, image)) {
        PyBuffer_Release(&image->view);
        return -1;
    }
    image->held = 1;
    return 0;
}

void release(Image* image) {
    if (image->held) PyBuffer_Release(&image->view);
    image->held = 0;
}

/* First and one past the last byte that an image may touch. */
static void bounds(const Image* image, const uint8_t** low, const uint8_t** high) {
    const Py_ssize_t planes = image->layout & PLANAR ? image->layout & CHANNELS : 1;
    const Py_ssize_t pixel = element_bytes[image->element] * (planes > 1 ? 1 : image->layout & CHANNELS);
    const Py_ssize_t rows = image->height > 0 ? (image->height - 1) * image->step : 0;
    const Py_ssize_t apart = planes > 1 ? (planes - 1) * image->plane : 0;
    *low = image->data + (rows < 0 ? rows : 0) + (apart < 0 ? apart : 0);
    *high = image->data + (rows > 0 ? rows : 0) + (apart > 0 ? apart : 0) + image->width * pixel;
}

/* Whether two images share a byte. Rows of one step that lie beside each other share none. */
int overlapping(const Image* a, const Image* b) {
    if (a->height < 1 || b->height < 1 || a->width < 1 || b->width < 1) return 0;
    const uint8_t *low_a, *high_a, *low_b, *high_b;
    bounds(a, &low_a, &high_a);
    bounds(b, &low_b, &high_b);
    if (high_a <= low_b || high_b <= low_a) return 0;
    if (a->step != b->step || a->step == 0 || (a->layout | b->layout) & PLANAR) return 1;
    const Py_ssize_t step = a->step < 0 ? -a->step : a->step;
    const Py_ssize_t bytes_a = (Py_ssize_t)a->width * element_bytes[a->element] * (a->layout & CHANNELS);
    const Py_ssize_t bytes_b = (Py_ssize_t)b->width * element_bytes[b->element] * (b->layout & CHANNELS);
    Py_ssize_t apart = (b->data - a->data) % step;
    if (apart < 0) apart += step;
    return apart < bytes_a || apart + bytes_b > step;
}

int among(const void* block, Py_ssize_t bytes, const Image* image) {
    const uint8_t *low, *high, *first = block;
    if (bytes < 1 || image->height < 1 || image->width < 1) return 0;
    bounds(image, &low, &high);
    return first < high && low < first + bytes;
}

PyObject* make_packed(int element, int height, int width, int dimensions) {
    if (!shared.empty && find_numpy(1)) {
        if (!PyErr_ExceptionMatches(PyExc_ImportError)) return NULL;
        PyErr_Clear();
        return new_packed_image(element, height, width, dimensions);
    }
    return make_array(element, height, width, 1, dimensions);
}

/* A new array, of NumPy where that is to be had, else a qori.Image; dimensions 2 leaves out the channels. */
PyObject* make_array(int element, int height, int width, int channels, int dimensions) {
    if (!shared.empty && find_numpy(1)) {
        if (!PyErr_ExceptionMatches(PyExc_ImportError)) return NULL;
        PyErr_Clear();
        return new_image(element, height, width, channels, dimensions);
    }
    PyObject* shape;
    if (dimensions == 1)
        shape = Py_BuildValue("(i)", width);
    else {
        shape = PyTuple_New(dimensions == 3 ? 3 : 2);
        if (shape) {
            PyTuple_SetItem(shape, 0, PyLong_FromLong(height));
            PyTuple_SetItem(shape, 1, PyLong_FromLong(width));
            if (dimensions == 3) PyTuple_SetItem(shape, 2, PyLong_FromLong(channels));
        }
    }
    if (!shape) return NULL;
    PyObject* array = PyObject_CallFunctionObjArgs(shared.empty, shape, shared.dtypes[element], NULL);
    Py_DECREF(shape);
    return array;
}

/* The element type that a dtype, a type of numbers or a word names; -1 where it is none. */
int element_of_type(PyObject* dtype) {
    for (int e = 0; e < ELEMENTS; ++e)
        if (shared.dtypes[e] == dtype) return e;
    PyObject* name = PyUnicode_Check(dtype) ? Py_NewRef(dtype) : PyObject_GetAttrString(dtype, "__name__");
    if (!name) {
        PyErr_Clear();
        name = PyObject_GetAttrString(dtype, "name");
    }
    if (!name) {
        PyErr_Clear();
        return -1;
    }
    const char* text = PyUnicode_Check(name) ? PyUnicode_AsUTF8AndSize(name, NULL) : NULL;
    int found = -1;
    for (int e = 0; text && e < ELEMENTS && found < 0; ++e)
        if (!strcmp(text, element_names[e])) found = e;
    if (!text) PyErr_Clear();
    Py_DECREF(name);
    if (found < 0 && shared.empty) { /* structures of re and im compare equal to ours */
        for (int e = C16; e <= C32; ++e) {
            const int equal = PyObject_RichCompareBool(dtype, shared.dtypes[e], Py_EQ);
            if (equal < 0) PyErr_Clear();
            if (equal == 1) return e;
        }
    }
    return found;
}
