"""Pages of the reference: one an operation, one for the plans and queries of a family, made from the registry."""
import re
from dataclasses import dataclass, field

import registry
from signatures import cpp_signature, python_signature

KIND_LEGEND = ("**R** writes a destination, **I** works in place, **M** writes where a mask is not zero, **Sfs** "
               "divides an integer result by 2^scaleFactor.")
DOC_FIELDS = (("shapes", "Shapes"), ("elements", "Elements"), ("units", "Units"), ("aliasing", "Aliasing"),
              ("notes", "Notes"))
NAME = re.compile(r"_(?P<types>(?:\d+(?:u|sc|s|fc|f))+)"
                  r"_(?P<layout>(?:AC4|AC1|A0C4|AP4|[CP]\d)(?:A0C4|AC4|C\d(?:C)?|[CP]\d|C)?)(?P<flags>I?M?R?(?:Sfs)?)$")

# What people look for, and the families in which they find it.
TASKS = (("Copy, fill, pad, reflect", ("copy", "set", "border", "mirror", "convert_bits")),
         ("Convert and scale values", ("convert", "scale", "lut", "palette")),
         ("Arithmetic", ("arith_binary", "arith_constant", "arith_division", "arith_unary")),
         ("Threshold", ("threshold", "otsu", "threshold_adaptive")),
         ("Smooth and sharpen", ("box", "box_border", "gauss", "filter", "filter_border", "window_sums")),
         ("Remove noise by order", ("median", "median_border", "filter_extreme")),
         ("Grow and shrink shapes", ("morphology", "morphology_mask")),
         ("Resize and warp", ("resize", "warp")),
         ("Measure", ("norms", "extrema", "histogram")),
         ("Frequencies", ("fft", "dft", "spectrum", "dct", "dct8x8")),
         ("Find patterns", ("crosscorr", "hog", "lbp")))


@dataclass
class Page:
    """An operation: every export of one snake_case name, in the order of the registry."""
    name: str
    family: registry.Family
    members: list = field(default_factory=list)

    @property
    def groups(self):
        return list({id(m.group): m.group for m in self.members}.values())

    @property
    def brief(self):
        """The first group's first words, without the formula of the C parameters."""
        return re.sub(r": (dst|p[A-Z])\S* = .*", ".", self.groups[0].keys["brief"])


def operations(families):
    pages = {}
    for family in families:
        for member in (m for g in family.groups for m in g.members if m.purpose == "operation"):
            pages.setdefault(member.operation.snake, Page(member.operation.snake, family)).members.append(member)
    return pages


def support(families):
    """Families with exports that are no operations: plans, queries, memory, the version."""
    found = {}
    for family in families:
        members = [m for g in family.groups for m in g.members if m.purpose != "operation"]
        if members:
            found[family.stem] = members
    return found


def by_task(pages):
    """(heading, pages) in the order of TASKS; every operation stands in one of them."""
    listed = {stem for _, stems in TASKS for stem in stems}
    lost = {p.family.stem for p in pages.values()} - listed
    if lost:
        raise registry.RegistryError(f"families that no task lists: {sorted(lost)}")
    return [(title, [p for stem in stems for p in pages.values() if p.family.stem == stem]) for title, stems in TASKS]


# --- parts of a page -----------------------------------------------------------------------------------------------

def escape(text):
    """Text of the registry in Markdown: nothing of it is markup."""
    return re.sub(r"([*_<>|\[\]`$~])", r"\\\1", text)


def fenced(language, text):
    return [f"```{language}", text.strip("\n"), "```", ""]


def declaration(member, width=96):
    """A prototype, broken between parameters where it is long."""
    line = f"{member.result} {member.name}("
    lines = []
    for index, parameter in enumerate(member.parameters or ["void"]):
        last = index + 1 >= len(member.parameters)
        piece = parameter + (");" if last else ", ")
        if len(line + piece) > width:
            lines.append(line.rstrip())
            line = "    "
        line += piece
    return "\n".join(lines + [line])


def code_parts(member):
    match = NAME.search(member.name)
    return (match["types"], match["layout"], match["flags"]) if match else ("", "", "")


def forms(page):
    """Members by registry group and flags: one prototype stands for each."""
    found = {}
    for member in page.members:
        form = id(member.group), code_parts(member)[2], member.c_operation, len(member.parameters)
        found.setdefault(form, []).append(member)
    return list(found.values())


def c_signatures(page):
    blocks = []
    for members in forms(page):
        more = f"/* {len(members)} of this form */\n" if len(members) > 1 else ""
        blocks.append(more + declaration(members[0]))
    return "\n\n".join(blocks)


def existing(page):
    """A table of element types by layouts; a cell names the flags of what exists there."""
    cells, layouts = {}, {}
    for member in page.members:
        types, layout, flags = code_parts(member)
        layouts[layout] = None
        kinds = cells.setdefault(types, {}).setdefault(layout, {})
        short = (flags or "·").replace("IR", "I").replace("MR", "M")
        kinds[short.replace("RSfs", "Sfs").replace("ISfs", "I Sfs")] = None
    if not any(cells):
        return [f"`{m.name}`" for m in page.members] + [""]
    order = sorted(layouts, key=lambda name: (len(name), name))
    lines = ["| elements | " + " | ".join(order) + " |", "|---|" + "---|" * len(order)]
    for types, row in cells.items():
        lines.append(f"| `{types}` | " + " | ".join(" · ".join(row.get(l, {})) for l in order) + " |")
    return ['<div class="exists">', ""] + lines + ["", "</div>", "", KIND_LEGEND, ""]


