"""A browser's own forms and requests. It is large, so nothing installs it for this alone: without
the package "chromium" these tests are skipped."""

import http.server
import json
import os
import queue
import shutil
import signal
import subprocess
import threading

import pytest

from downloads import Downloads, folder, sending  # noqa: F401  (fixtures)
from servers import serving
from upload import API, checksum, uploading
from webserver import WebServer

pytestmark = pytest.mark.skipif(shutil.which("chromium") is None, reason="chromium is not installed")

NAME = 'Bär "1" 文.bin'
PAGE = """<!DOCTYPE html><meta charset="utf-8">
<body><script>
const show = (value) => fetch("http://127.0.0.1:%d/",
                              {method: "POST", mode: "no-cors", body: JSON.stringify(value)});
const bytes = (size) => Uint8Array.from({length: size}, (_, i) => i %% 251);
%s
</script>"""
FORM = """
const form = document.createElement("form");
form.method = "post"; form.enctype = "multipart/form-data"; form.target = "answer";
form.action = %(url)s;
const input = document.createElement("input");
input.type = "file"; input.name = "file"; input.multiple = true;
const files = new DataTransfer();
files.items.add(new File([bytes(300000)], %(name)s));
files.items.add(new File([], "empty"));
input.files = files.files;
const field = document.createElement("input");
field.name = "text"; field.value = "a\\u00e4 & b";
const frame = document.createElement("iframe");
frame.name = "answer";
form.append(field, input);
document.body.append(frame, form);
frame.onload = () => { const text = frame.contentDocument.body.innerText; if (text) show(text); };
form.submit();
"""
FETCH = """
const data = new FormData();
data.append("text", "a\\u00e4 & b");
data.append("file", new File([bytes(300000)], %(name)s));
data.append("file", new File([], "empty"));
fetch(%(url)s, {method: "POST", body: data}).then((answer) => answer.text()).then(show);
"""
FRAME = """
window.onmessage = () => show("the page ran its script");
const frame = document.createElement("iframe");
frame.onload = () => setTimeout(() => show("loaded"), %(patience)s);
frame.src = %(url)s;
document.body.append(frame);
"""
GET = """
const ask = (headers) => fetch(%(url)s, {headers});
(async () => {
  const whole = await ask({});
  const body = new Uint8Array(await whole.arrayBuffer());
  const part = await ask({Range: "bytes=10-19"});
  show({length: body.length, last: body[body.length - 1], type: whole.headers.get("content-type"),
        part: Array.from(new Uint8Array(await part.arrayBuffer())), status: part.status});
})();
"""


class Sink(http.server.BaseHTTPRequestHandler):
    """Takes what the page shows."""

    def do_POST(self):
        self.server.shown.put(json.loads(self.rfile.read(int(self.headers["Content-Length"]))))
        self.send_response(204)
        self.end_headers()

    def log_message(self, *arguments):
        pass


@pytest.fixture(scope="module")
def server(root):
    """One that knows pages."""
    with serving(WebServer, lambda text: text + 'mimetype.assign = (".html" => "text/html")\n') as one:
        yield one


@pytest.fixture
def browse(server, tmp_path):
    """Opens a page with a script; answers what it shows first."""
    page = server.directory / "www" / "page.html"
    sink = http.server.ThreadingHTTPServer(("127.0.0.1", 0), Sink)
    sink.shown = queue.Queue()
    threading.Thread(target=sink.serve_forever, daemon=True).start()

    def open_page(script, **values):
        values = {name: json.dumps(value) for name, value in values.items()}
        page.write_text(PAGE % (sink.server_port, script % values))
        command = ["chromium", "--headless", "--disable-gpu", "--disable-dev-shm-usage",
                   "--no-first-run", "--disable-background-networking", "--no-proxy-server",
                   f"--user-data-dir={tmp_path / 'profile'}", "--remote-debugging-port=0",
                   f"http://127.0.0.1:{server.port}/page.html"]
        if os.geteuid() == 0:
            command.insert(1, "--no-sandbox")
        with open(tmp_path / "browser.log", "wb") as log:
            browser = subprocess.Popen(command, stdout=log, stderr=log, start_new_session=True)
        try:
            return sink.shown.get(timeout=30)
        except queue.Empty:
            raise AssertionError(server.log() + (tmp_path / "browser.log").read_text()) from None
        finally:
            os.killpg(browser.pid, signal.SIGKILL)
            browser.wait()

    yield open_page
    sink.shutdown()
    sink.server_close()
    page.unlink(missing_ok=True)


@pytest.mark.parametrize("script", [FORM, FETCH], ids=["form", "fetch"])
def test_Upload_ArrivesAsTheBrowserEncodesIt(browse, describe, script):
    uploading(describe, level=0)
    url = f"/webapi/entry.cgi?api={API}&version=1&method=take"
    data = json.loads(browse(script, url=url, name=NAME))["data"]
    content = bytes(i % 251 for i in range(300_000))
    assert [(file["name"], file["size"], file["sum"]) for file in data["files"]] == [
        (NAME, 300_000, checksum(content)), ("empty", 0, checksum(b""))]
    assert data["params"]["text"] == "aä & b"


def test_Download_IsReadWholeAndInParts(browse, server, folder, sending):  # noqa: F811
    downloads = Downloads(server.port, folder)
    file = downloads.put("file.png", bytes(i % 251 for i in range(300_000)))
    shown = browse(GET, url=downloads.url("file", path=file))
    assert shown == {"length": 300_000, "last": 299_999 % 251, "type": "image/png",
                     "part": list(range(10, 20)), "status": 206}


def test_UploadedPage_RunsNoScript(browse, server, folder, sending):  # noqa: F811
    downloads = Downloads(server.port, folder)
    file = downloads.put("page.html", b"<p>shown</p><script>parent.postMessage(1, '*')</script>")
    inline = downloads.url("file", path=file, name="page.html", inline=1)
    assert browse(FRAME, url=inline, patience=1000) == "loaded"
    # The same page without the policy: what is tested above is the policy.
    own = server.directory / "www" / "own.html"
    own.write_bytes(file.read_bytes())
    url = f"http://127.0.0.1:{server.port}/own.html"
    assert browse(FRAME, url=url, patience=20_000) == "the page ran its script"
    own.unlink()
