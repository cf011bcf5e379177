/* C arguments by the program of a form. */
#include <stdlib.h>
#include <string.h>

#include "steps.h"

static void* scratch(Call* call) { return call->values[call->value_count++].bytes; }

static int64_t size_of(int32_t height, int32_t width) {
    return (int64_t)((uint64_t)(uint32_t)height << 32 | (uint32_t)width);
}

static void number_slot(Slot* slot, int element, const void* value) {
    switch (element) {
        case U8: slot->i = *(const uint8_t*)value; break;
        case I8: slot->i = *(const int8_t*)value; break;
        case U16: slot->i = *(const uint16_t*)value; break;
        case I16: slot->i = *(const int16_t*)value; break;
        default: memcpy(slot, value, element_bytes[element]); break;
    }
}

static int number_step(Call* call, const Step* step, Slot* slot) {
    const Parameter* p = &call->operation->parameters[step->a];
    if (step->b < I64) return integer_of(call, step->a, step->b, &slot->i);
    if (call->given >> step->a & 1) return read_number(call, p->name, call->arguments[step->a], step->b, slot);
    if (step->b == F32)
        slot->f = (float)p->standard;
    else
        slot->d = p->standard;
    return 0;
}

static int value_step(Call* call, const Step* step, Slot* slot) {
    const Parameter* p = &call->operation->parameters[step->a];
    void* values = scratch(call);
    if (!(call->given >> step->a & 1))
        memset(values, 0, 64);
    else if (read_values(call, p->name, call->arguments[step->a], step->b, step->c, values))
        return -1;
    if (step->c)
        slot->p = values;
    else
        number_slot(slot, step->b, values);
    return 0;
}

/* Lists of a form share one number of entries for each channel. */
static int lists_step(Call* call, const Step* step, Slot* slot) {
    const Parameter* p = &call->operation->parameters[step->a];
    void** lists = scratch(call);
    int32_t counts[4] = {0, 0, 0, 0};
    const int n = step->c && step->c != 9 ? step->c : 1;
    if (read_lists(call, p->name, call->arguments[step->a], step->b, step->c, lists, counts)) return -1;
    for (int i = 0; i < n; ++i) {
        if (call->list_elements && counts[i] != call->counts[i])
            return refuse(PyExc_ValueError, call, p->name,
                          "lists of %d entries came beside lists of %d; accepted are equal lengths", counts[i],
                          call->counts[i]);
        call->counts[i] = counts[i];
    }
    for (int i = n; i < 4; ++i) call->counts[i] = 0;
    for (int i = 0; i < n; ++i) { /* what is read must not be what is written */
        const Py_ssize_t bytes = (Py_ssize_t)counts[i] * element_bytes[step->b] * (step->c == 9 ? 3 : 1);
        const Image* out = &call->images[OUT];
        if (out->held && among(lists[i], bytes, out))
            return refuse(PyExc_ValueError, call, "out", "an array that shares memory with %s came; pass a copy",
                          p->name);
    }
    call->list_elements = 1;
    slot->p = step->c && step->c != 9 ? (void*)lists : lists[0];
    return 0;
}

static int bits_step(Call* call, const Step* steps, Slot* slot) {
    (void)steps;
    int bits = 0;
    while (bits < 30 && 1 << bits < call->counts[0]) ++bits;
    for (int i = 0; i < 4; ++i)
        if ((!i || call->counts[i]) && call->counts[i] != 1 << bits)
            return refuse(PyExc_ValueError, call, "table",
                          "%d entries came; accepted are powers of 2, the same for all channels", call->counts[i]);
    slot->i = bits;
    return 0;
}

static int vector_step(Call* call, const Step* step, Slot* slot) {
    const Parameter* p = &call->operation->parameters[step->a];
    const Image* src = &call->images[SRC];
    void* list;
    int32_t count;
    if (read_lists(call, p->name, call->arguments[step->a], src->element, 0, &list, &count)) return -1;
    if (count != src->height)
        return refuse(PyExc_ValueError, call, p->name, "%d came; accepted are %d, one for each row", count,
                      src->height);
    slot->p = list;
    return 0;
}

static int rows_step(Call* call, Slot* slot) {
    const Image* src = &call->images[SRC];
    void** rows = allocate(call, (size_t)(src->height > 0 ? src->height : 1) * sizeof *rows);
    if (!rows) return -1;
    for (int32_t y = 0; y < src->height; ++y) rows[y] = src->data + y * src->step;
    slot->p = rows;
    return 0;
}

