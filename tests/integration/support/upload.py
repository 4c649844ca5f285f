"""Forms with files, and the API that takes them."""

from urllib.parse import urlencode

from conftest import ROOT

API = "QELO.Test.Upload"
BOUNDARY = "----WebKitFormBoundaryAbCdEf0123456789"
TYPE = f"multipart/form-data; boundary={BOUNDARY}"


class Form:
    """A form as a browser encodes it."""

    def __init__(self):
        self.parts = []

    def _add(self, parameters, content):
        head = f'--{BOUNDARY}\r\nContent-Disposition: form-data; {parameters}\r\n'.encode()
        self.parts.append(head + b"\r\n" + content + b"\r\n")
        return self

    def field(self, name, value):
        return self._add(f'name="{name}"', value.encode())

    def file(self, field, name, content):
        return self._add(f'name="{field}"; filename="{name}"', content)

    def body(self):
        return b"".join(self.parts) + f"--{BOUNDARY}--\r\n".encode()


def uploading(describe, level=2):
    """Describes the API: a method for each way to take an upload, and to end."""
    takes = {"allowUpload": True}
    describe(API, "uploading.so", authLevel=level, methods={"1": [
        {"take": takes}, {"user": {**takes, "grantByUser": True}},
        {"root": {**takes, "grantByDefault": True}}, {"defer": {**takes, "deferUpload": True}},
        {"keep": takes}, {"leave": takes}, {"die": takes}, {"wait": takes}]})


def post(client, form, method="take", headers=None, **parameters):
    """Sends a form; `method` None: the call stands in it."""
    body = form if isinstance(form, bytes) else form.body()
    query = {} if method is None else {"api": API, "version": 1, "method": method, **parameters}
    target = "/webapi/entry.cgi" + (f"?{urlencode(query)}" if query else "")
    return client.request("POST", target, body=body, headers={"Content-Type": TYPE, **(headers or {})})


def files_of(answer):
    return answer.data["files"]


def checksum(content):
    value = 14695981039346656037
    for byte in content:
        value = ((value ^ byte) * 1099511628211) & 0xFFFFFFFFFFFFFFFF
    return str(value)


def left_behind():
    """What stands in the temporary directories."""
    return sorted(str(path) for folder in ("tmp", "var/tmp") for path in (ROOT / folder).iterdir())
