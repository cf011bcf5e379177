#include "plan_makers.h"

#include <stdio.h>
#include <stdlib.h>
#include <string.h>

/* --- what constructors share ----------------------------------------------------------------------------------------
 */

/* A call that only names the constructor, for refusals. */
static Call* named(Call* call, Operation* operation, const char* name) {
    memset(operation, 0, sizeof *operation);
    operation->name = name;
    return start_call(call, operation);
}

static int shape_of(const Call* call, const char* name, PyObject* object, QorImageSize* size) {
    return read_pair(call, name, object, &size->height, &size->width);
}

static int element_from(const Call* call, PyObject* dtype, const char* accepted, uint32_t elements, int* element) {
    *element = dtype ? element_of_type(dtype) : elements & 1u << U8 ? U8 : F32;
    if (*element >= 0 && elements >> *element & 1) return 0;
    return refuse(PyExc_TypeError, call, "dtype", "%.80R came; accepted are %s", dtype, accepted);
}

/* Deallocation returns what a constructor has filled so far. */
static Plan* new_plan(PyTypeObject* type, int kind, int variant, int element) {
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

static int take_memory(Plan* plan, int32_t bytes) {
    plan->memory = calloc(bytes > 0 ? (size_t)bytes : 1, 1);
    if (!plan->memory) PyErr_NoMemory();
    return plan->memory ? 0 : -1;
}

static PyObject* finish(Plan* plan, Call* call, const char* member, int status) {
    free_call(call);
    if (!PyErr_Occurred() && (!status || !status_result(call, member, status)) && plan->text) return (PyObject*)plan;
    Py_DECREF((PyObject*)plan);
    return NULL;
}

static void set_shapes(Plan* plan, QorImageSize source, QorImageSize target) {
    plan->source_height = source.height;
    plan->source_width = source.width;
    plan->height = target.height;
    plan->width = target.width;
}

static void set_border(Plan* plan, QorBorderExtent border) {
    plan->top = border.top;
    plan->left = border.left;
    plan->bottom = border.bottom;
    plan->right = border.right;
}

/* --- resize ---------------------------------------------------------------------------------------------------------
 */

#define BY_TYPE(name) \
    { name##_8u, name##_16u, name##_16s, name##_32f }
static const uint8_t slots_of_elements[ELEMENTS] = {[U8] = 0, [U16] = 1, [I16] = 2, [F32] = 3, [F64] = 4};

typedef struct ResizeArguments {
    QorImageSize source, target;
    double b, c;
    int interpolation, antialias, variant;
    uint32_t lobes;
    uint8_t* init_buffer;
} ResizeArguments;

static QorResult fill_resize(const ResizeArguments* r, int element, QorResizePlan* plan, const char** member) {
    static QorResult (*const nearest[])(QorImageSize, QorImageSize, QorResizePlan*) = BY_TYPE(qoriResizeNearestInit);
    static QorResult (*const linear[])(QorImageSize, QorImageSize, QorResizePlan*) = {
        qoriResizeLinearInit_8u, qoriResizeLinearInit_16u, qoriResizeLinearInit_16s, qoriResizeLinearInit_32f,
        qoriResizeLinearInit_64f};
    static QorResult (*const super[])(QorImageSize, QorImageSize, QorResizePlan*) = BY_TYPE(qoriResizeSuperInit);
    static QorResult (*const cubic[])(QorImageSize, QorImageSize, float, float, QorResizePlan*, uint8_t*) =
        BY_TYPE(qoriResizeCubicInit);
    static QorResult (*const lanczos[])(QorImageSize, QorImageSize, uint32_t, QorResizePlan*, uint8_t*) =
        BY_TYPE(qoriResizeLanczosInit);
    const int e = slots_of_elements[element];
    const float b = (float)r->b, c = (float)r->c;
    *member = "the plan's initialisation";
    switch (r->interpolation) {
        case interpNearest: return nearest[e](r->source, r->target, plan);
        case interpSuper: return super[e](r->source, r->target, plan);
        case interpLinear:
            return r->antialias ? qoriResizeAntialiasingLinearInit(r->source, r->target, plan, r->init_buffer)
                                : linear[e](r->source, r->target, plan);
        case interpCubic:
            return r->antialias ? qoriResizeAntialiasingCubicInit(r->source, r->target, b, c, plan, r->init_buffer)
                                : cubic[e](r->source, r->target, b, c, plan, r->init_buffer);
        default:
            return r->antialias
                       ? qoriResizeAntialiasingLanczosInit(r->source, r->target, r->lobes, plan, r->init_buffer)
                       : lanczos[e](r->source, r->target, r->lobes, plan, r->init_buffer);
    }
}

static int resize_word(const Call* call, PyObject* word, ResizeArguments* r) {
    static const struct {
        const char* text;
        int32_t value;
        uint32_t lobes;
        int variant;
    } words[] = {{"nearest", interpNearest, 0, PLAN_NEAREST}, {"linear", interpLinear, 0, PLAN_LINEAR},
                 {"cubic", interpCubic, 0, PLAN_CUBIC},       {"super", interpSuper, 0, PLAN_SUPER},
                 {"lanczos", interpLanczos, 0, PLAN_LANCZOS}, {"lanczos2", interpLanczos, 2, PLAN_LANCZOS},
                 {"lanczos3", interpLanczos, 3, PLAN_LANCZOS}};
    const char* text = !word ? "linear" : PyUnicode_Check(word) ? PyUnicode_AsUTF8AndSize(word, NULL) : "";
    if (!text) return -1;
    for (size_t i = 0; i < sizeof words / sizeof *words; ++i)
        if (!strcmp(words[i].text, text)) {
            r->interpolation = words[i].value;
            r->variant = r->antialias && i != 0 && i != 3 ? PLAN_ANTIALIAS : words[i].variant;
            if (words[i].lobes) r->lobes = words[i].lobes;
            return 0;
        }
    return refuse(
        PyExc_ValueError, call, "interpolation",
        "%.80R came; accepted are 'nearest', 'linear', 'cubic', 'lanczos', 'lanczos2', 'lanczos3' and 'super'", word);
}

PyObject* make_resize(PyTypeObject* type, PyObject* arguments, PyObject* keywords) {
    static char* names[] = {"src_shape", "dst_shape", "interpolation", "dtype", "antialias", "b", "c", "lobes", NULL};
    static QorResult (*const sizes[])(QorImageSize, QorImageSize, int32_t, int32_t, int32_t*, int32_t*) = {
        qoriResizeGetSize_8u, qoriResizeGetSize_16u, qoriResizeGetSize_16s, qoriResizeGetSize_32f,
        qoriResizeGetSize_64f};
    static QorResult (*const borders[])(const QorResizePlan*, QorBorderExtent*) = {
        qoriResizeGetBorderSize_8u, qoriResizeGetBorderSize_16u, qoriResizeGetBorderSize_16s,
        qoriResizeGetBorderSize_32f, qoriResizeGetBorderSize_64f};
    static QorResult (*const buffers[])(const QorResizePlan*, QorImageSize, int32_t, int32_t*) = {
        qoriResizeGetBufferSize_8u, qoriResizeGetBufferSize_16u, qoriResizeGetBufferSize_16s,
        qoriResizeGetBufferSize_32f, qoriResizeGetBufferSize_64f};
    PyObject *source, *target, *word = NULL, *dtype = NULL;
    ResizeArguments r = {.c = 0.5, .lobes = 3};
    Operation operation;
    Call call;
    int element, lobes = 3;
    named(&call, &operation, "ResizePlan");
    if (!PyArg_ParseTupleAndKeywords(arguments, keywords, "OO|OO$pddi:ResizePlan", names, &source, &target, &word,
                                     &dtype, &r.antialias, &r.b, &r.c, &lobes))
        return NULL;
    r.lobes = (uint32_t)lobes;
    if (shape_of(&call, "src_shape", source, &r.source) || shape_of(&call, "dst_shape", target, &r.target) ||
        resize_word(&call, word, &r) ||
        element_from(&call, dtype, "'uint8', 'uint16', 'int16', 'float32' and, linear only, 'float64'",
                     1u << U8 | 1u << U16 | 1u << I16 | 1u << F32 | 1u << F64, &element))
        return NULL;
    if (element == F64 && r.variant != PLAN_LINEAR) {
        refuse(PyExc_TypeError, &call, "dtype",
               "float64 came; accepted are 'uint8', 'uint16', 'int16' and 'float32': only linear "
               "plans without antialias take float64");
        return NULL;
    }
    const int e = slots_of_elements[element];
    int32_t plan_bytes = 0, init_bytes = 0;
    int status = sizes[e](r.source, r.target, r.interpolation, r.antialias, &plan_bytes, &init_bytes);
    if (status) {
        if (status > 0)
            refuse(shared.error, &call, NULL, "shapes without pixels came; accepted are sides from 1 on");
        else
            status_result(&call, "qoriResizeGetSize", status);
        return NULL;
    }
    Plan* plan = new_plan(type, RESIZE_PLAN, r.variant, element);
    const char* member = "";
    if (!plan) return NULL;
    r.init_buffer = allocate(&call, (size_t)init_bytes);
    if (r.init_buffer && !take_memory(plan, plan_bytes)) {
        status = fill_resize(&r, element, plan->memory, &member);
        QorBorderExtent border = {0, 0, 0, 0};
        if (!status) status = borders[e](plan->memory, &border);
        for (int channels = 1; !status && channels < 5; ++channels)
            if (channels != 2 && buffers[e](plan->memory, r.target, channels, &plan->whole_bytes[channels]))
                plan->whole_bytes[channels] = 0;
        set_border(plan, border);
        set_shapes(plan, r.source, r.target);
        plan->antialias = r.antialias;
        static const char* const words[] = {[interpNearest] = "nearest",
                                            [interpLinear] = "linear",
                                            [interpCubic] = "cubic",
                                            [interpSuper] = "super",
                                            [interpLanczos] = "lanczos"};
        plan->text = PyUnicode_FromFormat("ResizePlan((%d, %d), (%d, %d), '%s', '%s'%s)", r.source.height,
                                          r.source.width, r.target.height, r.target.width, words[r.interpolation],
                                          element_names[element], r.antialias ? ", antialias=True" : "");
    }
    return finish(plan, &call, member, status);
}

PyObject* resize_src_offset(PyObject* self, PyObject* offset) {
    static QorResult (*const functions[])(const QorResizePlan*, QorPoint2D, QorPoint2D*) = {
        qoriResizeGetSrcOffset_8u, qoriResizeGetSrcOffset_16u, qoriResizeGetSrcOffset_16s, qoriResizeGetSrcOffset_32f,
        qoriResizeGetSrcOffset_64f};
    const Plan* plan = (const Plan*)self;
    Operation operation;
    Call call;
    QorPoint2D point, found;
    named(&call, &operation, "src_offset");
    if (read_pair(&call, "offset", offset, &point.y, &point.x)) return NULL;
    const int status = functions[slots_of_elements[plan->element]](plan->memory, point, &found);
    if (status && status_result(&call, "qoriResizeGetSrcOffset", status)) return NULL;
    return Py_BuildValue("(ii)", found.y, found.x);
}

PyObject* resize_src_roi(PyObject* self, PyObject* rect) {
    static QorResult (*const functions[])(const QorResizePlan*, QorImageRect, QorImageRect*, QorImageRect*) = {
        qoriResizeGetSrcRoi_8u, qoriResizeGetSrcRoi_16u, qoriResizeGetSrcRoi_16s, qoriResizeGetSrcRoi_32f,
        qoriResizeGetSrcRoi_64f};
    const Plan* plan = (const Plan*)self;
    Operation operation;
    Call call;
    QorImageRect wanted, source, target;
    named(&call, &operation, "src_roi");
    if (!PyTuple_Check(rect) || !PyArg_ParseTuple(rect, "iiii;rect: accepted is (row, column, height, width)",
                                                  &wanted.y, &wanted.x, &wanted.height, &wanted.width)) {
        if (!PyErr_Occurred())
            refuse(PyExc_TypeError, &call, "rect", "%.80R came; accepted is (row, column, height, width)", rect);
        return NULL;
    }
    const int status = functions[slots_of_elements[plan->element]](plan->memory, wanted, &source, &target);
    if (status && status_result(&call, "qoriResizeGetSrcRoi", status)) return NULL;
    return Py_BuildValue("((iiii)(iiii))", source.y, source.x, source.height, source.width, target.y, target.x,
                         target.height, target.width);
}

/* --- warp -----------------------------------------------------------------------------------------------------------
 */

/* Rows of numbers that take (row, column) to (row, column) as the coefficients that take (x, y) to (x, y). */
static int coefficients_of(const Call* call, PyObject* matrix, double coefficients[6]) {
    static const int places[2][3] = {{4, 3, 5}, {1, 0, 2}};
    if (!PySequence_Check(matrix) || PySequence_Size(matrix) != 2) goto wrong;
    for (int i = 0; i < 2; ++i) {
        PyObject* row = PySequence_GetItem(matrix, i);
        if (!row || !PySequence_Check(row) || PySequence_Size(row) != 3) {
            Py_XDECREF(row);
            goto wrong;
        }
        for (int j = 0; j < 3; ++j) {
            PyObject* item = PySequence_GetItem(row, j);
            const int failed = !item || read_number(call, "matrix", item, F64, &coefficients[places[i][j]]);
            Py_XDECREF(item);
            if (failed) {
                Py_DECREF(row);
                return -1;
            }
        }
        Py_DECREF(row);
    }
    return 0;
wrong:
    PyErr_Clear();
    return refuse(PyExc_ValueError, call, "matrix", "%.80R came; accepted is ((a, b, c), (d, e, f))", matrix);
}

PyObject* make_warp(PyTypeObject* type, PyObject* arguments, PyObject* keywords) {
    static char* names[] = {"src_shape",    "dst_shape", "matrix",  "interpolation",
                            "dtype",        "channels",  "inverse", "border",
                            "border_value", "b",         "c",       NULL};
    PyObject *source_shape, *target_shape, *matrix, *word = NULL, *dtype = NULL, *border_word = NULL, *value = NULL;
    int channels = 1, inverse = 0, element;
    int32_t interpolation = interpLinear, border = borderConstant, plan_bytes = 0, init_bytes = 0;
    double b = 0, c = 0.5, coefficients[6], values[4] = {0, 0, 0, 0};
    QorImageSize source, target;
    Operation operation;
    Call call;
    named(&call, &operation, "WarpAffinePlan");
    if (!PyArg_ParseTupleAndKeywords(arguments, keywords, "OOO|OOi$pOOdd:WarpAffinePlan", names, &source_shape,
                                     &target_shape, &matrix, &word, &dtype, &channels, &inverse, &border_word, &value,
                                     &b, &c))
        return NULL;
    if (shape_of(&call, "src_shape", source_shape, &source) || shape_of(&call, "dst_shape", target_shape, &target) ||
        coefficients_of(&call, matrix, coefficients) ||
        (word &&
         read_word(&call, "interpolation", word, enumeration_named("QorInterpolationKind"), 0, &interpolation)) ||
        (border_word && read_word(&call, "border", border_word, enumeration_named("QorBorderMode"), 1, &border)) ||
        element_from(&call, dtype, "'uint8', 'uint16', 'int16', 'float32' and 'float64'",
                     1u << U8 | 1u << U16 | 1u << I16 | 1u << F32 | 1u << F64, &element))
        return NULL;
    if (channels < 1 || channels > 4) {
        refuse(PyExc_ValueError, &call, "channels", "%d came; accepted are 1, 3 and 4", channels);
        return NULL;
    }
    if (value && read_values(&call, "border_value", value, F64, channels, values)) return NULL;
    int status = qoriWarpAffineGetSize(source, target, type_code(element), coefficients, interpolation, inverse, border,
                                       &plan_bytes, &init_bytes);
    if (status) {
        status_result(&call, "qoriWarpAffineGetSize", status);
        return NULL;
    }
    Plan* plan = new_plan(type, WARP_PLAN,
                          interpolation == interpNearest  ? PLAN_NEAREST
                          : interpolation == interpLinear ? PLAN_LINEAR
                                                          : PLAN_CUBIC,
                          element);
    if (!plan) return NULL;
    uint8_t* init = allocate(&call, (size_t)init_bytes + 1);
    if (init && !take_memory(plan, plan_bytes)) {
        const int32_t code = type_code(element);
        if (interpolation == interpCubic)
            status = qoriWarpAffineCubicInit(source, target, code, coefficients, inverse, channels, b, c, border,
                                             values, 0, plan->memory, init);
        else
            status = (interpolation == interpNearest ? qoriWarpAffineNearestInit : qoriWarpAffineLinearInit)(
                source, target, code, coefficients, inverse, channels, border, values, 0, plan->memory);
        QorBorderExtent extent = {0, 0, 0, 0};
        if (status >= 0 && (border & 15) == borderReadAll) qoriWarpGetBorderSize(plan->memory, &extent);
        set_border(plan, extent);
        set_shapes(plan, source, target);
        plan->channels = channels;
        plan->antialias = (border & 15) > borderReplicate; /* pixels that are not written */
        plan->text =
            PyUnicode_FromFormat("WarpAffinePlan((%d, %d), (%d, %d), ..., dtype='%s', channels=%d)", source.height,
                                 source.width, target.height, target.width, element_names[element], channels);
    }
    return finish(plan, &call, "the plan's initialisation", status);
}

/* --- transforms -----------------------------------------------------------------------------------------------------
 */

PyObject* make_dct(PyTypeObject* type, PyObject* arguments, PyObject* keywords) {
    static char* names[] = {"shape", "hint", NULL};
    PyObject *shape, *word = NULL;
    int32_t hint = hintFast, plan_bytes = 0, init_bytes = 0, buffer_bytes = 0;
    QorImageSize size;
    Operation operation;
    Call call;
    named(&call, &operation, "DctPlan");
    if (!PyArg_ParseTupleAndKeywords(arguments, keywords, "O|$O:DctPlan", names, &shape, &word) ||
        shape_of(&call, "shape", shape, &size) ||
        (word && read_word(&call, "hint", word, enumeration_named("QorAccuracyHint"), 0, &hint)))
        return NULL;
    int status = qoriDCTFwdGetSize_32f(size, hint, &plan_bytes, &init_bytes, &buffer_bytes);
    if (status) {
        status_result(&call, "qoriDCTFwdGetSize_32f", status);
        return NULL;
    }
    Plan* plan = new_plan(type, DCT_PLAN, PLAN_ANY, F32);
    if (!plan) return NULL;
    uint8_t* init = allocate(&call, (size_t)init_bytes);
    if (init && !take_memory(plan, plan_bytes)) {
        status = qoriDCTFwdInit_32f(size, hint, plan->memory, init);
        set_shapes(plan, size, size);
        plan->buffer_bytes = buffer_bytes;
        plan->text = PyUnicode_FromFormat("DctPlan((%d, %d))", size.height, size.width);
    }
    return finish(plan, &call, "qoriDCTFwdInit_32f", status);
}

/* Transforms of bytes are allocated by the library and released by it. */
static void free_dft_bytes(void* memory) { qoriDFTFree_R_32s(memory); }
static void free_fft_bytes(void* memory) { qoriFFTFree_R_32s(memory); }

typedef struct Fourier {
    QorImageSize size;
    int32_t order_x, order_y, norm, hint;
    int fast, element;
} Fourier;

static QorResult fourier_sizes(const Fourier* f, int32_t* plan, int32_t* init, int32_t* buffer) {
    if (f->fast)
        return (f->element == CF ? qoriFFTGetSize_C_32fc : qoriFFTGetSize_R_32f)(f->order_x, f->order_y, f->norm,
                                                                                 f->hint, plan, init, buffer);
    return (f->element == CF ? qoriDFTGetSize_C_32fc : qoriDFTGetSize_R_32f)(f->size, f->norm, f->hint, plan, init,
                                                                             buffer);
}

static QorResult fourier_init(const Fourier* f, void* plan, uint8_t* init) {
    if (f->fast)
        return (f->element == CF ? qoriFFTInit_C_32fc : qoriFFTInit_R_32f)(f->order_x, f->order_y, f->norm, f->hint,
                                                                           plan, init);
    return (f->element == CF ? qoriDFTInit_C_32fc : qoriDFTInit_R_32f)(f->size, f->norm, f->hint, plan, init);
}

static int order_of(const Call* call, int32_t side, int32_t* order) {
    *order = 0;
    while (*order < 30 && 1 << *order < side) ++*order;
    if (side < 1 || 1 << *order != side)
        return refuse(PyExc_ValueError, call, "shape",
                      "a side of %d came; accepted are powers of 2: DftPlan takes any size", side);
    return 0;
}

static PyObject* make_fourier(PyTypeObject* type, PyObject* arguments, PyObject* keywords, int fast) {
    static char* names[] = {"shape", "dtype", "norm", "hint", NULL};
    PyObject *shape, *dtype = NULL, *norm = NULL, *hint = NULL;
    Fourier f = {.norm = fftDivInvByN, .hint = hintFast, .fast = fast};
    int32_t plan_bytes = 0, init_bytes = 0, buffer_bytes = 0;
    const char* name = fast ? "FftPlan" : "DftPlan";
    Operation operation;
    Call call;
    named(&call, &operation, name);
    if (!PyArg_ParseTupleAndKeywords(arguments, keywords, "O|O$OO", names, &shape, &dtype, &norm, &hint) ||
        shape_of(&call, "shape", shape, &f.size) ||
        (norm && read_word(&call, "norm", norm, enumeration_named("QorFftNormFlag"), 0, &f.norm)) ||
        (hint && read_word(&call, "hint", hint, enumeration_named("QorAccuracyHint"), 0, &f.hint)))
        return NULL;
    f.element = dtype ? element_of_type(dtype) : F32;
    if (f.element != F32 && f.element != CF && f.element != U8) {
        refuse(PyExc_TypeError, &call, "dtype", "%.80R came; accepted are 'float32', 'complex64' and 'uint8'", dtype);
        return NULL;
    }
    if (fast && (order_of(&call, f.size.width, &f.order_x) || order_of(&call, f.size.height, &f.order_y))) return NULL;
    Plan* plan = new_plan(type, fast ? FFT_PLAN : DFT_PLAN, f.element == CF ? PLAN_COMPLEX : PLAN_REAL, f.element);
    if (!plan) return NULL;
    int status;
    if (f.element == U8) {
        QorFft2DPlan* made = NULL;
        status = fast ? qoriFFTInitAlloc_R_32s(&made, f.order_x, f.order_y, f.norm, f.hint)
                      : qoriDFTInitAlloc_R_32s(&made, f.size, f.norm, f.hint);
        plan->memory = status < 0 ? NULL : made;
        plan->free_memory = fast ? free_fft_bytes : free_dft_bytes;
        plan->target = I32;
    } else {
        status = fourier_sizes(&f, &plan_bytes, &init_bytes, &buffer_bytes);
        uint8_t* init = status ? NULL : allocate(&call, (size_t)init_bytes);
        if (init && !take_memory(plan, plan_bytes)) status = fourier_init(&f, plan->memory, init);
    }
    set_shapes(plan, f.size, f.size);
    plan->text =
        PyUnicode_FromFormat("%s((%d, %d), '%s')", name, f.size.height, f.size.width, element_names[f.element]);
    return finish(plan, &call, "the plan's initialisation", status);
}

PyObject* make_dft(PyTypeObject* type, PyObject* arguments, PyObject* keywords) {
    return make_fourier(type, arguments, keywords, 0);
}

PyObject* make_fft(PyTypeObject* type, PyObject* arguments, PyObject* keywords) {
    return make_fourier(type, arguments, keywords, 1);
}

/* --- histograms -----------------------------------------------------------------------------------------------------
 */

PyObject* make_histogram(PyTypeObject* type, PyObject* arguments, PyObject* keywords) {
    static char* names[] = {"levels", "dtype", "channels", "lower", "upper", NULL};
    PyObject *levels, *dtype = NULL, *lower = NULL, *upper = NULL;
    int channels = 1, element;
    int32_t counts[4] = {0, 0, 0, 0}, plan_bytes = 0, buffer_bytes = 0;
    float low[4], high[4];
    void* lists[4] = {NULL, NULL, NULL, NULL};
    Operation operation;
    Call call;
    named(&call, &operation, "HistogramPlan");
    if (!PyArg_ParseTupleAndKeywords(arguments, keywords, "O|Oi$OO:HistogramPlan", names, &levels, &dtype, &channels,
                                     &lower, &upper) ||
        element_from(&call, dtype, "'uint8', 'uint16', 'int16' and 'float32'",
                     1u << U8 | 1u << U16 | 1u << I16 | 1u << F32, &element))
        return NULL;
    if (channels < 1 || channels > 4 || channels == 2) {
        refuse(PyExc_ValueError, &call, "channels", "%d came; accepted are 1, 3 and 4", channels);
        return NULL;
    }
    const int uniform = lower && upper;
    if (!lower != !upper) {
        refuse(PyExc_TypeError, &call, "lower", "lower and upper come together, with a number of levels");
        return NULL;
    }
    int failed = uniform ? read_values(&call, "levels", levels, I32, channels, counts) ||
                               read_values(&call, "lower", lower, F32, channels, low) ||
                               read_values(&call, "upper", upper, F32, channels, high)
                         : read_lists(&call, "levels", levels, F32, channels, lists, counts);
    const QorImageSize any = {1, 1};
    int status = 0;
    if (!failed)
        status =
            qoriHistogramGetBufferSize(type_code(element), any, counts, channels, uniform, &plan_bytes, &buffer_bytes);
    if (failed || status) {
        if (!failed) status_result(&call, "qoriHistogramGetBufferSize", status);
        free_call(&call);
        return NULL;
    }
    Plan* plan = new_plan(type, HISTOGRAM_PLAN, PLAN_ANY, element);
    if (!plan) {
        free_call(&call);
        return NULL;
    }
    if (!take_memory(plan, plan_bytes)) {
        status =
            uniform ? qoriHistogramUniformInit(type_code(element), low, high, counts, channels, plan->memory)
                    : qoriHistogramInit(type_code(element), (const float* const*)lists, counts, channels, plan->memory);
        memcpy(plan->counts, counts, sizeof counts);
        plan->channels = channels;
        plan->buffer_bytes = buffer_bytes;
        plan->text = PyUnicode_FromFormat("HistogramPlan(%R, '%s', %d)", levels, element_names[element], channels);
    }
    return finish(plan, &call, "the plan's initialisation", status);
}

PyObject* histogram_levels(PyObject* self, void* unused) {
    (void)unused;
    const Plan* plan = (const Plan*)self;
    float* lists[4] = {NULL, NULL, NULL, NULL};
    PyObject* result = NULL;
    int status = 0, missing = 0;
    for (int i = 0; i < plan->channels; ++i) {
        lists[i] = malloc((size_t)plan->counts[i] * sizeof(float));
        missing |= !lists[i];
    }
    if (missing)
        PyErr_NoMemory();
    else
        status = qoriHistogramGetLevels(plan->memory, lists);
    if (!missing && !status && (result = PyTuple_New(plan->channels)))
        for (int i = 0; result && i < plan->channels; ++i) {
            PyObject* list = PyTuple_New(plan->counts[i]);
            for (int k = 0; list && k < plan->counts[i]; ++k)
                PyTuple_SetItem(list, k, PyFloat_FromDouble((double)lists[i][k]));
            if (!list)
                Py_CLEAR(result);
            else
                PyTuple_SetItem(result, i, list);
        }
    for (int i = 0; i < 4; ++i) free(lists[i]);
    return result;
}

/* --- filters, thresholds, descriptors -------------------------------------------------------------------------------
 */

PyObject* make_linear_filter(PyTypeObject* type, PyObject* arguments, PyObject* keywords) {
    static char* names[] = {"kernel", "dtype", "channels", "divisor", "rounding", NULL};
    PyObject *kernel, *dtype = NULL, *word = NULL;
    int channels = 1, divisor = 1, element, kernel_element;
    int32_t rounding = roundNearestEven, plan_bytes = 0, buffer_bytes = 0, height, width;
    void* data;
    Operation operation;
    Call call;
    named(&call, &operation, "LinearFilterPlan");
    if (!PyArg_ParseTupleAndKeywords(arguments, keywords, "O|Oi$iO:LinearFilterPlan", names, &kernel, &dtype, &channels,
                                     &divisor, &word) ||
        (word && read_word(&call, "rounding", word, enumeration_named("QorRoundingMode"), 0, &rounding)) ||
        element_from(&call, dtype, "'uint8', 'uint16', 'int16' and 'float32'",
                     1u << U8 | 1u << U16 | 1u << I16 | 1u << F32, &element))
        return NULL;
    if (read_kernel(&call, "kernel", kernel, &kernel_element, &height, &width, &data)) {
        free_call(&call);
        return NULL;
    }
    if (kernel_element != I16 && kernel_element != F32) {
        refuse(PyExc_TypeError, &call, "kernel", "elements of %s came; accepted are int16 and float32",
               element_names[kernel_element]);
        free_call(&call);
        return NULL;
    }
    const QorImageSize size = {width, height}, any = {1, 1};
    int status = qoriFilterBorderGetSize(size, any, type_code(element), type_code(kernel_element), channels,
                                         &plan_bytes, &buffer_bytes);
    Plan* plan = new_plan(type, LINEAR_FILTER_PLAN, PLAN_ANY, element);
    if (!plan) {
        free_call(&call);
        return NULL;
    }
    if (!status && !take_memory(plan, plan_bytes))
        status =
            kernel_element == I16
                ? qoriFilterBorderInit_16s(data, size, divisor, type_code(element), channels, rounding, plan->memory)
                : qoriFilterBorderInit_32f(data, size, type_code(element), channels, rounding, plan->memory);
    plan->channels = channels;
    plan->kernel_height = height;
    plan->kernel_width = width;
    plan->kernel_type = type_code(kernel_element);
    plan->text = PyUnicode_FromFormat("LinearFilterPlan(%s (%d, %d), '%s', %d)", element_names[kernel_element], height,
                                      width, element_names[element], channels);
    return finish(plan, &call, "the plan's initialisation", status);
}

PyObject* make_adaptive(PyTypeObject* type, PyObject* arguments, PyObject* keywords) {
    static char* names[] = {"size", "sigma", NULL};
    PyObject* object;
    double sigma = 0;
    QorImageSize size;
    const QorImageSize any = {1, 1};
    int32_t plan_bytes = 0, buffer_bytes = 0;
    Operation operation;
    Call call;
    named(&call, &operation, "AdaptiveGaussPlan");
    if (!PyArg_ParseTupleAndKeywords(arguments, keywords, "O|$d:AdaptiveGaussPlan", names, &object, &sigma) ||
        shape_of(&call, "size", object, &size))
        return NULL;
    int status = qoriThresholdAdaptiveGaussGetBufferSize(any, size, 1, 1, &plan_bytes, &buffer_bytes);
    Plan* plan = new_plan(type, ADAPTIVE_PLAN, PLAN_ANY, U8);
    if (!plan) return NULL;
    if (!status && !take_memory(plan, plan_bytes))
        status = qoriThresholdAdaptiveGaussInit(any, size, 1, 1, (float)sigma, plan->memory);
    plan->kernel_height = size.height;
    plan->kernel_width = size.width;
    plan->text = PyUnicode_FromFormat("AdaptiveGaussPlan((%d, %d))", size.height, size.width);
    return finish(plan, &call, "qoriThresholdAdaptiveGaussInit", status);
}

PyObject* make_hog(PyTypeObject* type, PyObject* arguments, PyObject* keywords) {
    static char* names[] = {"window", "cell", "block", "stride", "bins", "sigma", "limit", "columns_first", NULL};
    PyObject* window = NULL;
    QorHogConfig config = {0, 8, 16, 8, 9, 8.0f, 0.2f, {64, 128}};
    int32_t plan_bytes = 0, bytes = 0;
    int columns = 0;
    Operation operation;
    Call call;
    named(&call, &operation, "HogPlan");
    if (!PyArg_ParseTupleAndKeywords(arguments, keywords, "|O$iiiiffp:HogPlan", names, &window, &config.cellSize,
                                     &config.blockSize, &config.blockStride, &config.nbins, &config.blockWeightParam,
                                     &config.normParam, &columns) ||
        (window && shape_of(&call, "window", window, &config.winSize)))
        return NULL;
    config.blockOrder = columns;
    int status = qoriHOGGetSize(&config, &plan_bytes);
    Plan* plan = new_plan(type, HOG_PLAN, PLAN_ANY, NO_ELEMENT);
    if (!plan) return NULL;
    if (!status && !take_memory(plan, plan_bytes)) status = qoriHOGInit(&config, plan->memory);
    if (!status && !PyErr_Occurred()) status = qoriHOGGetDescriptorSize(plan->memory, &bytes);
    plan->descriptor = bytes / 4;
    plan->text = PyUnicode_FromFormat("HogPlan((%d, %d))", config.winSize.height, config.winSize.width);
    return finish(plan, &call, "qoriHOGInit", status);
}
