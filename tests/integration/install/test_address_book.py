"""The example of an address book, from its sources to calls by a web server, with the installed package alone."""

import json
import subprocess

import pytest

from conftest import SOURCE, needs_root
from installed import OVERLAYS, prefix, run, stage, step  # noqa: F401 (fixtures)
from webserver import free_port

EXAMPLE = SOURCE / "examples" / "address-book"
GUIDE = (EXAMPLE / "README.md").read_text()
INSTALLING = (SOURCE / "docs" / "installing.md").read_text()


def test_AddressBook_IsShort():
    lines = (EXAMPLE / "AddressBook.cpp").read_text().splitlines()
    assert len(lines) < 150
    assert [path.name for path in EXAMPLE.glob("*.cpp")] in (
        ["AddressBook.cpp", "AddressBookTest.cpp"], ["AddressBookTest.cpp", "AddressBook.cpp"])


@needs_root
def test_AddressBook_IsBuiltTestedInstalledAndCalled(stage, tmp_path):
    """By its README's commands, by an account of the host, over a web server."""
    work = tmp_path / "work"
    work.mkdir()
    overlays = OVERLAYS.format(work=work)
    if subprocess.run(["unshare", "-m", "sh", "-c", overlays], capture_output=True).returncode != 0:
        pytest.skip("files cannot be laid over the host's here: no overlay mount")
    port = free_port()
    configuration = step(INSTALLING, "lighttpd").replace("server.port = 80", f"server.port = {port}")
    login = "-d 'api=QELO.Access.Session&version=1&method=login&account=tina' --data-urlencode 'password=one 2 three'"
    script = "\n".join([
        overlays,
        "{",
        "{ userdel -f tina; userdel -f system; groupdel administrators; } 2> /dev/null || true",
        "useradd --create-home --home-dir /var/tina tina && echo 'tina:one 2 three' | chpasswd",
        step(INSTALLING, "accounts"), step(INSTALLING, "install"), step(INSTALLING, "pam"),
        step(INSTALLING, "rights"),
        f"cp -r {EXAMPLE} {tmp_path}/book && cd {tmp_path}/book",
        "} > /dev/null",
        step(GUIDE, "build"),
        "{",
        "mkdir -p /var/www/html /var/log/lighttpd /var/cache/lighttpd/uploads",
        "chown -R www-data: /var/log/lighttpd /var/cache/lighttpd",
        f"cat > /etc/lighttpd/lighttpd.conf << 'END'\n{configuration}END",
        "} > /dev/null",
        "/usr/sbin/lighttpd -D -f /etc/lighttpd/lighttpd.conf & server=$!",
        "trap 'kill $server' EXIT",
        f"for i in $(seq 100); do (: > /dev/tcp/127.0.0.1/{port}) 2> /dev/null && break",
        "  sleep 0.05; done",
        f"URL=http://127.0.0.1:{port}/webapi/entry.cgi",
        f"SID=$(curl -s $URL {login} | sed -n 's/.*\"sid\":\"\\([^\"]*\\)\".*/\\1/p')",
        "echo CALLS",
        step(GUIDE, "call"),
        "stat -c 'FILE %U %a' /var/tina/.webapi/address-book.db",
    ])
    output = run("unshare", "-m", "bash", "-c", script, cwd=SOURCE)
    assert "100% tests passed" in output
    created, ended, listed, *exported = output.split("CALLS\n")[1].splitlines()
    ann = {"id": 1, "mail": "", "name": "Ann", "phone": "12345"}
    assert json.loads(created)["data"] == ann
    ended = json.loads(ended)["data"]
    assert (ended["finish"], ended["data"]) == (True, 2)
    assert json.loads(listed)["data"] == [ann]
    assert exported[:3] == ["Ann\t12345\t", "Bob\t0123\tbob@example.net", "Eve\t\t"]
    assert exported[3].startswith("FILE tina 6")
