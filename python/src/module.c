/* The module: what it needs of the processor and of NumPy, its functions, types and words. */
#include "core.h"

#include <string.h>

#include "image_type.h"
#include "plans.h"

Shared shared;

#define OPERATION(name, number)                                                                       \
    static PyObject* operation_##name(PyObject* module, PyObject* const* arguments, Py_ssize_t count, \
                                      PyObject* names) {                                              \
        (void)module;                                                                                 \
        return run(&operations[number], arguments, count, names);                                     \
    }
#define METHOD(name, doc) \
    { #name, (PyCFunction)(void (*)(void))operation_##name, METH_FASTCALL | METH_KEYWORDS, doc }
#include "python_tables.inc"

const Enumeration* const all_enumerations = enumerations;
const Status* const all_statuses = statuses;
const Step* const* const all_programs = programs;
const Result* const* const all_results = results;
const Trampoline* const all_trampolines = trampolines;
const Parameter* const all_parameters = parameters;
const Operation* const all_operations = operations;
PyObject* parameter_names[PARAMETERS];

const Enumeration* enumeration_named(const char* name) {
    const Enumeration* e = enumerations;
    while (strcmp(e->name, name)) ++e;
    return e;
}

/* --- NumPy, looked up once ------------------------------------------------------------------------------------------
 */

static PyObject* complex_dtype(PyObject* maker, const char* part) {
    PyObject* fields = Py_BuildValue("[(ss)(ss)]", "re", part, "im", part);
    PyObject* dtype = fields ? PyObject_CallFunctionObjArgs(maker, fields, NULL) : NULL;
    Py_XDECREF(fields);
    return dtype;
}

static int take_dtypes(PyObject* numpy) {
    PyObject* maker = PyObject_GetAttrString(numpy, "dtype");
    int failed = !maker;
    for (int e = 0; !failed && e < ELEMENTS; ++e) {
        shared.dtypes[e] = e == C16   ? complex_dtype(maker, "i2")
                           : e == C32 ? complex_dtype(maker, "i4")
                                      : PyObject_CallFunction(maker, "s", element_names[e]);
        failed = !shared.dtypes[e];
    }
    Py_XDECREF(maker);
    return failed ? -1 : 0;
}

/* Takes what is needed of NumPy, where it has been imported or is to be. Without it arrays are qori.Image. */
int find_numpy(int import_it) {
    if (shared.empty) return 0;
    PyObject* name = PyUnicode_FromString("numpy");
    PyObject* numpy = name ? PyImport_GetModule(name) : NULL;
    Py_XDECREF(name);
    if (numpy == Py_None) Py_CLEAR(numpy); /* an import that has been forbidden */
    if (!numpy) {
        if (PyErr_Occurred() || !import_it) return PyErr_Occurred() ? -1 : 0;
        numpy = PyImport_ImportModule("numpy");
        if (!numpy) return -1;
    }
    PyObject* array = PyObject_GetAttrString(numpy, "ndarray");
    PyObject* empty = array ? PyObject_GetAttrString(numpy, "empty") : NULL;
    int failed = !empty || take_dtypes(numpy);
    Py_DECREF(numpy);
    if (failed) {
        Py_XDECREF(array);
        Py_XDECREF(empty);
        return -1;
    }
    shared.ndarray = (PyTypeObject*)array;
    shared.empty = empty;
    return 0;
}

/* --- module ---------------------------------------------------------------------------------------------------------
 */

static int require_features(int avx2, int fma) {
    if (avx2 && fma) return 0;
    PyErr_Format(PyExc_ImportError, "qori needs a processor with AVX2 and FMA, and this one has no %s",
                 avx2  ? "FMA"
                 : fma ? "AVX2"
                       : "AVX2 and no FMA");
    return -1;
}

static int check_processor(void) {
    __builtin_cpu_init();
    return require_features(__builtin_cpu_supports("avx2"), __builtin_cpu_supports("fma"));
}

/* Interned names and types are of the interpreter that imports first. */
static int check_interpreter(void) {
    static int64_t first = -1;
    const int64_t mine = PyInterpreterState_GetID(PyInterpreterState_Get());
    if (first >= 0 && first != mine) {
        PyErr_SetString(PyExc_ImportError, "qori works in one interpreter of a process, and another has imported it");
        return -1;
    }
    first = mine;
    return 0;
}

static int add_exceptions(PyObject* module) {
    shared.error = PyErr_NewExceptionWithDoc("qori.Error", "A call that the library refused; code is its status.",
                                             PyExc_ValueError, NULL);
    shared.warning =
        PyErr_NewExceptionWithDoc("qori.Warning", "A call that was done with a remark.", PyExc_UserWarning, NULL);
    PyObject* both = shared.error ? PyTuple_Pack(2, shared.error, PyExc_MemoryError) : NULL;
    if (both)
        shared.no_memory =
            PyErr_NewExceptionWithDoc("qori.OutOfMemoryError", "No memory for what a call works with.", both, NULL);
    Py_XDECREF(both);
    if (!shared.no_memory || !shared.warning) return -1;
    return PyModule_AddObjectRef(module, "Error", shared.error) ||
                   PyModule_AddObjectRef(module, "OutOfMemoryError", shared.no_memory) ||
                   PyModule_AddObjectRef(module, "Warning", shared.warning)
               ? -1
               : 0;
}

static PyObject* version(PyObject* module, PyObject* unused) {
    (void)module;
    (void)unused;
    const QorLibraryVersion* v = qoriGetLibVersion();
    return PyUnicode_FromFormat("%d.%d.%d", v->versionMajor, v->versionMinor, v->versionPatch);
}

/* (function, C member, its in-place twin or None) of every form. */
static PyObject* members(PyObject* module, PyObject* unused) {
    (void)module;
    (void)unused;
    PyObject* list = PyList_New(0);
    for (int o = 0; list && o < OPERATIONS; ++o)
        for (int i = 0; list && i < operations[o].form_count; ++i) {
            const Form* f = &operations[o].forms[i];
            PyObject* item = Py_BuildValue("(szz)", operations[o].name, f->function ? f->name : NULL, f->in_place_name);
            if (!item || PyList_Append(list, item)) Py_CLEAR(list);
            Py_XDECREF(item);
        }
    return list;
}

/* The C name of the member that a function would call with these arguments. */
static PyObject* member(PyObject* module, PyObject* const* arguments, Py_ssize_t count, PyObject* names) {
    (void)module;
    const char* name = count ? PyUnicode_AsUTF8AndSize(arguments[0], NULL) : NULL;
    for (int o = 0; name && o < OPERATIONS; ++o)
        if (!strcmp(operations[o].name, name)) return member_for(&operations[o], arguments + 1, count - 1, names);
    if (!PyErr_Occurred())
        PyErr_SetString(PyExc_ValueError, "_member: accepted are the name of a function and its arguments");
    return NULL;
}

/* What an import does on a processor with or without the two. */
static PyObject* require(PyObject* module, PyObject* arguments) {
    int avx2, fma;
    (void)module;
    if (!PyArg_ParseTuple(arguments, "pp:_require", &avx2, &fma) || require_features(avx2, fma)) return NULL;
    return Py_NewRef(Py_None);
}

static PyMethodDef more_methods[] = {
    {"version", version, METH_NOARGS, "version()\n--\n\nVersion of the library, as '8.2.0'."},
    {"_members", members, METH_NOARGS, "_members()\n--\n\n(function, C member, in-place C member) of every form."},
    {"_member", (PyCFunction)(void (*)(void))member, METH_FASTCALL | METH_KEYWORDS,
     "_member(function, /, *arguments, **keywords)\n--\n\nThe C member that the function would call."},
    {"_require", require, METH_VARARGS,
     "_require(avx2, fma, /)\n--\n\nImportError as on a processor without one of them."},
    {"_address", plan_address, METH_O, "_address(plan, /)\n--\n\nWhere the plan's memory is."},
    {"empty", (PyCFunction)(void (*)(void))empty_image, METH_VARARGS | METH_KEYWORDS, EMPTY_DOC},
    {NULL, NULL, 0, NULL}};

static int prepare_module(PyObject* module) {
    if (check_processor() || check_interpreter()) return -1;
    if (shared.error) {
        PyErr_SetString(PyExc_ImportError, "qori._core is loaded already");
        return -1;
    }
    for (int i = 0; i < PARAMETERS; ++i)
        if (!(parameter_names[i] = PyUnicode_InternFromString(parameters[i].name))) return -1;
    shared.name_dtype = PyUnicode_InternFromString("dtype");
    shared.code = PyUnicode_InternFromString("code");
    if (!shared.name_dtype || !shared.code || add_exceptions(module) || make_plan_types(module) ||
        make_image_type(module))
        return -1;
    return PyModule_AddFunctions(module, more_methods) || find_numpy(0) ? -1 : 0;
}

static PyModuleDef_Slot slots[] = {{Py_mod_exec, (void*)prepare_module}, {0, NULL}};
static struct PyModuleDef definition = {
    PyModuleDef_HEAD_INIT, "qori._core", "Image-processing primitives.", 0, methods, slots, NULL, NULL, NULL};

PyMODINIT_FUNC PyInit__core(void) { return PyModuleDef_Init(&definition); }
