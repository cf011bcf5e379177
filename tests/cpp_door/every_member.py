"""Sources that call every member through the C++ header, over a library that remembers what it was called with.

    every_member.py FOLDER PARTS    recorded.cpp, the library; calls_0.cpp ... ; calls.cpp, which runs them
"""
import sys
from pathlib import Path

ROOT = Path(__file__).resolve().parents[2]
sys.path.insert(0, str(ROOT / "tools"))
import door_cpp  # noqa: E402
import door_cpp_text  # noqa: E402
import registry  # noqa: E402

LAYOUT_NAMES = {"C3C": "ChannelOfC3", "C4C": "ChannelOfC4"}
SIZE, PATTERN = (100, 60), (7, 5)
EXTENTS = {"full": (106, 64), "valid": (94, 56), "same": SIZE, "algorithm": (94, 56), "frame": (120, 80),
           "blocks": (7, 3), "bits": SIZE, "plan": (70, 50)}


# --- the library ----------------------------------------------------------------------------------------------------

def recorded(member):
    """A definition of the member that notes its arguments."""
    notes, after = [], []
    for a in member.arguments:
        if a.kind.startswith("planes_"):
            notes.append(f"words({a.c_name}, {a.length})")
        elif a.kind in ("value", "count", "matrix") and a.length:
            notes.append(f"words({a.c_name}, {a.length})")
        elif a.name == "border_value" and a.stars:
            notes.append(f"words({a.c_name}, {registry.processed(member.target_layout)})")
        else:
            notes.append(f"word({a.c_name})")
        if a.kind == "bytes":
            after.append(f"*{a.c_name} = kBytes;")
    returned = {"QorResult": "return QOR_OK;", "void": ""}.get(member.result)
    if returned is None:
        after += ["*pStepBytes = 64;"] if "pStepBytes" in member.prototype else []
        returned = f"return reinterpret_cast<{member.result}>(memory);"
    noted = "" if member.name == "qoriFree" else f'note("{member.name}"{"".join(", " + n for n in notes)});'
    unused = "(void)ptr;" if member.name == "qoriFree" else ""
    return f"{member.result} QORI_CALL {member.name}({member.prototype}) {{ {noted}{unused} {' '.join(after)} {returned} }}"


# --- the calls ------------------------------------------------------------------------------------------------------

def tag(layout):
    return LAYOUT_NAMES.get(layout, layout)


def size_of(a, form):
    """The size of an image in a call, such that all fit."""
    if form.extent in door_cpp.BLOCKS:
        return 8, 8
    if a.name == "pattern":
        return PATTERN
    if a.kind == "out" and form.extent in EXTENTS:
        return EXTENTS[form.extent]
    return (13, 60) if form.extent == "bits" else SIZE


def elements(place, count):
    return [10 + place + i for i in range(count)]


def weighed(values, element):
    complex_one = element.startswith("QorComplex")
    return sum((i + 1) * (v * 1000 + v + 1 if complex_one else v) for i, v in enumerate(values))


