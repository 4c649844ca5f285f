"""The page that sharing links lead to: served by each web server, and used by a browser."""

import json
import os
import queue
import re
import shutil
import signal
import subprocess
import threading
from http.server import BaseHTTPRequestHandler, ThreadingHTTPServer
from urllib.parse import urlsplit

import pytest

from client import Client
from conftest import ROOT
from servers import server, serving  # noqa: F401  (a fixture)
from sharing import Owner, folder  # noqa: F401  (a fixture)
from webserver import PAGES, WebServer

TYPES = {"": "text/html", "page.css": "text/css", "page.js": "text/javascript"}


def test_LinksAddress_IsServedByEachServer(server, folder):  # noqa: F811
    client = Client(server.port)
    link = Owner(client, "alice").make(project="files", path=folder)
    address = urlsplit(link["url"])
    assert address.fragment == link["link"]
    assert address.port == server.port
    for name, kind in TYPES.items():
        answer = client.request("GET", address.path + name)
        assert answer.status == 200, server.log()
        assert answer.body == (PAGES / (name or "index.html")).read_bytes()
        assert answer.headers.get_all("Content-Type")[0].split(";")[0] == kind
        assert answer.headers["Content-Security-Policy"] == "frame-ancestors 'none'"
        assert answer.headers["X-Content-Type-Options"] == "nosniff"
    assert client.request("GET", address.path + "none").status == 404


def test_Page_NamesNothingOfOthers_AndRunsNothingInline():
    text = (PAGES / "index.html").read_text()
    policy = re.search(r'http-equiv="Content-Security-Policy"\s+content="([^"]*)"', text)[1]
    assert policy.startswith("default-src 'none'") and "unsafe" not in policy
    assert re.findall(r"<script([^>]*)>(.*?)</script>", text) == [(' src="page.js" defer', "")]
    assert not re.search(r"<style|\sstyle=|\son\w+=", text)
    for file in PAGES.iterdir():
        assert not re.search(r"https?:|url\(|@import|innerHTML|eval\(", file.read_text()), file


class Sink(BaseHTTPRequestHandler):
    """Takes what the script that plays the visitor shows."""

    def do_POST(self):
        self.server.shown.put(json.loads(self.rfile.read(int(self.headers["Content-Length"]))))
        self.send_response(204)
        self.end_headers()

    def log_message(self, *arguments):
        pass


# Put into the page beside its own script, by a server whose page lets it call the sink.
VISITOR = """
const tell = (value) => fetch("http://127.0.0.1:%d/", {method: "POST", mode: "no-cors",
                                                     body: JSON.stringify(value)});
const until = (condition) => new Promise((resolve) => {
  const look = () => condition() ? resolve(condition()) : setTimeout(look, 20);
  look();
});
const text = (id) => document.getElementById(id).textContent;
const type = (password) => {
  document.getElementById("password").value = password;
  document.querySelector("#open button").click();
};
const row = (name) => Array.from(document.querySelectorAll("#items a, #items button, #items span"))
    .find((element) => element.textContent === name);
(async () => {
  const seen = {};
  await until(() => !document.getElementById("open").hidden);
  type("wrong");
  seen.refused = await until(() => text("status").includes("wrong") && text("status"));
  type(%s);
  await until(() => row("a.txt"));
  seen.rows = Array.from(document.querySelectorAll("#items th")).map((cell) => cell.textContent);
  seen.title = document.title;
  seen.link = row("out").tagName;
  seen.download = await (await fetch(row("a.txt").href)).text();
  const files = new DataTransfer();
  files.items.add(new File(["brought"], "new.txt"));
  document.getElementById("chosen").files = files.files;
  document.getElementById("send").click();
  await until(() => row("new.txt"));
  seen.brought = await until(() => text("status").includes("uploaded") && text("status"));
  row("deep/").click();
  await until(() => row("b.txt"));
  seen.way = Array.from(document.querySelectorAll("#way li")).map((part) => part.textContent);
  document.querySelector("#way button").click();
  await until(() => row("a.txt"));
  row("a.txt").click();
  tell(seen);
})();
"""


@pytest.fixture
def visitor(root, tmp_path):
    """Has a browser open a link's address, and a visitor's script enter a password there; gives what
    the visitor saw, once the file that he asked for is downloaded."""
    sink = ThreadingHTTPServer(("127.0.0.1", 0), Sink)
    sink.shown = queue.Queue()
    threading.Thread(target=sink.serve_forever, daemon=True).start()

    def visit(server, address, password, downloaded):  # noqa: F811
        pages = server.directory / "sharing"
        page = pages / "index.html"
        page.write_text(page.read_text().replace(
            "connect-src 'self'", f"connect-src 'self' http://127.0.0.1:{sink.server_port}"))
        script = pages / "page.js"
        script.write_text(script.read_text() + VISITOR % (sink.server_port, json.dumps(password)))
        profile = tmp_path / "profile"
        (profile / "Default").mkdir(parents=True)
        (profile / "Default" / "Preferences").write_text(json.dumps(
            {"download": {"default_directory": str(downloaded.parent), "prompt_for_download": False}}))
        command = ["chromium", "--headless=new", "--disable-gpu", "--disable-dev-shm-usage",
                   "--no-first-run", "--disable-background-networking", "--no-proxy-server",
                   f"--user-data-dir={profile}", "--remote-debugging-port=0", address]
        if os.geteuid() == 0:
            command.insert(1, "--no-sandbox")
        with open(tmp_path / "browser.log", "wb") as log:
            browser = subprocess.Popen(command, stdout=log, stderr=log, start_new_session=True)
        try:
            seen = sink.shown.get(timeout=30)
            for _ in range(200):
                if downloaded.exists():
                    break
                threading.Event().wait(0.05)
            return seen
        except queue.Empty:
            raise AssertionError(server.log() + (tmp_path / "browser.log").read_text()) from None
        finally:
            os.killpg(browser.pid, signal.SIGKILL)
            browser.wait()

    yield visit
    sink.shutdown()
    sink.server_close()


@pytest.mark.skipif(shutil.which("chromium") is None, reason="chromium is not installed")
def test_Browser_EntersThePassword_Lists_Downloads_AndBrings(visitor, folder, tmp_path):  # noqa: F811
    downloaded = tmp_path / "downloads" / "a.txt"
    downloaded.parent.mkdir()
    with serving(WebServer) as one:
        owner = Owner(Client(one.port), "alice")
        link = owner.make(project="files", path=folder, upload="true", password="pass 12345")
        seen = visitor(one, link["url"], "pass 12345", downloaded)
    assert seen == {
        "refused": "The password is wrong.", "rows": ["a.txt", "deep/", "out"], "title": "shared",
        "link": "SPAN", "download": "shared", "brought": "new.txt is uploaded.",
        "way": ["shared", "deep"]}
    assert (ROOT / "home" / "alice" / "shared" / "new.txt").read_text() == "brought"
    assert downloaded.read_text() == "shared"
