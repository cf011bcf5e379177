"""Examples on small arrays: run by the package, written out in C, and as one C program that the tests compile."""
import ast
import contextlib
import ctypes
import io
import os
import re
import tempfile
import warnings
from dataclasses import dataclass

import numpy as np
from PIL import Image

import c_text
import calls
import inputs
import recipes
from paths import LIBRARY


def model():
    return calls.Model(LIBRARY)


@contextlib.contextmanager
def scratch():
    """A folder with the pictures that the pages' examples read, as the working folder."""
    old = os.getcwd()
    with tempfile.TemporaryDirectory() as folder:
        os.chdir(folder)
        try:
            named = inputs.everything()
            Image.fromarray(named["large"]).save("photo.png", compress_level=1)
            for name in ("page", "speckled", "stars"):
                Image.fromarray(named[name]).save(name + ".png")
            os.mkdir("holiday")
            for i in range(3):
                Image.fromarray(named["large"][20 * i:, 30 * i:]).save(f"holiday/{i + 1}.png", compress_level=1)
            yield
        finally:
            os.chdir(old)


def printed(text, names):
    """What statements print; and the value of a last expression, as at a prompt."""
    output = io.StringIO()
    with contextlib.redirect_stdout(output), warnings.catch_warnings(record=True) as remarks:
        warnings.simplefilter("always")
        value = recipes.run(text, names)
        if value is not None:
            print(shown(value))
        for remark in remarks:
            print(f"qori.{remark.category.__name__}: {remark.message}")
    return output.getvalue()


def shown(value):
    with np.printoptions(precision=6, suppress=True, linewidth=96, threshold=80, edgeitems=4):
        if isinstance(value, tuple):
            return "(" + ", ".join(shown(v) for v in value) + ")"
        return repr(value)


def own_names(names):
    """The arrays that an example makes itself."""
    known = inputs.everything()
    return {k: v for k, v in names.items() if isinstance(v, np.ndarray) and k not in known}


@dataclass
class CExample:
    text: str                       # declarations, calls, release
    computed: dict                  # C name: bytes after the calls, of arrays and results that the calls write
    value: object                   # of the last expression


def in_c(recipe, model_):
    """An example in C; the model makes its calls as well."""
    names = {"np": np, "qori": model_, **inputs.everything()}
    model_.restart()
    begun, value = {}, None
    for node in ast.parse(recipe.example).body:
        body = "\n".join(model_.lines)
        for name, array in own_names(names).items():
            if not any(array is known for known in model_.names.values()):
                model_.names[name] = array
            if model_.names.get(name) is array and not re.search(rf"\b{name}\b", body):
                begun[name] = array.copy()                      # as it is when the first call sees it
        piece = ast.unparse(node)
        value = recipes.run(piece, names)
    return assemble(model_, begun, value)


def assemble(model_, begun, value):
    body, declared, computed = "\n".join(model_.lines), [], {}
    for name, thing in model_.names.items():
        if not re.search(rf"\b{name}\b", body):
            continue
        if isinstance(thing, np.ndarray):
            element = c_text.C_NAME[thing.dtype]
            inside = re.search(rf"^\w+ {name}\[", body, re.M)
            if id(thing) in model_.fresh:
                declared.append(f"{element} {name}[{' * '.join(map(str, thing.shape))}];")
            elif not inside:
                declared.append(f"{element} {name}[] = {c_text.initialiser(begun.get(name, thing), element)};")
            if id(thing) in model_.fresh or inside or not np.array_equal(begun.get(name, thing), thing):
                computed[name] = thing.tobytes()
        elif isinstance(thing, ctypes.Array):
            computed[name] = bytes(thing)
    ends = model_.freed + [f"free({name});" for name, thing in model_.names.items() if isinstance(thing, bytes)]
    return CExample("\n".join(declared + model_.lines + ends), computed, value)


def program(found):
    """One C program of all examples: a line for each, with the bytes of what it computed in the order of names."""
    parts = ["#include <math.h>", "#include <stdio.h>", "#include <stdlib.h>", '#include "qori.h"', "",
             "static void show(const void* bytes, size_t count) {",
             '    for (size_t i = 0; i < count; ++i) printf("%02x", ((const unsigned char*)bytes)[i]);',
             '    printf(" ");', "}", ""]
    for name, example in found.items():
        body = example.text.splitlines()
        frees = [line for line in body if re.match(r"(free|qori\w+Free\w*)\(", line)]
        lines = [line for line in body if line not in frees]
        shows = [f"show({'' if c_is_array(c, example) else '&'}{c}, sizeof {c});" for c in example.computed]
        parts += [f"static void example_{name}(void) {{", *("    " + line for line in lines + shows + frees), "}", ""]
    calls_ = [f'    printf("{name} "); example_{name}(); printf("\\n");' for name in found]
    parts += ["int main(void) {", *calls_, "    return 0;", "}", ""]
    return "\n".join(parts)


def c_is_array(name, example):
    return re.search(rf"\b{name}\[", example.text) is not None


def markdown(recipe, names, model_):
    if not recipe.example:
        return []
    own = dict(names)
    text = recipe.example.strip()
    output = printed(text, own)
    lines = ["```python", "import numpy as np", "import qori", "", text, "```", ""]
    if output:
        lines += ["```text", output.rstrip(), "```", ""]
    return lines + ["The same in C, statuses left out:", "", "```c", in_c(recipe, model_).text, "```", ""]
