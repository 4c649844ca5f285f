"""A log line is short, whatever a client sent: a text that may be a client's goes through LogText,
which cuts it and takes control characters out."""

import re

from sources import name
from test_log_table import arguments, product_files, text_of, without_comments

CALL = re.compile(r"\b(WEBAPI_LOG|syslog)\s*\(")
CONVERSION = re.compile(r"%(?:%|[-+ #0]*\d*(?:\.\d+)?(?:hh|h|ll|l|z|j|t)?([a-zA-Z]))")
# What is never a client's: a literal, a constant, a file's line, what the system says of an error.
OURS = re.compile(r'^(?:"[^"]*"|k[A-Z]\w*|Paths::k\w+|QELO::Paths::k\w+|strerror\(.*\))$', re.DOTALL)
CUT = re.compile(r"^(?:QELO::)?LogText\(.*\)\.c_str\(\)$", re.DOTALL)

# Other texts that log lines show as they are, and whose they are.
ALLOWED = {
    ("platform/base/ModuleLoader.cpp", "path.c_str()"): "the platform's own module",
    ("platform/base/ModuleLoader.cpp", 'error != nullptr ? error : ""'): "the loader, of a module",
    ("platform/process/WebServer.cpp", "settings.pidFile.c_str()"): "a setting",
    ("platform/tasks/Task.cpp",
     'text.empty() && Platform::isTaskPropertyName(name) ? "its value nests too deep" '
     ': "its name cannot be one"'): "two literals",
    ("platform/tasks/module/TaskModule.cpp", "settings_.directory"): "the build's",
    ("platform/tasks/module/TaskModule.cpp",
     "opened ? use.Database().Error().c_str() : use.Error().c_str()"):
        "the database's or the system's word on a file",
    ("platform/tasks/module/TaskSchema.cpp", "directory.Path().c_str()"): "named by a user's number",
    ("platform/tasks/StorePlace.cpp", "name.c_str()"): "a user's number",
    ("platform/tasks/StorePlace.cpp", "aside.c_str()"): "a user's number and a secret",
    ("webapi/entry/WebEntry.cpp", "name"): "one of four variables",
    ("webapi/entry/sharing/HeldIds.cpp", "call"): "two literals",
    ("webapi/runner/execution/Credentials.cpp", "call"): "two literals",
    ("webapi/runner/execution/Credentials.cpp", "message"): "the system's word on an error",
    ("webapi/runner/execution/Fence.h", "what"): "literals",
}


def texts_of(path):
    """The arguments that log calls of a file show as text, as (line number, argument)."""
    code = without_comments(path.read_text())
    for match in CALL.finditer(code):
        # syslog(priority, format, ...), WEBAPI_LOG(source, format, ...)
        form, *values = arguments(code, match.end())[1:]
        kinds = [kind for kind in CONVERSION.findall(text_of(form)) if kind not in ("", "m")]
        assert len(kinds) == len(values), (name(path), form, values)
        line = code.count("\n", 0, match.start()) + 1
        for kind, value in zip(kinds, values):
            if kind == "s":
                yield line, re.sub(r"\s+", " ", value)


def checked():
    """All sources but the header that has the macro."""
    return [path for path in product_files() if name(path) != "webapi/base/Log.h"]


def test_LogLines_CutWhatAClientMayHaveChosen():
    shown = [(name(path), line, text) for path in checked() for line, text in texts_of(path)]
    assert len(shown) > 20
    assert [
        f"{file}:{line}: {text}"
        for file, line, text in shown
        if not OURS.match(text) and not CUT.match(text) and (file, text) not in ALLOWED
    ] == []


def test_AllowedTexts_AreStillShown():
    shown = {(name(path), text) for path in checked() for _, text in texts_of(path)}
    assert set(ALLOWED) - shown == set()
