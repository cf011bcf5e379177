/* Where a call writes, and what it must not share. */
#include <stdlib.h>
#include <string.h>

#include "steps.h"

Py_ssize_t pixel_bytes(const Image* image) {
    return element_bytes[image->element] * (image->layout & PLANAR ? 1 : image->layout & CHANNELS);
}

int check_writable(const Call* call, const Image* image, const char* name) {
    if (image->view.readonly)
        return refuse(PyExc_ValueError, call, name,
                      "a read-only array came; accepted are arrays that can be written: pass a copy");
    const Py_ssize_t row = (Py_ssize_t)image->width * pixel_bytes(image),
                     step = image->step < 0 ? -image->step : image->step;
    if (image->height > 1 && step < row)
        return refuse(PyExc_ValueError, call, name,
                      "rows of %zd bytes that are %zd bytes apart came; accepted are rows that do not overlap", row,
                      image->step);
    return 0;
}

/* Whether an input is the destination itself: 1 exactly, 0 apart, -1 refused. */
int meets(const Call* call, int which, const char* name) {
    const Image *in = &call->images[which], *out = &call->images[OUT];
    Image around;
    const Image* read = in;
    if (which == SRC && (call->top | call->left | call->bottom | call->right)) {
        around = *in;
        read = &around;
        around.data = in->data - (Py_ssize_t)call->top * in->step - (Py_ssize_t)call->left * pixel_bytes(in);
        around.height = in->height + call->top + call->bottom;
        around.width = in->width + call->left + call->right;
    }
    if (!overlapping(read, out)) return 0;
    const int exact = in->data == out->data && (in->step == out->step || in->height < 2) && in->height == out->height &&
                      in->width == out->width && element_bytes[in->element] == element_bytes[out->element] &&
                      in->layout == out->layout && (!(in->layout & PLANAR) || in->plane == out->plane);
    const int diagonal = call->form->extent == EXTENT_AXIS && call->pairs[call->operation->has[HAS_AXIS]][0] > 2;
    if (exact && call->form->overlap && !diagonal && which != MASK &&
        !(call->operation->forms->extent == EXTENT_LEVELS))
        return 1;
    if (call->form->contiguous_out && call->form->contiguous && in->data == out->data) return 1;
    if (call->form->extent == EXTENT_ROW && in->step && !((out->data - in->data) % in->step))
        return 0; /* one of the rows */
    return refuse(PyExc_ValueError, call, "out",
                  exact ? "the array of %s came; accepted is another array: this operation does not run in place"
                        : "an array that shares memory with %s came; accepted are that array itself or one apart from "
                          "it: pass a copy",
                  name);
}

static int make_out(Call* call, int height, int width) {
    const Form* form = call->form;
    if (!form->function)
        return refuse(PyExc_ValueError, call, "out", "these elements are computed in place only: pass out=%s",
                      call->operation->parameters[0].name);
    const int channels = form->target_layout & CHANNELS;
    if (form->target_layout & (ALPHA | CHANNEL))
        return refuse(PyExc_ValueError, call, "out",
                      "is missing: keep_alpha= and channel= keep parts of a destination, which must be there");
    if (height < 1 || width < 1)
        return refuse(shared.error, call, NULL, "a destination of (%d, %d) pixels came; accepted are sides from 1 on",
                      height, width);
    const Image* source = &call->images[SRC];
    const int dimensions = channels > 1                 ? 3
                           : form->extent == EXTENT_ROW ? 1 /* one for each column */
                           : source->held && source->dimensions == 3 && (source->layout & CHANNELS) == 1 ? 3
                                                                                                         : 2;
    /* Members that take no step write rows without gaps. */
    call->made = form->contiguous_out && dimensions < 3 ? make_packed(form->target, height, width, dimensions)
                                                        : make_array(form->target, height, width, channels, dimensions);
    if (!call->made || acquire(call, call->made, "out", &call->images[OUT], OUT)) return -1;
    const Image* out = &call->images[OUT];
    if (call->plan && call->plan->kind == WARP_PLAN && call->plan->antialias) /* pixels that the border leaves out */
        for (int32_t y = 0; y < out->height; ++y)
            memset(out->data + y * out->step, 0, (size_t)(out->width * pixel_bytes(out)));
    return 0;
}

