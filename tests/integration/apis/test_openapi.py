"""The OpenAPI document of QELO.Catalog.API, and clients that are made from it.

The linter and the generator are no packages of the host's: who wants their tests installs them somewhere
(npm install @redocly/cli openapi-typescript openapi-fetch typescript@5) and names that place's node_modules
in WEBAPI_OPENAPI_TOOLS."""

import json
import os
import re
import shutil
import subprocess
from pathlib import Path

import pytest

API = "QELO.Catalog.API"
TOOLS = Path(os.environ.get("WEBAPI_OPENAPI_TOOLS", "/none"))
CLIENT = Path(__file__).with_name("openapi_client.ts")

needs_tools = pytest.mark.skipif(
    not (TOOLS / "openapi-fetch").exists() or shutil.which("node") is None,
    reason="WEBAPI_OPENAPI_TOOLS names no node_modules with the tools, or there is no node")

SCHEMA = {
    "type": "object",
    "required": ["name"],
    "properties": {
        "name": {"$ref": "#/definitions/name"},
        "pair": {"type": "array", "items": [{"type": "integer"}, {"type": "string"}],
                 "additionalItems": False},
        "items": {"type": "boolean"},
        "card": {"dependencies": {"number": ["holder"], "debit": {"required": ["bank"]}}},
    },
    "definitions": {"name": {"type": "string", "maxLength": 9}},
}


@pytest.fixture
def described(describe):
    describe("QELO.Test.Good", "good.so", maxVersion=1, methods={"1": [
        {"echo": {"summary": "Answers what it gets", "description": "More.", "params": SCHEMA,
                  "returns": {"type": "object", "properties": {"name": {"type": "string"}}},
                  "errors": {"404": "nobody"}, "example": {"name": "ann"}}},
        {"put": {"allowUpload": True}}, {"get": {"allowDownload": True}}, "plain"]})


@pytest.fixture
def document(client, alice, described):
    return client.call(API, "openapi", _sid=alice["sid"]).data


def test_Document_HasAPathForEachMethodThatTheCallerMayCall(document):
    assert document["openapi"] == "3.1.0"
    paths = document["paths"]
    assert "/QELO.Test.Good/v1/echo" in paths and "/QELO.Test.Good/v1/plain" in paths
    assert "/QELO.Catalog.API/v1/openapi" in paths
    assert not any("QELO.Host.Info" in path for path in paths), "which is for administrators"
    assert "/QELO.Test.Good/v1/put" not in paths, "an upload"
    operations = [path["post"] for path in paths.values()]
    assert len({each["operationId"] for each in operations}) == len(operations)
    assert all(each["summary"] for each in operations)


def test_Document_HasWhatTheDescriptionTells(document):
    operation = document["paths"]["/QELO.Test.Good/v1/echo"]["post"]
    assert (operation["summary"], operation["description"]) == ("Answers what it gets", "More.")
    assert operation["security"] == [], "for everybody"
    body = operation["requestBody"]
    assert body["required"] is True
    content = body["content"]["application/json"]
    assert content["example"] == {"name": "ann"}
    assert content["schema"] == {
        "type": "object", "required": ["name"],
        "properties": {
            "name": {"type": "string", "maxLength": 9},
            "pair": {"type": "array", "items": False,
                     "prefixItems": [{"type": "integer"}, {"type": "string"}]},
            "items": {"type": "boolean"},
            "card": {"dependentRequired": {"number": ["holder"]},
                     "dependentSchemas": {"debit": {"required": ["bank"]}}}}}
    good = operation["responses"]["200"]["content"]["application/json"]["schema"]
    assert good["properties"]["data"] == {"type": "object", "properties": {"name": {"type": "string"}}}
    assert operation["responses"]["422"]["description"] == "404: nobody"
    download = document["paths"]["/QELO.Test.Good/v1/get"]["post"]
    assert download["responses"]["200"]["content"] == download["responses"]["206"]["content"] == {"*/*": {}}
    assert "206" not in operation["responses"]


def test_Document_SaysWhereUploadsAre(client, document, alice, described):
    text = document["info"]["description"]
    assert "QELO.Test.Good 1 put" in text and "multipart/form-data" in text and "/webapi/entry.cgi" in text
    assert "QELO.Test.Good 1 get" not in text
    other = client.call(API, "openapi", _sid=alice["sid"], prefix=API).data
    assert "description" not in other["info"]


