/* The structures of the Python door: what the generated tables hold, and what one call works with. */
#ifndef QORI_PYTHON_CORE_H
#define QORI_PYTHON_CORE_H

#define Py_LIMITED_API 0x030B0000
#define PY_SSIZE_T_CLEAN
#include <Python.h>
#include <stdint.h>

#include "qori.h"

typedef void (*Function)(void);

typedef union Slot {
    void* p;
    int32_t i;
    int64_t l;
    float f;
    double d;
    QorComplex32f c;
} Slot;

typedef int (*Trampoline)(Function f, const Slot* arguments);

/* Element types; the generator counts them in this order. */
enum { U8, I8, U16, I16, U32, I32, I64, F32, F64, C16, C32, CF, ELEMENTS, NO_ELEMENT = 255 };

/* Images of a call. */
enum { SRC, SRC2, OUT, MASK, OUT2, IMAGES };

/* Layouts are a number of channels with these. */
enum { CHANNELS = 7, ALPHA = 8, CHANNEL = 16, PLANAR = 32 };

enum {
    KIND_IMAGE,
    KIND_OUT,
    KIND_VALUE,
    KIND_NUMBER,
    KIND_ENUM,
    KIND_FLAGS,
    KIND_SIZE,
    KIND_POINT,
    KIND_KERNEL,
    KIND_PLAN,
    KIND_LISTS,
    KIND_VECTOR,
    KIND_POINTS,
    KIND_COUNTS,
    KIND_KEEP_ALPHA,
    KIND_CHANNEL,
    KIND_DTYPE,
    KIND_CHANNELS,
    KIND_WIDTH
};

enum {
    STEP_END,
    STEP_DATA,
    STEP_STEP,
    STEP_PLANES,
    STEP_ROWS,
    STEP_REGION,
    STEP_SIZE_OF,
    STEP_KERNEL_SIZE,
    STEP_BUFFER,
    STEP_LEFT,
    STEP_TOP,
    STEP_HEIGHT,
    STEP_WIDTH,
    STEP_COUNT_POINTS,
    STEP_COUNTS,
    STEP_BITS,
    STEP_RESULT,
    STEP_LISTS_OUT,
    STEP_VALUE,
    STEP_NUMBER,
    STEP_ANCHOR,
    STEP_LISTS,
    STEP_VECTOR,
    STEP_POINTS,
    STEP_ENUM,
    STEP_FLAGS,
    STEP_SIZE,
    STEP_POINT,
    STEP_KERNEL,
    STEP_PLAN
};

enum {
    PLAN_NONE,
    PLAN_ANY,
    PLAN_NEAREST,
    PLAN_LINEAR,
    PLAN_CUBIC,
    PLAN_LANCZOS,
    PLAN_SUPER,
    PLAN_ANTIALIAS,
    PLAN_REAL,
    PLAN_COMPLEX
};

enum {
    QUERY_NONE,
    QUERY_WINDOW,
    QUERY_CORRELATION,
    QUERY_KERNEL_ROW,
    QUERY_PLAN,
    QUERY_PLAN_TILE_CHANNELS,
    QUERY_PLAN_TILE,
    QUERY_PLAN_KNOWN,
    QUERY_FILTER_BORDER,
    QUERY_ADAPTIVE
};

enum {
    REACH_NONE,
    REACH_WINDOW,
    REACH_KERNEL,
    REACH_STRUCTURE,
    REACH_FIXED,
    REACH_1,
    REACH_2,
    REACH_ROW,
    REACH_COLUMN,
    REACH_CENTRED,
    REACH_CENTRED_KERNEL,
    REACH_CENTRED_PLAN,
    REACH_PLAN
};

enum {
    EXTENT_SAME,
    EXTENT_FULL,
    EXTENT_VALID,
    EXTENT_ALGORITHM,
    EXTENT_PLAN,
    EXTENT_AXIS,
    EXTENT_FRAME,
    EXTENT_BLOCKS,
    EXTENT_BITS,
    EXTENT_ROW,
    EXTENT_2X2,
    EXTENT_4X4,
    EXTENT_8X8,
    EXTENT_LEVELS,
    EXTENT_WINDOWS
};