def statuses(members):
    """Tables of statuses in the order of the checks, members with the same list under one heading."""
    lists, everywhere = {}, {}
    for member in members:
        types = lists.setdefault(tuple(member.checks), {}).setdefault(pattern(member), {})
        types[code_parts(member)[0]] = None
        everywhere.setdefault(pattern(member), set()).add(tuple(member.checks))
    lines = []
    for checks, names in lists.items():
        if not checks:
            continue
        if len(lists) > 1:
            lines += [", ".join(f"`{n}`" + (f" of {' '.join(types)}" if len(everywhere[n]) > 1 else "")
                                for n, types in names.items()), ""]
        lines += ["| | status | when |", "|---|---|---|"]
        for number, text in enumerate(checks, 1):
            match = re.match(r"^(QOR_\w+) \((.*)\)$", text)
            status, cause = (match[1], match[2]) if match else (text, "")
            lines.append(f"| {number} | `{status}` | {escape(cause)} |")
        lines.append("")
    return lines


def pattern(member):
    """The export's name with its element types and layout left open."""
    types, layout, flags = code_parts(member)
    if not types:
        return member.name
    return f"{member.name[:-len(types + layout + flags) - 2]}_…{flags and '_…' + flags}"


def details(members):
    """What the registry says of each group, once where groups say the same."""
    lines = []
    groups = list({id(m.group): m.group for m in members}.values())
    for group in groups:
        own = [m for m in members if m.group is group]
        names = list(dict.fromkeys(pattern(m) for m in own))
        lines += [f"**{escape(group.keys['brief'])}** — " + ", ".join(f"`{n}`" for n in names), ""]
        for key, label in DOC_FIELDS:
            if key in group.keys:
                lines.append(f"- *{label}.* {escape(group.keys[key])}")
        if not group.keys.get("returns", "QOR_OK; in this order").startswith("QOR_OK; in this order"):
            lines += [f"- *Returns.* {escape(group.keys['returns'])}"]
        lines.append("")
    return lines


def all_names(members):
    lines = ["<details><summary>All exports ({})</summary>".format(len(members)), ""]
    return lines + fenced("c", "\n".join(declaration(m, 116) for m in members)) + ["</details>", ""]


def registry_examples(members):
    texts = [g.keys["example"] for g in {id(m.group): m.group for m in members}.values() if "example" in g.keys]
    return ["From the header:", ""] + [line for text in texts for line in fenced("c", text)] if texts else []


def related(page, pages, support_pages):
    same = [p.name for p in pages.values() if p.family.stem == page.family.stem and p is not page]
    lines = []
    if page.family.stem in support_pages:
        lines.append(f"Plans, buffers and queries: [{page.family.title}](../plans/{page.family.stem}.md).")
    if same:
        lines.append("Of the same family: " + ", ".join(f"[{n}]({n}.md)" for n in same) + ".")
    return lines + [""] if lines else []


def operation_page(page, pages, support_pages, show):
    """`show` gives the Markdown of the operation's pictures, examples, panels and errors, lists of lines by these names."""
    lines = [f"# {page.name}", "", escape(show.get("brief") or page.brief), ""]
    lines += show.get("pictures", [])
    lines += ["## Call", ""]
    for language, title, text in (("python", "Python", python_signature(page.members)),
                                  ("cpp", "C++", cpp_signature(page.members)), ("c", "C", c_signatures(page))):
        lines += [f'<p class="language">{title}</p>', ""] + fenced(language, text)
    if show.get("example") or registry_examples(page.members):
        lines += ["## Example", ""] + show.get("example", []) + registry_examples(page.members)
    lines += show.get("panels", [])
    lines += ["## What exists", ""] + existing(page)
    lines += ["## Behaviour", ""] + details(page.members)
    lines += ["## Errors", "", "The first that applies is returned, and then nothing is written.", ""]
    lines += show.get("errors", []) + statuses(page.members)
    lines += ["## Related", ""] + related(page, pages, support_pages) + all_names(page.members)
    return "\n".join(lines)


def support_page(family, members, pages):
    title = family.title if family.stem in ("memory", "version") else f"{family.title}: plans and queries"
    lines = [f"# {title}", ""]
    users = [p.name for p in pages.values() if p.family.stem == family.stem]
    if users:
        lines += ["Used by " + ", ".join(f"[{n}](../operations/{n}.md)" for n in users) + ".", ""]
    for group in family.groups:
        own = [m for m in group.members if m in members]
        if not own:
            continue
        title = re.sub(r"^qori", "", own[0].c_operation if own[0].types else own[0].name)
        lines += [f"## {title}", "", escape(group.keys["brief"]), ""]
        lines += fenced("c", "\n".join(declaration(m, 116) for m in own[:6]))
        if len(own) > 6:
            lines += all_names(own)
        for key, label in DOC_FIELDS + (("returns", "Returns"),):
            if key in group.keys:
                lines.append(f"- *{label}.* {escape(group.keys[key])}")
        lines += [""] + statuses(own) + registry_examples(own)
    return "\n".join(lines)


# --- numerics ------------------------------------------------------------------------------------------------------

GENERAL_RULES = "by the rules above, and exact where values are moved, chosen or counted."


def bounds(pages):
    """What the registry says of elements, by family: text first said of which operations. Those of which it says nothing
    follow the page's general rules."""
    lines = []
    for _, group in by_task(pages):
        for family in dict.fromkeys(p.family.stem for p in group):
            said = {}
            for page in (p for p in group if p.family.stem == family):
                for text in [g.keys["elements"] for g in page.groups if "elements" in g.keys] or [GENERAL_RULES]:
                    said.setdefault(text, {})[page.name] = None
            title = next(p.family.title for p in group if p.family.stem == family)
            lines += [f"### {title}", ""]
            lines += [f"- {', '.join(f'[{n}](operations/{n}.md)' for n in names)}: {escape(text)}"
                      for text, names in said.items()] + [""]
    return "\n".join(lines)
