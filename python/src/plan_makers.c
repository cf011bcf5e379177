/* Plans of transforms, histograms, filters, thresholds and descriptors. */
#include "plan_makers.h"

#include <stdlib.h>
#include <string.h>

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
    if (!parse(&call, arguments, keywords, "O|$O:DctPlan", names, &shape, &word) ||
        shape_of(&call, "shape", shape, &size) ||
        (word && read_word(&call, "hint", word, enumeration_named("QorAccuracyHint"), 0, &hint)))
        return NULL;
    int status = qoriDCTFwdGetSize_32f(size, hint, &plan_bytes, &init_bytes, &buffer_bytes);
    if (sizes_known(&call, "qoriDCTFwdGetSize_32f", status)) return NULL;
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
    if (!parse(&call, arguments, keywords, "O|O$OO", names, &shape, &dtype, &norm, &hint) ||
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
    if (!parse(&call, arguments, keywords, "O|Oi$OO:HistogramPlan", names, &levels, &dtype, &channels, &lower,
               &upper) ||
        element_from(&call, dtype, "'uint8', 'uint16', 'int16' and 'float32'",
                     1u << U8 | 1u << U16 | 1u << I16 | 1u << F32, &element))
        return NULL;
    if (channels < 1 || channels > 4 || channels == 2) {
        refuse(PyExc_ValueError, &call, "channels", "%d came; accepted are 1, 3 and 4", channels);
        return NULL;
    }
    if (lower == Py_None) lower = NULL;
    if (upper == Py_None) upper = NULL;
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
        if (!failed) sizes_known(&call, "qoriHistogramGetBufferSize", status);
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
    if (!result && !PyErr_Occurred()) PyErr_Format(shared.error, "levels: status %d (qoriHistogramGetLevels)", status);
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
    if (!parse(&call, arguments, keywords, "O|Oi$iO:LinearFilterPlan", names, &kernel, &dtype, &channels, &divisor,
               &word) ||
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
    if (!parse(&call, arguments, keywords, "O|$d:AdaptiveGaussPlan", names, &object, &sigma) ||
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
    /* Where they are not given, blocks are of 2 x 2 cells, a cell apart. */
    const int32_t none = INT32_MIN;
    QorHogConfig config = {0, 8, none, none, 9, 8.0f, 0.2f, {64, 128}};
    int32_t plan_bytes = 0, bytes = 0;
    int columns = 0;
    Operation operation;
    Call call;
    named(&call, &operation, "HogPlan");
    if (!parse(&call, arguments, keywords, "|O$iiiiffp:HogPlan", names, &window, &config.cellSize, &config.blockSize,
               &config.blockStride, &config.nbins, &config.blockWeightParam, &config.normParam, &columns) ||
        (window && shape_of(&call, "window", window, &config.winSize)))
        return NULL;
    if (config.cellSize > 0 && config.cellSize < 1 << 24) {
        if (config.blockSize == none) config.blockSize = 2 * config.cellSize;
        if (config.blockStride == none) config.blockStride = config.cellSize;
    }
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
