"""Two private roots, each with a web server, one in front of the other by TLS; and a host that does as it
is told."""

import json
import shutil
import subprocess

import pytest
from conftest import BUILD, ROOT
from tls import Authority, ScriptedHost, TlsFront
from webserver import WebServer

TABLE = ROOT / "etc" / "webapi" / "relay.json"
TRUST = ROOT / "etc" / "webapi" / "relay"
API = "QELO.Test.Identity"
# The other root is at the first one's place for all that runs behind this.
AT_OTHER_ROOT = ["unshare", "-m", "sh", "-c", 'mount --bind "$0" "$1" && shift && exec "$@"']


@pytest.fixture(scope="module")
def authority(tmp_path_factory):
    return Authority(tmp_path_factory.mktemp("authority"))


@pytest.fixture(scope="module")
def good(authority):
    return authority.sign("good")


@pytest.fixture(scope="module")
def other(root, good, tmp_path_factory):
    """The other host: a root of its own, a web server, and TLS in front."""
    place = tmp_path_factory.mktemp("other") / "root"
    subprocess.run(["cp", "-a", root, place], check=True)  # with its owners
    for spare in (place / "run" / "webapi", place / "var" / "lib" / "webapi"):
        shutil.rmtree(spare, ignore_errors=True)
    at_other = [*AT_OTHER_ROOT, place, ROOT]
    token = subprocess.run(
        [*at_other, BUILD / "programs" / "webapi-token", "create", "--user", "alice"],
        check=True, capture_output=True, text=True).stdout.strip()
    server = WebServer(tmp_path_factory.mktemp("other-server"), BUILD / "programs" / "entry.cgi")
    server.start(*at_other)
    front = TlsFront(*good, server.port)
    front.token, front.place = token, place
    yield front
    front.stop()
    server.stop()


@pytest.fixture(scope="module")
def scripted(good):
    host = ScriptedHost(*good)
    yield host
    host.stop()


@pytest.fixture
def hosts(root, authority):
    """Writes the table of hosts: hosts(7, url, token, **more)."""
    TRUST.mkdir(exist_ok=True)
    table = {}

    def write(number, url, token="t" * 43, trust=authority.certificate, **more):
        if trust is not None:
            shutil.copy(trust, TRUST / f"{number}.pem")
            (TRUST / f"{number}.pem").chmod(0o644)
            more["trust"] = f"/etc/webapi/relay/{number}.pem"
        table[str(number)] = {"url": url, "token": token, **more}
        TABLE.write_text(json.dumps(table))
        TABLE.chmod(0o600)

    yield write
    shutil.rmtree(TRUST)
    TABLE.unlink(missing_ok=True)


def relayed(client, session, method="plain", number=7, **parameters):
    return client.call(API, method, _sid=session["sid"], relay_zt=number, **parameters)
