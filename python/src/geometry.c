#include "geometry.h"

#include <string.h>

#include "plans.h"

int parameter_index(const Operation* operation, int kind, const char* name) {
    for (int i = 0; i < operation->count; ++i)
        if (operation->parameters[i].kind == kind && (!name || !strcmp(operation->parameters[i].name, name))) return i;
    return -1;
}

int pair_of(Call* call, int i, int32_t* first, int32_t* second) {
    const Parameter* p = &call->operation->parameters[i];
    if (!(call->read >> i & 1)) {
        if (call->given >> i & 1) {
            if (read_pair(call, p->name, call->arguments[i], &call->pairs[i][0], &call->pairs[i][1])) return -1;
        } else {
            call->pairs[i][0] = call->pairs[i][1] = (int32_t)p->standard;
        }
        call->read |= 1u << i;
    }
    *first = call->pairs[i][0];
    *second = call->pairs[i][1];
    return 0;
}

int word_of(Call* call, int i, int32_t* value) {
    const Parameter* p = &call->operation->parameters[i];
    if (!(call->read >> i & 1)) {
        call->pairs[i][0] = (int32_t)p->standard;
        if (call->given >> i & 1 && read_word(call, p->name, call->arguments[i], &all_enumerations[p->enumeration],
                                              p->kind == KIND_FLAGS, &call->pairs[i][0]))
            return -1;
        call->read |= 1u << i;
    }
    *value = call->pairs[i][0];
    return 0;
}

int integer_of(Call* call, int i, int element, int32_t* value) {
    const Parameter* p = &call->operation->parameters[i];
    if (!(call->read >> i & 1)) {
        int32_t number = 0;
        if (!(call->given >> i & 1))
            number = (int32_t)p->standard;
        else if (read_number(call, p->name, call->arguments[i], element, &number))
            return -1;
        else if (element == I8)
            number = (int8_t)number;
        else if (element == I16)
            number = (int16_t)number;
        call->pairs[i][0] = number;
        call->read |= 1u << i;
    }
    *value = call->pairs[i][0];
    return 0;
}

/* Rows and columns of a neighbourhood around its anchor; one that the library will refuse reaches nowhere. */
static void around(Call* call, int32_t height, int32_t width, int32_t y, int32_t x) {
    if (height < 1 || width < 1 || y < 0 || x < 0 || y >= height || x >= width) return;
    call->top = y;
    call->left = x;
    call->bottom = height - 1 - y;
    call->right = width - 1 - x;
}

static int anchored(Call* call, int32_t height, int32_t width, int turned) {
    const int i = parameter_index(call->operation, KIND_POINT, "anchor");
    int32_t y = (height - 1) / 2, x = (width - 1) / 2;
    if (call->given >> i & 1) {
        if (pair_of(call, i, &y, &x)) return -1;
    } else {
        call->pairs[i][0] = y;
        call->pairs[i][1] = x;
        call->read |= 1u << i;
    }
    if (turned && height > 0 && width > 0 && (y < 0 || x < 0 || y >= height || x >= width))
        return refuse(PyExc_ValueError, call, "anchor",
                      "(%d, %d) came; accepted are positions in the kernel of (%d, %d)", y, x, height, width);
    if (turned)
        around(call, height, width, height - 1 - y, width - 1 - x);
    else
        around(call, height, width, y, x);
    return 0;
}

static int along(Call* call, int vertical) {
    const int size_index = parameter_index(call->operation, KIND_NUMBER, "size");
    const int anchor_index = parameter_index(call->operation, KIND_NUMBER, "anchor");
    int32_t size, anchor;
    if (integer_of(call, size_index, I32, &size)) return -1;
    if (call->given >> anchor_index & 1) {
        if (integer_of(call, anchor_index, I32, &anchor)) return -1;
    } else {
        anchor = (size - 1) / 2;
        call->pairs[anchor_index][0] = anchor;
        call->read |= 1u << anchor_index;
    }
    around(call, vertical ? size : 1, vertical ? 1 : size, vertical ? anchor : 0, vertical ? 0 : anchor);
    return 0;
}

/* Keeps of the margins those of the sides that the border reads from memory. */
static int sides_in_memory(Call* call) {
    const int i = call->operation->has[HAS_BORDER];
    if (i < 0) return 0;
    int32_t border;
    if (word_of(call, i, &border)) return -1;
    if ((border & 15) == 6) return 0;
    if (!(border & 0x10)) call->top = 0;
    if (!(border & 0x20)) call->bottom = 0;
    if (!(border & 0x40)) call->left = 0;
    if (!(border & 0x80)) call->right = 0;
    return 0;
}

