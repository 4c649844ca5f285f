"""docs/logs.md names every message that the sources log, and no other."""

import re

import pytest

from sources import SOURCE, cpp_files, name

TABLE = SOURCE / "docs/logs.md"
PRODUCT = ("include/", "webapi/", "platform/", "programs/", "apis/")

LITERAL = r'"(?:[^"\\]|\\.)*"'
LITERALS = re.compile(rf"\s*({LITERAL}(?:\s*{LITERAL})*)\s*\Z")
MACRO = re.compile(r"^#define (\w+)\(((?:.*\\\n)*.*)", re.MULTILINE)
CONSTANT = re.compile(rf"\bconstexpr char (\w+)\[\] = ({LITERAL});")
# A source that is a parameter: what callers hand in.
HANDED_IN = {
    "webapi/runner/execution/Fence.h": {"APIRunner.cpp", "APIPolling.cpp", "WebEntry"},
    "webapi/model/response/HeaderLines.cpp": {"APIDownload.cpp", "WebEntry.cpp"},
}
FACILITIES = {"LOG_AUTH": "auth", "LOG_AUTHPRIV": "authpriv"}
LEVELS = {"LOG_CRIT": "crit", "LOG_ERR": "err", "LOG_WARNING": "warning", "LOG_NOTICE": "notice",
          "LOG_INFO": "info", "LOG_DEBUG": "debug"}


def product_files():
    return [path for path in cpp_files() if name(path).startswith(PRODUCT)]


def without_comments(text):
    pattern = re.compile(rf"({LITERAL}|'(?:[^'\\]|\\.)+')|//[^\n]*")
    return pattern.sub(lambda found: found.group(1) or "", text)


def arguments(text, start):
    """The arguments of a call whose opening parenthesis ends at `start`."""
    found, depth, begin, position = [], 1, start, start
    token = re.compile(rf"{LITERAL}|'(?:[^'\\]|\\.)+'|[()\[\]{{}},]")
    while depth > 0:
        match = token.search(text, position)
        assert match, text[start:start + 80]
        position = match.end()
        mark = match.group()
        if mark in "([{":
            depth += 1
        elif mark in ")]}":
            depth -= 1
        if depth == 0 or (depth == 1 and mark == ","):
            found.append(text[begin:match.start()].strip())
            begin = position
    return found


def level_of(priority):
    words = set(re.findall(r"\bLOG_\w+", priority))
    facilities = [FACILITIES[word] for word in words if word in FACILITIES]
    levels = [LEVELS[word] for word in words if word in LEVELS]
    assert len(levels) == 1 and len(facilities) <= 1, priority
    return f"{(facilities or ['user'])[0]}.{levels[0]}"


def text_of(expression):
    match = LITERALS.match(expression)
    assert match, f"not a text: {expression}"
    return "".join(re.findall(LITERAL, match.group(1))).replace('""', "").strip('"')


def log_macros():
    """The macros that make a message of a source and a format, with their level."""
    found = {}
    for path in product_files():
        for macro, body in MACRO.findall(path.read_text()):
            if re.search(r"\bsyslog\(", body):
                assert body.startswith("source, format, ..."), f"{name(path)}: {macro}"
                found[macro] = level_of(body)
    return found


def constants():
    """Texts with a name, by (file, name) and, for those of headers, by name alone."""
    found = {}
    for path in product_files():
        for constant, text in CONSTANT.findall(path.read_text()):
            found[name(path), constant] = text_of(text)
            if path.suffix == ".h":
                found[constant] = text_of(text)
    return found


def sources_of(path, expression, names):
    if LITERALS.match(expression):
        return {text_of(expression)}
    known = names.get((name(path), expression), names.get(expression))
    return {known} if known else HANDED_IN[name(path)]


def messages_of(path, macros, names):
    text = without_comments(path.read_text())
    for call in re.finditer(rf"\b({'|'.join([*macros, 'syslog'])})\(", text):
        if text[:call.start()].rsplit("\n", 1)[-1].startswith("#define") or (
                text[:call.start()].rstrip().endswith("\\")):
            continue  # the macro itself
        given = arguments(text, call.end())
        if call.group(1) == "syslog":
            level, form, source = level_of(given[0]), text_of(given[1]), given[2]
            assert form.startswith(("%s:%d ", "%s(%d)")), f"{name(path)}: {form}"
            form = form.removeprefix("%s:%d ")
        else:
            level, form, source = macros[call.group(1)], text_of(given[1]), given[0]
        for named in sources_of(path, source, names):
            yield named, level, form


def logged():
    macros, names = log_macros(), constants()
    return {message for path in product_files() for message in messages_of(path, macros, names)}


def rows():
    """(source, level, message) of each row, with what it means and what to do."""
    source = None
    for line in TABLE.read_text().splitlines():
        heading = re.match(r"#+ (\S+)$", line)
        source = heading.group(1) if heading else source
        row = re.match(r"\| `(.*?)` \| (\w+\.\w+) \| (.+?) \| (.+?) \|$", line)
        if row:
            yield (source, row.group(2), row.group(1)), row.group(3), row.group(4)


def test_LoggedMessages_StandInTheTable():
    found = logged()
    assert found
    missing = sorted(found - {message for message, _, _ in rows()})
    assert missing == [], "a row each, below the heading of its source, is missing in docs/logs.md"


def test_Table_NamesLoggedMessagesAlone():
    gone = sorted({message for message, _, _ in rows()} - logged())
    assert gone == [], "no source logs this any more; take it out of docs/logs.md"


def test_Table_NamesEachMessageOnce():
    messages = [message for message, _, _ in rows()]
    assert sorted({message for message in messages if messages.count(message) > 1}) == []


def test_Messages_GoToSyslogByCallsThatTheTableSees():
    """A message that is put together elsewhere could not be compared."""
    hidden = [name(path) for path in product_files() if re.search(r"\bvsyslog\(", path.read_text())]
    assert hidden == []


@pytest.mark.parametrize("call,expected", [
    ('syslog(LOG_AUTH | LOG_INFO, "%s:%d a(%d)", "A.cpp", line, 1)', ("A.cpp", "auth.info", "a(%d)")),
    ('X_LOG("B.cpp", "one "\n  "two, (%s)", text(")", 1))', ("B.cpp", "user.err", "one two, (%s)")),
    ('X_LOG(kName, "c")  // X_LOG("D.cpp", "d")', ("C.cpp", "user.err", "c")),
])
def test_Reader_TakesCallsApart(call, expected, tmp_path, monkeypatch):
    monkeypatch.setattr("test_log_table.name", lambda path: path.name)
    path = tmp_path / "some.cpp"
    path.write_text(call)
    names = {("some.cpp", "kName"): "C.cpp"}
    assert list(messages_of(path, {"X_LOG": "user.err"}, names)) == [expected]