class Call:
    """One call of a member by a signature: its text, and what each place of C must then hold."""

    def __init__(self, member, form, signature, choice):
        self.member, self.form, self.places, self.before = member, form, {}, []
        self.channels = registry.processed(door_cpp.ends_of(member, form.arguments)[1][1]) if form.keyed == "images" else 1
        self.images = [a for a in choice.arguments.values() if a.image]
        texts = [self.argument(choice.arguments[a.name]) for a in signature.arguments]
        for a in choice.left_out:
            self.left_out(a)
        for place, role in form.sizes.items():
            self.places[place] = self.size(role)
        types = ""
        if form.keyed == "types":
            types = f"<{member.source}{', ' + tag(member.source_layout) if member.layout else ''}>"
        self.text = f"{signature.operation}{types}({', '.join(texts)})"

    def c(self, a, slot=0):
        return self.member.arguments[a.places[slot]]

    def size(self, role):
        images = {a.name: a for a in self.images}
        if role == "region":
            chosen = [a for a in self.images if a.kind == "out"] if self.form.extent == "bits" else self.images
        else:
            chosen = [images[role]]
        width, height = size_of(chosen[0], self.form)
        return width * 1000 + height

    def image(self, a):
        place, element = a.places[0], self.c(a).element
        source, target = door_cpp.ends_of(self.member, self.form.arguments)
        layout = {"in": source[1], "mask": "C1"}.get(a.kind, target[1])
        const = "const " if a.kind in ("in", "mask") else ""
        width, height = size_of(a, self.form)
        planes = {"P3": 3, "P4": 4}.get(layout, 0)
        self.places[place] = (sum((i + 1) * ((place + 40 * i + 1) << 16) for i in range(planes)) if planes
                              else (place + 1) << 16)
        self.places[a.places[1]] = 1000 + place
        view = f"image<{const}{element}, {tag(layout)}>({place}, {width}, {height})"
        return f"in_place({view})" if a.kind == "inout" else view

    def per_channel(self, place, c):
        """A constant of one element per channel, as an argument of C++, and its word."""
        length = c.length or (self.channels if c.stars else 0)
        values = elements(place, length or 1)
        shown = [f"element<{c.element}>({v})" for v in values]
        return ("{" + ", ".join(shown) + "}" if length > 1 else shown[0]), weighed(values, c.element)

    def argument(self, a):
        place, c = a.places[0], self.c(a)
        if a.image:
            return self.image(a)
        if a.kind == "value":
            text, self.places[place] = self.per_channel(place, c)
            return text
        if a.kind == "border":
            self.places[place] = 0x31
            text, self.places[a.places[1]] = self.per_channel(a.places[1], self.c(a, 1))
            return f"{{0x31, {text}}}"
        if a.kind == "kernel":
            self.places.update({place: (place + 1) << 16, a.places[1]: 9007, a.places[2]: 2003})
            return f"Kernel<{c.element}>(at<const {c.element}>({place}), {{9, 7}}, {{2, 3}})"
        if a.kind == "window":
            self.places.update({place: 9007, a.places[1]: 2003})
            return "{9, 7, 2, 3}"
        if a.kind == "result":
            name, count = f"result{place}", c.length or 1
            self.before.append(f"{c.element} {name}[{count}] = {{}};")
            self.places[place] = f"word({name})"
            return name if count > 1 else f"{name}[0]"
        if a.kind == "buffer":
            self.before.append("Buffer buffer;")
            self.places[place] = "word(memory)"
            return "buffer"
        return self.plain(a, place, c)

    def plain(self, a, place, c):
        if a.kind == "enum":
            self.places[place] = 1
            return f"{a.detail}(1)"
        if c.kind == "bytes":
            self.before.append(f"int32_t bytes{place} = 0;")
            self.places[place] = f"word(&bytes{place})"
            return f"&bytes{place}"
        if c.name == "step" and c.stars:
            self.before.append(f"int32_t step{place} = 0;")
            self.places[place] = f"word(&step{place})"
            return f"&step{place}"
        if c.kind == "matrix":
            self.before.append(f"const double matrix{place}[6] = {{1, 2, 3, 4, 5, 6}};")
            self.places[place] = sum(i * i for i in range(1, 7))
            return f"matrix{place}"
        if c.name == "border_value" and c.stars:
            self.before.append(f"const {c.element} value{place}[4] = {{}};")
            self.places[place] = 0
            return f"value{place}"
        if c.stars:
            self.places[place] = (place + 1) << 16
            pointed = door_cpp_text.passed(c)
            return f"at<{pointed[:-1].rstrip()}>({place})"
        if c.kind == "flags" and c.detail == "QorCorrelation":
            self.places[place] = 0x10101
            return "corrNorm | corrTransform | corrValid"
        if c.name == "bit_offset":
            self.places[place] = 4
            return "4"
        return self.scalar(place, c)

    def scalar(self, place, c):
        structures = {"QorImageSize": ("{15, 25}", 15025), "QorPoint2D": ("{3, 4}", 3004),
                      "QorImageRect": ("{1, 2, 3, 4}", 1002 + 21 + 44)}
        if c.element in structures:
            text, self.places[place] = structures[c.element]
            return text
        self.places[place] = 20 + place
        return f"{c.element}({20 + place})"

    def left_out(self, a):
        if a.kind == "buffer":
            self.places[a.places[0]] = "word(memory)"
        elif a.kind == "border":
            self.places[a.places[0]] = "word(int32_t(borderReplicate))"
            self.places[a.places[1]] = 0
        else:
            self.places[a.places[0]] = f"word(int32_t({a.default}))"

    def statement(self):
        words = ", ".join(str(self.places[p]) for p in sorted(self.places))
        shown = self.text.replace('"', "'")
        run = f"const QorResult status = {self.text};"
        if self.member.result != "QorResult":
            run = f"static_cast<void>({self.text}); const QorResult status = QOR_OK;"
        lines = [*self.before, run, f'expect("{shown}", status, "{self.member.name}", {{{words}}});']
        return "{ " + "\n  ".join(lines) + " }"


