"""Calls of the web API, as a client on another machine would make them."""

import http.client
import io
import json
import socket
from urllib.parse import urlencode

PATH = "/webapi/entry.cgi"


class Answer:
    """One HTTP answer; the body is read as the web API's JSON on demand."""

    def __init__(self, status, headers, body):
        self.status = status
        self.headers = headers
        self.body = body

    @property
    def json(self):
        return json.loads(self.body.decode("utf-8"))

    @property
    def data(self):
        answer = self.json
        assert answer["success"], answer
        return answer.get("data")

    @property
    def code(self):
        """The web API's error code, 0 for success."""
        answer = self.json
        return 0 if answer["success"] else answer["error"]["code"]

    @property
    def word(self):
        """The permission check's word on why it refused."""
        return self.headers.get("x-request-error")

    @property
    def refusal(self):
        return self.code, self.word


def answer_in(received):
    """The first HTTP answer in `received`, which may come in chunks."""

    class Received:
        def makefile(self, mode):
            return io.BytesIO(received)

    response = http.client.HTTPResponse(Received())
    response.begin()
    return Answer(response.status, response.headers, response.read())


class Client:
    """A client at an address; keeps no cookies of its own."""

    def __init__(self, port, address="127.0.0.1"):
        self.port = port
        self.address = address

    def request(self, verb, target, body=None, headers=None):
        connection = http.client.HTTPConnection(
            "127.0.0.1", self.port, timeout=30, source_address=(self.address, 0)
        )
        try:
            connection.request(verb, target, body=body, headers=headers or {})
            response = connection.getresponse()
            return Answer(response.status, response.headers, response.read())
        finally:
            connection.close()

    def get(self, query, headers=None):
        return self.request("GET", f"{PATH}?{query}", headers=headers)

    def post(self, body, headers=None):
        form = {"Content-Type": "application/x-www-form-urlencoded"}
        return self.request("POST", PATH, body=body, headers={**form, **(headers or {})})

    def call(self, api, method, version=1, headers=None, cookie=None, **parameters):
        """Calls a method; `cookie` is a session that comes as cookie, `_sid` one as parameter."""
        headers = dict(headers or {})
        if cookie is not None:
            headers["Cookie"] = f"id={cookie}"
        query = {"api": api, "version": version, "method": method, **parameters}
        return self.post(urlencode(query), headers)

    def login(self, account, password):
        return self.call("QELO.Access.Session", "login", account=account, password=password)

    def raw(self, data, end_of_sending=False, timeout=30):
        """Sends bytes as they are and reads until the server closes."""
        with socket.create_connection(
            ("127.0.0.1", self.port), timeout=timeout, source_address=(self.address, 0)
        ) as connection:
            connection.sendall(data)
            if end_of_sending:
                connection.shutdown(socket.SHUT_WR)
            received = b""
            while True:
                piece = connection.recv(65536)
                if not piece:
                    return received
                received += piece
