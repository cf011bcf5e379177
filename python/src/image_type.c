/* Images in memory of the library, shown through the buffer protocol. */
#include "image_type.h"

typedef struct ImageObject {
    PyObject_HEAD void* data;
    int element, dimensions;
    Py_ssize_t shape[3], strides[3];
} ImageObject;

static const char* const formats[ELEMENTS] = {
    "B", "b", "H", "h", "I", "i", "q", "f", "d", "T{h:re:h:im:}", "T{i:re:i:im:}", "Zf"};

static void deallocate(PyObject* object) {
    PyTypeObject* type = Py_TYPE(object);
    qoriFree(((ImageObject*)object)->data);
    ((freefunc)PyType_GetSlot(type, Py_tp_free))(object);
    Py_DECREF(type);
}

static int get_buffer(PyObject* object, Py_buffer* view, int flags) {
    ImageObject* image = (ImageObject*)object;
    const int last = image->dimensions - 1;
    Py_ssize_t bytes = element_bytes[image->element], packed = bytes;
    int contiguous = 1;
    for (int i = last; i >= 0; --i) {
        bytes *= image->shape[i];
        contiguous &= image->strides[i] == packed || image->shape[i] < 2;
        packed *= image->shape[i];
    }
    /* What asks for an order of its own besides strides takes the elements as one block. */
    const int ordered = flags & ((PyBUF_C_CONTIGUOUS | PyBUF_ANY_CONTIGUOUS) & ~PyBUF_STRIDES);
    const int columns_first = (flags & PyBUF_F_CONTIGUOUS) == PyBUF_F_CONTIGUOUS && image->dimensions > 1;
    if ((!contiguous && (ordered || (flags & PyBUF_STRIDES) != PyBUF_STRIDES)) || columns_first) {
        PyErr_SetString(PyExc_BufferError, "rows of a qori.Image are padded, and not columns: strides are needed");
        view->obj = NULL;
        return -1;
    }
    view->obj = Py_NewRef(object);
    view->buf = image->data;
    view->len = bytes;
    view->itemsize = element_bytes[image->element];
    view->readonly = 0;
    view->ndim = image->dimensions;
    view->format = flags & PyBUF_FORMAT ? (char*)formats[image->element] : NULL;
    view->shape = flags & PyBUF_ND ? image->shape : NULL;
    view->strides = (flags & PyBUF_STRIDES) == PyBUF_STRIDES ? image->strides : NULL;
    view->suboffsets = NULL;
    view->internal = NULL;
    return 0;
}

static PyObject* get_shape(PyObject* object, void* unused) {
    (void)unused;
    const ImageObject* image = (ImageObject*)object;
    PyObject* shape = PyTuple_New(image->dimensions);
    for (int i = 0; shape && i < image->dimensions; ++i) PyTuple_SetItem(shape, i, PyLong_FromSsize_t(image->shape[i]));
    return shape;
}

static PyObject* get_dtype(PyObject* object, void* unused) {
    (void)unused;
    return PyUnicode_FromString(element_names[((ImageObject*)object)->element]);
}

static PyGetSetDef attributes[] = {{"shape", get_shape, NULL, "(height, width) or (height, width, channels).", NULL},
                                   {"dtype", get_dtype, NULL, "Name of the elements.", NULL},
                                   {NULL, NULL, NULL, NULL, NULL}};

int make_image_type(PyObject* module) {
    PyType_Slot slots[] = {{Py_tp_doc, "Memory of the library as an image; qori.empty makes one."},
                           {Py_tp_dealloc, (void*)deallocate},
                           {Py_tp_getset, attributes},
                           {Py_bf_getbuffer, (void*)get_buffer},
                           {0, NULL}};
    PyType_Spec spec = {"qori.Image", sizeof(ImageObject), 0,
                        Py_TPFLAGS_DEFAULT | Py_TPFLAGS_IMMUTABLETYPE | Py_TPFLAGS_DISALLOW_INSTANTIATION, slots};
    PyObject* type = PyType_FromModuleAndSpec(module, &spec, NULL);
    if (!type) return -1;
    shared.image_type = (PyTypeObject*)type;
    return PyModule_AddObjectRef(module, "Image", type);
}

