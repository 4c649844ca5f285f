"""What documents name is there, and what is there is named where a list claims to be whole."""

import re

import pytest

from sources import SOURCE, cpp_files, files, name

DOCUMENTS = [path for path in files("*.md") if path.name != "CHANGELOG.md"]
FOLDERS = "apis|bench|cmake|docs|include|packaging|platform|programs|tests|webapi"
READERS = r'\b(?:Get|GetNumber|GetSwitch|QLIBCFileCheckKeyValue)\((?:[\w:]+, )?"([a-z_]+)"'


def table_of(document, heading):
    """The first cells of the tables below a heading, without their marks."""
    text = (SOURCE / document).read_text()
    section = re.search(rf"^#+ {heading}$(.*?)(?=^#|\Z)", text, re.DOTALL | re.MULTILINE)
    cells = re.findall(r"^\| (`[^|]*)\|", section.group(1), re.MULTILINE)
    return {word for cell in cells for word in re.findall(r"`([^`]+)`", cell)}


@pytest.mark.parametrize("document", DOCUMENTS, ids=name)
def test_PathsOfTheTree_AreThere(document):
    named = re.findall(rf"`((?:{FOLDERS})/[\w./*-]+\.\w+)`", document.read_text())
    missing = [path for path in named
               if not list(SOURCE.glob(path)) and not list((SOURCE / "include").glob(path))]
    assert missing == []


def test_Settings_StandInTheirTable():
    read = {
        key
        for path in cpp_files()
        if name(path).startswith(("platform/", "webapi/"))
        for key in re.findall(READERS, path.read_text())
        if "ettings" in path.read_text() or "kSystemInfo" in path.read_text()
    }
    assert len(read) > 10
    assert table_of("docs/platform.md", "Settings") == read


@pytest.mark.parametrize("heading,keys", [("Members of an API", "kMembers"), ("Methods", "kAttributes")])
def test_DescriptionKeys_StandInTheirTables(heading, keys):
    text = (SOURCE / "webapi/runner/catalogue/DescriptionKeys.h").read_text()
    listed = re.search(rf"{keys}\[\] = {{(.*?)}};", text, re.DOTALL).group(1)
    names = set(re.findall(r'{"(\w+)",', listed))
    assert len(names) > 10
    assert table_of("docs/description.md", heading) == names


def test_Modules_StandInTheirTable():
    text = (SOURCE / "platform/Modules.cmake").read_text()
    built = {f"{module}.so" for module in re.findall(r"^ *webapi_platform_module\((\w+)", text, re.M)}
    assert len(built) > 3
    assert table_of("docs/platform.md", "Loadable modules") == built


def test_Packages_StandInTheDependencies():
    """Those of the set-up; the run-time halves of development packages have lines of their own."""
    script = (SOURCE / "packaging/setup").read_text()
    lists = re.findall(r"^\w+_packages=\(([^)]*)\)", script, re.MULTILINE)
    installed = {package for text in lists for package in text.split()}
    assert len(installed) > 10
    document = (SOURCE / "docs/dependencies.md").read_text()
    assert {package for package in installed if f"`{package}`" not in document} == set()
    to_build = table_of("docs/dependencies.md", "To build")
    to_test = table_of("docs/dependencies.md", "To test and measure")
    assert to_build | to_test == installed


def test_Lints_StandInTheirList():
    text = (SOURCE / "DEVELOPING.md").read_text()
    section = text.split("## Mistakes that became lints", 1)[1].split("\n## ", 1)[0]
    there = {test for path in files("tests/lint/*.py")
             for test in re.findall(r"^def (test_\w+)", path.read_text(), re.MULTILINE)}
    assert len(there) > 20
    assert set(re.findall(r"`(test_\w+)`", section)) == there, "DEVELOPING.md lists each lint"
