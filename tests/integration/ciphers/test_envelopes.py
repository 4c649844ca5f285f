"""Enciphered calls through the web server, enciphered by programs that share nothing with the one that
opens them: the openssl command and node."""

import json
import shutil
import subprocess
import time
from urllib.parse import urlencode

import pytest
from conftest import BUILD, ROOT
from webserver import SOURCE

EXAMPLES = SOURCE / "examples" / "ciphers"
API = "QELO.Test.Identity"
CALL = f"api={API}&version=1&method=plain&"


@pytest.fixture(scope="module")
def public_key(root, tmp_path_factory):
    private, public = ROOT / "etc/webapi/cipher.pem", tmp_path_factory.mktemp("key") / "public.pem"
    subprocess.run(["openssl", "genpkey", "-quiet", "-algorithm", "RSA", "-pkeyopt", "rsa_keygen_bits:2048",
                    "-out", private], check=True, capture_output=True)
    private.chmod(0o600)
    subprocess.run(["openssl", "pkey", "-in", private, "-pubout", "-out", public], check=True)
    yield public
    private.unlink()


@pytest.fixture(scope="module")
def token(root):
    """An access token of alice's: the secret and its number."""
    made = subprocess.run([BUILD / "programs" / "webapi-token", "create", "--user", "alice"],
                          check=True, capture_output=True, text=True)
    return made.stdout.strip(), made.stderr.split()[1]


def by_shell(kind, key, line):
    return subprocess.run([EXAMPLES / "envelope.sh", kind, key, line], check=True, capture_output=True,
                          text=True).stdout.strip()


def by_node(kind, key, line):
    call = {"host": "encipherForHost(fs.readFileSync(process.argv[1], 'utf8'), process.argv[2])",
            "token": "encipherWithToken(process.argv[1], process.argv[2])"}[kind]
    script = ("import fs from 'node:fs'; import { webcrypto } from 'node:crypto';"
              "globalThis.crypto ??= webcrypto;"
              f"const {{ encipherForHost, encipherWithToken }} = await import('{EXAMPLES}/envelope.mjs');"
              f"console.log(await {call});")
    return subprocess.run(["node", "--input-type=module", "-e", script, key, line], check=True,
                          capture_output=True, text=True).stdout.strip()


MAKERS = [by_shell, pytest.param(by_node, marks=pytest.mark.skipif(
    shutil.which("node") is None, reason="node is not installed"))]


@pytest.mark.parametrize("make", MAKERS)
def test_WholeLine_IsDeciphered(make, client, alice, public_key):
    envelope = make("host", public_key, CALL + f"text=%C3%A4+b&number=5&_sid={alice['sid']}")
    for send in (client.get, client.post):
        envelope = make("host", public_key, CALL + f"text=%C3%A4+b&number=5&_sid={alice['sid']}")
        answer = send(urlencode({"method": "other", "outside": 1, "__cIpHeRtExT": envelope}))
        assert answer.data["user"] == "alice"
        parameters = answer.data["parameters"]
        assert parameters == {"api": API, "version": 1, "method": "plain", "text": "ä b", "number": 5,
                              "outside": 1, "_sid": alice["sid"]}
        assert send(urlencode({"__cIpHeRtExT": envelope})).code == 101  # a second time


@pytest.mark.parametrize("make", MAKERS)
def test_EnvelopeWithinAnObject_AddsToIt(make, client, alice, public_key):
    envelope = make("host", public_key, "inner=1")
    body = CALL + urlencode({"_sid": alice["sid"], "webapi": json.dumps(
        {"plain": 2, "__cIpHeRtExT": envelope, "__cIpHeRtOkEn": "x"})})
    assert client.post(body).data["parameters"]["webapi"] == {"plain": 2, "inner": 1}
    assert client.post(body).data["parameters"]["webapi"] == {"plain": 2}  # a second time


@pytest.mark.parametrize("make", MAKERS)
def test_LineOfAToken_IsDeciphered(make, client, token):
    secret, number = token
    envelope = make("token", secret, CALL + f"tid={secret}&text=5")
    body = urlencode({"__nEkOtReHpIc": number, "__tXeTrEhPiC": envelope, "text": "outside"})
    answer = client.post(body)
    assert answer.data["user"] == "alice"
    assert answer.data["parameters"] == {"api": API, "version": 1, "method": "plain", "text": 5,
                                         "tid": secret}
    assert client.post(body).code == 101


