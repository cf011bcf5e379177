"""The text of include/qori.hpp: hand-written parts in api/cpp/, and between them what door_cpp.py derives."""
import re
import textwrap
from pathlib import Path

import door_cpp
import roles
from door_cpp import TYPE_NAMES, LAYOUT_NAMES

API = Path(__file__).resolve().parent.parent / "api"
WIDTH = 118


# --- choices among members ------------------------------------------------------------------------------------------

def chain(name, members):
    lines = [f"template <unsigned k> inline auto {name}() noexcept {{"]
    lines += [f"    QORI_AT(0x{key:04x}, {member}) else" for key, member in members]
    return lines + ["    return Missing{};", "}"]


def queries(form):
    """The queries of the form's work memory; one serves all its members, or each has one of its own."""
    return {key: roles.buffer_query(member) for key, member in form.members.items()}


def chains(forms):
    lines = []
    for form in forms:
        if form.keyed == "nothing":
            continue
        lines += chain(form.name, [(key, m.name) for key, m in form.members.items()])
        if any(a.kind == "buffer" for a in form.arguments) and len(set(queries(form).values())) > 1:
            lines += chain(form.name + "_bytes", queries(form).items())
    return ["namespace detail {", *lines, "}   // namespace detail"] if lines else []


def table(form):
    """What exists: element types grouped by the layouts that they come in."""
    layouts = {}
    for member in form.members.values():
        source, target = door_cpp.ends_of(member, form.arguments)
        types = "->".join(dict.fromkeys(TYPE_NAMES[end[0]] for end in (source, target)))
        shape = "->".join(dict.fromkeys(LAYOUT_NAMES.get(end[1], end[1]) for end in (source, target)))
        if form.weighted:
            kernel = next(member.arguments[a.places[0]].element for a in form.arguments if a.kind == "kernel")
            types += " by " + TYPE_NAMES[kernel]
        layouts.setdefault(types, dict())[shape] = None
    together = {}
    for types, found in layouts.items():
        together.setdefault(tuple(found), []).append(types)
    return "; ".join(f"{', '.join(types)}: {' '.join(found)}" for found, types in together.items())


def words(operation, forms):
    """The message for whatever does not exist: each way to call the operation, and for which images."""
    calls = {}
    for form in forms:
        shown = []
        for a in door_cpp.in_order(form.arguments, operation):
            text = f"in_place({a.name})" if a.kind == "inout" else "value" if a.kind == "value" and len(a.name) == 1 else a.name
            left_out = a.default is not None or a.kind == "buffer" or is_count(form.anyone().arguments[a.places[0]])
            shown.append(f"[{text}]" if left_out else text)
        calls.setdefault(table(form), []).append(f"{operation}({', '.join(shown)})")
    return f"qori::{operation}: no such call. " + ". ".join(f"{' or '.join(c)} of {t}" for t, c in calls.items())


def define(name, text):
    pieces = textwrap.wrap(text, WIDTH - 12, drop_whitespace=False)
    return [f"#define {name} \\"] + [f'    "{p}"' + (" \\" if p is not pieces[-1] else "") for p in pieces]


# --- parameters -----------------------------------------------------------------------------------------------------

def is_count(c):
    """Whether a C argument says how long lists are, which a List says itself."""
    return c.kind == "count" and c.detail == "levels"


def c_argument(choice, argument, place=0):
    return choice.form.anyone().arguments[choice.arguments[argument.name].places[place]]


def passed(c):
    """The type that a C argument has in C++ where it is one for all members."""
    if c.length or (c.stars and c.declaration.endswith("]")):
        return re.sub(r"\s*\w+(\[\w*\])$", "", c.declaration).rstrip() + "*"
    return re.sub(r"\s*\w+$", "", c.declaration).rstrip()


def one_type(signature, argument, place=0):
    """That type, where all members of the signature's forms agree."""
    types = {passed(member.arguments[choice.arguments[argument.name].places[place]])
             for choice in signature.choices for member in choice.form.members.values()}
    return types.pop() if len(types) == 1 else None


def looked_up(signature, argument, place=0):
    texts = [f"detail::Arg<F{i}, {c.arguments[argument.name].places[place]}>" for i, c in enumerate(signature.choices)]
    text = texts.pop()
    while texts:
        text = f"detail::Either<{texts.pop()}, {text}>"
    return text


