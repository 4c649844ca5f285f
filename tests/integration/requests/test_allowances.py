"""One compound request, whose entries may come in by different ways: each entry has the caller that it
would have alone."""

import json
import os
import subprocess
import time

from conftest import BUILD, SESSIONS, needs_root

API = "QELO.Test.Identity"
OPEN = "QELO.Test.Open"  # its authLevel is 0


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


@needs_root
def test_EntryThatNeedsNoLogin_SeesNothingOfTheOneBeforeIt(client, alice):
    def call(api, method):
        return {"api": api, "version": 1, "method": method}

    def caller(data):
        return {key: data[key] for key in (
            "user", "userVariable", "session", "isAdmin", "isTimeout", "isAuthorized", "authResult")}

    entries = [call(API, "asRoot"), call(OPEN, "asRoot"), call(API, "asRoot"), call(OPEN, "plain")]
    answer = client.call(
        "QELO.Entry.Request", "request", compound=json.dumps(entries), _sid=alice["sid"])
    alone = [client.call(e["api"], e["method"], _sid=alice["sid"]).data for e in entries]
    assert [caller(result["data"]) for result in answer.data["result"]] == [caller(d) for d in alone]
    assert [d["user"] for d in alone] == ["alice", "", "alice", ""]
