#!/usr/bin/env python3
"""Writes the library's regular code from the tables in src/tables.

operations.tsv feeds the session base class, the call-tracing session and (with exports.tsv)
the exported functions, the version script and the Windows module definition; statuses.tsv
feeds the message table; attributes.tsv the time-service attribute dictionary; both attribute
tables the list of attributes that the tiktal command knows by name; enumerations.tsv the numbers
of the enumerated attributes, for the library and the command; the attribute tables and
enumerations.tsv together the enumerations and attributes of the Python package
(python/_attributes.py, which python/setup.py writes too when pip builds the package); roco_functions.tsv the C
interface of the routing service and the library's table of its functions; qpxi_functions.tsv the
same for the PXI chassis query library; device_requests.tsv the
timing module's driver requests, for the library's proxy and for the device daemon."""
import argparse
import os
import re

TRACE_FORMATS = {
    "ViInt32": "%d", "ViUInt32": "%u", "ViAttr": "%u",
    "ViUInt16": "%hu", "ViBoolean": "%hu", "ViReal64": "%lg", "ViUInt64": "%llu",
}


def read_tsv(path):
    with open(path, encoding="utf-8") as f:
        return [line.rstrip("\n").split("\t") for line in f if line.strip() and not line.startswith("#")]


def parse_params(text):
    """'ViInt32 a, ViChar* b' -> [('ViInt32', 'a'), ('ViChar*', 'b')]; '-' -> []."""
    if text == "-":
        return []
    return [tuple(p.strip().rsplit(" ", 1)) for p in text.split(",")]


def cpp_type(t):
    return "std::string&" if t == "text" else t


def signature(params, names=True):
    return ", ".join(cpp_type(t) + (" " + n if names else "") for t, n in params)


def load(tables):
    ops = [dict(slot=int(s), name=n, default=d, params=parse_params(p))
           for s, n, d, p in read_tsv(os.path.join(tables, "operations.tsv"))]
    by_name = {op["name"]: op for op in ops}
    exports = []
    for ordinal, name, kind, op, params in read_tsv(os.path.join(tables, "exports.tsv")):
        e = dict(ordinal=ordinal, name=name, kind=kind, op=by_name.get(op))
        e["params"] = e["op"]["params"] if params == "=" else parse_params(params)
        exports.append(e)
    statuses = read_tsv(os.path.join(tables, "statuses.tsv"))
    return ops, exports, statuses


def gen_session_class(ops):
    decls = "\n".join(f"    virtual void {op['name']}({signature(op['params'])});" for op in ops)
    header = f"""// Generated from src/tables/operations.tsv: the session interface, one operation per slot.
#pragma once

#include <string>
#include <tiktal/tiktal.h>

namespace tiktal {{

class Session {{
public:
    Session() = default;
    Session(const Session&) = delete;
    Session& operator=(const Session&) = delete;
    virtual ~Session();
{decls}

    ViSession id = 0;  // the handle, written once by the registry
}};

}}  // namespace tiktal
"""
    bodies = "\n".join(
        f"void Session::{op['name']}({signature(op['params'], names=False)}) {{\n"
        f"    throw ZRERR_RAISE(tiktalerr_{op['default']}).debug(\"func\", \"tiktal::Session::{op['name']}\");\n}}\n"
        for op in ops if op["default"] != "-")
    source = f"""// Generated from src/tables/operations.tsv: every operation fails with its slot's status.
#include "SessionClass.h"

#include "errors/zrerr.h"

namespace tiktal {{

Session::~Session() = default;

{bodies}
}}  // namespace tiktal
"""
    return header, source


def trace_param(t, n):
    if t == "text":
        fmt, value = "%p", f"static_cast<const void*>(&{n})"
    elif t.endswith("*"):
        fmt, value = "%p", f"static_cast<const void*>({n})"
    elif t == "ViUInt64":
        fmt, value = "%llu", f"static_cast<unsigned long long>({n})"
    elif t in ("ViConstString", "ViRsrc"):
        fmt, value = "%s", f"{n} ? {n} : \"(null)\""
    else:
        fmt, value = TRACE_FORMATS[t], n
    return (f"    {{\n        zrsdbg_VarLine v(kFile, __LINE__, \"{n}: \");\n"
            f"        v.printf(\"%s{fmt}%s\", v.prefix(), {value}, v.suffix());\n    }}\n")


