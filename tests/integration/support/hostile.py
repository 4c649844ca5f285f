"""Requests as nobody means them well: sizes, counts, depths and texts that a client may send."""

import socket
import struct
from urllib.parse import quote_from_bytes, urlencode

PATH = "/webapi/entry.cgi"
FORM = "application/x-www-form-urlencoded"
NAMES = ["a/../../etc/passwd", "x\nsshd: Accepted", "\0", "QELO.\0.Info", "%n%s%x", "\x7f\x1b[2J",
         "é" * 500, "." * 4000, "QELO." * 2000, " ", "\r\n\r\n", "${PATH}", "'; --", "\ufeff\u202e"]


class Hostile:
    """One request: bytes as they are sent, and how the client goes on."""

    def __init__(self, label, data, hang_up=None):
        self.label = label
        self.data = data
        self.hang_up = hang_up  # None: waits; "close" and "reset": goes when all is sent


def head(verb, target, *headers):
    lines = [f"{verb} {target} HTTP/1.1", "Host: localhost", "Connection: close", *headers]
    return "\r\n".join(lines).encode("utf-8", "surrogateescape") + b"\r\n\r\n"


def post(body, *headers, kind=FORM, length=None, target=PATH):
    size = len(body) if length is None else length
    return head("POST", target, f"Content-Type: {kind}", f"Content-Length: {size}", *headers) + body


def call(**parameters):
    named = {"api": "QELO.Host.Info", "version": 1, "method": "get", **parameters}
    return urlencode(named).encode()


def names():
    for name in [*NAMES, "x" * 1_000_000, "Q." * 500_000]:
        yield "api name", post(urlencode({"api": name, "version": 1, "method": "get"}).encode())
        yield "method name", post(call(method=name))
        yield "session", post(call(_sid=name))
        yield "token", post(call(tid=name))
        yield "account", post(call(api="QELO.Access.Session", method="login", account=name,
                                   password=name))
        yield "parameter name", post(call() + b"&" + quote_from_bytes(name.encode()).encode() + b"=1")
    for version in ("-1", "0", "9" * 5000, "1e308", "[1]", "null", '"1"'):
        yield "version", post(call(version=version))


