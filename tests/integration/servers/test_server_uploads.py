"""Uploads behind each web server, by the ways in which it hands a body on."""

import random
import socket
import time

import pytest

from client import PATH, Client
from marks import wait_for
from servers import server  # noqa: F401  (a fixture)
from upload import API, TYPE, Form, checksum, files_of, left_behind, post, uploading

PIPE = 64 << 10
BUFFER = 256 << 10


@pytest.fixture(scope="module")
def client(server):  # noqa: F811
    return Client(server.port)


@pytest.fixture(autouse=True)
def described(describe):
    uploading(describe)
    yield
    assert wait_for(lambda: not left_behind(), 5), left_behind()


@pytest.mark.parametrize("method", ["take", "defer"])
@pytest.mark.parametrize("size", [0, 1, PIPE - 1, PIPE, BUFFER - 74, BUFFER, BUFFER + 1, 1_500_000])
def test_FileOfAnySize_ArrivesWhole(client, method, size):
    content = (bytes(range(251)) * (size // 251 + 1))[:size]
    form = Form().field("n", "5").file("f", "ü.bin", content).field("last", "1")
    answer = post(client, form, method)
    (file,) = files_of(answer)
    assert (file["size"], file["sum"], file["name"]) == (size, checksum(content), "ü.bin")
    assert {"n": 5, "last": 1}.items() <= answer.data["params"].items()


def test_CallInTheFields_IsMade(client):
    form = (Form().field("api", API).field("version", "1").field("method", "take")
            .file("f", "x", b"content"))
    assert files_of(post(client, form, None))[0]["size"] == 7


def test_ClientThatBreaksOff_LeavesNothing(server, client):  # noqa: F811
    body = Form().file("f", "x", bytes(1_000_000)).body()
    head = (f"POST {PATH}?api={API}&version=1&method=take HTTP/1.1\r\nHost: nas\r\n"
            f"Content-Type: {TYPE}\r\nContent-Length: {len(body)}\r\n\r\n").encode()
    places = random.Random(3)
    for _ in range(4):
        with socket.create_connection(("127.0.0.1", server.port), timeout=10) as connection:
            connection.sendall(head + body[:places.randrange(1, len(body))])
            time.sleep(0.02)
    assert files_of(post(client, Form().file("f", "x", b"1")))[0]["size"] == 1