def gen_trace_session(ops):
    traced = [op for op in ops if op["default"] != "-"]
    decls = "\n".join(f"    void {op['name']}({signature(op['params'])}) override;" for op in traced)
    header = f"""// Generated from src/tables/operations.tsv: a session that traces every call and does nothing.
#pragma once

#include "SessionClass.h"

namespace tiktal {{

class SessionDebugPrintOnly final : public Session {{
public:
    SessionDebugPrintOnly();
    ~SessionDebugPrintOnly() override;
{decls}
}};

}}  // namespace tiktal
"""
    qual = "tiktal::SessionDebugPrintOnly::"
    bodies = []
    for op in traced:
        lines = "".join(trace_param(t, n) for t, n in op["params"])
        bodies.append(f"void SessionDebugPrintOnly::{op['name']}({signature(op['params'])}) {{\n"
                      f"    zrsdbg_ScopeLine scope(kFile, __LINE__, \"{qual}{op['name']}\");\n{lines}}}\n")
    source = f"""// Generated from src/tables/operations.tsv.
#include "SessionDebugPrintOnly.h"

#include "sessions/trace_line.h"

namespace tiktal {{
namespace {{
constexpr const char* kFile = "codegen/SessionDebugPrintOnly";
}}

SessionDebugPrintOnly::SessionDebugPrintOnly() {{
    zrsdbg_ScopeLine scope(kFile, __LINE__, "{qual}SessionDebugPrintOnly");
}}

SessionDebugPrintOnly::~SessionDebugPrintOnly() {{
    zrsdbg_ScopeLine scope(kFile, __LINE__, "{qual}~SessionDebugPrintOnly");
}}

{chr(10).join(bodies)}
}}  // namespace tiktal
"""
    return header, source


def export_body(e):
    args = ", ".join(n for _, n in e["op"]["params"]) if e["op"] else ""
    if e["kind"] == "forward":
        return f"return tiktal::forward(vi, [&](tiktal::Session& s) {{ s.{e['op']['name']}({args}); }});"
    if e["kind"] == "text":
        args = ", ".join("text" if t == "text" else n for t, n in e["op"]["params"])
        query = "true" if e["name"] == "tiktal_GetTimeReferenceNames" else "false"
        return (f"return tiktal::forwardText(vi, \"{e['name']}\", bufferSize, valueString, {query},\n"
                f"        [&](tiktal::Session& s, std::string& text) {{ s.{e['op']['name']}({args}); }});")
    if e["kind"] == "stub":
        return "return tiktalerr_featureNotSupported;"
    return "return VI_SUCCESS;"


def read_cjson_functions(header):
    """(return type, name, parameters) of every function that cJSON's header declares."""
    if not header:
        return []
    pattern = re.compile(r"^CJSON_PUBLIC\((.+?)\)\s*(cJSON_\w+)\((.*?)\);", re.M)
    with open(header, encoding="utf-8") as f:
        return pattern.findall(f.read())


def gen_cjson_forwarders(functions):
    """The cJSON functions, exported from the library under their own names: each forwards to
    cJSON's own definition in the cJSON library the driver library is linked with."""
    bodies = []
    for ret, name, params in functions:
        names = [] if params.strip() == "void" else [re.findall(r"\w+", p)[-1] for p in params.split(",")]
        call = f"reinterpret_cast<{ret} (*)({params})>(entry)({', '.join(names)})"
        bodies.append(f"CJSON_PUBLIC({ret}) {name}({params}) {{\n"
                      f"    static void* const entry = tiktal::cjsonEntry(\"{name}\");\n"
                      f"    return {call};\n}}\n")
    return f"""// Generated from cJSON's header.
#include <cjson/cJSON.h>

#include "api/cjson_exports.h"

extern "C" {{

{chr(10).join(bodies)}
}}  // extern "C"
"""


def takes_vi(e):
    """Whether vi comes first, before the parameters the table lists: for all but the SetGVRT
    functions and the opening functions, whose vi (an output) the table lists."""
    return not e["name"].startswith("SetGVRT") and "vi" not in [n for _, n in e["params"]]


def argument_words(types):
    """The 32-bit words the arguments of these C types take on a 32-bit stack."""
    return sum(2 if t.replace("const ", "").strip() in ("ViReal64", "ViUInt64", "double") else 1 for t in types)


def export_words(e):
    return argument_words([t for t, _ in e["params"]]) + (1 if takes_vi(e) else 0)


def cjson_param_types(params):
    return [] if params.strip() == "void" else [re.sub(r"\s*\w+$", "", p.strip()) for p in params.split(",")]


def shared_body(e):
    """The body a stub or a zero export shares on Windows with those of the same kind and argument
    words (their bodies read no argument); None for the others."""
    if e["kind"] not in ("stub", "zero"):
        return None
    return f"tiktal{e['kind'].capitalize()}{export_words(e)}Words"


def gen_shared_bodies(exports):
    groups = {(e["kind"], export_words(e)): shared_body(e) for e in exports if shared_body(e)}
    defs = []
    for (kind, words), name in sorted(groups.items()):
        result = "tiktalerr_featureNotSupported" if kind == "stub" else "VI_SUCCESS"
        defs.append(f"ViStatus _VI_FUNC {name}({', '.join(['ViUInt32'] * words)}) {{\n    return {result};\n}}\n")
    return defs


