"""The installing of packages that are missing: what it says before it does it, with stand-ins for the
system's programs."""

import subprocess

import pytest

from conftest import SOURCE

USER = "#!/bin/sh\necho 1000\n"
# One package is missing, and none is ever installed.
QUERY = '#!/bin/sh\nfor name; do :; done\n[ "$name" != wrk ] && echo installed\n'


def program(directory, name, text):
    path = directory / name
    path.write_text(text)
    path.chmod(0o755)
    return path


def recording(directory, name, status=0, says=":"):
    """A program that records how it was called."""
    program(directory, name,
            f'#!/bin/sh\n{says}\necho "{name} $*" >> "$0.calls"\nexit {status}\n')


@pytest.fixture
def host(tmp_path):
    """A directory of programs that stands for the whole of an ordinary user's PATH."""
    for name in ("bash", "mktemp", "rm", "tail"):
        (tmp_path / name).symlink_to(f"/usr/bin/{name}")
    program(tmp_path, "id", USER)
    program(tmp_path, "dpkg-query", QUERY)
    recording(tmp_path, "apt-get")
    return tmp_path


def setup(host, kind="bench"):
    """Both outputs in the order in which a person sees them."""
    return subprocess.run(
        ["/bin/bash", SOURCE / "packaging" / "setup", kind], env={"PATH": str(host)},
        stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True,
        timeout=30, check=False,
    )


def calls(host, name):
    path = host / f"{name}.calls"
    return path.read_text().splitlines() if path.exists() else []


def test_Packages_AreNamedBeforeThePasswordIsAskedFor(host):
    recording(host, "sudo", says="echo Password:")
    result = setup(host)
    assert result.returncode == 0, result.stdout
    assert "wrk" in result.stdout
    assert result.stdout.index("wrk") < result.stdout.index("Password:")
    assert calls(host, "sudo")[0] == "sudo true"
    assert any("apt-get install -y --no-install-recommends wrk" in call
               for call in calls(host, "sudo"))
    assert calls(host, "apt-get") == [], "not without sudo"


def test_WhoMayNotInstall_GetsTheAdministratorsCommand(host):
    recording(host, "sudo", status=1)
    result = setup(host)
    assert result.returncode == 1
    assert "\n  apt-get install -y --no-install-recommends wrk\n" in result.stdout
    assert calls(host, "sudo") == ["sudo true"], "one refusal is enough"
    assert calls(host, "apt-get") == []


def test_HostWithoutSudo_GetsTheAdministratorsCommand(host):
    result = setup(host)
    assert result.returncode == 1
    assert "\n  apt-get install -y --no-install-recommends wrk\n" in result.stdout
    assert calls(host, "apt-get") == []


def test_NothingMissing_IsQuiet(host):
    program(host, "dpkg-query", "#!/bin/sh\necho installed\n")
    result = setup(host)
    assert (result.returncode, result.stdout) == (0, "")