/* Levels as numbers of entries, one for all channels or one each. */
static int counts_step(Call* call, const Step* step, Slot* slot) {
    const int i = parameter_index(call->operation, KIND_COUNTS, NULL);
    if (i >= 0 && !call->list_elements) {
        if (read_values(call, "levels", call->arguments[i], I32, step->c, call->counts)) return -1;
        for (int k = 0; k < (step->c ? step->c : 1); ++k)
            if (call->counts[k] < 2 || call->counts[k] > 1 << 28)
                return refuse(PyExc_ValueError, call, "levels", "%d came; accepted are numbers from 2 on",
                              call->counts[k]);
        call->list_elements = 1;
    }
    if (step->c)
        slot->p = call->counts;
    else
        slot->i = call->counts[0];
    return 0;
}

static int buffer_step(Call* call, Slot* slot) {
    const int64_t bytes = work_bytes(call);
    if (bytes < 0) return -1;
    return (slot->p = allocate(call, (size_t)bytes)) ? 0 : -1;
}

static int planes_step(Call* call, const Image* image, Slot* slot) {
    void** planes = scratch(call);
    for (int i = 0; i < (image->layout & CHANNELS); ++i) planes[i] = image->data + i * image->plane;
    slot->p = planes;
    return 0;
}

/* Levels are read before the bins between them are made. */
static int levels_first(Call* call, const Step* step) {
    Slot* slot = call->slots;
    const int counts = parameter_index(call->operation, KIND_COUNTS, NULL) >= 0;
    while (step->code != (counts ? STEP_COUNTS : STEP_LISTS)) ++step, ++slot;
    return counts ? counts_step(call, step, slot) : lists_step(call, step, slot);
}

int execute(Call* call, const Step* step) {
    const Image* images = call->images;
    call->list_elements = 0;
    if (call->form->extent == EXTENT_LEVELS && !call->plan && levels_first(call, step)) return -1;
    for (Slot* slot = call->slots; step->code != STEP_END; ++step, ++slot) {
        int32_t a, b;
        int failed = 0;
        switch (step->code) {
            case STEP_DATA: slot->p = images[step->a].data; break;
            case STEP_STEP: slot->i = (int32_t)images[step->a].step; break;
            case STEP_REGION: slot->l = size_of(call->height, call->width); break;
            case STEP_NUMBER:
            case STEP_ANCHOR: failed = number_step(call, step, slot); break;
            case STEP_VALUE: failed = value_step(call, step, slot); break;
            case STEP_ENUM:
            case STEP_FLAGS: failed = word_of(call, step->a, &slot->i); break;
            case STEP_SIZE:
            case STEP_POINT:
                failed = pair_of(call, step->a, &a, &b);
                slot->l = size_of(a, b);
                break;
            case STEP_SIZE_OF: slot->l = size_of(images[step->a].height, images[step->a].width); break;
            case STEP_KERNEL: slot->p = call->kernel; break;
            case STEP_KERNEL_SIZE: slot->l = size_of(call->kernel_height, call->kernel_width); break;
            case STEP_PLAN: slot->p = call->plan->memory; break;
            case STEP_BUFFER: failed = buffer_step(call, slot); break;
            case STEP_RESULT: slot->p = call->results[step->a].bytes; break;
            case STEP_PLANES: failed = planes_step(call, &images[step->a], slot); break;
            case STEP_LEFT: slot->i = call->pairs[step->a][1]; break;
            case STEP_TOP: slot->i = call->pairs[step->a][0]; break;
            case STEP_HEIGHT: slot->i = images[step->a].height; break;
            case STEP_WIDTH: slot->i = images[step->a].width; break;
            case STEP_ROWS: failed = rows_step(call, slot); break;
            case STEP_VECTOR: failed = vector_step(call, step, slot); break;
            case STEP_LISTS:
                if (call->form->extent != EXTENT_LEVELS) failed = lists_step(call, step, slot);
                break;
            case STEP_LISTS_OUT: failed = lists_out(call, step->a, step->c, slot); break;
            case STEP_COUNTS: failed = counts_step(call, step, slot); break;
            case STEP_BITS: failed = bits_step(call, step, slot); break;
            case STEP_POINTS: slot->p = call->kernel; break;
            case STEP_COUNT_POINTS: slot->i = call->counts[0]; break;
            default: return refuse(PyExc_SystemError, call, NULL, "its program has a step %d", step->code);
        }
        if (failed) return -1;
    }
    return 0;
}
