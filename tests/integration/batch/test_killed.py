"""Processes that are killed at any moment: what they had stored is whole, and all goes on."""

import json
import os
import signal
import subprocess
import time

from conftest import ENTRY, PASSWORDS, SESSIONS
from tasks import TASK, alice, started  # noqa: F401

LOGIN = f"api=QELO.Access.Session&version=1&method=login&account=bob&password={PASSWORDS['bob']}"
SPREAD = 0.012  # seconds, about what a login takes


def test_Logins_KilledAnywhere_LeaveWholeSessionsOrNone(client, root):
    environment = {
        "REQUEST_METHOD": "POST",
        "REMOTE_ADDR": "127.0.0.9",
        "CONTENT_TYPE": "application/x-www-form-urlencoded",
        "CONTENT_LENGTH": str(len(LOGIN)),
    }
    client.login("bob", PASSWORDS["bob"])
    before = set(os.listdir(SESSIONS))
    answered = []
    tries = 40
    for number in range(tries):
        with subprocess.Popen(
            [ENTRY], stdin=subprocess.PIPE, stdout=subprocess.PIPE, env=environment
        ) as process:
            process.stdin.write(LOGIN.encode())
            process.stdin.close()
            time.sleep(SPREAD * number / tries)
            process.kill()
            output = process.stdout.read()
        if b"\r\n\r\n" in output:
            answered.append(json.loads(output.split(b"\r\n\r\n")[1]))
        # Attempts that ended before their success was known count against the address.
        for count in (root / "run/webapi/logins").iterdir():
            if count.is_file():
                count.unlink()
    for answer in answered:
        sid = answer["data"]["sid"]
        assert client.call("QELO.Access.Session", "logout", _sid=sid).code in (0, 150)
    for name in set(os.listdir(SESSIONS)) - before:
        if len(name) == 43:  # an id: readers may come across it
            record = json.loads((SESSIONS / name).read_text())
            assert record["user"] == "bob" and len(record["token"]) == 43
    assert client.login("bob", PASSWORDS["bob"]).data["user"] == "bob"


def test_Tasks_KilledAnywhere_EndWithoutHarmToOthers(alice):
    witness = alice.start(steps=1, pause=30_000)
    for number in range(15):
        full_id = alice.start(steps=5_000, pause=1)
        pid = alice.status(full_id).data["data"]["pid"]
        time.sleep(0.002 * number)
        os.kill(pid, signal.SIGKILL)
        data = alice.wait_for_end(full_id)
        assert (data["success"], data["error"]["code"]) == (False, 117)
        assert alice.call(TASK, "stop", task_id=full_id, remove="true").code == 0
    status = alice.status(witness).data
    assert (status["success"], status["finish"]) == (True, False)
