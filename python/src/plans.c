/* The plans' types: attributes, calls, and how much work memory an operation takes. */
#include "plans.h"

#include <string.h>

#include <structmember.h>

#include "plan_makers.h"

static const int32_t type_codes[ELEMENTS] = {[U8] = 1, [U16] = 5, [I16] = 7, [F32] = 13, [F64] = 19};

int32_t type_code(int element) { return element < ELEMENTS ? type_codes[element] : 0; }

/* --- a plan as an argument ------------------------------------------------------------------------------------------
 */

const Plan* plan_of(const Call* call, PyObject* object) {
    const int i = call->operation->has[HAS_PLAN];
    PyTypeObject* wanted = shared.plan_types[call->operation->parameters[i].enumeration];
    if (Py_TYPE(object) == wanted) return (const Plan*)object;
    PyObject *came = PyType_GetName(Py_TYPE(object)), *name = PyType_GetName(wanted);
    if (came && name) refuse(PyExc_TypeError, call, "plan", "an object of type %U came; accepted is a %U", came, name);
    Py_XDECREF(came);
    Py_XDECREF(name);
    return NULL;
}

/* Whether a plan serves a form: its variant, elements and channels. */
int plan_serves(const Plan* plan, const Form* form) {
    if (form->plan > PLAN_ANY && form->plan != plan->variant) return 0;
    if (plan->channels && plan->channels != form->channels) return 0;
    if (plan->element == NO_ELEMENT || plan->element == form->source) return 1;
    return plan->element == U8 && plan->target == I32 && form->source == I32; /* spectra of bytes, back */
}

int64_t work_bytes(Call* call) {
    const Form* form = call->form;
    const Plan* plan = call->plan;
    int32_t bytes = 0, plan_bytes, status = 0, algorithm;
    const QorImageSize region = {call->width, call->height}, window = {call->size_width, call->size_height};
    const QorImageSize source = {call->images[SRC].width, call->images[SRC].height};
    const QorImageSize other = {call->images[SRC2].width, call->images[SRC2].height};
    const QorImageSize kernel = {call->kernel_width, call->kernel_height};
    const QorImageSize out = {call->images[OUT].width, call->images[OUT].height};
    const int32_t channels = form->source_layout & CHANNELS, code = type_code(form->source);
    switch (form->query) {
        case QUERY_WINDOW:
            status = ((QorResult(*)(QorImageSize, QorImageSize, int32_t, int32_t, int32_t*))form->ask)(
                region, window, code, channels, &bytes);
            break;
        case QUERY_CORRELATION:
            if (word_of(call, parameter_index(call->operation, KIND_FLAGS, "algorithm"), &algorithm)) return -1;
            status = ((QorResult(*)(QorImageSize, QorImageSize, int32_t, int32_t*))form->ask)(source, other, algorithm,
                                                                                              &bytes);
            break;
        case QUERY_KERNEL_ROW:
            status = ((QorResult(*)(QorImageSize, int32_t, int32_t*))form->ask)(kernel, region.width, &bytes);
            break;
        case QUERY_PLAN: status = ((QorResult(*)(const void*, int32_t*))form->ask)(plan->memory, &bytes); break;
        case QUERY_PLAN_TILE_CHANNELS:
            if (out.height == plan->height && out.width == plan->width && plan->whole_bytes[channels])
                return plan->whole_bytes[channels];
            status = ((QorResult(*)(const void*, QorImageSize, int32_t, int32_t*))form->ask)(plan->memory, out,
                                                                                             channels, &bytes);
            break;
        case QUERY_PLAN_TILE:
            status = ((QorResult(*)(const void*, QorImageSize, int32_t*))form->ask)(
                plan->memory, plan->kind == HOG_PLAN ? region : out, &bytes);
            break;
        case QUERY_FILTER_BORDER: {
            const QorImageSize size = {plan->kernel_width, plan->kernel_height};
            status = qoriFilterBorderGetSize(size, region, code, plan->kernel_type, channels, &plan_bytes, &bytes);
            break;
        }
        case QUERY_ADAPTIVE: {
            const QorImageSize size = {plan->kernel_width, plan->kernel_height};
            status = qoriThresholdAdaptiveGaussGetBufferSize(region, size, code, channels, &plan_bytes, &bytes);
            break;
        }
        default: bytes = plan ? plan->buffer_bytes : 0; break;
    }
    if (status < 0) return status_result(call, member_of(call), status);
    return bytes > 0 ? bytes : 1;
}