def calls(families):
    members = [m for f in families for g in f.groups for m in g.members]
    door_cpp_text.header(families)                          # gives operations their queries
    for operation, forms in door_cpp.forms_of(members).items():
        signatures = door_cpp.signatures_of(operation, forms)
        for form in forms:
            # Every member by its longest signature, the first of a form by all.
            own = [(s, c) for s in signatures for c in s.choices if c.form is form]
            own.sort(key=lambda pair: -len(pair[0].arguments))
            for number, (key, member) in enumerate(form.members.items()):
                for signature, choice in own if number == 0 else own[:1]:
                    tried = signature.choices[:signature.choices.index(choice)]
                    if any(key in earlier.form.members for earlier in tried) or member.name == "qoriFree":
                        continue
                    yield Call(member, form, signature, choice)


HEAD = '#include "recorder.h"\nusing namespace qori;\nusing namespace recorder;\n'


def main(folder, parts):
    families = registry.load(ROOT / "api")
    members = registry.all_members(families)
    folder.mkdir(parents=True, exist_ok=True)
    library = "\n".join(recorded(m) for m in members)
    files = {"recorded.cpp": f'{HEAD}extern "C" {{\n{library}\n}}\n'}
    found = list(calls(families))
    missing = {m.name for m in members} - {c.member.name for c in found} - {"qoriFree"}
    if missing:
        sys.exit(f"no call reaches {sorted(missing)[:5]}")
    for part in range(parts):
        own = found[part * len(found) // parts:(part + 1) * len(found) // parts]
        functions = [own[i:i + 50] for i in range(0, len(own), 50)]
        text = "".join(f"static void calls{i}() {{\n" + "\n".join(c.statement() for c in f) + "\n}\n"
                       for i, f in enumerate(functions))
        files[f"calls_{part}.cpp"] = (f"{HEAD}void part{part}();\n{text}void part{part}() {{\n" +
                                      "".join(f"    calls{i}();\n" for i in range(len(functions))) + "}\n")
    files["calls.cpp"] = (HEAD + "".join(f"void part{i}();\n" for i in range(parts)) + "int main() {\n" +
                          "".join(f"    part{i}();\n" for i in range(parts)) +
                          f'    release(memory);\n    std::printf("{len(found)} calls of {len(members)} members, %d wrong\\n", '
                          "failures);\n    return failures != 0;\n}\n")
    for name, text in files.items():
        path = folder / name
        if not path.exists() or path.read_text() != text:
            path.write_text(text)


if __name__ == "__main__":
    main(Path(sys.argv[1]), int(sys.argv[2]))