enum { RESULT_END, RESULT_PLAIN, RESULT_COLUMN, RESULT_ROW };

typedef struct Parameter {
    const char* name;
    uint8_t kind;
    int8_t image;
    uint8_t enumeration;
    uint8_t required;
    uint8_t twin;    /* the parameter of this name that takes numbers; 0: none */
    double standard; /* value where none is given */
} Parameter;

/* Where one C argument comes from: an image or a parameter a, an element type b, a number of channels c. */
typedef struct Step {
    uint8_t code, a, b, c;
} Step;

typedef struct Result {
    uint8_t element, channels, kind;
} Result;

/* A C member and its in-place twin; either may be missing. */
typedef struct Form {
    const char* name;
    Function function;
    uint16_t signature, program;
    const char* in_place_name;
    Function in_place;
    uint16_t in_place_signature, in_place_program;
    uint8_t in_place_image; /* the source that the twin overwrites */
    uint8_t source, target, source_layout, target_layout;
    uint32_t accepts, requires; /* parameters by bit */
    uint8_t plan, query;
    Function ask;
    uint8_t kernel;
    uint16_t results;
    uint8_t reach, extent, overlap, contiguous, contiguous_out, channels;
} Form;

typedef struct Span {
    uint16_t first, count;
} Span;

/* Forms by element type and channels of the first image, planar ones from 5 on. */
typedef struct Index {
    Span spans[ELEMENTS][10];
} Index;

/* Parameters that every call asks for; -1 where the operation has none. */
enum { HAS_OUT, HAS_PATTERN, HAS_BORDER, HAS_OFFSET, HAS_AXIS, HAS_PLAN, HAS };

typedef struct Operation {
    const char* name;
    const Parameter* parameters;
    const Form* forms;
    uint8_t count, positional;
    uint16_t form_count;
    const Index* index;
    int8_t has[HAS];
} Operation;

typedef struct Word {
    const char* text;
    int32_t value;
} Word;

typedef struct Enumeration {
    const char* name;
    const Word* words;
} Enumeration;

typedef struct Status {
    int32_t code;
    const char* name;
    const char* text;
} Status;

enum { MAX_PARAMETERS = 24, MAX_SLOTS = 20 };

/* An array as an image: height and width in pixels, step in bytes, channels last. */
typedef struct Image {
    Py_buffer view;
    uint8_t* data;
    Py_ssize_t step, plane;
    int32_t height, width;
    uint8_t element, layout, dimensions, held;
} Image;

struct Plan;

typedef struct Call {
    const Operation* operation;
    const Form* form;
    uint32_t given; /* parameters by bit; those that are None are not */
    uint32_t read;  /* those that pairs holds already */
    uint8_t keep_alpha, in_place;
    int16_t channel, dtype, channels; /* -1: none is asked for */
    int16_t kernel_element;           /* of the kernel or the tables; -1: unknown */
    int32_t kernel_height, kernel_width;
    void* kernel;
    int32_t height, width;            /* of what is computed */
    int32_t top, left, bottom, right; /* pixels that are read around it */
    const struct Plan* plan;
    int32_t size_height, size_width; /* the neighbourhood's, for queries */
    int64_t buffer_bytes;
    int block_count;
    int array_count;
    int32_t counts[4]; /* entries of lists */
    int32_t list_elements;
    PyObject* made;  /* the destination that the call allocates: a new reference */
    PyObject* lists; /* lists that the call allocates */
    PyObject* arguments[MAX_PARAMETERS];
    int32_t pairs[MAX_PARAMETERS][2];
    Image images[IMAGES];
    int value_count;
    Slot slots[MAX_SLOTS];
    int small_used;
    /* What most calls do without stands last, so that the rest lies together. */
    union {
        uint8_t bytes[64];
        double alignment;
    } values[8], results[6];
    void* blocks[12];                 /* memory of the call, freed at its end */
    Image arrays[12];                 /* of kernels and lists */
    _Alignas(64) uint8_t small[2048]; /* for what a small call needs, without malloc */
} Call;

