"""What becomes of a POST by the type of its body and by where it names its call."""

import pytest

API = "QELO.Test.Good"
CALL = f"api={API}&version=1&method=echo"
FORM = "application/x-www-form-urlencoded"
JSON = "application/json"
MULTIPART = "multipart/form-data; boundary=x"
PARTS = '--x\r\nContent-Disposition: form-data; name="n"\r\n\r\n5\r\n--x--\r\n'


@pytest.fixture(autouse=True)
def described(describe):
    describe(API, "good.so", methods={"1": ["echo", {"upload": {"allowUpload": True}}]})


def post(client, query, body, kind):
    target = "/webapi/entry.cgi" + (f"?{query}" if query else "")
    return client.request("POST", target, body=body, headers={"Content-Type": kind})


@pytest.mark.parametrize("query, body, kind, code", [
    ("", CALL, FORM, 0),
    (CALL, "n=5", FORM, 0),
    ("", f'{{"api": "{API}", "version": 1, "method": "echo"}}', JSON, 101),
    ("", PARTS, MULTIPART, 101),
    (CALL, PARTS, MULTIPART, 115),
    (CALL, "", FORM, 101),
    ("", "", FORM, 101),
])
def test_Post_IsAnswered(client, query, body, kind, code):
    assert post(client, query, body, kind).code == code


def test_JsonBody_BesideACallInTheQuery_IsReadAsAParameterLine(client):
    data = post(client, CALL, '{"n":5}', JSON).data
    assert "n" not in data
    assert data['{"n":5}'] == ""
