/* What a user reads when a call is refused: the argument, what came, what is accepted, and what to do. */
#include <stdarg.h>
#include <stdio.h>
#include <string.h>

#include "core.h"

int refuse(PyObject* kind, const Call* call, const char* argument, const char* format, ...) {
    va_list list;
    va_start(list, format);
    PyObject* text = PyUnicode_FromFormatV(format, list);
    va_end(list);
    if (!text) return -1;
    if (argument)
        PyErr_Format(kind, "%s: argument %s: %U", call->operation->name, argument, text);
    else
        PyErr_Format(kind, "%s: %U", call->operation->name, text);
    Py_DECREF(text);
    return -1;
}

static const Status* status_of(int code) {
    for (const Status* s = all_statuses; s->name; ++s)
        if (s->code == code) return s;
    return NULL;
}

/* Steps are refused by members that walk downwards only; the array's own steps say more than the code does. */
static void add_steps(const Call* call, char* text, size_t bytes) {
    size_t used = strlen(text);
    for (int i = 0; i < IMAGES; ++i) {
        const Image* image = &call->images[i];
        if (!image->held || used + 80 > bytes) continue;
        if (image->height > 1 && image->step < 1)
            used += (size_t)snprintf(text + used, bytes - used,
                                     " Image %d has rows %lld bytes apart; numpy.ascontiguousarray "
                                     "copies it into rows that go down.",
                                     i + 1, (long long)image->step);
    }
}

const char* member_of(const Call* call) { return call->in_place ? call->form->in_place_name : call->form->name; }

int status_result(const Call* call, const char* member, int status) {
    if (!status) return 0;
    const Status* found = status_of(status);
    char text[400];
    snprintf(text, sizeof text, "%s: %s (%d). %s (%s)", call->operation->name, found ? found->name : "unknown status",
             status, found ? found->text : "", member);
    if (status > 0) return PyErr_WarnEx(shared.warning, text, 1);
    if (status == -14) add_steps(call, text, sizeof text);
    PyObject* type = status == -9 ? shared.no_memory : shared.error;
    PyObject* error = PyObject_CallFunction(type, "s", text);
    PyObject* code = error ? PyLong_FromLong(status) : NULL;
    if (code && !PyObject_SetAttr(error, shared.code, code)) PyErr_SetObject(type, error);
    Py_XDECREF(code);
    Py_XDECREF(error);
    return -1;
}

/* Element types and channels that an operation takes, as a sentence. */
static void list_accepted(const Operation* operation, char* text, size_t bytes) {
    size_t used = 0;
    text[0] = 0;
    for (int e = 0; e < ELEMENTS; ++e) {
        char channels[24] = "";
        for (int c = 1; c < 10; ++c)
            if (operation->index->spans[e][c].count) {
                char one[16];
                snprintf(one, sizeof one, "%s%d%s", *channels ? "," : "", c > 5 ? c - 5 : c, c > 5 ? "p" : "");
                strncat(channels, one, sizeof channels - strlen(channels) - 1);
            }
        if (*channels && used + 40 < bytes)
            used +=
                (size_t)snprintf(text + used, bytes - used, "%s%s of %s", used ? "; " : "", element_names[e], channels);
    }
}

/* What was asked of an operation, in its own words. */
static void list_given(const Call* call, char* text, size_t bytes) {
    size_t used = 0;
    text[0] = 0;
    for (int i = 0; i < call->operation->count; ++i) {
        const Parameter* p = &call->operation->parameters[i];
        if (!(call->given >> i & 1) || p->kind == KIND_IMAGE || p->kind == KIND_OUT || used + 40 > bytes) continue;
        used += (size_t)snprintf(text + used, bytes - used, "%s%s=", used ? ", " : " with ", p->name);
    }
}

/* No member does what was asked. */
PyObject* no_form(const Call* call) {
    char accepted[600], given[200], first[96], out[96];
    list_accepted(call->operation, accepted, sizeof accepted);
    list_given(call, given, sizeof given);
    const Image* image = call->images[SRC].held ? &call->images[SRC] : &call->images[OUT];
    const Image* destination = image != &call->images[OUT] && call->images[OUT].held ? &call->images[OUT] : NULL;
    refuse(PyExc_TypeError, call, NULL,
           "no form takes %s%s%s%s; accepted are images of %s channels (p: planes): convert with qori.convert or "
           ".astype(...), "
           "or see help(qori.%s)",
           describe(image, first), destination ? " into " : "", destination ? describe(destination, out) : "", given,
           accepted, call->operation->name);
    return NULL;
}
