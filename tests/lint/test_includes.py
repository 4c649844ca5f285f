"""Who may include whom. The folders are layers; each names only what it is built on."""

import re

import pytest

from sources import SOURCE, cpp_files, files, includes, name, run

# The JSON type with its helpers, the mark of what is exported and the table of error codes belong to
# everybody.
COMMON = {"webapi/JsonHelper.h", "webapi/json/Literal.h", "webapi/Export.h",
          "webapi/WebAPIError.h"}

PUBLIC = "include/webapi"
FLOOR = {"webapi/base"}
SEAM = {"webapi/platform"}
# Folder: folders whose headers it may name, beside its own. An exported header belongs to the folder
# that implements it.
ALLOWED = {
    "include/webapi": set(),
    "webapi/base": set(),
    "webapi/json": FLOOR,
    "webapi/platform": set(),
    "webapi/model": FLOOR | SEAM,
    "webapi/runner": FLOOR | SEAM | {"webapi/json", "webapi/model"},
    "webapi/batch": FLOOR | SEAM | {"webapi/model", "webapi/runner"},
    "webapi/transfer": FLOOR | SEAM | {"webapi/model", "webapi/runner"},
    "webapi/entry": FLOOR | SEAM | {"webapi/model", "webapi/runner", "webapi/batch",
                                    "webapi/transfer"},
    "platform": FLOOR | SEAM | {"webapi/json"},
    "programs/server": FLOOR | SEAM,
    "programs": FLOOR | SEAM | {"webapi/json", "webapi/model", "webapi/runner", "webapi/batch",
                                "webapi/transfer", "webapi/entry", "programs/server"},
    "apis": {"webapi/model", "webapi/runner", "webapi/batch", "webapi/transfer", "webapi/entry",
             PUBLIC},
}
# Exported headers whose file of the same name is none: the folder that they belong to.
IMPLEMENTED_IN = {
    "APITable.h": "webapi/runner",
    "HttpStatus.h": "webapi/model",
    "WebAPIErrorText.h": "webapi/runner",
}
# A file that names what its folder may not, and why.
EXCEPTIONS = {
    ("programs/webapi-token/Commands.cpp", "platform"):
        "the administrators' program for the token database, which is the embedded platform's own",
    ("programs/webapi/doctor/Host.cpp", "platform"):
        "the administrators' program looks at the places that the embedded platform alone knows",
    ("webapi/runner/APIRunner.cpp", "webapi/batch"):
        "a compound request is one of a call's three roads, and its entries are dispatched "
        "again: the circle is the call's own",
    ("webapi/runner/exec/ExecHandler.cpp", "webapi/batch"):
        "a call from code gets its answer from a child by the same pipe as an entry does",
}


def folder_of(path):
    """The layer that a file belongs to."""
    parts = name(path).split("/")
    if parts[:2] == ["programs", "server"]:
        return "programs/server"
    if parts[0] in ("platform", "programs", "apis"):
        return parts[0]
    return "/".join(parts[:2])


def implementing_folder(header):
    """The layer that an exported header belongs to. Those that nothing implements, Method.h and what
    stands in folders, are made of the others and belong to no room of the library."""
    if header == "Method.h" or "/" in header:
        return PUBLIC
    if header in IMPLEMENTED_IN:
        return IMPLEMENTED_IN[header]
    sources = files(f"webapi/**/{header.removesuffix('.h')}.cpp")
    assert len(sources) == 1, f"{header}: who implements it?"
    return folder_of(sources[0])


def target_of(header):
    """The layer that a header as written in an #include belongs to; None when it is not ours."""
    if header in COMMON:
        return None
    if header.startswith("webapi/"):
        if (SOURCE / "include" / header).exists():
            return implementing_folder(header.removeprefix("webapi/"))
        assert (SOURCE / header).exists(), header
        return "/".join(header.split("/")[:2])
    if header.startswith("platform/"):
        return "platform"
    if header.startswith("programs/"):
        return folder_of(SOURCE / header)
    return None


def named_layers(path):
    """The layers that a file names beside its own, as (line number, header, layer)."""
    exported = folder_of(path) == PUBLIC  # exported headers name each other
    for number, header in includes(path):
        target = target_of(header)
        if target in (None, folder_of(path)):
            continue
        if not (exported and (SOURCE / "include" / header).exists()):
            yield number, header, target


def test_Includes_KeepToTheLayers():
    wrong = []
    for path in cpp_files():
        folder = folder_of(path)
        if folder not in ALLOWED:
            continue
        for number, header, target in named_layers(path):
            if target not in ALLOWED[folder] and (name(path), target) not in EXCEPTIONS:
                wrong.append(f"{name(path)}:{number}: {folder} may not include {header}")
    assert wrong == []