def texts():
    for depth in (255, 256, 257, 1_000, 5_000, 100_000):
        for opening, closing in (("[", "]"), ('{"a":', "}")):
            nested = opening * depth + "1" + closing * depth
            yield "depth", post(call(value=nested))
            yield "depth, cut", post(call(value=nested[: len(nested) // 2]))
            yield "depth, bare", post(nested.encode(), kind="application/json")
    for count in (1_000, 10_000, 100_000, 1_000_000):
        yield "values", post(call(value="[" + "0," * count + "0]"))
        yield "members", post(call(value="{" + ",".join(f'"{i}":0' for i in range(count // 10)) + "}"))
        yield "parameters", post(call() + b"&a=1" * (count // 4))
        yield "names", post(call() + b"".join(b"&%d=" % i for i in range(count // 10)))
        yield "blanks", post(call(value=" " * count))
        yield "escapes", post(call() + b"&a=" + b"%00" * (count // 3))
        yield "broken escapes", post(call() + b"&a=" + b"%" * count)
    for number in ("1" * 100_000, "1e999999", "-" * 1000, "0." + "0" * 50_000 + "1"):
        yield "number", post(call(value=number))
        yield "list of numbers", post(call(value=f"[{number}]"))
    for text in (b"\x00", b"\xff\xfe", b"&" * 100_000, b"=" * 100_000, b"a" * 8, b"\r\n" * 1000):
        yield "bare body", post(text)


def headers():
    for count in (100, 1_000, 4_000):
        yield "cookies", post(call(), "Cookie: " + "; ".join(f"c{i}=v" for i in range(count)))
        yield "session cookies", post(call(), "Cookie: " + "; ".join(["id=x"] * count))
    for size in (4_000, 8_190, 30_000, 65_000, 70_000, 300_000):
        yield "header", post(call(), "X-Long: " + "h" * size)
        yield "agent", post(call(), "User-Agent: " + "Mozilla " * (size // 8))
        yield "query", head("GET", f"{PATH}?api=" + "q" * size)
        yield "address", post(call(), "X-Forwarded-For: " + "1.2.3.4," * (size // 8))
    for count in (50, 500):
        yield "headers", post(call(), *(f"X-H{i}: v" for i in range(count)))
    for value in ("id=\x01", "id=" + "s" * 6000, ";" * 5000, "=" * 5000, "id", 'id="'):
        yield "cookie", post(call(), f"Cookie: {value}")
    for verb in ("PUT", "DELETE", "OPTIONS", "TRACE", "X" * 500):
        yield "verb", head(verb, f"{PATH}?" + call().decode())
        yield "verb with a body", head(verb, PATH, "Content-Length: 100000") + b"b" * 100_000


def bodies():
    for size in (1, 1_000, 100_000, 3_000_000):
        body = b"v" * size
        query = f"{PATH}?" + call().decode()
        yield "unread by GET", head("GET", query, f"Content-Length: {size}") + body
        for target in (PATH, query):
            kind = "multipart/form-data; boundary=b"
            yield "upload", post(b"--b\r\n" + body, kind=kind, target=target)
            yield "upload of no form", post(body, kind="multipart/form-data", target=target)
            yield "other kind", post(body, kind="image/png", target=target)
    for length in ("-1", "0", "x", "1e9", "99999999999999999999", "+5", "5, 5"):
        yield "length", post(call(), length=length)
    for length in (1, 10, 40):
        yield "length too short", post(call(), length=length)
    chunks = b"5\r\napi=Q\r\n" * 1000
    for end in (b"0\r\n\r\n", b"zz\r\n", b"FFFFFFFFFFFFFFFF\r\n"):
        yield "chunks", head("POST", PATH, f"Content-Type: {FORM}",
                             "Transfer-Encoding: chunked") + chunks + end


def compounds():
    entry = '{"api":"QELO.Host.Info","version":1,"method":"get"}'
    for text in ("[]", "{}", "5", "[5,null,[]]", "[" + entry + "]", "[" + ",".join(["{}"] * 3000) + "]",
                 '[{"compound":' * 100 + "[]" + "}]" * 100):
        for mode in ("sequential", "parallel"):
            yield "compound", post(call(api="QELO.Entry.Request", method="request", compound=text,
                                        mode=mode))


def hang_ups():
    whole = post(call())
    for how in ("close", "reset"):
        for cut in (1, 20, 100, len(whole) - 10, len(whole)):
            for body in (whole, post(call(value="x" * 500_000))):
                yield "hang-up", body[:cut], how
        yield "hang-up in a body", post(call(value="y" * 2_000_000))[:1_000_000], how
        yield "hang-up before a long body", post(b"", length=16_000_000), how


def requests():
    """All of them, in an order that mixes the kinds."""
    made = [Hostile(*item) for kind in (names, texts, headers, bodies, compounds, hang_ups)
            for item in kind()]
    return [made[i] for offset in range(7) for i in range(offset, len(made), 7)]


def send(port, hostile, timeout=60):
    """Sends a request. @return what came back, b"" when the server hung up"""
    received = b""
    try:
        with socket.create_connection(("127.0.0.1", port), timeout=timeout) as connection:
            try:
                connection.sendall(hostile.data)
            except (BrokenPipeError, ConnectionResetError):
                pass  # refused before it was all sent
            if hostile.hang_up == "reset":
                linger = struct.pack("ii", 1, 0)
                connection.setsockopt(socket.SOL_SOCKET, socket.SO_LINGER, linger)
            while hostile.hang_up is None and (piece := connection.recv(65536)):
                received += piece
    except ConnectionResetError:
        pass
    return received