/* The library allocates seven types; others take a row of bytes. */
static void* allocate_pixels(int element, int channels, int width, int height, int32_t* step) {
#define BY_CHANNELS(type)                                                 \
    (channels == 1   ? (void*)qoriMalloc_##type##_C1(width, height, step) \
     : channels == 2 ? (void*)qoriMalloc_##type##_C2(width, height, step) \
     : channels == 3 ? (void*)qoriMalloc_##type##_C3(width, height, step) \
                     : (void*)qoriMalloc_##type##_C4(width, height, step))
    switch (element) {
        case U8: return BY_CHANNELS(8u);
        case U16: return BY_CHANNELS(16u);
        case I16: return BY_CHANNELS(16s);
        case I32: return BY_CHANNELS(32s);
        case F32: return BY_CHANNELS(32f);
        case C32: return BY_CHANNELS(32sc);
        case CF: return BY_CHANNELS(32fc);
        default: {
            const int64_t bytes = (int64_t)width * channels * element_bytes[element];
            return bytes > INT32_MAX ? NULL : qoriMalloc_8u_C1((int32_t)bytes, height, step);
        }
    }
}

/* An object that owns the memory, which is released where there is none. */
static PyObject* image_of(void* data, int step, int element, int height, int width, int channels, int dimensions) {
    ImageObject* image =
        (ImageObject*)((allocfunc)PyType_GetSlot(shared.image_type, Py_tp_alloc))(shared.image_type, 0);
    if (!image) {
        qoriFree(data);
        return NULL;
    }
    const Py_ssize_t item = element_bytes[element];
    image->data = data;
    image->element = element;
    image->dimensions = dimensions;
    const Py_ssize_t shape[3] = {height, width, channels}, strides[3] = {step, channels * item, item};
    for (int i = 0; i < dimensions; ++i) {
        image->shape[i] = dimensions == 1 ? width : shape[i];
        image->strides[i] = dimensions == 1 ? item : strides[i];
    }
    return (PyObject*)image;
}

PyObject* new_image(int element, int height, int width, int channels, int dimensions) {
    int32_t step = 0;
    /* The library measures steps and blocks modulo 2^32. */
    const int64_t row = ((int64_t)width * channels * element_bytes[element] + 63) / 64 * 64;
    void* data = row > INT32_MAX || row * height > (int64_t)1 << 31
                     ? NULL
                     : allocate_pixels(element, channels, width, height, &step);
    return data ? image_of(data, step, element, height, width, channels, dimensions) : PyErr_NoMemory();
}

PyObject* new_packed_image(int element, int height, int width, int dimensions) {
    const int64_t row = (int64_t)width * element_bytes[element];
    void* data =
        row > INT32_MAX || row * height > INT32_MAX ? NULL : qoriMalloc_8u_C1((int)(row * height), 1, &(int){0});
    return data ? image_of(data, (int)row, element, height, width, 1, dimensions) : PyErr_NoMemory();
}
PyObject* empty_image(PyObject* module, PyObject* arguments, PyObject* keywords) {
    static char* names[] = {"shape", "dtype", NULL};
    PyObject *shape, *dtype = NULL;
    int64_t sides[3] = {0, 0, 1};
    Operation operation = {.name = "empty"};
    Call call;
    (void)module;
    start_call(&call, &operation);
    if (!PyArg_ParseTupleAndKeywords(arguments, keywords, "O|O:empty", names, &shape, &dtype)) return NULL;
    const Py_ssize_t count = PyTuple_Check(shape) ? PyTuple_Size(shape) : 0;
    if (count < 2 || count > 3) {
        refuse(PyExc_TypeError, &call, "shape",
               "%.80R came; accepted are (height, width) and (height, width, channels)", shape);
        return NULL;
    }
    for (Py_ssize_t i = 0; i < count; ++i)
        if (read_integer(&call, "shape", PyTuple_GetItem(shape, i), 1, i < 2 ? INT32_MAX : 4, &sides[i])) return NULL;
    const int element = dtype ? element_of_type(dtype) : U8;
    if (element < 0) {
        refuse(PyExc_TypeError, &call, "dtype", "%.80R came; accepted are types of elements, as 'uint8'", dtype);
        return NULL;
    }
    return new_image(element, (int)sides[0], (int)sides[1], (int)sides[2], (int)count);
}
