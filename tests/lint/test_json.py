"""The JSON library throws on ordinary mistakes, so values are read through JsonHelper. A call that
can throw is right only where the line itself, or one shortly before it, has asked for the type."""

import re

from sources import SOURCE, cpp_files, name

THROWING = re.compile(
    r"(?<!JsonHelper::)\b(?:\.|->)(as(?:String|CString|Int|Int64|UInt|UInt64|Bool|Double|Float|"
    r"LargestInt|LargestUInt)|isMember|getMemberNames)\(\)?"
)
# What asks for the type of a value that is then converted.
GUARD = re.compile(
    r"\bis(String|Int|Int64|UInt|UInt64|Bool|Double|Numeric|Object|Array|Null)\(|"
    r"\btype\(\) == Json::\w+Value"
)
GUARD_DISTANCE = 6  # lines

# Files that may, and why.
ALLOWED = {
    "webapi/json/JsonHelper.cpp": "it is the place where types are asked for",
    "platform/schema/module/Values.cpp": "it branches on the type of every value that it compares",
    "webapi/json/Writer.cpp": "it branches on the type of every value that it writes",
}


def unguarded(path):
    lines = path.read_text().splitlines()
    for number, line in enumerate(lines, 1):
        code = line.split("//")[0]
        if THROWING.search(code):
            before = lines[max(0, number - 1 - GUARD_DISTANCE):number]
            if not any(GUARD.search(earlier) for earlier in before):
                yield f"{name(path)}:{number}: {line.strip()}"


def test_ThrowingConversions_AreGuarded():
    checked = [
        path
        for path in cpp_files()
        if name(path).startswith(("webapi/", "platform/", "programs/", "apis/"))
        and name(path) not in ALLOWED
    ]
    assert checked
    assert [line for path in checked for line in unguarded(path)] == []


def test_AllowedFiles_Exist():
    assert [path for path in ALLOWED if not (SOURCE / path).exists()] == []
