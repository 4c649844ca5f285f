"""What a compiler says of a method that is written wrong names the mistake in words; what docs/method.md
shows, it takes."""

import re

import pytest

from sources import SOURCE, run

PARAMS = "struct P { %s n{}; static constexpr auto Fields() { return QELO::Fields(%s); } };\n"
METHOD = "void (*method)(QELO::APIRequest*, QELO::APIResponse*) = QELO::Method<f>;\n"
REQUIRED = 'QELO::Required("n", &P::n)'

MISTAKES = {
    "parameters that are not described": (
        "struct P { int n; };\nint f(const P&) { return 1; }\n" + METHOD,
        "a method takes a QELO::Call, a struct with Fields(), or both"),
    "a method of the plain form": (
        "void f(QELO::APIRequest*, QELO::APIResponse*) {}\n" + METHOD, "stands in the table by itself"),
    "parameters that could be changed": (
        PARAMS % ("int", REQUIRED) + "int f(P&) { return 1; }\n" + METHOD,
        "by value or as a reference to const"),
    "two structs of parameters": (
        PARAMS % ("int", REQUIRED) + "int f(const P&, const P&) { return 1; }\n" + METHOD,
        "a method takes one struct of parameters"),
    "a member that cannot be read": (
        "struct X {};\n" + PARAMS % ("X", REQUIRED) + "int f(const P&) { return 1; }\n" + METHOD,
        "a parameter is a number, bool, std::string"),
    "an optional that is required": (
        PARAMS % ("std::optional<int>", REQUIRED) + "int f(const P&) { return 1; }\n" + METHOD,
        "a required member is no std::optional"),
    "a result that cannot be written": (
        "struct X {};\nX f() { return {}; }\n" + METHOD, "a result is a number, bool, text"),
    "a check that says nothing": (
        "void f(const QELO::Call&) {}\nauto check = &QELO::Check<f>;\n"
        "int c() { return check(nullptr, nullptr); }\n",
        "a check is a function of const QELO::Call& that gives a bool"),
}


@pytest.fixture(scope="module")
def said(tmp_path_factory):
    """The errors of all mistakes, made in one file since reading the headers takes a second."""
    source = tmp_path_factory.mktemp("mistakes") / "mistakes.cpp"
    parts = [f"namespace m{number} {{\n{text}}}\n" for number, (text, _) in enumerate(MISTAKES.values())]
    source.write_text("#include <webapi/Method.h>\n" + "".join(parts))
    flags = run("pkg-config", "--cflags", "jsoncpp").stdout.split()
    result = run("g++", "-std=c++20", "-fsyntax-only", f"-I{SOURCE}/include", *flags, str(source))
    assert result.returncode != 0
    return "\n".join(line for line in result.stderr.splitlines() if "error:" in line)


@pytest.mark.parametrize("mistake", MISTAKES)
def test_Mistake_IsNamedByTheCompiler(mistake, said):
    assert MISTAKES[mistake][1] in said


def test_Guide_IsCompiled(tmp_path):
    text = (SOURCE / "docs/method.md").read_text()
    blocks = re.findall(r"^<!-- test: method[\w-]* -->\n```cpp\n(.*?)^```$", text, re.DOTALL | re.MULTILINE)
    assert len(blocks) > 2
    source = tmp_path / "guide.cpp"
    source.write_text("\n".join(blocks) + "auto entries = {QELO::Method<report>, QELO::Method<count>, QELO::Method<keep>};\n")
    flags = run("pkg-config", "--cflags", "jsoncpp").stdout.split()
    result = run("g++", "-std=c++20", "-Wall", "-Wextra", "-Wshadow", "-Wpedantic", "-Werror", "-fsyntax-only",
                 f"-I{SOURCE}/include", *flags, str(source))
    assert result.returncode == 0, result.stderr
