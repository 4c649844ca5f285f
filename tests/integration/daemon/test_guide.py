"""What docs/daemon.md shows works as it stands there."""

import re
import subprocess
import time

from conftest import BUILD, DESCRIPTIONS, ROOT, SOURCE

DOCUMENT = (SOURCE / "docs" / "daemon.md").read_text()


def test_Trying_HasTheDaemonMakeTheCall(client, alice, tmp_path):
    block = re.search(r"<!-- test: trying -->\n```sh\n(.*?)```", DOCUMENT, re.DOTALL)[1]
    script = f"set -e\n{block.replace('build/dev', str(BUILD))}read -r _ || true\nkill %1\nwait\n"
    script = script.replace(f"$PWD/{BUILD}", str(BUILD))
    socket = ROOT / "run" / "webapi" / "api" / "try.sock"
    description = DESCRIPTIONS / "QELO.Catalog.API.lib"
    log = tmp_path / "log"
    before = description.read_text()
    preload = str(BUILD / "tests" / "integration" / "log_file.so")
    shell = subprocess.Popen(["bash", "-c", script], cwd=tmp_path, stdin=subprocess.PIPE,
                             env={"PATH": "/usr/bin:/bin", "LD_PRELOAD": preload, "LOG_FILE": str(log)})
    try:
        deadline = time.monotonic() + 10
        while not socket.exists() and time.monotonic() < deadline:
            assert shell.poll() is None
            time.sleep(0.02)
        answer = client.call("QELO.Catalog.API", "list", _sid=alice["sid"])
        assert answer.code == 0, answer.body
    finally:
        shell.stdin.close()
        shell.wait(timeout=20)
        description.write_text(before)
    assert 'call="QELO.Catalog.API_1_list" user="alice" end=answered' in log.read_text()