def test_ApisAndPlugins_KnowTheExportedHeadersAlone():
    wrong = [
        f"{name(path)}:{number}: {header}"
        for path in cpp_files()
        if name(path).startswith(("apis/", "tests/plugins/"))
        for number, header in includes(path)
        if header.startswith(("webapi/", "platform/")) and not (SOURCE / "include" / header).exists()
    ]
    assert wrong == []


def test_Exceptions_AreStillNeeded():
    needed = {
        (name(path), target)
        for path in cpp_files()
        if folder_of(path) in ALLOWED
        for _, _, target in named_layers(path)
    }
    assert set(EXCEPTIONS) - needed == set()


def test_Architecture_HasTheSameTable():
    text = (SOURCE / "docs/architecture.md").read_text()
    rows = re.findall(r"^\| `([\w/]+)` \| ((?:nothing|`webapi/).*?) \|$", text, re.MULTILINE)
    table = {folder: set(re.findall(r"`([\w/]+)`", allowed)) for folder, allowed in rows}
    built = {folder for folder in ALLOWED if (SOURCE / folder).exists()}
    assert table == {folder: ALLOWED[folder] & built for folder in built}
    assert [path for path, _ in EXCEPTIONS if f"`{path}`" not in text] == []


def test_Layers_AreTheFoldersThatThereAre():
    folders = {folder_of(path) for path in files("*.cpp", "*.h")}
    folders = {folder for folder in folders if folder.split("/")[0] not in ("tests", "bench", "fuzz", "examples")}
    assert folders - set(ALLOWED) == set()


def room_of(file):
    """The subject within a layer, as "platform/login"; a loadable module counts to its subject. Files
    at a layer's top belong to no subject."""
    parts = file.split("/")
    depth = 2 if parts[0] == "platform" else 3
    return "/".join(parts[:depth]) if len(parts) > depth else None


def test_Rooms_FormNoCircle():
    """Within a layer the subjects stand one upon the other."""
    edges = {}
    for path in cpp_files():
        room = room_of(name(path)) if name(path).startswith(("webapi/", "platform/")) else None
        for _, header in includes(path) if room else []:
            other = room_of(header) if header.startswith(("webapi/", "platform/")) else None
            if other not in (None, room) and (SOURCE / header).exists():
                edges.setdefault(room, set()).add(other)
    assert edges
    done = set()

    def walk(room, road):
        assert room not in road, " -> ".join([*road[road.index(room):], room])
        if room not in done:
            for other in sorted(edges.get(room, ())):
                walk(other, [*road, room])
            done.add(room)

    for room in sorted(edges):
        walk(room, [])


def test_GroundFloor_KnowsNothingOfOurs():
    files_of_it = [path for path in cpp_files() if folder_of(path) == "webapi/base"]
    assert files_of_it
    wrong = [
        f"{name(path)}:{number}: {header}"
        for path in files_of_it
        for number, header in includes(path)
        if header.startswith(("webapi/", "platform/", "json/"))
        and not header.startswith("webapi/base/")
    ]
    assert wrong == []


def test_PlatformsBase_KnowsNoSubject():
    wrong = [
        f"{name(path)}:{number}: {header}"
        for path in cpp_files()
        if name(path).startswith("platform/base/")
        for number, header in includes(path)
        if header.startswith("platform/") and not header.startswith("platform/base/")
    ]
    assert wrong == []


def test_SharedLibraries_OfTheCommonRoad_IncludeNoHeavyLibrary():
    """What costs start-up time stays in loadable modules, or in the API library that is loaded for
    its own calls."""
    heavy = re.compile(r"^(openssl|curl|security)/|^sqlite3\.h$")
    wrong = [
        f"{name(path)}:{number}: {header}"
        for path in cpp_files()
        if not name(path).startswith(("apis/", "examples/", "tests/", "bench/")) and "/module/" not in name(path)
        for number, header in includes(path)
        if heavy.match(header)
    ]
    assert wrong == []


@pytest.mark.parametrize("header", files("include/webapi/**/*.h"), ids=name)
def test_ExportedHeader_StandsAlone(header, tmp_path):
    flags = run("pkg-config", "--cflags", "jsoncpp").stdout.split()
    source = tmp_path / "alone.cpp"
    line = f"#include <{header.relative_to(SOURCE / 'include')}>\n"
    source.write_text(line + line)
    result = run(
        "g++", "-std=c++20", "-Wall", "-Wextra", "-Wpedantic", "-Werror", "-fsyntax-only",
        f"-I{SOURCE}/include", *flags, str(source),
    )
    assert result.returncode == 0, result.stderr


def test_SeamHeaders_DeclareOnly():
    """The seam promises; it does not do."""
    assert files("webapi/platform/*.h")
    assert files("webapi/platform/*.cpp") == []
