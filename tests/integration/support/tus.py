"""A client of tus 1.0, the protocol for uploads that go on after a break."""

import base64
import http.client
import json
import socket
import time
from urllib.parse import urlencode

from files import API

BODY = "application/offset+octet-stream"


class Uploader:
    """What a client of the protocol does."""

    def __init__(self, user, folder="/own", query=None):
        self.user = user
        self.endpoint = "/webapi/entry.cgi?" + urlencode(
            {"api": API, "version": 1, "method": "tus", "_sid": user.sid,
             "path": json.dumps(folder), **(query or {})})
        self.location = None

    def request(self, verb, target=None, body=b"", **headers):
        headers = {"Tus-Resumable": "1.0.0",
                   **{name.replace("_", "-"): value for name, value in headers.items()}}
        connection = http.client.HTTPConnection("127.0.0.1", self.user.client.port, timeout=30)
        try:
            connection.request(verb, target or self.location, body=body,
                               headers={name: value for name, value in headers.items() if value})
            response = connection.getresponse()
            response.content = response.read()
            return response
        finally:
            connection.close()

    def create(self, name, length, **headers):
        metadata = "filetype dGV4dA==,filename " + base64.b64encode(name.encode()).decode()
        answer = self.request("POST", self.endpoint, Upload_Length=str(length),
                              Upload_Metadata=metadata, **headers)
        self.location = answer.headers["Location"]
        return answer

    def patch(self, offset, data, **headers):
        return self.request("PATCH", body=data, **{
            "Upload_Offset": str(offset), "Content_Type": BODY, **headers})

    def offset(self):
        answer = self.request("HEAD")
        assert answer.status == 200, answer.status
        return int(answer.headers["Upload-Offset"])

    def break_off(self, offset, data, announced, **headers):
        """Sends the beginning of a body, and hangs up."""
        more = "".join(f"{name.replace('_', '-')}: {value}\r\n" for name, value in headers.items())
        head = (f"PATCH {self.location} HTTP/1.1\r\nHost: localhost\r\nTus-Resumable: 1.0.0\r\n"
                f"Content-Type: {BODY}\r\nUpload-Offset: {offset}\r\n"
                f"{more}Content-Length: {announced}\r\n\r\n")
        with socket.create_connection(("127.0.0.1", self.user.client.port)) as connection:
            connection.sendall(head.encode() + data)
            time.sleep(0.3)


def wait_for_offset(upload):
    """The offset when the request that was broken off has ended."""
    deadline = time.monotonic() + 10
    while (answer := upload.request("HEAD")).status == 423 and time.monotonic() < deadline:
        time.sleep(0.05)
    return int(answer.headers["Upload-Offset"])
