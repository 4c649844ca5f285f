"""What entry.cgi takes from who starts it, and which files it believes."""

import os
import shutil
import subprocess

import pytest

from conftest import ENTRY, PLUGINS, ROOT, answer_of, run_entry

API = "QELO.Test.Surroundings"
QUERY = f"api={API}&version=1&method=run"
CGI = {"REQUEST_METHOD": "GET", "QUERY_STRING": QUERY, "REMOTE_ADDR": "127.0.0.1"}


def run(environment, **options):
    done = subprocess.run([ENTRY], env={**CGI, **environment}, stdin=subprocess.DEVNULL,
                          capture_output=True, timeout=30, check=True, **options)
    return answer_of(done.stdout)["data"]


def test_Descriptors_OfTheCallerAreClosed(describe, tmp_path):
    describe(API, "surroundings.so")
    with open(tmp_path / "secret", "w") as secret:
        os.set_inheritable(secret.fileno(), True)
        data = run({}, pass_fds=[secret.fileno()])
    assert str(tmp_path / "secret") not in data["descriptors"]
    assert data["descriptors"], "the process's own are seen"


def test_Environment_HoldsWhatACgiProgramNeedsAlone(describe):
    describe(API, "surroundings.so")
    kept = {"HTTP_COOKIE": "a=b", "HTTP_X_OWN": "1", "HTTPS": "on", "HOST": "h", "TZ": "UTC",
            "LANG": "C", "LC_ALL": "C", "REWRITE_APP": "x", "SERVER_NAME": "n"}
    dropped = {"HTTP_PROXY": "http://evil.example", "http_proxy": "x", "BASH_ENV": "/x",
               "LD_AUDIT": "", "GCONV_PATH": "/x", "HOME": "/root", "SHELL": "/bin/sh", "XYZ": "1",
               "qeloaccesstoken": "x", "httpd": "x"}
    seen = dict(entry.split("=", 1) for entry in run({**kept, **dropped})["environment"])
    assert {name: seen.get(name) for name in kept} == kept
    assert [name for name in dropped if name in seen] == []
    assert run({"PATH": "/tmp"})["environment"].count(
        "PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin") == 1


def test_Environment_KeepsWhatASettingAdds(describe):
    describe(API, "surroundings.so")
    settings = ROOT / "etc" / "qeloinfo.conf"
    before = settings.read_text()
    try:
        settings.write_text(before + 'keep_environment="SITE_NAME, OTHER"\n')
        seen = run({"SITE_NAME": "x", "OTHER": "y", "THIRD": "z", "SITE": "w"})["environment"]
    finally:
        settings.write_text(before)
    assert {"SITE_NAME=x", "OTHER=y"} <= set(seen)
    assert not any(entry.startswith(("THIRD=", "SITE=")) for entry in seen)


@pytest.mark.parametrize("mode", [0o664, 0o646])
def test_Description_ThatOthersMayWrite_IsRefused(describe, mode):
    file = describe(API, "surroundings.so")
    assert answer_of(run_entry(QUERY))["success"]
    file.chmod(mode)
    assert answer_of(run_entry(QUERY))["error"]["code"] == 102
    file.chmod(0o644)


@pytest.mark.parametrize("mode, folder", [(0o775, 0o755), (0o757, 0o755), (0o755, 0o777)])
def test_Library_ThatOthersMayWrite_IsRefused(describe, tmp_path, mode, folder):
    place = tmp_path / "place"
    place.mkdir()
    library = place / "copy.so"
    shutil.copy(PLUGINS / "surroundings.so", library)
    describe(API, lib=str(library))
    assert answer_of(run_entry(QUERY))["success"]
    library.chmod(mode)
    place.chmod(folder)
    assert answer_of(run_entry(QUERY))["error"]["code"] == 111