def gen_module_definition(exports, cjson, arch):
    """The module definition of tiktal.dll for `arch` (i686 or x86_64): the numbered exports with
    their ordinals, the others, then cJSON's functions. On i686 the functions are __stdcall and
    named name@bytes, bytes = 4 x argument words; the DLL is linked with --kill-at, which exports
    them undecorated, and the import libraries keep the decorated names that callers reference."""
    def decorated(name, words):
        return f"{name}@{4 * words}" if arch == "i686" else name

    lines = []
    for e in sorted(exports, key=lambda e: e["ordinal"] == "-"):
        words = export_words(e)
        line = decorated(e["name"], words)
        if shared_body(e):
            line += " = " + decorated(shared_body(e), words)
        if e["ordinal"] != "-":
            line += f" @{e['ordinal']}"
        lines.append(line)
    lines += [decorated(name, argument_words(cjson_param_types(params))) for _, name, params in cjson]
    return "LIBRARY tiktal.dll\nEXPORTS\n" + "".join(f"    {line}\n" for line in lines)


def gen_exports(exports, cjson=(), windows_arch=None):
    """The exports' source, the version script, the module definition and the list of names. For
    Windows (windows_arch set) the stubs and the zero exports share bodies, which the module
    definition exports under each name, and cJSON's functions are exported from the static cJSON."""
    defs = []
    for e in exports:
        if e["kind"] == "manual" or (windows_arch and shared_body(e)):
            continue
        used = e["kind"] in ("forward", "text")
        params = [("ViSession", "vi")] + e["params"]
        sig = ", ".join(t + (" " + n if used else "") for t, n in params)
        defs.append(f"ViStatus _VI_FUNC {e['name']}({sig}) {{\n    {export_body(e)}\n}}\n")
    if windows_arch:
        defs += gen_shared_bodies(exports)
    source = f"""// Generated from src/tables/exports.tsv: the forwarding exports, the stubs, and the exports
// that return 0.
#include "api/frame.h"

extern "C" {{

{chr(10).join(defs)}
}}  // extern "C"
"""
    names = [e["name"] for e in exports] + [name for _, name, _ in cjson]
    version_script = "{\n  global:\n" + "".join(f"    {n};\n" for n in names) + "  local: *;\n};\n"
    if windows_arch:
        module_def = gen_module_definition(exports, cjson, windows_arch)
    else:
        numbered = [e for e in exports if e["ordinal"] != "-"]
        module_def = "LIBRARY tiktal\nEXPORTS\n" + "".join(f"    {e['name']} @{e['ordinal']}\n" for e in numbered) + \
            "".join(f"    {e['name']}\n" for e in exports if e["ordinal"] == "-")
    return source, version_script, module_def, "\n".join(names) + "\n"


def c_string(text):
    return '"' + text.replace("\\", "\\\\").replace('"', '\\"') + '"'


def gen_status_table(statuses):
    rows = "\n".join(f"    {{static_cast<std::int32_t>({code}u), {c_string(name)}, {c_string(msg)}}},"
                     for code, name, msg in statuses)
    checks = "\n".join(f"static_assert({name} == static_cast<ViStatus>({code}u), \"{name}\");"
                       for code, name, _ in statuses)
    return f"""// Generated from src/tables/statuses.tsv.
constexpr StatusRow kStatusTable[] = {{
{rows}
}};
{checks}
"""


ENUMERATION_NONE = "-"


def load_service_attributes(tables):
    """The rows of attributes.tsv: identifier, constant, type, whether a time-reference name is
    needed, whether the attribute may be written, its enumeration, and its JSON keys by type."""
    path = os.path.join(tables, "attributes.tsv")
    with open(path, encoding="utf-8") as f:
        header = [line.rstrip("\n").split("\t") for line in f if line.startswith("# identifier")][0]
    types = header[6:]
    attributes = []
    for identifier, constant, value_type, active, access, enumeration, *keys in read_tsv(path):
        if active not in ("required", "not-used") or access not in ("read", "read-write"):
            raise SystemExit(f"attributes.tsv: {constant}: active item {active!r}, access {access!r}")
        if enumeration != ENUMERATION_NONE and value_type != "Int32":
            raise SystemExit(f"attributes.tsv: {constant}: only Int32 attributes have an enumeration")
        attributes.append(dict(id=int(identifier), constant=constant, type=value_type, item=active == "required",
                               writable=access == "read-write", enumeration=enumeration,
                               keys=[(t, "" if k == '""' else k) for t, k in zip(types, keys) if k != "-"]))
    return attributes


def load_module_attributes(tables):
    attributes = []
    for identifier, constant, value_type, access in read_tsv(os.path.join(tables, "module_attributes.tsv")):
        if access not in ("read", "read-write"):
            raise SystemExit(f"module_attributes.tsv: {constant}: access {access!r}")
        attributes.append(dict(id=int(identifier), constant=constant, type=value_type, item=False,
                               writable=access == "read-write", enumeration=ENUMERATION_NONE, keys=[]))
    return attributes


