/* The form that a call takes: the member by elements, layouts and what was given. */
#include <stdlib.h>
#include <string.h>

#include "steps.h"

int packed_rows(const Image* image) {
    return image->height < 2 ||
           image->step == (Py_ssize_t)image->width * element_bytes[image->element] * (image->layout & CHANNELS);
}

static int suits(const Call* call, const Form* form, const Image* key) {
    const Image* out = &call->images[OUT];
    if (call->given & ~form->accepts || form->requires & ~call->given) return 0;
    const int layouts = form->source_layout | form->target_layout;
    if (((layouts & ALPHA) != 0) != call->keep_alpha || ((layouts & CHANNEL) != 0) != (call->channel >= 0)) return 0;
    if (call->plan && !plan_serves(call->plan, form)) return 0;
    if (form->kernel != NO_ELEMENT && call->kernel_element >= 0 && form->kernel != call->kernel_element) return 0;
    if (form->contiguous && !packed_rows(&call->images[SRC])) return 0;
    if (call->dtype >= 0 && form->target != call->dtype) return 0;
    if (call->channels >= 0 && (form->target_layout & CHANNELS) != call->channels) return 0;
    if (!out->held || out == key) return 1;
    return out->element == form->target &&
           (out->layout & (CHANNELS | PLANAR)) == (form->target_layout & (CHANNELS | PLANAR)) &&
           (!form->contiguous_out || packed_rows(out));
}

static int bit_count(uint32_t bits) { return __builtin_popcount(bits); }

/* The first form that takes what was given; forms with fewer parameters come first. Where several destinations are
 * possible and none is asked for, the one of the source's own type, or the only one of the fewest parameters. */
int choose(Call* call) {
    const Operation* operation = call->operation;
    const Image* key = call->images[SRC].held ? &call->images[SRC] : &call->images[OUT];
    const Span span = operation->index->spans[key->element][(key->layout & CHANNELS) + (key->layout & PLANAR ? 5 : 0)];
    const Form *form = operation->forms + span.first, *end = form + span.count, *found = NULL, *keeping = NULL;
    const int makes_out = operation->has[HAS_OUT] >= 0 && !call->images[OUT].held;
    int ambiguous = 0;
    for (; form < end; ++form) {
        if (!suits(call, form, key)) continue;
        if (makes_out && form->target_layout & PLANAR) continue;
        if (makes_out && form->target_layout & (ALPHA | CHANNEL)) { /* keeps parts of a destination that is not there */
            keeping = form;
            continue;
        }
        if (!found) {
            found = form;
            if (call->images[OUT].held || call->dtype >= 0) break;
        } else if (form->target != found->target || (form->target_layout ^ found->target_layout) & CHANNELS) {
            if (bit_count(form->accepts) > bit_count(found->accepts)) continue;
            if (found->target == found->source && found->target_layout == found->source_layout) continue;
            if (form->target == form->source && form->target_layout == form->source_layout) {
                found = form;
                ambiguous = 0;
            } else {
                ambiguous = 1;
            }
        }
    }
    if (!found) found = keeping;
    if (!found) {
        no_form(call);
        return -1;
    }
    if (ambiguous)
        return refuse(PyExc_TypeError, call, NULL,
                      "%s makes several types of this source; say which by dtype=, channels= or out=", operation->name);
    call->form = found;
    return 0;
}