def parameter(signature, a, letter):
    """A parameter of the template, and what it adds to the template's own."""
    if a.kind == "in":
        return f"const {letter}& {a.name}", [f"class {letter}"]
    if a.kind == "out":
        return f"{letter}&& {a.name}", [f"class {letter}"]
    if a.kind == "inout":
        return f"const InPlace<T{letter}, L{letter}>& {a.name}", [f"class T{letter}, class L{letter}"]
    if a.kind == "mask":
        return f"const View<const uint8_t, C1>& {a.name}", []
    if a.kind == "block_in":
        return f"const {letter}* {a.name}", [f"class {letter}"]
    if a.kind in ("block_out", "block_inout"):
        return f"{letter}* {a.name}", [f"class {letter}"]
    if a.kind == "kernel" and signature.weighted:
        return f"const Kernel<{letter}>& {a.name}", [f"class {letter}"]
    return other_parameter(signature, a), []


def other_parameter(signature, a):
    if a.kind == "window":
        return f"Window {a.name}"
    if a.kind == "enum":
        return f"{a.detail} {a.name}"
    if a.kind == "buffer":
        return f"Buffer& {a.name}"
    if a.kind == "border":
        return f"const detail::Edge<{looked_up(signature, a, 1)}, k>& {a.name}"
    if a.kind == "result":
        return f"detail::Result<{looked_up(signature, a)}, k> {a.name}"
    single = one_type(signature, a)
    if a.kind == "kernel":
        return f"const detail::Weights<{single or looked_up(signature, a)}>& {a.name}"
    if a.kind == "value" and not single:
        return f"const detail::Value<{looked_up(signature, a)}, k>& {a.name}"
    return f"{single or looked_up(signature, a)} {a.name}"


# --- bodies ---------------------------------------------------------------------------------------------------------

def images_of(signature):
    return [a for a in signature.arguments if a.image]


def size_of(form, role, images):
    if role == "region":
        chosen = [a for a in images if a.kind == "out"] if form.extent == "bits" else images
        return f"{chosen[0].name}V.size()"
    return f"{role}V.size()"


def extent_check(form, images):
    """A condition under which the sizes of a call's images do not fit each other."""
    names = [f"{a.name}V" for a in images]
    corr = {"full": "srcV.width() + int64_t(patternV.width()) - 1, srcV.height() + int64_t(patternV.height()) - 1",
            "valid": "srcV.width() - int64_t(patternV.width()) + 1, srcV.height() - int64_t(patternV.height()) + 1",
            "same": "srcV.width(), srcV.height()"}
    if form.extent in corr:
        return f"!detail::isSize(dstV.size(), {corr[form.extent]})"
    if form.extent == "algorithm":
        cases = (f"algorithm & corrValid ? detail::isSize(dstV.size(), {corr['valid']}) : "
                 f"algorithm & corrSame ? detail::isSize(dstV.size(), {corr['same']}) : ")
        return f"!({cases}detail::isSize(dstV.size(), {corr['full']}))"
    if form.extent == "axis" and len(names) == 2:
        return ("axis < flipDiagonal ? detail::differ(srcV, dstV) "
                ": !detail::isSize(dstV.size(), srcV.height(), srcV.width())")
    if form.extent == "blocks":
        return "!detail::areBlocks(srcV.size(), block, minV.size()) || detail::differ(minV, maxV)"
    if form.extent == "bits":
        return "!detail::holdsBits(srcV.size(), bit_offset, dstV.size())"
    if form.extent in door_cpp.BLOCKS:
        return " || ".join(f"!detail::isSize({n}.size(), 8, 8)" for n in names)
    if form.extent in ("frame", "plan") or len(names) < 2:
        return ""
    return f"detail::differ({', '.join(names)})"


def c_arguments(choice, images, number):
    """What stands at each place of the C call."""
    form, at = choice.form, {}
    for place, role in form.sizes.items():
        at[place] = size_of(form, role, images)
    for name, a in choice.arguments.items():
        shown = {"in": [f"{name}V.data()", f"{name}V.step()"], "kernel": [f"{name}.data()", f"{name}.size()", f"{name}.anchor()"],
                 "window": [f"{name}.size()", f"{name}.anchor()"], "value": [f"detail::pass({name})"],
                 "border": [f"{name}.mode()", f"detail::beyond<detail::Arg<F{number}, {a.places[-1]}>>({name})"],
                 "result": [f"{name}.data"], "buffer": [f"{name}.data()"]}
        text = shown["in"] if a.image else shown.get(a.kind, [name])
        if a in choice.left_out and a.kind not in ("buffer", "border"):
            text = [a.default]
        at.update(zip(a.places, text))
    return ", ".join(at[place] for place in sorted(at))


