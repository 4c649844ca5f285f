"""Files that the web server sends for the program, as docs/webservers.md has it."""

import os
import re
from urllib.parse import quote

import pytest

from client import PATH
from conftest import ROOT, SOURCE
from downloads import Downloads, sending  # noqa: F401  (a fixture)
from servers import serving
from webserver import Nginx, WebServer

DOCUMENT = (SOURCE / "docs" / "webservers.md").read_text()
FOLDER = ROOT.resolve() / "srv" / "fast"
CONTENT = bytes(range(256)) * 1000


def block(name):
    """What the document says, for our directory."""
    found = re.search(rf"<!-- test: {name} -->\n```\n(.*?)```", DOCUMENT, re.DOTALL)
    assert found, name
    return found.group(1)


def settings(name):
    """Below the private root directories are named without it."""
    return block(name).replace("/volume1/public", "/srv/fast")


def of_lighttpd(text):
    return text + block("fast-lighttpd").replace("/volume1/public", str(FOLDER))


def of_nginx(text):
    place = "    location = /webapi/entry.cgi {"
    assert place in text
    return text.replace(place, block("fast-nginx").replace("/volume1/public", str(FOLDER)) + place)


@pytest.fixture
def configure(root):
    file = root / "etc" / "qeloinfo.conf"
    before = file.read_text()
    yield lambda text: file.write_text(before + text)
    file.write_text(before)


@pytest.fixture
def public(root):
    reachable = all(folder.stat().st_mode & 0o001 for folder in root.resolve().parents)
    if os.geteuid() == 0 and not reachable:
        pytest.skip("the web server's account cannot reach the private root")
    FOLDER.mkdir(parents=True, exist_ok=True)
    FOLDER.chmod(0o755)
    return Downloads(0, FOLDER)


@pytest.mark.parametrize("kind, change, name", [(WebServer, of_lighttpd, "fast-lighttpd-settings"),
                                                (Nginx, of_nginx, "fast-nginx-settings")],
                         ids=["lighttpd", "nginx"])
def test_WholeFile_IsSentByTheServer(configure, public, sending, kind, change, name):  # noqa: F811
    file = public.put("Bär 50%.png", CONTENT)
    mine = public.put("mine.png", b"mine")
    mine.chmod(0o600)
    if os.geteuid() == 0:
        os.chown(mine, 900, 900)  # the method's account
    with serving(kind, change) as server:
        public.port = server.port
        slow = public.file(file)
        configure(settings(name))
        fast = public.file(file)
        assert fast.body == slow.body == CONTENT
        # Lines that differ, as those of the server and the day do not count.
        own = {key.lower(): value for key, value in slow.lines}
        theirs = {key.lower(): value for key, value in fast.lines}
        for key in ("content-type", "content-length", "content-disposition", "etag", "last-modified",
                    "content-security-policy", "x-content-type-options", "cache-control"):
            assert theirs[key] == own[key], key
        assert not {"x-sendfile", "x-accel-redirect"} & set(theirs)
        assert len(theirs) == len(fast.lines)
        assert public.file(file, "-r", "255-256").body == b"\xff\x00"
        assert public.file(file, "-H", f"If-None-Match: {own['etag']}").status == 304
        assert public.file(file, "-H", f"If-Match: {own['etag']}").status == 200
        assert public.file(mine).body == b"mine"


def test_Server_ThatIsNotSetUp_GetsThePathAlone(configure, public, sending):  # noqa: F811
    """So what was got above came from the server."""
    file = public.put("file", CONTENT)
    with serving(WebServer) as server:
        public.port = server.port
        assert public.file(file).body == CONTENT
        configure(settings("fast-lighttpd-settings"))
        assert public.file(file).body == b""


def test_Link_IsNotFollowedByTheServer(describe, public):
    """As somebody may put one between the program's look and the server's."""
    describe("QELO.Test.Download", "downloads.so", methods={"1": [{"bare": {"allowDownload": True}}]})
    file = public.put("file", CONTENT)
    link = FOLDER / "link"
    link.unlink(missing_ok=True)
    link.symlink_to(file)
    with serving(WebServer, of_lighttpd) as server:
        call = f"http://127.0.0.1:{server.port}{PATH}?api=QELO.Test.Download&version=1&method=bare&text="
        for path, status in ((file, 200), (link, 403), (SOURCE / "README.md", 403)):
            text = quote(f"Content-Type: text/plain\r\nX-Sendfile: {path}\r\n\r\n")
            got = public.curl(call + text)
            assert got.status == status
            assert (got.body == CONTENT) == (status == 200)