/* --- module.c: what is imported once; one interpreter --- */
typedef struct Shared {
    PyObject* error;     /* qori.Error */
    PyObject* no_memory; /* an Error that is a MemoryError too */
    PyObject* warning;
    PyObject* name_dtype;
    PyTypeObject* ndarray; /* null until NumPy has been seen */
    PyObject* empty;
    PyObject* dtypes[ELEMENTS]; /* numpy.dtype of each element type */
    PyTypeObject* plan_types[16];
    PyTypeObject* image_type;
    PyObject* code;
} Shared;
extern Shared shared;
int find_numpy(int import_it);

/* --- errors.c --- */
extern const char* const element_names[ELEMENTS];
/* Sets an exception of "OPERATION: argument NAME: ..." and returns -1. */
int refuse(PyObject* kind, const Call* call, const char* argument, const char* format, ...);
/* Sets qori.Error, or warns; 0 where the call may go on. */
int status_result(const Call* call, const char* member, int status);
/* The C member that a call with a form calls. */
const char* member_of(const Call* call);
const char* describe(const Image* image, char text[96]);
PyObject* no_form(const Call* call);

/* --- images.c --- */
int acquire(const Call* call, PyObject* object, const char* name, Image* image, int which);
void release(Image* image);
PyObject* make_array(int element, int height, int width, int channels, int dimensions);
/* A new array (height, width) whose rows follow each other without gaps. */
PyObject* make_packed(int element, int height, int width, int dimensions);
int element_of_type(PyObject* dtype);
int overlapping(const Image* a, const Image* b);
/* Whether a block of elements lies among an image's bytes. */
int among(const void* block, Py_ssize_t bytes, const Image* image);
extern const uint8_t element_bytes[ELEMENTS];

/* --- arguments.c --- */
int read_integer(const Call* call, const char* name, PyObject* object, int64_t low, int64_t high, int64_t* value);
int read_number(const Call* call, const char* name, PyObject* object, int element, void* into);
PyObject* item_of(const Call* call, const char* name, PyObject* object, int index, int count);
int read_pair(const Call* call, const char* name, PyObject* object, int32_t* rows, int32_t* columns);
int read_word(const Call* call, const char* name, PyObject* object, const Enumeration* enumeration, int combine,
              int32_t* value);
int read_values(const Call* call, const char* name, PyObject* object, int element, int channels, void* into);
int read_lists(Call* call, const char* name, PyObject* object, int element, int channels, void** lists,
               int32_t* counts);
int read_kernel(Call* call, const char* name, PyObject* object, int* element, int32_t* height, int32_t* width,
                void** data);
Image* next_array(Call* call, const char* name);
int read_points(Call* call, const char* name, PyObject* object, void** data, int32_t* count);
void* allocate(Call* call, size_t bytes);

/* --- dispatch.c --- */
/* The member that a call would take, as its C name. */
PyObject* member_for(const Operation* operation, PyObject* const* arguments, Py_ssize_t count, PyObject* names);
PyObject* run(const Operation* operation, PyObject* const* arguments, Py_ssize_t count, PyObject* names);
void free_call(Call* call);
Call* start_call(Call* call, const Operation* operation);
extern PyObject* parameter_names[];

/* --- generated --- */
extern const Enumeration* const all_enumerations;
extern const Status* const all_statuses;
extern const Step* const* const all_programs;
extern const Result* const* const all_results;
extern const Trampoline* const all_trampolines;
extern const Parameter* const all_parameters;
extern const Operation* const all_operations;
const Enumeration* enumeration_named(const char* name);

#endif
