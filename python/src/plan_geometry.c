/* Plans of resizes and affine warps. */
#include "plan_makers.h"

#include <string.h>

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

/* Whether the interpolation can make the target of the source; the library's own words name no interpolation. */
static int resizes(const Call* call, const ResizeArguments* r) {
    const QorImageSize s = r->source, t = r->target;
    if (r->interpolation == interpSuper && (t.height > s.height || t.width > s.width))
        return refuse(PyExc_ValueError, call, "dst_shape",
                      "(%d, %d) came; 'super' reduces: accepted are sides up to those of src_shape, (%d, %d), and "
                      "'linear', 'cubic' and 'lanczos' enlarge",
                      t.height, t.width, s.height, s.width);
    const int32_t least = r->interpolation == interpLinear    ? 2
                          : r->interpolation == interpCubic   ? 4
                          : r->interpolation == interpLanczos ? (r->lobes == 3 ? 6 : 4)
                                                              : 1;
    if (s.height > 0 && s.width > 0 && (s.height < least || s.width < least))
        return refuse(PyExc_ValueError, call, "src_shape",
                      "(%d, %d) came; accepted for this interpolation are sides from %d on, and 'nearest' takes any",
                      s.height, s.width, least);
    return 0;
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
    if (!parse(&call, arguments, keywords, "OO|OO$pddi:ResizePlan", names, &source, &target, &word, &dtype,
               &r.antialias, &r.b, &r.c, &lobes))
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
    if (resizes(&call, &r)) return NULL;
    const int e = slots_of_elements[element];
    int32_t plan_bytes = 0, init_bytes = 0;
    int status = sizes[e](r.source, r.target, r.interpolation, r.antialias, &plan_bytes, &init_bytes);
    if (sizes_known(&call, "qoriResizeGetSize", status)) return NULL;
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
        for (int channels = 1; channels < 5; ++channels) plan->usual[channels] = usual_form(plan, channels);
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
    if (!PyTuple_Check(rect) || !parse(&call, rect, NULL, "iiii;rect: accepted is (row, column, height, width)", NULL,
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
    if (!parse(&call, arguments, keywords, "OOO|OOi$pOOdd:WarpAffinePlan", names, &source_shape, &target_shape, &matrix,
               &word, &dtype, &channels, &inverse, &border_word, &value, &b, &c))
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
    if (sizes_known(&call, "qoriWarpAffineGetSize", status)) return NULL;
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
