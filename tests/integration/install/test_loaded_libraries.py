"""The libraries that entry.cgi loads on the common road. Each costs time at every call: the start
of the process is most of what a call costs."""

import re
import subprocess
from pathlib import Path

from conftest import ENTRY

COMMON_ROAD = {
    "libwebapi-ARDO5.so",
    "libjsoncpp.so.25",
    "libstdc++.so.6",
    "libgcc_s.so.1",
    "libm.so.6",
    "libc.so.6",
}


def loaded(query):
    """Names of the libraries that are initialised while entry.cgi answers a query."""
    environment = {
        "REQUEST_METHOD": "GET",
        "REMOTE_ADDR": "127.0.0.1",
        "QUERY_STRING": query,
        "LD_DEBUG": "files",
    }
    process = subprocess.run(
        [ENTRY], env=environment, stdin=subprocess.DEVNULL, capture_output=True, check=True
    )
    assert b'"success":true' in process.stdout, process.stdout
    paths = re.findall(r"calling init: (\S+)", process.stderr.decode())
    names = {re.sub(r"(libwebapi-\w+\.so).*", r"\1", Path(path).name) for path in paths}
    return {name for name in names if not name.startswith("ld-linux")}


def test_AuthenticatedCall_LoadsTheApiLibraryAndNothingElse(client, alice):
    query = f"api=QELO.Access.Session&version=1&method=current&_sid={alice['sid']}"
    assert loaded(query) == COMMON_ROAD | {"QELO.Access.Session.so"}


def test_UnauthenticatedCall_LoadsTheApiLibraryAndNothingElse(client):
    assert loaded("api=QELO.Test.Open&version=1&method=plain") == COMMON_ROAD | {"identity.so"}


def test_RefusedCall_LoadsNoApiLibrary(client):
    query = "api=QELO.Host.Info&version=1&method=get"
    process = subprocess.run(
        [ENTRY],
        env={"REQUEST_METHOD": "GET", "QUERY_STRING": query, "LD_DEBUG": "files"},
        stdin=subprocess.DEVNULL,
        capture_output=True,
        check=True,
    )
    assert b"QELO.Host.Info.so" not in process.stderr