static int reach(Call* call) {
    const Operation* operation = call->operation;
    const Plan* plan = call->plan;
    int32_t a, b;
    switch (call->form->reach) {
        case REACH_NONE: return 0;
        case REACH_WINDOW:
        case REACH_CENTRED:
            if (pair_of(call, parameter_index(operation, KIND_SIZE, "size"), &a, &b)) return -1;
            call->size_height = a;
            call->size_width = b;
            if (call->form->reach == REACH_WINDOW) return anchored(call, a, b, 0);
            around(call, a, b, (a - 1) / 2, (b - 1) / 2);
            break;
        case REACH_KERNEL: return anchored(call, call->kernel_height, call->kernel_width, 1);
        case REACH_STRUCTURE: return anchored(call, call->kernel_height, call->kernel_width, 0);
        case REACH_FIXED:
            if (word_of(call, parameter_index(operation, KIND_ENUM, "mask"), &a)) return -1;
            if (a > 10 && a < 56) around(call, a % 10, a / 10, a % 10 / 2, a / 10 / 2);
            return 0;
        case REACH_1:
        case REACH_2: call->top = call->left = call->bottom = call->right = call->form->reach == REACH_1 ? 1 : 2; break;
        case REACH_ROW:
        case REACH_COLUMN: return along(call, call->form->reach == REACH_COLUMN);
        case REACH_CENTRED_KERNEL:
            around(call, plan->kernel_height, plan->kernel_width, plan->kernel_height / 2, plan->kernel_width / 2);
            break;
        case REACH_CENTRED_PLAN:
            around(call, plan->kernel_height, plan->kernel_width, plan->kernel_height / 2, plan->kernel_width / 2);
            break;
        case REACH_PLAN:
            call->top = plan->top;
            call->left = plan->left;
            call->bottom = plan->bottom;
            call->right = plan->right;
            if (plan->kind == WARP_PLAN) return 0; /* the plan's border has left out what is not in memory */
            break;
        default: break;
    }
    return sides_in_memory(call);
}

static int plan_extent(Call* call, int32_t* height, int32_t* width) {
    const Plan* plan = call->plan;
    if (call->height != plan->source_height || call->width != plan->source_width)
        return refuse(PyExc_ValueError, call, call->operation->parameters[0].name,
                      "(%d, %d) pixels came; the plan is for (%d, %d)%s: make a plan for this size", call->height,
                      call->width, plan->source_height, plan->source_width,
                      call->top | call->left | call->bottom | call->right ? " inside what it reads around them" : "");
    *height = plan->height;
    *width = plan->width;
    const int i = call->operation->has[HAS_OFFSET];
    if (i >= 0 && call->given >> i & 1) {
        int32_t y, x;
        if (!call->images[OUT].held)
            return refuse(PyExc_ValueError, call, "offset",
                          "a part of the plan's destination needs out=, which has its size");
        if (pair_of(call, i, &y, &x)) return -1;
        *height = call->images[OUT].height;
        *width = call->images[OUT].width;
    }
    return 0;
}

static int frame_extent(Call* call, int32_t* height, int32_t* width) {
    const Operation* operation = call->operation;
    const int before = parameter_index(operation, KIND_SIZE, "before"),
              after = parameter_index(operation, KIND_SIZE, "after");
    const Image *src = &call->images[SRC], *out = &call->images[OUT];
    int32_t top, left, bottom, right;
    if (pair_of(call, before, &top, &left)) return -1;
    if (call->given >> after & 1) {
        if (pair_of(call, after, &bottom, &right)) return -1;
    } else if (out->held) {
        const int64_t below = (int64_t)out->height - src->height - top,
                      beside = (int64_t)out->width - src->width - left;
        bottom = below < 0 ? -1 : below > INT32_MAX ? INT32_MAX : (int32_t)below;
        right = beside < 0 ? -1 : beside > INT32_MAX ? INT32_MAX : (int32_t)beside;
    } else {
        bottom = top;
        right = left;
    }
    const int64_t h = (int64_t)src->height + top + bottom, w = (int64_t)src->width + left + right;
    if (top < 0 || left < 0 || bottom < 0 || right < 0 || h > INT32_MAX || w > INT32_MAX)
        return refuse(
            PyExc_ValueError, call, "before",
            "a frame of (%d, %d) before and (%d, %d) after came; accepted are numbers from 0 on that fit into out", top,
            left, bottom, right);
    *height = (int32_t)h;
    *width = (int32_t)w;
    return 0;
}

static int bits_extent(Call* call, int32_t* height, int32_t* width) {
    const int offset_index = parameter_index(call->operation, KIND_NUMBER, "bit_offset");
    const int width_index = parameter_index(call->operation, KIND_WIDTH, NULL);
    const Image* src = &call->images[SRC];
    int32_t offset;
    if (integer_of(call, offset_index, I32, &offset)) return -1;
    *height = src->height;
    if (call->given >> width_index & 1) {
        int64_t wanted;
        if (read_integer(call, "width", call->arguments[width_index], 0, INT32_MAX, &wanted)) return -1;
        *width = (int32_t)wanted;
    } else {
        const int64_t all = (int64_t)src->width * 8 - offset;
        *width = call->images[OUT].held ? call->images[OUT].width
                 : all < 0              ? 0
                 : all > INT32_MAX      ? INT32_MAX
                                        : (int32_t)all;
    }
    if (offset < 0 || (int64_t)offset + *width > (int64_t)src->width * 8)
        return refuse(PyExc_ValueError, call, "bit_offset", "bits %d to %lld of rows of %lld came", offset,
                      (long long)offset + *width, (long long)src->width * 8);
    call->width = *width;
    return 0;
}

