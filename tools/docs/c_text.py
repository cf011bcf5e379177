"""Elements, values and arrays in C."""
import ctypes as ct
import re

import numpy as np

ELEMENT = {"uint8_t": np.uint8, "int8_t": np.int8, "uint16_t": np.uint16, "int16_t": np.int16, "uint32_t": np.uint32,
           "int32_t": np.int32, "int64_t": np.int64, "float": np.float32, "double": np.float64,
           "QorComplex16s": [("re", "i2"), ("im", "i2")], "QorComplex32s": [("re", "i4"), ("im", "i4")],
           "QorComplex32f": np.complex64}
ELEMENT = {name: np.dtype(d) for name, d in ELEMENT.items()}
C_NAME = {d: name for name, d in ELEMENT.items()}
TYPE_CODE = {"uint8_t": "8u", "uint16_t": "16u", "int16_t": "16s", "float": "32f", "double": "64f", "int32_t": "32s",
             "QorComplex32f": "32fc"}
DATA_TYPE = {"uint8_t": "qor8u", "uint16_t": "qor16u", "int16_t": "qor16s", "float": "qor32f", "double": "qor64f"}
SCALAR = {"uint8_t": ct.c_uint8, "int8_t": ct.c_int8, "uint16_t": ct.c_uint16, "int16_t": ct.c_int16,
          "uint32_t": ct.c_uint32, "int32_t": ct.c_int32, "int64_t": ct.c_int64, "float": ct.c_float,
          "double": ct.c_double}
FLOATS = ("float", "double")


class Pair(ct.Structure):
    """QorImageSize and QorPoint2D."""
    _fields_ = [("x", ct.c_int32), ("y", ct.c_int32)]


def literal(value, element="float"):
    """A number in C; complex elements are braces."""
    if isinstance(value, (complex, np.complexfloating)):
        return f"{{{literal(value.real)}, {literal(value.imag)}}}"
    if isinstance(value, np.void):
        return f"{{{value['re']}, {value['im']}}}"
    if element not in FLOATS:
        return str(int(value))
    number = float(value)
    if not np.isfinite(number):
        return "NAN" if np.isnan(number) else "-INFINITY" if number < 0 else "INFINITY"
    if element == "double":
        text = repr(number)
    elif 1e-5 < abs(number) < 1e9 or not number:
        text = np.format_float_positional(np.float32(number), unique=True, trim="0")
    else:
        text = repr(float(np.float32(number)))
    return (text if re.search(r"[.e]", text) else text + ".0") + ("f" if element == "float" else "")


def initialiser(array, element):
    """Elements in braces, rows on lines of their own."""
    rows = np.ascontiguousarray(array).reshape(array.shape[0], -1) if array.ndim > 1 else array.reshape(1, -1)
    return "{" + ",\n    ".join(", ".join(literal(v, element) for v in row) for row in rows) + "}"


def listed(c_type, texts):
    """A compound literal of several values."""
    return f"({c_type}[]){{{', '.join(texts)}}}"


def size_text(shape):
    return f"(QorImageSize){{{shape[1]}, {shape[0]}}}"


def size(shape):
    """(C text, value) of the size of a shape (rows, columns)."""
    return size_text(shape), Pair(shape[1], shape[0])


def number(value):
    return str(value), value
