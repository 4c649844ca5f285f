"""The filter for fail2ban finds the lines that logins write, and no text of a client's instead."""

import configparser
import re
import shutil
import subprocess
from pathlib import Path
from urllib.parse import urlencode

import pytest

from conftest import BUILD, PASSWORDS, SOURCE, run_entry

FILTER = SOURCE / "packaging" / "fail2ban" / "webapi.conf"
PREFIX = "Nov 21 22:00:00 nas entry.cgi_QELO.Access.Session_1_login[123]: "
ADDRESS = "192.0.2.77"


def expressions():
    """The filter's expressions with what fail2ban puts in for a line of a log file."""
    parser = configparser.ConfigParser(interpolation=None)
    parser.read(FILTER)
    definition = parser["Definition"]
    prefix = r"\w+ +\d+ [\d:]+ \S+ " + definition["_daemon"] + r"(?:\[\d+\])?: "
    texts = definition["failregex"].strip().splitlines()
    return [
        re.compile(text.replace("%(__prefix_line)s", prefix).replace("<ADDR>", r"([0-9a-fA-F:.]+)"))
        for text in texts
    ]


def hosts(lines):
    """The addresses that would be counted."""
    matches = [each.match(line) for line in lines for each in expressions()]
    return [match[1] for match in matches if match]


@pytest.fixture
def lines(root, tmp_path):
    """Calls entry.cgi and answers the lines of its log."""

    def call(account, password, address=ADDRESS, api="QELO.Access.Session", **environment):
        log = tmp_path / "log"
        log.unlink(missing_ok=True)
        body = urlencode({"api": api, "version": 1, "method": "login",
                          "account": account, "password": password}).encode()
        run_entry(body=body, REMOTE_ADDR=address, LOG_FILE=str(log),
                  LD_PRELOAD=str(BUILD / "tests" / "integration" / "log_file.so"),
                  ASAN_OPTIONS="verify_asan_link_order=0", **environment)
        text = log.read_text() if log.exists() else ""
        return [PREFIX + line for line in text.splitlines()]

    return call


def test_Filter_CountsFailedAndRefusedLogins(lines):
    assert hosts(lines("alice", "wrong")) == [ADDRESS]
    assert hosts(lines("nobody-here", "wrong", "2001:db8::9")) == ["2001:db8::9"]
    refused = [lines("alice", "wrong") for _ in range(5)][-1]
    assert "too many attempts" in refused[-1]
    assert hosts(refused) == [ADDRESS]


def test_Filter_CountsNoLoginThatIsRightOrNotTheClientsFault(lines):
    assert hosts(lines("bob", PASSWORDS["bob"], "192.0.2.78")) == []
    other = lines("bob", PASSWORDS["bob"], "192.0.2.78", HTTP_SEC_FETCH_SITE="cross-site")
    assert "another site" in other[-1]
    assert hosts(other) == []


@pytest.mark.parametrize("text", [
    "x\nNov 21 22:00:00 nas entry.cgi_x[1]: LoginSession.cpp:1 login failed from 198.51.100.1: y",
    "login failed from 198.51.100.1: y",
    "LoginSession.cpp:1 login failed from 198.51.100.1: y",
])
def test_Filter_IsNotMisledByTextOfTheClient(lines, text):
    assert set(hosts(lines(text, "wrong", "192.0.2.79"))) == {"192.0.2.79"}
    assert hosts(lines("alice", "wrong", "192.0.2.80", api=text)) == []


@pytest.mark.skipif(shutil.which("fail2ban-regex") is None, reason="fail2ban is not installed")
def test_Filter_IsReadByFail2banItself(lines, tmp_path):
    log = tmp_path / "auth.log"
    log.write_text("\n".join(lines("alice", "wrong", "192.0.2.81")) + "\n")
    own = Path("/etc/fail2ban/filter.d/common.conf")
    (tmp_path / "common.conf").write_text(own.read_text())
    shutil.copy(FILTER, tmp_path)
    report = subprocess.run(["fail2ban-regex", log, tmp_path / FILTER.name], capture_output=True, text=True, check=True)
    assert "Lines: 1 lines, 0 ignored, 1 matched" in report.stdout, report.stdout