def load_enumerations(tables):
    """Enumeration name -> its members in table order: name, value, service text (None for none)
    and whether other texts read as the member. Names and values are unique within an
    enumeration, and at most one member takes the other texts."""
    enumerations = {}
    for enumeration, member, value, text, others in read_tsv(os.path.join(tables, "enumerations.tsv")):
        if others not in ("yes", "-"):
            raise SystemExit(f"enumerations.tsv: {enumeration}.{member}: others {others!r}")
        enumerations.setdefault(enumeration, []).append(
            dict(name=member, value=int(value, 0), text=None if text == "-" else text, others=others == "yes"))
    for enumeration, members in enumerations.items():
        for field in ("name", "value"):
            values = [m[field] for m in members]
            if len(set(values)) != len(values):
                raise SystemExit(f"enumerations.tsv: {enumeration}: a {field} comes twice")
        if sum(m["others"] for m in members) > 1:
            raise SystemExit(f"enumerations.tsv: {enumeration}: more than one member takes the other texts")
        if not all(re.fullmatch(r"[A-Z][A-Z0-9_]*", m["name"]) for m in members):
            raise SystemExit(f"enumerations.tsv: {enumeration}: member names are upper-case identifiers")
    return enumerations


def check_enumerations(attributes, enumerations):
    for a in attributes:
        if a["enumeration"] != ENUMERATION_NONE and a["enumeration"] not in enumerations:
            raise SystemExit(f"attributes.tsv: {a['constant']}: no enumeration {a['enumeration']}")


def gen_enumerations(enumerations):
    """The enumeration of each enumerated attribute, and the members of every enumeration."""
    names = ", ".join(["None"] + list(enumerations))
    tables = []
    for enumeration, members in enumerations.items():
        rows = "\n".join(f"    {{{c_string(m['name'])}, {m['value']}, {c_string(m['text']) if m['text'] else 'nullptr'}, "
                         f"{'true' if m['others'] else 'false'}}}," for m in members)
        tables.append(f"inline constexpr EnumerationMember k{enumeration}[] = {{\n{rows}\n}};")
    return f"""// Generated from src/tables/enumerations.tsv.
#pragma once

#include <tiktal/tiktal.h>

namespace tiktal {{

// The enumeration whose numbers an Int32 attribute reads and writes (None: a plain number).
enum class Enumeration {{ {names} }};

struct EnumerationMember {{
    const char* name;  // the member's name (also in the tiktal command's output)
    ViInt32 value;     // the number of the C interface
    const char* text;  // the service's text, or null when the member has none of its own
    bool others;       // texts that the enumeration does not list read as this member
}};

{chr(10).join(tables)}

}}  // namespace tiktal
"""


def gen_attribute_dictionary(tables):
    attributes = load_service_attributes(tables)
    records = []
    for a in attributes:
        entries = ", ".join(f'{{"{t}", {c_string(k)}}}' for t, k in a["keys"])
        enumeration = "None" if a["enumeration"] == ENUMERATION_NONE else a["enumeration"]
        records.append(f"    {{{a['constant']}, {{{'true' if a['item'] else 'false'}, AttrValueType::{a['type']}, "
                       f"{{{entries}}}, Enumeration::{enumeration}}}}},")
    checks = "\n".join(f"static_assert({a['constant']} == {a['id']}u, \"{a['constant']}\");" for a in attributes)
    return f"""// Generated from src/tables/attributes.tsv.
const std::unordered_map<ViAttr, ApiAttrData> kHorloApiAttrDict = {{
{chr(10).join(records)}
}};
{checks}
"""


def gen_command_attributes(tables):
    """Every attribute by constant name, with its value type and whether it names a time reference."""
    attributes = load_service_attributes(tables) + load_module_attributes(tables)
    rows = "\n".join(f'    {{"{a["constant"]}", {a["constant"]}, AttributeType::{a["type"]}, '
                     f'{"true" if a["item"] else "false"}}},' for a in attributes)
    # The header's constants are the tables' numbers (the service's are checked with the dictionary).
    checks = "\n".join(f"static_assert({a['constant']} == {a['id']}u, \"{a['constant']}\");"
                       for a in load_module_attributes(tables))
    return f"""// Generated from src/tables/attributes.tsv and src/tables/module_attributes.tsv.
const AttributeInfo kAttributes[] = {{
{rows}
}};
{checks}
"""


ATTRIBUTE_PREFIX = "TIKTAL_ATTR_"
# A Python name cannot start with a digit: the two families of time-reference attributes get words.
PYTHON_FAMILIES = (("1588_", "ptp_"), ("8021AS_", "gptp_"))
PYTHON_TYPES = {"Int32": ("Int32Attribute", "int"), "Real64": ("Real64Attribute", "float"),
                "Boolean": ("BooleanAttribute", "bool"), "String": ("StringAttribute", "str")}