def test_Document_OfAPrefix_HasThoseAlone(client, alice, described):
    data = client.call(API, "openapi", _sid=alice["sid"], prefix="QELO.Test.Good").data
    assert {path.split("/")[1] for path in data["paths"]} == {"QELO.Test.Good"}
    assert [tag["name"] for tag in data["tags"]] == ["QELO.Test.Good"]


def test_Document_IsValid(document):
    """By the rules that matter of OpenAPI 3.1: members, references, and schemas that are schemas."""
    jsonschema = pytest.importorskip("jsonschema")
    assert set(document) <= {"openapi", "info", "servers", "paths", "components", "security", "tags"}
    assert {"title", "version"} <= set(document["info"]) <= {"title", "version", "description"}
    schemes = set(document["components"]["securitySchemes"])
    assert all(set(needed) <= schemes for needed in document["security"])
    schemas = list(document["components"]["schemas"].values())
    for path, item in document["paths"].items():
        assert re.fullmatch(r"/[^/{}]+/v[1-9][0-9]*/[^/{}]+", path) and set(item) == {"post"}
        operation = item["post"]
        assert set(operation) <= {"operationId", "tags", "summary", "description", "requestBody",
                                  "responses", "security"}
        answers = operation["responses"]
        assert all(re.fullmatch(r"[1-5][0-9][0-9]|default", status) for status in answers)
        assert all(answer["description"] for answer in answers.values())
        for holder in (operation["requestBody"], *answers.values()):
            schemas += [kind["schema"] for kind in holder.get("content", {}).values()
                        if "schema" in kind]
        assert set(operation["tags"]) <= {tag["name"] for tag in document["tags"]}
    for schema in schemas:
        jsonschema.Draft202012Validator.check_schema(schema)
    references = set(re.findall(r'"\$ref": "([^"]*)"', json.dumps(document)))
    assert references == {"#/components/schemas/Error"}


def test_Document_HasNoSchemaThatIsNone(client, describe, alice):
    """A method whose params are no schema cannot be called."""
    describe("QELO.Test.Good", "good.so", maxVersion=1, methods={"1": [
        {"echo": {"params": {"type": "object", "properties": {"a": {"type": "text"}}}}},
        {"fail": {"params": {"type": "array"}}}, {"silent": {"returns": {"minimum": "x"}}}]})
    paths = client.call(API, "openapi", _sid=alice["sid"], prefix="QELO.Test.Good").data["paths"]
    assert list(paths) == ["/QELO.Test.Good/v1/silent"]
    good = paths["/QELO.Test.Good/v1/silent"]["post"]["responses"]["200"]["content"]["application/json"]
    assert good["schema"]["properties"]["data"] == {}
    assert client.call("QELO.Test.Good", "echo", a="x").code == 103


@needs_tools
def test_Document_PassesThePublicLinter(document, tmp_path):
    (tmp_path / "openapi.json").write_text(json.dumps(document))
    result = subprocess.run(
        ["node", TOOLS / "@redocly" / "cli" / "bin" / "cli.js", "lint", "--format", "json",
         "openapi.json"], cwd=tmp_path, capture_output=True, text=True, timeout=120, check=False,
        env={**os.environ, "REDOCLY_TELEMETRY": "off", "CI": "true"})
    problems = json.loads(result.stdout)
    errors = [each for each in problems["problems"] if each["severity"] == "error"]
    assert errors == []
    assert problems["totals"]["errors"] == 0 and result.returncode == 0, result.stderr


@needs_tools
def test_AGeneratedClient_CallsTheServer(document, client, alice, tmp_path):
    (tmp_path / "openapi.json").write_text(json.dumps(document))
    os.symlink(TOOLS, tmp_path / "node_modules")
    (tmp_path / "package.json").write_text('{"type": "module"}')
    shutil.copy(CLIENT, tmp_path / "client.ts")
    node = lambda *command: subprocess.run(
        ["node", *map(str, command)], cwd=tmp_path, capture_output=True, text=True, timeout=120,
        check=False)
    made = node(TOOLS / "openapi-typescript" / "bin" / "cli.js", "openapi.json", "-o", "api.d.ts")
    assert made.returncode == 0, made.stderr
    built = node(TOOLS / "typescript" / "bin" / "tsc", "--strict", "--module", "nodenext", "--target",
                 "es2022", "--lib", "es2022,dom", "--skipLibCheck", "client.ts")
    assert built.returncode == 0, built.stdout
    base = f"http://127.0.0.1:{client.port}/webapi/rest"
    run = node("client.js", base, alice["sid"])
    assert run.returncode == 0, run.stderr
    assert json.loads(run.stdout) == {
        "api": API, "name": "ann", "status": 400, "path": "/name", "refused": 401}
