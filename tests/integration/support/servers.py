"""Each web server that there is a recipe for, as one fixture."""

import contextlib
import os
import shutil
import tempfile
from pathlib import Path

import pytest

from conftest import ENTRY
from webserver import ApacheCgi, ApacheCgid, ApacheScgi, LighttpdScgi, Nginx, NginxScgi, WebServer

SERVERS = {
    "lighttpd": WebServer,
    "lighttpd-scgi": LighttpdScgi,
    "nginx": Nginx,
    "nginx-scgi": NginxScgi,
    "apache-mod_cgi": ApacheCgi,
    "apache-mod_cgid": ApacheCgid,
    "apache-scgi": ApacheScgi,
}


@contextlib.contextmanager
def serving(kind, change=lambda text: text):
    """Where there are accounts, the server has its own, and the program is set-user-id root.

    change: makes of the server's configuration another one
    """
    directory = Path(tempfile.mkdtemp(prefix="webapi-server-"))
    entry = directory / "entry.cgi"
    programs = [entry, directory / "rest.cgi"]
    for program in programs:
        shutil.copy(ENTRY.with_name(program.name), program)
    identity = {}
    if os.geteuid() == 0:
        directory.chmod(0o755)
        identity = {"user": "www-data", "group": "www-data", "extra_groups": []}
        for program in programs:
            program.chmod(0o4755)
    server = kind(directory, entry)
    server.configuration.write_text(change(server.configuration.read_text()))
    if identity:
        for path in (directory, *directory.iterdir()):
            if path not in programs:
                shutil.chown(path, "www-data", "www-data")
    server.start(**identity)
    yield server
    server.stop()
    shutil.rmtree(directory)


@pytest.fixture(scope="module", params=SERVERS.values(), ids=SERVERS)
def server(request, root):
    with serving(request.param) as one:
        yield one