def python_name(constant):
    """TIKTAL_ATTR_1588_PRIORITY1 -> ptp_priority1, TIKTAL_ATTR_8021AS_AS_CAPABLE -> gptp_as_capable."""
    if not constant.startswith(ATTRIBUTE_PREFIX):
        raise SystemExit(f"{constant}: an attribute constant starts with {ATTRIBUTE_PREFIX}")
    name = constant[len(ATTRIBUTE_PREFIX):]
    for prefix, word in PYTHON_FAMILIES:
        if name.startswith(prefix):
            name = word + name[len(prefix):]
    name = name.lower()
    if not re.fullmatch(r"[a-z_][a-z0-9_]*", name):
        raise SystemExit(f"{constant}: {name!r} is not a Python name")
    return name


def python_descriptor(a):
    """One attribute as a class member with its docstring."""
    access = "read and write" if a["writable"] else "read only"
    if a["enumeration"] != ENUMERATION_NONE:
        call = f"EnumAttribute({a['id']}, {a['constant']!r}, {a['enumeration']}, writable={a['writable']})"
        what = f"{a['enumeration']} (Int32), {access}"
    else:
        cls, kind = PYTHON_TYPES[a["type"]]
        call = f"{cls}({a['id']}, {a['constant']!r}, writable={a['writable']})"
        what = f"{kind} ({a['type']}), {access}"
    return f'    {python_name(a["constant"])} = {call}\n    """{a["constant"]} ({a["id"]}): {what}."""\n'


def gen_python_attributes(tables):
    """The Python package's enumerations, and its attributes as typed properties: those that name
    a time reference on the time references, the others on the session."""
    service = load_service_attributes(tables)
    module = load_module_attributes(tables)
    enumerations = load_enumerations(tables)
    check_enumerations(service, enumerations)
    names = [python_name(a["constant"]) for a in service + module]
    if len(set(names)) != len(names):
        raise SystemExit("two attributes have the same Python name")
    enum_classes = []
    for enumeration, members in enumerations.items():
        users = ", ".join(python_name(a["constant"]) for a in service if a["enumeration"] == enumeration)
        body = "".join(f"    {m['name']} = {m['value']}\n" for m in members)
        enum_classes.append(f'class {enumeration}(enum.IntEnum):\n    """The numbers of {users or "no attribute"}."""\n\n{body}')
    session = [a for a in service if not a["item"]] + module
    reference = [a for a in service if a["item"]]
    exported = ", ".join(repr(e) for e in enumerations)
    return (
        '"""Enumerations and attributes of libtiktal, generated by tools/codegen/gen.py from\n'
        'src/tables/attributes.tsv, module_attributes.tsv and enumerations.tsv: do not edit."""\n'
        "import enum\n\n"
        "from .attributes import BooleanAttribute, EnumAttribute, Int32Attribute, Real64Attribute, StringAttribute\n\n"
        f"__all__ = [{exported}, 'SessionAttributes', 'TimeReferenceAttributes']\n\n\n"
        + "\n\n".join(enum_classes)
        + "\n\nclass SessionAttributes:\n"
        '    """The attributes of a session that name no time reference: those of a time service\'s\n'
        '    selected time reference, and those of a timing module."""\n\n'
        "    __slots__ = ()\n\n"
        + "\n".join(python_descriptor(a) for a in session)
        + "\n\nclass TimeReferenceAttributes:\n"
        '    """The attributes of one time reference of a time service."""\n\n'
        "    __slots__ = ()\n\n"
        + "\n".join(python_descriptor(a) for a in reference))


ROCO_FUNCTION_COUNT = 56
QPXI_FUNCTION_COUNT = 17


def load_functions(tables, file_name, first, count):
    """The rows of a library's function table, numbered first, first + 1, ... in order."""
    rows = read_tsv(os.path.join(tables, file_name))
    functions = [dict(index=int(i), name=n, result=r, params=parse_params(p)) for i, n, r, p in rows]
    if [f["index"] for f in functions] != list(range(first, first + count)):
        raise SystemExit(f"{file_name}: expected the rows {first} to {first + count - 1} in order")
    return functions


def load_roco_functions(tables):
    return load_functions(tables, "roco_functions.tsv", 0, ROCO_FUNCTION_COUNT)


def c_params(params):
    return ", ".join(f"{t} {n}" for t, n in params) or "void"


