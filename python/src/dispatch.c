/* One call: arguments to parameters, arrays to images, a form by what they are, C arguments by the form's program. */
#include <stdlib.h>
#include <string.h>

#include "steps.h"

/* Traffic in bytes from which on other threads may run meanwhile: below it, handing over the interpreter costs more
 * than the call. Neighbourhoods and plans cost more for each byte. */
enum { RELEASE_BYTES = 1 << 17, RELEASE_BYTES_FILTER = 1 << 13 };

Call* start_call(Call* call, const Operation* operation) {
    call->operation = operation;
    call->form = NULL;
    call->given = call->read = 0;
    call->keep_alpha = call->in_place = 0;
    call->channel = call->dtype = call->channels = call->kernel_element = -1;
    call->top = call->left = call->bottom = call->right = 0;
    call->plan = NULL;
    call->kernel = NULL;
    call->block_count = call->array_count = call->value_count = call->small_used = 0;
    call->made = call->lists = NULL;
    for (int i = 0; i < IMAGES; ++i) call->images[i].held = 0;
    return call;
}

void free_call(Call* call) {
    for (int i = 0; i < IMAGES; ++i) release(&call->images[i]);
    while (call->array_count) release(&call->arrays[--call->array_count]);
    while (call->block_count) free(call->blocks[--call->block_count]);
    Py_CLEAR(call->made);
    Py_CLEAR(call->lists);
}

static int64_t traffic(const Call* call) {
    int64_t bytes = 0;
    for (int i = 0; i < IMAGES; ++i)
        if (call->images[i].held)
            bytes += (int64_t)call->images[i].height * call->images[i].width * pixel_bytes(&call->images[i]);
    return bytes;
}

static int prepare(Call* call) {
    if (take_arguments(call) || choose(call) || lay_destination(call) || offset_source(call)) return -1;
    if (call->form->extent == EXTENT_BLOCKS && special_outputs(call)) return -1;
    if (call->form->extent == EXTENT_WINDOWS && descriptors(call)) return -1;
    if (call->kernel && call->form->extent != EXTENT_WINDOWS && call->images[OUT].held) {
        const Py_ssize_t bytes =
            (Py_ssize_t)call->kernel_height * call->kernel_width * element_bytes[call->kernel_element];
        if (among(call->kernel, bytes, &call->images[OUT]))
            return refuse(PyExc_ValueError, call, "out",
                          "an array that shares memory with the kernel came; pass a copy");
    }
    return 0;
}

PyObject* member_for(const Operation* operation, PyObject* const* arguments, Py_ssize_t count, PyObject* names) {
    Call call;
    PyObject* result = NULL;
    start_call(&call, operation);
    if (!bind(&call, arguments, count, names) && !prepare(&call)) result = PyUnicode_FromString(member_of(&call));
    free_call(&call);
    return result;
}

PyObject* run(const Operation* operation, PyObject* const* arguments, Py_ssize_t count, PyObject* names) {
    Call call;
    PyObject* result = NULL;
    start_call(&call, operation);
    const int ready = operation->has[HAS_PLAN] == 1 ? prepare_straight(&call, arguments, count, names) : 0;
    if (ready < 0 || (!ready && (bind(&call, arguments, count, names) || prepare(&call)))) goto end;
    const Form* form = call.form;
    const Function function = call.in_place ? form->in_place : form->function;
    if (execute(&call, all_programs[call.in_place ? form->in_place_program : form->program])) goto end;
    const Trampoline trampoline = all_trampolines[call.in_place ? form->in_place_signature : form->signature];
    int status;
    const int heavy = form->reach | form->plan | form->extent;
    if (traffic(&call) >= (heavy ? RELEASE_BYTES_FILTER : RELEASE_BYTES)) {
        PyThreadState* thread = PyEval_SaveThread();
        status = trampoline(function, call.slots);
        PyEval_RestoreThread(thread);
    } else {
        status = trampoline(function, call.slots);
    }
    if (!status || !status_result(&call, member_of(&call), status)) result = result_of(&call);
end:
    free_call(&call);
    return result;
}
