/* One call: arguments to parameters, arrays to images, a form by what they are, C arguments by the form's program. */
#include <stdlib.h>
#include <string.h>

#include "geometry.h"
#include "plan_makers.h"
#include "plans.h"

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
    call->block_count = call->view_count = call->value_count = 0;
    call->made = call->lists = NULL;
    for (int i = 0; i < IMAGES; ++i) call->images[i].held = 0;
    return call;
}

void free_call(Call* call) {
    for (int i = 0; i < IMAGES; ++i) release(&call->images[i]);
    while (call->view_count) PyBuffer_Release(&call->views[--call->view_count]);
    while (call->block_count) free(call->blocks[--call->block_count]);
    Py_CLEAR(call->made);
    Py_CLEAR(call->lists);
}

/* --- arguments to parameters ----------------------------------------------------------------------------------------
 */

static int too_many(const Call* call, Py_ssize_t count) {
    int accepted = call->operation->positional;
    for (int i = 0; i < call->operation->count; ++i) accepted -= call->operation->parameters[i].twin != 0;
    return refuse(PyExc_TypeError, call, NULL, "%zd positional arguments came; accepted are at most %d", count,
                  accepted);
}

static int keyword(Call* call, PyObject* name) {
    const Operation* operation = call->operation;
    PyObject* const* names = parameter_names + (operation->parameters - all_parameters);
    for (int i = 0; i < operation->count; ++i)
        if (names[i] == name) return i;
    for (int i = 0; i < operation->count; ++i)
        if (!PyUnicode_Compare(names[i], name)) return i;
    return refuse(PyExc_TypeError, call, NULL, "there is no argument %R; see help(qori.%s)", name, operation->name);
}

static int bind(Call* call, PyObject* const* arguments, Py_ssize_t count, PyObject* names) {
    const Operation* operation = call->operation;
    const Parameter* parameters = operation->parameters;
    int parameter = 0;
    for (Py_ssize_t i = 0; i < count; ++i, ++parameter) {
        if (parameter && parameters[parameter - 1].twin == parameter) ++parameter;
        if (parameter >= operation->positional) return too_many(call, count);
        if (arguments[i] == Py_None) continue;
        call->arguments[parameter] = arguments[i];
        call->given |= 1u << parameter;
    }
    const int filled = parameter;
    const Py_ssize_t keywords = names ? PyTuple_Size(names) : 0;
    for (Py_ssize_t i = 0; i < keywords; ++i) {
        PyObject* name = PyTuple_GetItem(names, i);
        parameter = keyword(call, name);
        if (parameter < 0) return -1;
        if (parameter < filled || call->given >> parameter & 1)
            return refuse(PyExc_TypeError, call, parameters[parameter].name, "came twice");
        if (arguments[count + i] == Py_None) continue;
        call->arguments[parameter] = arguments[count + i];
        call->given |= 1u << parameter;
    }
    return 0;
}

/* Whether an operand is a number or one for each channel, and not an image. */
static int is_value(PyObject* object) {
    if (Py_TYPE(object) == shared.ndarray) return 0;
    if (PyFloat_Check(object) || PyLong_Check(object) || PyTuple_Check(object) || PyList_Check(object) ||
        !PyObject_CheckBuffer(object))
        return 1;
    Py_buffer view;
    if (PyObject_GetBuffer(object, &view, PyBUF_STRIDED_RO)) {
        PyErr_Clear();
        return 0;
    }
    const int scalar = view.ndim == 0;
    PyBuffer_Release(&view);
    return scalar;
}

static int small_integer(const Call* call, int i, int64_t low, int64_t high, int16_t* value) {
    int64_t number;
    if (read_integer(call, call->operation->parameters[i].name, call->arguments[i], low, high, &number)) return -1;
    *value = (int16_t)number;
    return 0;
}

/* Elements of palettes, by which forms are chosen; those of numbers say nothing. */
static int elements_of_tables(Call* call, PyObject* object) {
    PyObject* first = NULL;
    if (PyTuple_Check(object) || PyList_Check(object)) {
        first = PySequence_Size(object) > 0 ? PySequence_GetItem(object, 0) : NULL;
        object = first;
    }
    if (object && PyObject_CheckBuffer(object) && !is_value(object)) {
        Image image;
        image.held = 0;
        if (acquire(call, object, "table", &image, SRC)) {
            Py_XDECREF(first);
            return -1;
        }
        const int triples = !first && image.dimensions == 2 && image.width == 3 && image.height > 4;
        call->kernel_element = triples ? ELEMENTS : image.element;
        release(&image);
    }
    Py_XDECREF(first);
    return 0;
}