def gen_c_header(functions, prefix, table, what, types=""):
    """The C interface of a library that reports through the JSON status record: the record, the
    library's own `types`, and a typedef and a prototype for each function."""
    macro = prefix.upper()
    typedefs = "\n".join(f"typedef {f['result']} (*{prefix}_{f['name']}_fn)({c_params(f['params'])});" for f in functions)
    prototypes = "\n".join(f"{macro}_EXPORT {f['result']} {prefix}_{f['name']}({c_params(f['params'])});"
                           for f in functions)
    return f"""/* Generated from src/tables/{table}: the C interface of {what}. */
#ifndef {macro}_H
#define {macro}_H

#include <stdint.h>

#ifdef __cplusplus
extern "C" {{
#endif

/* The status record of one call: the caller makes a fresh one with code 0 and no text; a failing
   call sets a negative code (a warning a positive one) and writes a JSON object into the text,
   after asking the caller's reallocate for room. */
typedef struct {prefix}_Status {prefix}_Status;
/* Makes room for `capacity` bytes of text, or frees the text when it is 0; nonzero on success.
   A capacity above 0x7FFFFFFF fails. */
typedef int32_t (*{prefix}_Reallocate)({prefix}_Status* status, uint32_t capacity);
struct {prefix}_Status {{
    int32_t code;
    uint32_t capacity;
    {prefix}_Reallocate reallocate;
    char* json;
}};
{types}
#ifndef {macro}_EXPORT
#define {macro}_EXPORT
#endif

{typedefs}

{prototypes}

#ifdef __cplusplus
}}
#endif

#endif
"""


def gen_roco_header(functions):
    return gen_c_header(functions, "zrrocoapi", "roco_functions.tsv", "the routing service")


def gen_roco_table(functions):
    names = "\n".join(f'    "zrrocoapi_{f["name"]}",' for f in functions)
    decls, calls = [], []
    for f in functions:
        args = ", ".join(n for _, n in f["params"])
        fn = f"zrrocoapi_{f['name']}_fn"
        params = c_params(f["params"])
        decls.append(f"    virtual bool has_{f['name']}() const = 0;\n"
                     f"    virtual {f['result']} {f['name']}({params}) = 0;")
        calls.append(f"    bool has_{f['name']}() const override {{ return _functions[{f['index']}] != nullptr; }}\n"
                     f"    {f['result']} {f['name']}({params}) override {{\n"
                     f"        return reinterpret_cast<{fn}>(_functions[{f['index']}])({args});\n    }}")
    return f"""// Generated from src/tables/roco_functions.tsv: the routing service's functions as the library
// calls them, one pair of slots per function in table order.
#pragma once

#include <cstddef>

#include "zrrocoapi.h"

namespace zrrocoapi::dynlib {{

inline constexpr std::size_t kFunctionCount = {len(functions)};

// The export names, in table order.
inline constexpr const char* kFunctionNames[kFunctionCount] = {{
{names}
}};

// For each function: whether it is loaded, and the call itself.
class RoCoLibInterface {{
public:
    virtual ~RoCoLibInterface() = default;
{chr(10).join(decls)}
}};

// The loaded functions; all null until the loader fills them.
class RoCoLib final : public RoCoLibInterface {{
public:
    static constexpr std::size_t kCount = kFunctionCount;
    static const char* name(std::size_t index) {{ return kFunctionNames[index]; }}

{chr(10).join(calls)}

    // Where the loader puts function `index` of the table.
    void*& function(std::size_t index) {{ return _functions[index]; }}

private:
    void* _functions[kFunctionCount] = {{}};
}};

}}  // namespace zrrocoapi::dynlib
"""


def load_qpxi_functions(tables):
    return load_functions(tables, "qpxi_functions.tsv", 1, QPXI_FUNCTION_COUNT)


QPXI_TYPES = """
/* The PCI address of a device as the library takes it: 16 bytes, the first word 0. */
typedef struct zrqpxi_PciAddress {
    uint32_t reserved;
    uint32_t bus;
    uint32_t device;
    uint32_t function;
} zrqpxi_PciAddress;
"""


def gen_qpxi_header(functions):
    return gen_c_header(functions, "zrqpxi", "qpxi_functions.tsv", "the PXI chassis query library", QPXI_TYPES)


def gen_qpxi_table(functions):
    names = "\n".join(f'    "zrqpxi_{f["name"]}",' for f in functions)
    decls, calls = [], []
    for f in functions:
        params = c_params(f["params"])
        args = ", ".join(n for _, n in f["params"])
        slot = f"_functions[{f['index'] - 1}]"
        call = f"reinterpret_cast<zrqpxi_{f['name']}_fn>({slot})({args})"
        decls.append(f"    virtual {f['result']} {f['name']}({params}) = 0;")
        if f["params"] and f["params"][-1][0] == "zrqpxi_Status*":
            guard = f"if (!{slot}) notLoaded(kFunctionNames[{f['index'] - 1}]);"
        else:  # no status to report in: a function that is not loaded does nothing
            guard = f"if (!{slot}) return{' 0' if f['result'] != 'void' else ''};"
        calls.append(f"    {f['result']} {f['name']}({params}) override {{\n"
                     f"        {guard}\n        return {call};\n    }}")
    return f"""// Generated from src/tables/qpxi_functions.tsv: the PXI chassis query library's functions as
// the library calls them, one slot per function in table order after the destructor.
#pragma once

#include <cstddef>

#include "zrqpxi.h"

namespace zrqpxi {{

inline constexpr std::size_t kFunctionCount = {len(functions)};

// The export names, in table order.
inline constexpr const char* kFunctionNames[kFunctionCount] = {{
{names}
}};

// The library's functions: the destructor, then slots 1 to {len(functions)} in table order.
class QPXILibrary {{
public:
    virtual ~QPXILibrary() = default;
{chr(10).join(decls)}
}};

// Raises the failure of calling `name`, a function that is not loaded.
[[noreturn]] void notLoaded(const char* name);

// The functions as loaded, all null until the loader fills them. A function that takes a status
// record raises a failure when it is not loaded; the others then do nothing and answer 0.
class QPXIFunctionTable : public QPXILibrary {{
public:
{chr(10).join(calls)}

    // Function `index` of the table (0 is the first, slot 1).
    void* function(std::size_t index) const noexcept {{ return _functions[index]; }}

protected:
    void* _functions[kFunctionCount] = {{}};
}};

}}  // namespace zrqpxi
"""