static int place_source(Call* call, Image* image, int layout) {
    if (layout & CHANNEL) {
        if (call->channel >= (image->layout & CHANNELS))
            return refuse(PyExc_ValueError, call, "channel", "%d came; accepted are those of %d channels",
                          call->channel, image->layout & CHANNELS);
        image->data += call->channel * element_bytes[image->element];
    }
    return 0;
}

static int same_image(const Call* call, int which, int height, int width) {
    const Image *image = &call->images[which], *first = &call->images[SRC];
    char text[96], other[96];
    if (image->element == first->element && image->layout == first->layout && image->height == height &&
        image->width == width)
        return 0;
    return refuse(PyExc_ValueError, call, which == MASK ? "mask" : "b", "%s came; accepted is what %s is: %s",
                  describe(image, text), call->operation->parameters[0].name, describe(first, other));
}

static int check_inputs(const Call* call, int height, int width) {
    const Image *second = &call->images[SRC2], *mask = &call->images[MASK];
    char text[96];
    if (second->held) {
        if (call->operation->has[HAS_PATTERN] >= 0) {
            if (second->element != call->images[SRC].element || second->layout != call->images[SRC].layout)
                return refuse(PyExc_ValueError, call, "pattern", "%s came; accepted are elements and channels of src",
                              describe(second, text));
        } else if (same_image(call, SRC2, height, width)) {
            return -1;
        }
    }
    if (mask->held && (mask->element != U8 || mask->layout != 1 || mask->height != height || mask->width != width))
        return refuse(PyExc_ValueError, call, "mask", "%s came; accepted is uint8 or bool (%d, %d)",
                      describe(mask, text), height, width);
    return 0;
}

static int in_frame(const Call* call) {
    const Image *src = &call->images[SRC], *out = &call->images[OUT];
    const int before = parameter_index(call->operation, KIND_SIZE, "before");
    return call->form->in_place && src->step == out->step && src->height > 1 &&
           src->data == out->data + call->pairs[before][0] * out->step + call->pairs[before][1] * pixel_bytes(out);
}

int lay_destination(Call* call) {
    int32_t height, width;
    if (measure(call, &height, &width)) return -1;
    Image *src = &call->images[SRC], *out = &call->images[OUT];
    const Form* form = call->form;
    if (src->held) {
        src->data += (Py_ssize_t)call->top * src->step + (Py_ssize_t)call->left * pixel_bytes(src);
        src->height = call->height;
        src->width = form->extent == EXTENT_BITS ? src->width : call->width;
    }
    if (check_inputs(call, call->height, call->width)) return -1;
    const int destination = call->operation->has[HAS_OUT];
    if (destination < 0 || form->extent >= EXTENT_LEVELS || form->extent == EXTENT_BLOCKS) return 0;
    if (!out->held) {
        if (make_out(call, height, width)) return -1;
        return src->held ? place_source(call, src, form->source_layout) : 0;
    }
    if (check_writable(call, out, call->operation->parameters[destination].name)) return -1;
    /* A small block may be written over the first elements of the source's own. */
    const int over = form->in_place && form->contiguous && out->data == src->data && out->element == src->element &&
                     out->height == src->height && out->width == src->width;
    const int fits = (out->height == height && out->width == width) || over;
    if (!fits) {
        char text[96];
        return refuse(PyExc_ValueError, call, "out", "%s came; accepted is (%d, %d)%s", describe(out, text), height,
                      width, " pixels: pass out=None to have it made");
    }
    if (place_source(call, out, form->target_layout) || (src->held && place_source(call, src, form->source_layout)))
        return -1;
    if (form->extent == EXTENT_FRAME && in_frame(call)) {
        call->in_place = 1;
        return 0;
    }
    static const char* const names[] = {"the first source", "the second source", "", "mask"};
    for (int i = SRC; i <= MASK; ++i) {
        if (i == OUT || !call->images[i].held) continue;
        const int same = meets(call, i, names[i]);
        if (same < 0) return -1;
        if (same && form->in_place && i == form->in_place_image) call->in_place = 1;
    }
    if (!form->function && !call->in_place)
        return refuse(PyExc_ValueError, call, "out", "these elements are computed in place only: pass out=%s",
                      call->operation->parameters[0].name);
    return 0;
}