static int take_argument(Call* call, int i) {
    const Parameter* p = &call->operation->parameters[i];
    PyObject* object = call->arguments[i];
    int element;
    switch (p->kind) {
        case KIND_IMAGE: return acquire(call, object, p->name, &call->images[p->image], p->image);
        case KIND_OUT:
            if (call->operation->forms->extent == EXTENT_LEVELS || call->operation->forms->extent == EXTENT_BLOCKS)
                return 0;
            return acquire(call, object, p->name, &call->images[OUT], OUT);
        case KIND_PLAN: return (call->plan = plan_of(call, object)) ? 0 : -1;
        case KIND_KEEP_ALPHA:
            if (object != Py_True && object != Py_False)
                return refuse(PyExc_TypeError, call, p->name, "%.80R came; accepted are True and False", object);
            call->keep_alpha = object == Py_True;
            return 0;
        case KIND_CHANNEL: return small_integer(call, i, 0, 3, &call->channel);
        case KIND_CHANNELS: return small_integer(call, i, 1, 4, &call->channels);
        case KIND_DTYPE:
            if (!shared.empty && find_numpy(0) < 0) return -1;
            element = element_of_type(object);
            if (element < 0)
                return refuse(PyExc_TypeError, call, "dtype", "%.80R came; accepted are types of elements, as 'uint8'",
                              object);
            call->dtype = (int16_t)element;
            return 0;
        case KIND_KERNEL:
            if (read_kernel(call, p->name, object, &element, &call->kernel_height, &call->kernel_width, &call->kernel))
                return -1;
            call->kernel_element = (int16_t)element;
            return 0;
        case KIND_LISTS: return strcmp(p->name, "table") ? 0 : elements_of_tables(call, object);
        default: return 0;
    }
}

static int take_arguments(Call* call) {
    const Operation* operation = call->operation;
    for (int i = 0; i < operation->count; ++i) {
        const Parameter* p = &operation->parameters[i];
        if (!(call->given >> i & 1)) {
            if (p->required && !(i && p[-1].twin == i) && !p->twin)
                return refuse(PyExc_TypeError, call, p->name, "is missing");
            if (p->twin && !(call->given >> p->twin & 1)) return refuse(PyExc_TypeError, call, p->name, "is missing");
            continue;
        }
        if (p->twin && is_value(call->arguments[i])) {
            call->arguments[p->twin] = call->arguments[i];
            call->given ^= 1u << i | 1u << p->twin;
            continue;
        }
        if (take_argument(call, i)) return -1;
    }
    return 0;
}

/* --- the form -------------------------------------------------------------------------------------------------------
 */