FIELD_BYTES = {"u32": 4, "u64": 8, "i32": 4}


def parse_fields(text):
    """'a:u32,pad,st' -> [('a', 'u32'), ('pad', None), ('st', 'i32')]."""
    fields = []
    for field in text.split(","):
        if field == "st":
            fields.append(("st", "i32"))
        elif field == "pad":
            fields.append(("pad", None))
        else:
            name, kind = field.split(":")
            fields.append((name, kind))
    return fields


def packet_size(fields):
    return sum(FIELD_BYTES.get(kind, 4) for _, kind in fields)


def load_device_requests(tables):
    requests = []
    for interface, slot, name, code, params, inputs, outputs, result in read_tsv(os.path.join(tables, "device_requests.tsv")):
        requests.append(dict(interface=interface, slot=int(slot), name=name, code=code,
                             params=[] if params == "-" else params.split(","),
                             input=parse_fields(inputs), output=parse_fields(outputs), result=result.split(";")))
    for interface, count in (("tiktal", 9), ("routing", 11)):
        slots = [r["slot"] for r in requests if r["interface"] == interface]
        if slots != list(range(count)):
            raise SystemExit(f"device_requests.tsv: {interface} needs the slots 0 to {count - 1} in order")
    return requests


def gen_device_request_table(requests):
    rows = "\n".join(f'    {{"{r["name"]}", {r["code"]}u, {packet_size(r["input"])}, {packet_size(r["output"])}}},'
                      for r in requests)
    return f"""// Generated from src/tables/device_requests.tsv: the timing module's driver requests, their
// control codes and packet sizes in bytes.
#pragma once

#include <cstdint>

namespace tiktalq300::requests {{

struct Request {{
    const char* name;
    std::uint32_t code;
    std::uint32_t inputSize;
    std::uint32_t outputSize;
}};

inline constexpr Request kRequests[] = {{
{rows}
}};

// A driver wait, and its cancel (packets of 24 and 8 bytes, no output).
inline constexpr std::uint32_t kWaitCode = 0x0022FC00u;
inline constexpr std::uint32_t kCancelWaitCode = 0x0022FC04u;
inline constexpr std::uint32_t kWaitInputSize = 24;
inline constexpr std::uint32_t kCancelWaitInputSize = 8;

}}  // namespace tiktalq300::requests
"""


def request_params(r):
    params = [f"std::uint32_t* {p[1:]}" if p.startswith("*") else f"std::uint32_t {p}" for p in r["params"]]
    return ", ".join(params + ["nZRAPALS100::tStatus& status"])


def request_return(r):
    returned = [x for x in r["result"] if x != "-" and "=" not in x]
    if not returned:
        return "void"
    return "std::uint16_t" if returned[0].endswith(":u16") else "std::uint32_t"


def request_body(r):
    void = request_return(r) == "void"
    fail = "return;" if void else "return 0;"
    lines = [f"    if (status.isError()) {fail}"]
    pointers = {p[1:] for p in r["params"] if p.startswith("*")}
    for pointer in sorted(pointers):
        lines.append(f"    if (!{pointer}) {{\n        mergeNullArgument(status, __FILE__, __LINE__);\n        {fail}\n    }}")
    lines.append(f"    PacketWriter in({packet_size(r['input'])});")
    for name, kind in r["input"]:
        if name == "pad":
            lines.append("    in.pad();")
        elif name == "st":
            lines.append("    in.i32(status.code);")
        else:
            value = f"*{name}" if name in pointers else name
            lines.append(f"    in.{kind}({value});")
    out_size = packet_size(r["output"])
    lines.append(f"    std::uint8_t out[{out_size}] = {{}};")
    lines.append(f"    if (!request({r['code']}u, in, out, sizeof out, status)) {fail}")
    lines.append("    PacketReader reader(out);")
    for name, kind in r["output"]:
        if name == "st":
            lines.append("    mergeDriverStatus(reader.i32(), status, __FILE__, __LINE__);")
        else:
            lines.append(f"    const std::uint32_t {name}Out = reader.u32();")
    for result in r["result"]:
        if "=" in result:
            target, field = result.split("=")
            lines.append(f"    *{target} = {field}Out;")
    returned = [x for x in r["result"] if x != "-" and "=" not in x]
    if returned:
        field = returned[0].split(":")[0]
        cast = "static_cast<std::uint16_t>" if returned[0].endswith(":u16") else ""
        lines.append(f"    return {cast}({field}Out);")
    return "\n".join(lines)


