"""Compound requests as curl sends them."""

import json
import subprocess

import pytest

from client import PATH

ENTRIES = "QELO.Test.Entries"
LOSING = "QELO.Test.Losing"
IDENTITY = "QELO.Test.Identity"
OUTER = "QELO.Entry.Request"
LOSSES = ["killed", "ended", "hangsUp", "rubbish", "nothing", "scalar", "cut", "aborted"]
modes = pytest.mark.parametrize("mode", ["sequential", "parallel"])


def entry(method, version=1, api=ENTRIES, **parameters):
    return {"api": api, "version": version, "method": method, **parameters}


class Compound:
    """Compound requests of one session."""

    def __init__(self, server, sid):
        self.url = f"http://127.0.0.1:{server.port}{PATH}"
        self.sid = sid

    def __call__(self, entries, **parameters):
        """The answer as curl gets it."""
        fields = {"api": OUTER, "version": 1, "method": "request", **parameters}
        fields["compound"] = json.dumps(entries)
        if self.sid is not None:
            fields["_sid"] = self.sid
        command = ["curl", "-sS", "--include", "--max-time", "60", "-H", "Expect:", self.url]
        text = ""
        for name, value in fields.items():
            value = value if isinstance(value, str) else json.dumps(value)
            if name == "compound":
                text = value
                command += ["--data-urlencode", f"{name}@-"]
            else:
                command += ["--data-urlencode", f"{name}={value}"]
        output = subprocess.run(command, input=text, capture_output=True, text=True, check=True)
        head, body = output.stdout.split("\n\n", 1)
        self.head = head.lower()
        return json.loads(body)

    def results(self, entries, **parameters):
        answer = self(entries, **parameters)
        assert answer["success"], answer
        assert len(answer["data"]["result"]) == len(entries)
        self.has_fail = answer["data"]["has_fail"]
        return answer["data"]["result"]


def code(result):
    """An entry's error code, 0 for success, None for no answer."""
    if result is None:
        return None
    return 0 if result["success"] else result["error"]["code"]