static int correlation_extent(Call* call, int32_t* height, int32_t* width) {
    const Image *src = &call->images[SRC], *pattern = &call->images[SRC2];
    int extent = call->form->extent;
    if (extent == EXTENT_ALGORITHM) {
        int32_t algorithm;
        if (word_of(call, parameter_index(call->operation, KIND_FLAGS, "algorithm"), &algorithm)) return -1;
        algorithm &= 0xF0000;
        extent = algorithm == 0x10000 ? EXTENT_VALID : algorithm ? EXTENT_SAME : EXTENT_FULL;
    }
    const int32_t sign = extent == EXTENT_FULL ? 1 : extent == EXTENT_VALID ? -1 : 0;
    const int64_t h = (int64_t)src->height + sign * (int64_t)(pattern->height - 1);
    const int64_t w = (int64_t)src->width + sign * (int64_t)(pattern->width - 1);
    if (pattern->height > src->height || pattern->width > src->width || h > INT32_MAX || w > INT32_MAX)
        return refuse(PyExc_ValueError, call, "pattern",
                      "(%d, %d) pixels came; accepted are sides up to those of src, (%d, %d)", pattern->height,
                      pattern->width, src->height, src->width);
    *height = (int32_t)h;
    *width = (int32_t)w;
    return 0;
}

static int blocks_extent(Call* call, int32_t* height, int32_t* width) {
    int32_t h, w;
    if (pair_of(call, parameter_index(call->operation, KIND_SIZE, "block"), &h, &w)) return -1;
    if (h < 1 || w < 1)
        return refuse(PyExc_ValueError, call, "block", "(%d, %d) came; accepted are sides from 1 on", h, w);
    *height = call->height / h + (call->height % h > 0);
    *width = call->width / w + (call->width % w > 0);
    return 0;
}

static int axis_extent(Call* call, int32_t* height, int32_t* width) {
    int32_t axis;
    if (word_of(call, call->operation->has[HAS_AXIS], &axis)) return -1;
    const int diagonal = axis == 3 || axis == 4;
    *height = diagonal ? call->width : call->height;
    *width = diagonal ? call->height : call->width;
    return 0;
}

/* A flat block lies in rows of its side. */
static void fold(Image* image, int side) {
    if (image->dimensions != 1 || image->width != side * side) return;
    image->height = image->width = side;
    image->step = (Py_ssize_t)side * element_bytes[image->element];
}

static int block_extent(Call* call, int side, int32_t* height, int32_t* width) {
    Image *src = &call->images[SRC], *out = &call->images[OUT];
    fold(src, 8);
    if (out->held) fold(out, side);
    if (src->height != 8 || src->width != 8)
        return refuse(PyExc_ValueError, call, "src", "(%d, %d) elements came; accepted is a block of (8, 8)",
                      src->height, src->width);
    call->height = call->width = 8;
    *height = *width = side;
    return 0;
}

int measure(Call* call, int32_t* height, int32_t* width) {
    const Image* source = call->images[SRC].held ? &call->images[SRC] : &call->images[OUT];
    if (reach(call)) return -1;
    const int64_t h = (int64_t)source->height - call->top - call->bottom,
                  w = (int64_t)source->width - call->left - call->right;
    if ((h < 1 || w < 1) && (call->top | call->left | call->bottom | call->right))
        return refuse(PyExc_ValueError, call, call->operation->parameters[0].name,
                      "(%d, %d) pixels came, of which (%d, %d) before and (%d, %d) after are only read; accepted are "
                      "larger images",
                      source->height, source->width, call->top, call->left, call->bottom, call->right);
    *height = call->height = (int32_t)h;
    *width = call->width = (int32_t)w;
    switch (call->form->extent) {
        case EXTENT_FULL:
        case EXTENT_VALID:
        case EXTENT_ALGORITHM: return correlation_extent(call, height, width);
        case EXTENT_PLAN: return plan_extent(call, height, width);
        case EXTENT_AXIS: return axis_extent(call, height, width);
        case EXTENT_FRAME: return frame_extent(call, height, width);
        case EXTENT_BLOCKS: return blocks_extent(call, height, width);
        case EXTENT_BITS: return bits_extent(call, height, width);
        case EXTENT_ROW: *height = 1; return 0;
        case EXTENT_2X2: return block_extent(call, 2, height, width);
        case EXTENT_4X4: return block_extent(call, 4, height, width);
        case EXTENT_8X8: return block_extent(call, 8, height, width);
        default:
            /* Correlations of one size with their source come without an extent. */
            return call->images[SRC2].held && call->operation->has[HAS_PATTERN] >= 0
                       ? correlation_extent(call, height, width)
                       : 0;
    }
}