def work_memory(choice, images):
    """Asks how many bytes the call takes, and has them."""
    form = choice.form
    buffer = next(a for a in form.arguments if a.kind == "buffer")
    names = queries(form)
    query = next(iter(names.values()))
    head = f"detail::{form.name}_bytes<k>()" if len(set(names.values())) > 1 else query
    asked = form.anyone().operation.query.arguments
    texts = []
    for c in asked:
        if c.kind == "region" or (c.kind == "size_of" and any(a.name == c.detail for a in images)):
            texts.append(size_of(form, "region" if c.kind == "region" else c.detail, images))
        elif c.kind == "size_of":
            texts.append(f"{c.detail}.size()")
        elif c.kind == "data_type":
            texts.append("detail::dataType<detail::ElementOf<decltype(srcV)>>")
        elif c.kind == "channels":
            texts.append("int32_t(detail::channels(k))")
        elif c.kind == "columns":
            texts.append("dstV.width()")
        elif c.kind == "bytes":
            texts.append("&bytes")
        else:
            texts.append(c.name)
    lines = [f"    Buffer {buffer.name};"] if buffer in choice.left_out else []
    return lines + ["    int32_t bytes = 0;",
                    f"    if (const QorResult asked = {head}({', '.join(texts)})) return asked;",
                    f"    if (!{buffer.name}.fits(bytes)) return QOR_ERR_NO_MEMORY;"]


def body(signature, choice, number):
    images = images_of(signature)
    form = choice.form
    lines = [f"const auto& {a.name}V = detail::view({a.name});" for a in images]
    for a in choice.left_out:
        if a.kind == "border":
            lines.append(f"const detail::Edge<detail::Arg<F{number}, {a.places[1]}>, k> {a.name}({a.default});")
        elif a.name == "bit_offset":
            lines.append(f"constexpr int32_t bit_offset = {a.default};")
    if check := extent_check(form, images):
        lines.append(f"if ({check}) return QOR_ERR_SIZE;")
    lines = ["    " + line for line in lines]
    if any(a.kind == "buffer" for a in form.arguments):
        lines += work_memory(choice, images)
    returned = "" if form.anyone().result == "void" else "return "
    return lines + [f"    {returned}detail::{form.name}<k>()({c_arguments(choice, images, number)});"]


# --- functions ------------------------------------------------------------------------------------------------------

def declared(operation):
    """The name where it is declared; in parentheses it is no macro."""
    return f"({operation})" if operation in MACROS else operation


def wrapped(text, indent=""):
    """Lines that break behind the commas of the outermost list, so that arguments of templates stay together."""
    bound, depth = [], 0
    least = 2 if text.startswith("template <template") else 1
    for before, character in zip(" " + text, text):
        depth += (character in "<({") - (character in ">)}" and before not in "-=")
        outer = before == "," and depth <= least
        bound.append("\0" if character == " " and not outer else character)
    lines = textwrap.wrap("".join(bound), WIDTH, initial_indent=indent, subsequent_indent=indent + "    ",
                          break_long_words=False, break_on_hyphens=False)
    if any(len(line) > WIDTH + 2 for line in lines):
        lines = textwrap.wrap(text, WIDTH, initial_indent=indent, subsequent_indent=indent + "    ", break_long_words=False,
                              break_on_hyphens=False)
    return [line.replace("\0", " ").rstrip() for line in lines]


def template_head(signature, own, key, conditions):
    head = own + [f"unsigned k = {key}"]
    head += [f"class F{i} = decltype(detail::{c.form.name}<k>())" for i, c in enumerate(signature.choices)]
    if conditions:
        head.append(f"detail::If<{' && '.join(conditions)}> = 0")
    head.append("bool exists = false")
    return f"template <{', '.join(head)}>"


def by_images(signature):
    parameters, own, ins, outs, conditions, weight = [], [], [], [], [], ""
    for letter, a in zip("ABCDEGHIJKMN", signature.arguments):
        text, added = parameter(signature, a, letter)
        parameters.append(text)
        own += added
        if a.kind in ("in", "out", "inout", "block_in", "block_out", "block_inout"):
            pointer = {"block_in": f"const {letter}*", "inout": f"InPlace<T{letter}, L{letter}>"}
            operand = pointer.get(a.kind, letter + "*" if a.kind.startswith("block") else letter)
            (ins if a.kind in door_cpp.READ else outs).append(operand)
            if a.kind in ("in", "out"):
                conditions.append(f"detail::isImage<{letter}>")
        if a.kind == "kernel" and signature.weighted:
            weight = f", {letter}"
    key = f"detail::key<detail::In<{', '.join(ins)}>, detail::Out<{', '.join(outs)}>{weight}>"
    lines = wrapped(template_head(signature, own, key, conditions))
    lines += wrapped(f"[[nodiscard]] QorResult {declared(signature.operation)}({', '.join(parameters)}) noexcept {{")
    return lines + alternatives(signature)


