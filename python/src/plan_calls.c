/* Calls of plans as if they were functions. */
#include <string.h>

#include "steps.h"

/* Operations by name, looked up once. */
enum { PLAN_FUNCTIONS = 12 };
static const char* const function_names[PLAN_FUNCTIONS] = {[RESIZE_PLAN] = "resize",
                                                           [WARP_PLAN] = "warp_affine",
                                                           [DCT_PLAN] = "dct_forward",
                                                           [DFT_PLAN] = "dft_forward",
                                                           [FFT_PLAN] = "fft_forward",
                                                           [HISTOGRAM_PLAN] = "histogram",
                                                           [LINEAR_FILTER_PLAN] = "filter_linear_border",
                                                           [ADAPTIVE_PLAN] = "threshold_adaptive_gauss",
                                                           [HOG_PLAN] = "hog",
                                                           "dct_inverse",
                                                           "dft_inverse",
                                                           "fft_inverse"};
static const Operation* functions[PLAN_FUNCTIONS];

void find_plan_functions(void) {
    for (int i = 0; i < PLAN_FUNCTIONS; ++i) {
        functions[i] = all_operations;
        while (strcmp(functions[i]->name, function_names[i])) ++functions[i];
    }
}

/* The operation with the plan put behind its first argument. */
static PyObject* with_plan(const Operation* operation, PyObject* self, PyObject* const* arguments, Py_ssize_t count,
                           PyObject* names) {
    PyObject* all[MAX_PARAMETERS + 1];
    const Py_ssize_t keywords = names ? PyTuple_Size(names) : 0;
    if (count < 1 || count + keywords >= MAX_PARAMETERS) {
        PyErr_Format(PyExc_TypeError, "%s: %zd positional arguments came; the first is the image", operation->name,
                     count);
        return NULL;
    }
    all[0] = arguments[0];
    all[1] = self;
    memcpy(all + 2, arguments + 1, (size_t)(count + keywords - 1) * sizeof *all);
    return run(operation, all, count + 1, names);
}

PyObject* call_plan(PyObject* self, PyObject* arguments, PyObject* keywords) {
    PyObject *all[MAX_PARAMETERS], *names = NULL, *result = NULL;
    const Operation* operation = functions[((Plan*)self)->kind];
    const Py_ssize_t count = PyTuple_Size(arguments), more = keywords ? PyDict_Size(keywords) : 0;
    if (count + more >= MAX_PARAMETERS) {
        PyErr_Format(PyExc_TypeError, "%s: %zd arguments came", operation->name, count + more);
        return NULL;
    }
    for (Py_ssize_t i = 0; i < count; ++i) all[i] = PyTuple_GetItem(arguments, i);
    if (more) {
        names = PyTuple_New(more);
        if (!names) return NULL;
        Py_ssize_t position = 0, i = 0;
        PyObject *key, *value;
        while (PyDict_Next(keywords, &position, &key, &value)) {
            PyTuple_SetItem(names, i, Py_NewRef(key));
            all[count + i++] = value;
        }
    }
    result = with_plan(operation, self, all, count, names);
    Py_XDECREF(names);
    return result;
}

PyObject* plan_forward(PyObject* self, PyObject* const* arguments, Py_ssize_t count, PyObject* names) {
    return with_plan(functions[((Plan*)self)->kind], self, arguments, count, names);
}

PyObject* plan_inverse(PyObject* self, PyObject* const* arguments, Py_ssize_t count, PyObject* names) {
    return with_plan(functions[HOG_PLAN + 1 + ((Plan*)self)->kind - DCT_PLAN], self, arguments, count, names);
}

/* --- the shortest way -----------------------------------------------------------------------------------------------
 */

/* The form that a plan's call takes for packed arrays of so many channels where nothing but out= is given: the one that
 * choose() would find. */
const Form* usual_form(const Plan* plan, int channels) {
    const Operation* operation = functions[plan->kind];
    const Span span = operation->index->spans[plan->element][channels];
    for (const Form *form = operation->forms + span.first, *end = form + span.count; form < end; ++form)
        if (form->function && form->source_layout == channels && form->target_layout == channels && !form->contiguous &&
            !form->contiguous_out && plan_serves(plan, form))
            return form;
    return NULL;
}

/* Whether nothing stands in the way: arrays of the plan's own sizes, apart from each other. */
static int goes_straight(const Plan* plan, const Form* form, const Image* in, const Image* out) {
    return form && in->element == form->source && in->layout == form->source_layout && out->element == form->target &&
           out->layout == form->target_layout && in->height == plan->source_height && in->width == plan->source_width &&
           out->height == plan->height && out->width == plan->width && !out->view.readonly &&
           (out->height < 2 || out->step >= out->width * pixel_bytes(out)) && !overlapping(in, out);
}

/* An operation with a plan of resizes, called as (src, plan, out) or (src, plan, out=...): 1 where the call is ready by
 * the plan's usual form, -1 with an exception set, 0 where it takes the general way, which finds the same form and
 * tells what is wrong. */
int prepare_straight(Call* call, PyObject* const* arguments, Py_ssize_t count, PyObject* names) {
    const Operation* operation = call->operation;
    const int target = operation->has[HAS_OUT];
    if (count + (names ? PyTuple_Size(names) : 0) != 3 || count < 2 || arguments[2] == Py_None ||
        Py_TYPE(arguments[1]) != shared.plan_types[RESIZE_PLAN] ||
        (count == 2 && PyTuple_GetItem(names, 0) != parameter_names[operation->parameters - all_parameters + target]))
        return 0;
    const Plan* plan = (const Plan*)arguments[1];
    Image *in = &call->images[SRC], *out = &call->images[OUT];
    if (acquire(call, arguments[0], operation->parameters[0].name, in, SRC) ||
        acquire(call, arguments[2], operation->parameters[target].name, out, OUT))
        return -1;
    const Form* form = in->layout < PLANAR ? plan->usual[in->layout] : NULL;
    if (!goes_straight(plan, form, in, out)) {
        release(in);
        release(out);
        return 0;
    }
    call->plan = plan;
    call->form = form;
    call->height = in->height;
    call->width = in->width;
    call->arguments[target] = arguments[2];
    return 1;
}

PyObject* call_plan_directly(PyObject* self, PyObject* const* arguments, size_t flags, PyObject* names) {
    return with_plan(functions[((Plan*)self)->kind], self, arguments, (Py_ssize_t)(flags & ~((size_t)1 << 63)), names);
}
