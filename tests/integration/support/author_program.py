"""Running webapi, the program for authors."""

import subprocess

from conftest import BUILD

WEBAPI = BUILD / "programs" / "webapi"


def webapi(*arguments, **options):
    return subprocess.run([WEBAPI, *map(str, arguments)], capture_output=True, text=True, timeout=120,
                          check=False, **options)