def by_lists(signature):
    """The call with lists that bring their counts, where a member takes pointers and counts: it calls the other."""
    form = signature.choices[0].form
    kinds = {a.name: form.anyone().arguments[a.places[0]] for a in signature.arguments}
    if len(signature.choices) > 1 or not any(is_count(c) for c in kinds.values()):
        return []
    own, ins, outs, conditions, parameters, passed_on, lists = [], [], [], [], [], [], []
    for letter, a in zip("ABCDEGHIJKMN", signature.arguments):
        if is_count(kinds[a.name]):
            passed_on.append("levels.counts()")
            continue
        if kinds[a.name].kind.startswith("lists_"):
            parameters.append(f"const detail::Listed<detail::Arg<F0, {a.places[0]}>, k>& {a.name}")
            passed_on.append(f"{a.name}.data()")
            lists.append(a.name)
            continue
        text, added = parameter(signature, a, letter)
        parameters.append(text)
        own += added
        passed_on.append(a.name)
        if a.kind == "inout":
            outs.append(f"InPlace<T{letter}, L{letter}>")
        elif a.image:
            (ins if a.kind == "in" else outs).append(letter)
            conditions.append(f"detail::isImage<{letter}>")
    key = f"detail::key<detail::In<{', '.join(ins)}>, detail::Out<{', '.join(outs)}>>"
    found = " && ".join([*conditions, "detail::found<F0>"])
    lines = wrapped(f"template <{', '.join(own)}, unsigned k = {key}, class F0 = decltype(detail::{form.name}<k>()), "
                    f"detail::If<{found}> = 0>")
    lines += wrapped(f"[[nodiscard]] QorResult {signature.operation}({', '.join(parameters)}) noexcept {{")
    for name in lists:
        if name != "levels":
            lines.append(f"    if (!detail::haveCounts(levels, {name}, {int(name == 'hist')})) return QOR_ERR_SIZE;")
    return lines + wrapped(f"return {signature.operation}({', '.join(passed_on)});", "    ") + ["}"]


def alternatives(signature, result="QOR_ERR_BAD_ARG"):
    lines = []
    for number, choice in enumerate(signature.choices):
        lines.append(f"    {'} else ' if number else ''}if constexpr (detail::found<F{number}>) {{")
        for line in body(signature, choice, number):
            lines += wrapped(line.strip(), "        ")
    return lines + ["    } else {", "        static_assert(exists, QORI_WORDS);", f"        return {result};", "    }",
                    "}"]


def by_types(signature):
    member = signature.choices[0].form.anyone()
    own = ["class T"] + (["class L"] if member.layout else [])
    key = f"detail::keyOf<T{', L' if member.layout else ''}>"
    parameters = [other_parameter(signature, a) for a in signature.arguments]
    result, failed = ("T*", "nullptr") if "*" in member.result else (member.result, "QOR_ERR_BAD_ARG")
    lines = wrapped(template_head(signature, own, key, []))
    lines += wrapped(f"[[nodiscard]] {result} {signature.operation}({', '.join(parameters)}) noexcept {{")
    return lines + alternatives(signature, failed)


def plain(signature):
    """A function without a choice, under its name in C++."""
    form = signature.choices[0].form
    member = form.anyone()
    parameters = [other_parameter(signature, a) for a in form.arguments]
    names = ", ".join(a.name for a in form.arguments)
    head = "" if member.result == "void" else "[[nodiscard]] "
    call = f"{'' if member.result == 'void' else 'return '}{member.name}({names});"
    lines = wrapped(f"{head}inline {member.result} {signature.operation}({', '.join(parameters)}) noexcept {{")
    return lines + wrapped(call, "    ") + ["}"]


MOST_ARGUMENTS = 10
MACROS = ("min", "max")      # of <windows.h>, where nobody prevents them


def otherwise(operation):
    """Takes whatever no other overload does and says what there is."""
    nothing = ", ".join(["detail::Anything = {}"] * MOST_ARGUMENTS)
    return wrapped(f"template <bool exists = false> QorResult {declared(operation)}({nothing}) noexcept {{") + \
        ["    static_assert(exists, QORI_WORDS);", "    return QOR_ERR_BAD_ARG;", "}"]


