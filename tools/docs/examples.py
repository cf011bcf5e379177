"""Examples on small arrays: run by the package, written out in C, and as one C program that the tests compile."""
import contextlib
import io
import os
import tempfile

import numpy as np
from PIL import Image

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
            Image.fromarray(named["large"]).save("photo.png")
            for name in ("page", "speckled", "stars"):
                Image.fromarray(named[name]).save(name + ".png")
            os.mkdir("holiday")
            for i in range(3):
                Image.fromarray(named["large"][20 * i:, 30 * i:]).save(f"holiday/{i + 1}.png")
            yield
        finally:
            os.chdir(old)


def printed(text, names):
    """What statements print; and the value of a last expression, as at a prompt."""
    output = io.StringIO()
    with contextlib.redirect_stdout(output):
        value = recipes.run(text, names)
        if value is not None:
            print(shown(value))
    return output.getvalue()


def shown(value):
    with np.printoptions(precision=6, suppress=True, linewidth=96, threshold=80, edgeitems=4):
        if isinstance(value, tuple):
            return "(" + ", ".join(shown(v) for v in value) + ")"
        return repr(value)


def own_names(text, names):
    """The names that an example makes itself."""
    return {k: v for k, v in names.items() if isinstance(v, np.ndarray) and k not in inputs.everything()}


def c_text(recipe, model_):
    """(declarations and calls, names of what is computed, value) of an example in C; the model runs it too."""
    import ast
    tree = ast.parse(recipe.example)
    names = {"np": np, "qori": model_, **inputs.everything()}
    model_.restart()
    value = None
    for node in tree.body:
        model_.names.update({k: v for k, v in own_names("", names).items()
                             if not any(v is known for known in model_.names.values())})
        piece = ast.Module([node], [])
        if isinstance(node, ast.Expr):
            value = eval(compile(ast.Expression(node.value), "<example>", "eval"), names)
        else:
            exec(compile(piece, "<example>", "exec"), names)
    return assemble(model_), value


def assemble(model_):
    declared, computed, text = [], [], "\n".join(model_.lines)
    for name, array in model_.names.items():
        if not isinstance(array, np.ndarray) or not used(name, text) or f" {name}[" in text and "int32_t " + name + "[" in text:
            continue
        element = calls.C_NAME[array.dtype]
        if id(array) in model_.fresh or not array.flags.writeable and False:
            declared.append(f"{element} {name}[{' * '.join(map(str, array.shape))}];")
            computed.append(name)
        elif f"{element} {name}[" not in text:
            declared.append(f"{element} {name}[] = {calls.block(array, element)};")
    ends = model_.freed + [f"free({name});" for name, v in model_.names.items() if isinstance(v, bytes) and v == b"allocated"]
    return "\n".join(declared + model_.lines + ends), computed


def used(name, text):
    import re
    return re.search(rf"\b{name}\b", text) is not None


def markdown(recipe, names, model_):
    if not recipe.example:
        return []
    own = dict(names)
    text = recipe.example.strip()
    output = printed(text, own)
    lines = ["```python", text, "```", ""]
    if output:
        lines += ["```text", output.rstrip(), "```", ""]
    (c, _), _ = c_text(recipe, model_)
    return lines + ["The same in C:", "", "```c", c, "```", ""]