static int packed_rows(const Image* image) {
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
static int choose(Call* call) {
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

/* --- destination and overlaps ---------------------------------------------------------------------------------------
 */

static Py_ssize_t pixel_bytes(const Image* image) {
    return element_bytes[image->element] * (image->layout & PLANAR ? 1 : image->layout & CHANNELS);
}

static int check_writable(const Call* call, const Image* image, const char* name) {
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
static int meets(const Call* call, int which, const char* name) {
    const Image *in = &call->images[which], *out = &call->images[OUT];
    Image around = *in;
    if (which == SRC) {
        around.data = in->data - (Py_ssize_t)call->top * in->step - (Py_ssize_t)call->left * pixel_bytes(in);
        around.height = in->height + call->top + call->bottom;
        around.width = in->width + call->left + call->right;
    }
    if (!overlapping(&around, out)) return 0;
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
    const int dimensions = channels > 1                                                                  ? 3
                           : source->held && source->dimensions == 3 && (source->layout & CHANNELS) == 1 ? 3
                                                                                                         : 2;
    call->made = make_array(form->target, height, width, channels, dimensions);
    if (!call->made || acquire(call, call->made, "out", &call->images[OUT], OUT)) return -1;
    if (call->plan && call->plan->kind == WARP_PLAN && call->plan->antialias) /* pixels that the border leaves out */
        memset(call->images[OUT].data, 0, (size_t)call->images[OUT].view.len);
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

static int lay_destination(Call* call) {
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

/* --- lists and blocks that are written ------------------------------------------------------------------------------
 */

/* An array of the call's own, or the one given, as memory for `count` int32 or elements. */
static int list_memory(Call* call, PyObject* given, int element, int count, PyObject** array, void** data) {
    Image image;
    image.held = 0;
    *array = given ? Py_NewRef(given) : make_array(element, 1, count, 1, 1);
    if (!*array) return -1;
    if (acquire(call, *array, "out", &image, OUT)) return -1;
    call->views[call->view_count++] = image.view;
    if (image.view.readonly) return check_writable(call, &image, "out");
    if (image.element != element || image.dimensions != 1 || image.width != count ||
        image.view.strides[0] != image.view.itemsize)
        return refuse(PyExc_ValueError, call, "out",
                      "an array of another type or length came; accepted is %s (%d,), contiguous",
                      element_names[element], count);
    *data = image.data;
    return 0;
}

/* which 0: bins of the levels' intervals; 1: levels. Of one channel the list itself is the argument. */
static int lists_out(Call* call, int which, int channels, Slot* slot) {
    void** pointers = (void**)call->values[call->value_count++].bytes;
    const int n = channels ? channels : 1;
    const int index = call->operation->has[HAS_OUT];
    PyObject* given = !which && call->given >> index & 1 ? call->arguments[index] : NULL;
    PyObject* made = PyTuple_New(n);
    if (!made) return -1;
    const int32_t* counts = call->plan ? call->plan->counts : call->counts;
    for (int i = 0; i < n; ++i) {
        PyObject *array = NULL, *one = given;
        if (given && channels) {
            one = item_of(call, "out", given, i, n);
            if (!one) goto failed;
        }
        const int failed = list_memory(call, one, I32, counts[i] - !which, &array, &pointers[i]);
        if (given && channels) Py_DECREF(one);
        if (array) PyTuple_SetItem(made, i, array);
        if (failed) goto failed;
    }
    slot->p = channels ? (void*)pointers : pointers[0];
    PyObject* result = channels ? made : Py_NewRef(PyTuple_GetItem(made, 0));
    if (!channels) Py_DECREF(made);
    if (!call->lists) {
        call->lists = result;
    } else {
        PyObject* both = PyTuple_Pack(2, call->lists, result);
        Py_DECREF(result);
        if (!both) return -1;
        Py_DECREF(call->lists);
        call->lists = both;
    }
    return 0;
failed:
    Py_DECREF(made);
    return -1;
}

/* The two images of smallest and largest elements of blocks. */
static int special_outputs(Call* call) {
    int32_t height, width;
    const int index = call->operation->has[HAS_OUT];
    PyObject* given = index >= 0 && call->given >> index & 1 ? call->arguments[index] : NULL;
    if (call->form->extent == EXTENT_BLOCKS) {
        if (measure(call, &height, &width)) return -1;
        call->lists = PyTuple_New(2);
        for (int i = 0; call->lists && i < 2; ++i) {
            PyObject* array =
                given ? item_of(call, "out", given, i, 2) : make_array(call->form->target, height, width, 1, 2);
            if (!array) return -1;
            PyTuple_SetItem(call->lists, i, array);
            Image* image = &call->images[i ? OUT2 : OUT];
            if (acquire(call, array, "out", image, OUT) || check_writable(call, image, "out")) return -1;
            if (image->element != call->form->target || image->layout != 1 || image->height != height ||
                image->width != width)
                return refuse(PyExc_ValueError, call, "out",
                              "an array of another type or shape came; accepted are two of %s (%d, %d)",
                              element_names[call->form->target], height, width);
            if (overlapping(image, &call->images[SRC]) || (i && overlapping(image, &call->images[OUT])))
                return refuse(PyExc_ValueError, call, "out",
                              "arrays that share memory came; accepted are arrays apart");
        }
        return call->lists ? 0 : -1;
    }
    return 0;
}

/* Descriptors: one row for each location. */
static int descriptors(Call* call) {
    const int i = parameter_index(call->operation, KIND_POINTS, NULL);
    int32_t count = 1;
    call->kernel = NULL;
    if (call->given >> i & 1 && read_points(call, "locations", call->arguments[i], &call->kernel, &count)) return -1;
    call->counts[0] = count;
    Image* out = &call->images[OUT];
    if (!out->held) {
        if (count < 1) return refuse(PyExc_ValueError, call, "locations", "none came; accepted is one or more");
        call->made = make_array(F32, count, call->plan->descriptor, 1, 2);
        if (!call->made || acquire(call, call->made, "out", out, OUT)) return -1;
        memset(out->data, 0, (size_t)count * (size_t)call->plan->descriptor * sizeof(float));
        return 0;
    }
    char text[96];
    if (check_writable(call, out, "out")) return -1;
    if (out->element != F32 || out->layout != 1 || out->height != count || out->width != call->plan->descriptor ||
        !packed_rows(out))
        return refuse(PyExc_ValueError, call, "out", "%s came; accepted is float32 (%d, %d), contiguous",
                      describe(out, text), count, call->plan->descriptor);
    return meets(call, SRC, "src") ? -1 : 0;
}

/* --- the program ----------------------------------------------------------------------------------------------------
 */

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
        const uint8_t *low = lists[i],
                      *high = low + (size_t)counts[i] * element_bytes[step->b] * (step->c == 9 ? 3 : 1);
        const Image* out = &call->images[OUT];
        Image list = {.data = lists[i],
                      .height = 1,
                      .width = (int32_t)(high - low),
                      .step = high - low,
                      .element = U8,
                      .layout = 1};
        if (out->held && overlapping(&list, out))
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
    for (int i = 0; i < 3; ++i)
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

static int execute(Call* call, const Step* step) {
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

/* --- results --------------------------------------------------------------------------------------------------------
 */

static PyObject* number_object(int element, const void* value) {
    switch (element) {
        case U8: return PyLong_FromLong(*(const uint8_t*)value);
        case I8: return PyLong_FromLong(*(const int8_t*)value);
        case U16: return PyLong_FromLong(*(const uint16_t*)value);
        case I16: return PyLong_FromLong(*(const int16_t*)value);
        case U32: return PyLong_FromUnsignedLong(*(const uint32_t*)value);
        case I32: return PyLong_FromLong(*(const int32_t*)value);
        case F32: return PyFloat_FromDouble((double)*(const float*)value);
        default: return PyFloat_FromDouble(*(const double*)value);
    }
}

/* A number, or a tuple of one for each channel. */
static PyObject* result_object(const Result* result, const uint8_t* bytes) {
    if (result->channels < 2) return number_object(result->element, bytes);
    PyObject* tuple = PyTuple_New(result->channels);
    for (int i = 0; tuple && i < result->channels; ++i) {
        PyObject* item = number_object(result->element, bytes + i * element_bytes[result->element]);
        if (!item)
            Py_CLEAR(tuple);
        else
            PyTuple_SetItem(tuple, i, item);
    }
    return tuple;
}

/* (row, column), or a tuple of one such pair for each channel; the column stands first in C. */
static PyObject* position_object(const Result* result, const int32_t* columns, const int32_t* rows) {
    if (result->channels < 2) return Py_BuildValue("(ii)", rows[0], columns[0]);
    PyObject* tuple = PyTuple_New(result->channels);
    for (int i = 0; tuple && i < result->channels; ++i) {
        PyObject* item = Py_BuildValue("(ii)", rows[i], columns[i]);
        if (!item)
            Py_CLEAR(tuple);
        else
            PyTuple_SetItem(tuple, i, item);
    }
    return tuple;
}

static PyObject* results_object(Call* call) {
    PyObject* found[8];
    int count = 0;
    const Result* result = all_results[call->form->results];
    if (call->lists && call->form->extent == EXTENT_BLOCKS)
        for (int i = 0; i < 2; ++i) found[count++] = Py_NewRef(PyTuple_GetItem(call->lists, i));
    for (int i = 0; result->kind != RESULT_END; ++result, ++i) {
        if (result->kind == RESULT_ROW) continue;
        found[count++] = result->kind == RESULT_COLUMN ? position_object(result, (int32_t*)call->results[i].bytes,
                                                                         (int32_t*)call->results[i + 1].bytes)
                                                       : result_object(result, call->results[i].bytes);
    }
    PyObject* tuple = NULL;
    int failed = 0;
    for (int i = 0; i < count; ++i) failed |= !found[i];
    if (count == 1 && !failed) return found[0];
    if (!failed && (tuple = PyTuple_New(count)))
        for (int i = 0; i < count; ++i) PyTuple_SetItem(tuple, i, found[i]);
    else
        for (int i = 0; i < count; ++i) Py_XDECREF(found[i]);
    return tuple;
}

static PyObject* result_of(Call* call) {
    if (all_results[call->form->results]->kind != RESULT_END) return results_object(call);
    if (call->lists) return Py_NewRef(call->lists);
    if (call->made) return Py_NewRef(call->made);
    const int out = call->operation->has[HAS_OUT];
    return Py_NewRef(call->arguments[out]);
}

/* --- the call -------------------------------------------------------------------------------------------------------
 */

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
        Image list = {.data = call->kernel,
                      .height = 1,
                      .width = call->kernel_height * call->kernel_width,
                      .element = (uint8_t)call->kernel_element,
                      .layout = 1,
                      .step = 1};
        if (overlapping(&list, &call->images[OUT]))
            return refuse(PyExc_ValueError, call, "out",
                          "an array that shares memory with the kernel came; pass a copy");
    }
    return 0;
}

PyObject* member_for(const Operation* operation, PyObject* const* arguments, Py_ssize_t count, PyObject* names) {
    Call call;
    PyObject* result = NULL;
    start_call(&call, operation);
    if (!bind(&call, arguments, count, names) && !prepare(&call))
        result = PyUnicode_FromString(call.in_place ? call.form->in_place_name : call.form->name);
    free_call(&call);
    return result;
}

PyObject* run(const Operation* operation, PyObject* const* arguments, Py_ssize_t count, PyObject* names) {
    Call call;
    PyObject* result = NULL;
    start_call(&call, operation);
    if (bind(&call, arguments, count, names) || prepare(&call)) goto end;
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
    if (!status || !status_result(&call, form->name, status)) result = result_of(&call);
end:
    free_call(&call);
    return result;
}