def documentation(forms):
    briefs = list(dict.fromkeys(form.anyone().group.keys["brief"] for form in forms))
    names = list(dict.fromkeys("qori" + form.c_operation for form in forms))
    text = " ".join(briefs) + " C: " + ", ".join(names) + "."
    if any(form.anyone().operation.reversed for form in forms):
        text += " Of two images a is the second source of C, pSrc2 or in place pSrcDst, and b the first."
    lines = textwrap.wrap(text, WIDTH - 3, initial_indent="/** ", subsequent_indent=" *  ")
    return lines[:-1] + [lines[-1] + " */"]


def operation_text(operation, forms):
    lines = [""] + chains(forms)
    signatures = door_cpp.signatures_of(operation, forms)
    keyed = [s for s in signatures if s.keyed != "nothing"]
    if keyed:
        lines += define("QORI_WORDS", words(operation, [f for f in forms if f.keyed != "nothing"]))
    lines += documentation(forms)
    for signature in signatures:
        lines += {"images": by_images, "types": by_types, "nothing": plain}[signature.keyed](signature)
        if signature.keyed == "images":
            lines += by_lists(signature)
    if any(s.keyed == "images" for s in keyed):
        lines += otherwise(operation)
    return lines + (["#undef QORI_WORDS"] if keyed else [])


def texts(header):
    """A case per status, with the words of the C header."""
    body_text = re.search(r"typedef enum QorStatusCode \{(.*?)\n\} QorStatusCode;", header, re.DOTALL)[1]
    pattern = re.compile(r"(?:/\*\*(?P<before>(?:(?!\*/).)*?)\*/\s*)?(?P<name>QOR_\w+) = -?\d+,(?: /\*\*<(?P<after>.*?)\*/)?",
                         re.DOTALL)
    lines = []
    for m in pattern.finditer(body_text):
        said = re.sub(r"\s*\n\s*\*\s*", " ", m["after"] or m["before"]).strip()
        if len(said) < 70:
            lines.append(f'case {m["name"]}: return "{said}";')
        else:
            pieces = textwrap.wrap(said, 96, drop_whitespace=False)
            lines += [f"case {m['name']}:", *(f'    {"return" if p is pieces[0] else "      "} "{p}"' for p in pieces)]
            lines[-1] += ";"
    return lines


def texts_in(part, template):
    marker = re.search(r"^( *)// @TEXTS@\n", part, re.MULTILINE)
    cases = "".join(f"{marker[1]}{line}\n" for line in texts(template))
    return part[:marker.start()].lstrip() + cases + part[marker.end():].rstrip()


# Beyond the end of the header: there is nothing to quote there.
UNQUOTED = 100_000


def unquoted(text):
    """Static assertions and deleted functions under a line number that the file does not have. GCC quotes the line of an
    error below it, which for a message that says everything already takes as much room again."""
    lines, inside = [], False
    for line in text.splitlines():
        begins = not inside and (line.lstrip().startswith("static_assert(") or line.endswith("= delete;"))
        if begins:
            lines.append(f"#line {UNQUOTED}")
            inside = True
        lines.append(line)
        if inside and line.endswith(";"):
            lines.append(f"#line {len(lines) + 2}")
            inside = False
    assert len(lines) < UNQUOTED
    return "\n".join(lines) + "\n"


def header(families):
    """The whole of include/qori.hpp."""
    template = (API / "header.h.in").read_text()
    members = [m for f in families for g in f.groups for m in g.members]
    named = {m.name: m for m in members}
    for m in members:
        m.operation.query = named.get(roles.buffer_query(m))
    operations = door_cpp.forms_of(members)
    first = {name: operations.pop(name) for name in ("allocate", "release") if name in operations}
    at = ["", "// One member of a choice among those of a form.",
          "#define QORI_AT(key, member) if constexpr (k == key) return &member;"]
    part = {path.stem: path.read_text() for path in (API / "cpp").glob("*.hpp")}
    lines = [part["views"].rstrip(), "", texts_in(part["values"], template), "",
             part["choice"].rstrip(), *at]
    for name, forms in first.items():
        lines += operation_text(name, forms)
    lines += ["", part["images"].strip(), "", "// --- operations, in the order of qori.h"]
    for name, forms in operations.items():
        lines += operation_text(name, forms)
    lines += ["", "#undef QORI_AT", "", part["plans"].strip(), "", part["transforms"].strip(), "", "}   // namespace qori", "", "#endif", ""]
    return unquoted("\n".join(lines))