def test_Makers_AgreeWithAThirdReckoning(token):
    """The key of a token, as the standards' words and Python have it."""
    import base64
    import hashlib
    import hmac

    def hkdf(digest, secret, info, size):
        extracted = hmac.digest(b"\0" * hashlib.new(digest).digest_size, secret, digest)
        return hmac.digest(extracted, info + b"\x01", digest)[:size]

    def decoded(text):
        return base64.urlsafe_b64decode(text + "=" * (-len(text) % 4))

    secret = token[0]
    text = base64.urlsafe_b64encode(
        hkdf("sha256", hashlib.sha256(secret.encode()).digest(), b"webapi parameter key", 24))
    key = hkdf("sha512", text, b"webapi parameter cipher", 64)
    for make in (by_shell, *([by_node] if shutil.which("node") else [])):
        header, wrapped, vector, content, tag = make("token", secret, "a=1&b=2").split(".")
        assert wrapped == ""
        assert set(json.loads(decoded(header))) == {"alg", "enc", "iat"}
        proof = hmac.digest(key[:32], header.encode() + decoded(vector) + decoded(content)
                            + (8 * len(header)).to_bytes(8, "big"), "sha512")[:32]
        assert proof == decoded(tag)
        plain = subprocess.run(["openssl", "enc", "-d", "-aes-256-cbc", "-K", key[32:].hex(), "-iv",
                                decoded(vector).hex()], input=decoded(content), capture_output=True,
                               check=True).stdout
        assert plain == b"a=1&b=2"


def test_ForeignEnvelopes_EndTheCall(client, alice, public_key, token):
    good = by_shell("host", public_key, CALL + f"_sid={alice['sid']}")
    for envelope in ("", "x", "a.b.c.d.e", good[:-1], "." + good, good + ".", good.replace(".", "..", 1),
                     by_shell("token", token[0], CALL)):
        assert client.post(urlencode({"__cIpHeRtExT": envelope})).code == 101
    for number in ("0", "999999", "x", token[1] + "0"):
        envelope = by_shell("token", token[0], CALL)
        body = urlencode({"__nEkOtReHpIc": number, "__tXeTrEhPiC": envelope})
        assert client.post(body).code == 101
    assert client.post(urlencode({"__cIpHeRtExT": good})).data["user"] == "alice"


def test_PublicKey_IsGivenToEverybody(client, public_key):
    data = client.call("QELO.Access.Cipher", "get").data
    assert data["key"] == public_key.read_text()
    assert (data["alg"], data["enc"]) == ("RSA-OAEP-256", "A256CBC-HS512")
    assert abs(data["time"] - time.time()) < 30


def test_PublicKey_OfAHostWithoutOne_Is400(client, public_key):
    private = ROOT / "etc/webapi/cipher.pem"
    private.rename(private.with_suffix(".away"))
    try:
        assert client.call("QELO.Access.Cipher", "get").code == 400
    finally:
        private.with_suffix(".away").rename(private)


@pytest.mark.skipif(shutil.which("node") is None, reason="node is not installed")
def test_Page_AsksForTheKeyAndEnciphersForIt(client, alice, public_key):
    """The example module, by itself: the host's key, its clock, an envelope and the call."""
    script = (f"import {{ encipherForHost, hostKey }} from '{EXAMPLES}/envelope.mjs';"
              "const [url, line] = process.argv.slice(1);"
              "const clock = Date.now; Date.now = () => clock() - 3_600_000;"  # an hour slow
              "const { key, now } = await hostKey(url);"
              "const body = new URLSearchParams({ __cIpHeRtExT: await encipherForHost(key, line, now()) });"
              "console.log(await (await fetch(url, { method: 'POST', body })).text());")
    output = subprocess.run(
        ["node", "--input-type=module", "-e", script, f"http://127.0.0.1:{client.port}/webapi/entry.cgi",
         CALL + f"_sid={alice['sid']}"], check=True, capture_output=True, text=True).stdout
    assert json.loads(output)["data"]["user"] == "alice"
