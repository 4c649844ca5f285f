"""A session that has timed out and an access token in one compound request: each entry has the caller
that it would have alone."""

import json
import os
import subprocess
import time

from conftest import BUILD, SESSIONS, needs_root

API = "QELO.Test.Identity"


@needs_root
def test_TimedOutSessionAndToken_EachEntryHasItsOwnCaller(client, alice):
    program = BUILD / "programs" / "webapi-token"
    made = subprocess.run([program, "create", "--user", "bob"], capture_output=True, check=True)
    hour_ago = time.time() - 3600
    os.utime(SESSIONS / alice["sid"], (hour_ago, hour_ago))
    # These run in one process, one after the other.
    methods = ["asRoot", "patientAsRoot", "asRoot", "patientAsRoot"]
    entries = [{"api": API, "version": 1, "method": method} for method in methods]
    answer = client.call(
        "QELO.Entry.Request", "request", compound=json.dumps(entries),
        tid=made.stdout.decode().strip(), cookie=alice["sid"],
        headers={"X-Qelo-Token": alice["token"]},
    )
    callers = [result["data"]["user"] for result in answer.data["result"]]
    assert callers == ["bob", "alice", "bob", "alice"]
