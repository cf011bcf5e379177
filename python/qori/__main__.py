"""python -m qori list | show OPERATION | run OPERATION IN OUT [NAME=VALUE ...]

list   the operations, one a line
show   an operation's arguments and the C members behind it
run    an operation on a picture file, into another (needs Pillow): python -m qori run mirror in.png out.png axis=vertical
"""
# pyright: reportPrivateUsage=false
import ast
import inspect
import sys

from . import _core

OPERATIONS: dict[str, list[str]] = {}
for _operation, _member, _twin in _core._members():
    OPERATIONS.setdefault(_operation, []).extend(name for name in (_member, _twin) if name)


def show(operation: str) -> None:
    function = getattr(_core, operation)
    print(f"{operation}{inspect.signature(function)}\n\n{inspect.getdoc(function)}\n")
    for name in sorted(OPERATIONS[operation]):
        print(f"  {name}")


def value_of(text: str) -> object:
    try:
        return ast.literal_eval(text)
    except (ValueError, SyntaxError):
        return text


def run(operation: str, source: str, target: str, settings: list[str]) -> int:
    try:
        import numpy
        from PIL import Image
    except ImportError as error:
        print(f"qori run reads and writes pictures with NumPy and Pillow: {error}", file=sys.stderr)
        return 1
    keywords = {name: value_of(text) for name, _, text in (setting.partition("=") for setting in settings)}
    picture = Image.open(source)
    if picture.mode not in ("L", "RGB", "RGBA"):
        picture = picture.convert("RGB")
    result = getattr(_core, operation)(numpy.ascontiguousarray(picture), **keywords)
    if isinstance(result, numpy.ndarray):
        Image.fromarray(result).save(target)
    else:
        print(result)
    return 0


def main(arguments: list[str]) -> int:
    command, *operands = arguments or [""]
    if command == "list" and not operands:
        print("\n".join(sorted(OPERATIONS)))
    elif command in ("show", "run") and operands and operands[0] not in OPERATIONS:
        print(f"There is no operation {operands[0]}; python -m qori list names them.", file=sys.stderr)
        return 1
    elif command == "show" and len(operands) == 1:
        show(operands[0])
    elif command == "run" and len(operands) >= 3:
        try:
            return run(operands[0], operands[1], operands[2], operands[3:])
        except (OSError, TypeError, ValueError) as error:
            print(f"qori: {error}", file=sys.stderr)
            return 1
    else:
        print(__doc__, file=sys.stderr)
        return 2
    return 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