def gen_device_proxy(requests):
    def decls(interface, pure):
        suffix = " = 0;" if pure else " override;"
        return "\n".join(f"    virtual {request_return(r)} {r['name']}({request_params(r)}){suffix}"
                         for r in requests if r["interface"] == interface)
    header = f"""// Generated from src/tables/device_requests.tsv: the timing module's driver requests as
// interfaces, and the proxy that sends them.
#pragma once

#include <cstdint>

#include "timing/interface_proxy.h"

namespace tiktalq300 {{

class iInterfaceProxy_tiktal : public virtual tiktal::nZRAPAL000::iInterfaceProxy {{
public:
{decls("tiktal", True)}
}};

}}  // namespace tiktalq300

namespace tiktal {{

class iInterfaceProxy_routing : public virtual nZRAPAL000::iInterfaceProxy {{
public:
{decls("routing", True)}
}};

}}  // namespace tiktal

namespace tiktalq300 {{

class tInterfaceProxy_tiktal final : public tiktal::nZRAPAL000::tDeviceInterfaceProxy,
                                     public iInterfaceProxy_tiktal,
                                     public tiktal::iInterfaceProxy_routing {{
public:
    tInterfaceProxy_tiktal() = default;
    ~tInterfaceProxy_tiktal() override;

{decls("tiktal", False)}
{decls("routing", False)}
}};

}}  // namespace tiktalq300
"""
    bodies = "\n\n".join(f"{request_return(r)} tInterfaceProxy_tiktal::{r['name']}({request_params(r)}) {{\n"
                          f"{request_body(r)}\n}}" for r in requests)
    source = f"""// Generated from src/tables/device_requests.tsv: each request builds its input packet field by
// field, sends it, and reads the driver's answer and status from the output packet.
#include "InterfaceProxyTiktal.h"

#include "timing/packet.h"

namespace tiktalq300 {{

using tiktal::nZRAPAL000::PacketReader;
using tiktal::nZRAPAL000::PacketWriter;

tInterfaceProxy_tiktal::~tInterfaceProxy_tiktal() {{ close(); }}

{bodies}

}}  // namespace tiktalq300
"""
    return header, source


def main():
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument("--tables", required=True)
    parser.add_argument("--out", required=True)
    parser.add_argument("--cjson-header", help="cJSON's header, whose functions the library exports too")
    parser.add_argument("--windows", choices=("i686", "x86_64"),
                        help="write the exports for tiktal.dll of this architecture")
    args = parser.parse_args()
    ops, exports, statuses = load(args.tables)
    os.makedirs(args.out, exist_ok=True)
    files = {}
    files["SessionClass.h"], files["SessionClass.cpp"] = gen_session_class(ops)
    files["SessionDebugPrintOnly.h"], files["SessionDebugPrintOnly.cpp"] = gen_trace_session(ops)
    cjson = read_cjson_functions(args.cjson_header)
    files["apiFunctions.cpp"], files["exports.map"], files["tiktal.def"], files["exports.txt"] = gen_exports(
        exports, cjson, args.windows)
    files["cjsonForwarders.cpp"] = gen_cjson_forwarders(cjson)
    files["statusTable.inc"] = gen_status_table(statuses)
    files["HorloApiAttrDict.inc"] = gen_attribute_dictionary(args.tables)
    enumerations = load_enumerations(args.tables)
    check_enumerations(load_service_attributes(args.tables), enumerations)
    files["enumerations.h"] = gen_enumerations(enumerations)
    files["python/_attributes.py"] = gen_python_attributes(args.tables)
    files["commandAttributes.inc"] = gen_command_attributes(args.tables)
    roco = load_roco_functions(args.tables)
    files["zrrocoapi.h"] = gen_roco_header(roco)
    files["RoCoLib.h"] = gen_roco_table(roco)
    qpxi = load_qpxi_functions(args.tables)
    files["zrqpxi.h"] = gen_qpxi_header(qpxi)
    files["QPXILibrary.h"] = gen_qpxi_table(qpxi)
    device_requests = load_device_requests(args.tables)
    files["deviceRequests.h"] = gen_device_request_table(device_requests)
    files["InterfaceProxyTiktal.h"], files["InterfaceProxyTiktal.cpp"] = gen_device_proxy(device_requests)
    for name, text in files.items():
        path = os.path.join(args.out, name)
        os.makedirs(os.path.dirname(path), exist_ok=True)
        old = open(path, encoding="utf-8").read() if os.path.exists(path) else None
        if old != text:
            with open(path, "w", encoding="utf-8") as f:
                f.write(text)


if __name__ == "__main__":
    main()
