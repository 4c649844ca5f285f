"""Secrets are looked up by their hash and by nothing else: how much of a guess is right makes no
difference to what is compared, so its time tells nothing. And ids that are worth nothing."""

import hashlib
import re
import sqlite3

import pytest

from conftest import ROOT
from sharing import DATABASE, Visitor, alice, change_database, shared, stranger, visit  # noqa: F401

pytestmark = pytest.mark.usefixtures("shared")

TOKENS = DATABASE.with_name("tokens.db")
OTHER = "".join("ABCDEFGH-_"[i % 10] for i in range(43))


def hash_of(secret):
    return hashlib.sha256(secret.encode()).digest()


def change(database, sql, *values):
    with sqlite3.connect(database, timeout=5) as connection:
        assert connection.execute(sql, values).rowcount == 1
    connection.close()


def exchange(database, table, secret):
    """Puts the hash of another secret in the place of this one's."""
    change(database, f"UPDATE {table} SET hash = ? WHERE hash = ?", hash_of(OTHER), hash_of(secret))


@pytest.fixture
def token(alice):
    scopes = '[{"api": "QELO.Test.*"}]'
    made = alice.client.call("QELO.Access.Token", "create", _sid=alice.sid, name="of a test", scopes=scopes)
    yield made.data
    alice.client.call("QELO.Access.Token", "revoke", _sid=alice.sid, id=made.data["id"])


def by_token(alice, token):
    return alice.client.call("QELO.Test.Identity", "plain", tid=token).code


def test_Link_IsFoundByTheHashOfItsIdAlone(alice, visit):
    visitor = visit(alice.make())
    exchange(DATABASE, "links", visitor.link)
    assert visitor.call().code == 126
    assert Visitor(visitor.client, OTHER, visitor.sid).call().code == 0
    change_database(f"DELETE FROM links WHERE hash = X'{hash_of(OTHER).hex()}'")


def test_Session_IsFoundByTheHashOfItsIdAlone(alice, visit):
    visitor = visit(alice.make())
    exchange(DATABASE, "sessions", visitor.sid)
    assert visitor.call().code == 122
    assert Visitor(visitor.client, visitor.link, OTHER).call().code == 0
    change_database(f"DELETE FROM sessions WHERE hash = X'{hash_of(OTHER).hex()}'")


def test_Token_IsFoundByItsHashAlone(alice, token):
    assert by_token(alice, token["token"]) == 0
    exchange(TOKENS, "tokens", token["token"])
    assert by_token(alice, token["token"]) == 119
    assert by_token(alice, OTHER) == 0


def test_Token_ServesWholeAlone(alice, token):
    secret = token["token"]
    for place in range(0, 43, 6):
        other = "A" if secret[place] != "A" else "B"
        for wrong in (secret[:place] + other + secret[place + 1:], secret[:place], secret + other):
            assert by_token(alice, wrong) in ((105,) if wrong == "" else (119,)), wrong
    assert by_token(alice, secret) == 0


def test_Token_PastItsEnd_IsRefused(alice, token):
    change(TOKENS, "UPDATE tokens SET expires = 1 WHERE id = ?", token["id"])
    assert by_token(alice, token["token"]) == 119


def test_Token_IsInNoFile(alice, token):
    for file in (TOKENS, *TOKENS.parent.glob("tokens.db-*")):
        assert token["token"].encode() not in file.read_bytes()


@pytest.fixture
def locked(alice):
    """Alice's account, which may not log in for the time of the test."""
    shadow = ROOT / "etc" / "shadow"
    before = shadow.read_text()

    def lock():
        shadow.write_text(re.sub("^alice:", "alice:!", before, flags=re.MULTILINE))

    yield lock
    shadow.write_text(before)


def test_LockedAccount_IsRefusedByEachRoad(alice, visit, token, locked):
    visitor = visit(alice.make())
    locked()
    answer = alice.client.call("QELO.Test.Identity", "plain", _sid=alice.sid)
    assert answer.refusal == (105, "noprivilege")
    assert by_token(alice, token["token"]) == 119
    assert visitor.call().code == 124
    assert visitor.open().code == 402