/* A tile's source begins where the library says. */
int offset_source(Call* call) {
    const int i = call->operation->has[HAS_OFFSET];
    if (!call->plan || call->plan->kind != RESIZE_PLAN || i < 0 || !(call->given >> i & 1)) return 0;
    QorPoint2D at;
    const QorPoint2D offset = {call->pairs[i][1], call->pairs[i][0]};
    const int status = qoriResizeGetSrcOffset_8u(call->plan->memory, offset, &at);
    if (status) return status_result(call, "qoriResizeGetSrcOffset_8u", status);
    Image* src = &call->images[SRC];
    src->data += at.y * src->step + (Py_ssize_t)at.x * element_bytes[src->element] * (src->layout & CHANNELS);
    return 0;
}

/* --- the types ------------------------------------------------------------------------------------------------------
 */

static void deallocate(PyObject* object) {
    Plan* plan = (Plan*)object;
    PyTypeObject* type = Py_TYPE(object);
    if (plan->memory) plan->free_memory(plan->memory);
    Py_XDECREF(plan->text);
    ((freefunc)PyType_GetSlot(type, Py_tp_free))(object);
    Py_DECREF(type);
}

static PyObject* represent(PyObject* object) { return Py_NewRef(((Plan*)object)->text); }

/* The plan's memory as a number. */
PyObject* plan_address(PyObject* module, PyObject* object) {
    (void)module;
    for (int kind = 0; kind < PLAN_TYPES; ++kind)
        if (Py_TYPE(object) == shared.plan_types[kind]) return PyLong_FromVoidPtr(((Plan*)object)->memory);
    PyErr_SetString(PyExc_TypeError, "_address: accepted is a plan");
    return NULL;
}

static int is_transform(int kind) { return kind == DCT_PLAN || kind == DFT_PLAN || kind == FFT_PLAN; }

/* The protocol of calls without a tuple: in the limited API from 3.12 on, with the flag and the member that 3.11 has.
 */
#ifndef Py_TPFLAGS_HAVE_VECTORCALL
#define Py_TPFLAGS_HAVE_VECTORCALL (1UL << 11)
#endif

static PyMemberDef plan_members[] = {{"__vectorcalloffset__", T_PYSSIZET, offsetof(Plan, vectorcall), READONLY, NULL},
                                     {NULL, 0, 0, 0, NULL}};

static PyMemberDef no_members[] = {{NULL, 0, 0, 0, NULL}};

static PyObject* get_source_shape(PyObject* self, void* unused) {
    (void)unused;
    return Py_BuildValue("(ii)", ((Plan*)self)->source_height, ((Plan*)self)->source_width);
}

static PyObject* get_shape(PyObject* self, void* unused) {
    (void)unused;
    return Py_BuildValue("(ii)", ((Plan*)self)->height, ((Plan*)self)->width);
}

static PyObject* get_dtype(PyObject* self, void* unused) {
    (void)unused;
    const int element = ((Plan*)self)->element;
    if (element == NO_ELEMENT) Py_RETURN_NONE;
    return PyUnicode_FromString(element_names[element]);
}

static PyObject* get_border(PyObject* self, void* unused) {
    (void)unused;
    const Plan* plan = (Plan*)self;
    return Py_BuildValue("(iiii)", plan->top, plan->bottom, plan->left, plan->right);
}

static PyObject* get_descriptor(PyObject* self, void* unused) {
    (void)unused;
    return PyLong_FromLong(((Plan*)self)->descriptor);
}

static PyGetSetDef image_attributes[] = {
    {"src_shape", get_source_shape, NULL, "(height, width) of the source.", NULL},
    {"dst_shape", get_shape, NULL, "(height, width) of the destination.", NULL},
    {"dtype", get_dtype, NULL, "Name of the source's elements.", NULL},
    {"border", get_border, NULL, "Pixels that may be read around the source: (top, bottom, left, right).", NULL},
    {NULL, NULL, NULL, NULL, NULL}};
static PyGetSetDef plain_attributes[] = {{"dtype", get_dtype, NULL, "Name of the source's elements; None: any.", NULL},
                                         {NULL, NULL, NULL, NULL, NULL}};
static PyGetSetDef hog_attributes[] = {
    {"descriptor_size", get_descriptor, NULL, "Elements of one window's descriptor.", NULL},
    {NULL, NULL, NULL, NULL, NULL}};
