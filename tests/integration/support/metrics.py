"""The figures of a fork server, read as a monitor would."""

import json
import re
import socket

from scgi import rest


def page(path, name="/metrics", method="GET"):
    """The status of the page and its body, from the socket at a path."""
    answer = ask(path, f"{method} {name} HTTP/1.1\r\nHost: localhost\r\n\r\n".encode())
    head, body = answer.split(b"\r\n\r\n", 1)
    assert f"Content-Length: {len(body)}\r\n".encode() in head + b"\r\n"
    return int(head.split()[1]), body.decode()


def ask(path, data):
    """All that comes back for some bytes."""
    with socket.socket(socket.AF_UNIX) as connection:
        connection.settimeout(10)
        connection.connect(str(path))
        connection.sendall(data)
        return rest(connection)


def figures(path):
    """Each figure of the text by its name with labels; the text's form is checked, too."""
    status, text = page(path)
    assert status == 200 and text.endswith("\n")
    found = {}
    for line in text.splitlines():
        if line.startswith("# "):
            assert re.fullmatch(r"# (HELP \w+ .+|TYPE \w+ (counter|gauge|histogram))", line), line
            continue
        name, value = re.fullmatch(r'(\w+(?:\{\w+="[^"\\]*"(?:,\w+="[^"\\]*")*\})?) (\S+)', line).groups()
        assert name not in found, line
        found[name] = float(value)
    return found


def state(path):
    status, text = page(path, "/status")
    assert status == 200
    return json.loads(text)