static PyGetSetDef histogram_attributes[] = {{"dtype", get_dtype, NULL, "Name of the source's elements.", NULL},
                                             {"levels", histogram_levels, NULL, "The levels of each channel.", NULL},
                                             {NULL, NULL, NULL, NULL, NULL}};

static PyMethodDef transform_methods[] = {
    {"forward", (PyCFunction)(void (*)(void))plan_forward, METH_FASTCALL | METH_KEYWORDS,
     "forward($self, src, out=None, **keywords)\n--\n\nThe spectrum of an image."},
    {"inverse", (PyCFunction)(void (*)(void))plan_inverse, METH_FASTCALL | METH_KEYWORDS,
     "inverse($self, src, out=None, **keywords)\n--\n\nThe image of a spectrum."},
    {NULL, NULL, 0, NULL}};
static PyMethodDef resize_methods[] = {
    {"src_offset", resize_src_offset, METH_O,
     "src_offset($self, offset, /)\n--\n\nThe source pixel (row, column) at which a tile of the destination begins."},
    {"src_roi", resize_src_roi, METH_O,
     "src_roi($self, rect, /)\n--\n\nOf a destination rectangle (row, column, height, width) the smallest source "
     "rectangle\n"
     "that it is made of, and the rectangle trimmed to the destination."},
    {NULL, NULL, 0, NULL}};
static PyMethodDef no_methods[] = {{NULL, NULL, 0, NULL}};

typedef struct PlanType {
    const char* name;
    const char* doc;
    newfunc make;
    PyMethodDef* methods;
    PyGetSetDef* attributes;
} PlanType;

static const PlanType plan_types[PLAN_TYPES] = {
    [RESIZE_PLAN] = {"qori.ResizePlan", RESIZE_DOC, make_resize, resize_methods, image_attributes},
    [WARP_PLAN] = {"qori.WarpAffinePlan", WARP_DOC, make_warp, no_methods, image_attributes},
    [DCT_PLAN] = {"qori.DctPlan", DCT_DOC, make_dct, transform_methods, image_attributes},
    [DFT_PLAN] = {"qori.DftPlan", DFT_DOC, make_dft, transform_methods, image_attributes},
    [FFT_PLAN] = {"qori.FftPlan", FFT_DOC, make_fft, transform_methods, image_attributes},
    [HISTOGRAM_PLAN] = {"qori.HistogramPlan", HISTOGRAM_DOC, make_histogram, no_methods, histogram_attributes},
    [LINEAR_FILTER_PLAN] = {"qori.LinearFilterPlan", LINEAR_FILTER_DOC, make_linear_filter, no_methods,
                            plain_attributes},
    [ADAPTIVE_PLAN] = {"qori.AdaptiveGaussPlan", ADAPTIVE_DOC, make_adaptive, no_methods, plain_attributes},
    [HOG_PLAN] = {"qori.HogPlan", HOG_DOC, make_hog, no_methods, hog_attributes}};

int make_plan_types(PyObject* module) {
    find_plan_functions();
    for (int kind = 0; kind < PLAN_TYPES; ++kind) {
        const PlanType* t = &plan_types[kind];
        PyType_Slot slots[] = {{Py_tp_doc, (void*)t->doc},
                               {Py_tp_new, (void*)t->make},
                               {Py_tp_dealloc, (void*)deallocate},
                               {Py_tp_repr, (void*)represent},
                               {Py_tp_methods, t->methods},
                               {Py_tp_getset, t->attributes},
                               {Py_tp_members, is_transform(kind) ? no_members : plan_members},
                               {is_transform(kind) ? 0 : Py_tp_call, (void*)call_plan},
                               {0, NULL}};
        const unsigned long flags =
            Py_TPFLAGS_DEFAULT | Py_TPFLAGS_IMMUTABLETYPE | (is_transform(kind) ? 0 : Py_TPFLAGS_HAVE_VECTORCALL);
        PyType_Spec spec = {t->name, sizeof(Plan), 0, (unsigned int)flags, slots};
        PyObject* type = PyType_FromModuleAndSpec(module, &spec, NULL);
        if (!type) return -1;
        shared.plan_types[kind] = (PyTypeObject*)type;
        if (PyModule_AddObjectRef(module, strchr(t->name, '.') + 1, type)) return -1;
    }
    return 0;
}
