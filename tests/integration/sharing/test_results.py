"""What a method is told that runs whatever the check of a link found: each result, from outside."""

import pytest

from client import Client
from sharing import (DATABASE, Visitor, alice, change_database, fresh_addresses,  # noqa: F401
                     shared, stranger, visit)

pytestmark = pytest.mark.usefixtures("shared")


@pytest.fixture
def told(describe):
    """The result that the method of a call finds, which runs for everybody."""
    describe("QELO.Test.Open", "identity.so", authLevel=2, methods={"1": [
        {"plain": {"allowSharing": True, "skipSharingAppCheck": True}},
        {"asRoot": {"allowSharing": True}}]})
    describe("QELO.Test.Identity", "identity.so", authLevel=2, methods={"1": ["plain"]})

    def found(visitor, method="plain", api="QELO.Test.Open", **parameters):
        return visitor.call(method, api, **parameters).data["authResult"]

    return found


def test_Results_OfTheLink_AreTold(alice, visit, told, server):
    link = alice.make()
    visitor = visit(link)
    assert told(visitor) == 1
    elsewhere = Client(server.port, next(fresh_addresses))
    assert told(Visitor(elsewhere, visitor.link, visitor.sid)) == -8
    assert told(Visitor(visitor.client, alice.make()["link"], visitor.sid)) == -7
    assert told(Visitor(visitor.client, visitor.link)) == -5
    assert told(Visitor(visitor.client, visitor.link, "A" * 43)) == -5
    assert told(Visitor(visitor.client, "A" * 43, visitor.sid)) == -2
    assert told(Visitor(visitor.client, visitor.link[1:], visitor.sid)) == -7  # malformed
    assert told(Visitor(visitor.client, visitor.link, visitor.sid[1:])) == -7
    alice.call("change", id=link["id"], expires=1)
    assert told(visitor) == -6


def test_Results_ThatAreNotTheLinks_AreTold(alice, visit, told):
    visitor = visit(alice.make())
    change_database("UPDATE sessions SET ends = 1 + strftime('%s', 'now') - 10")
    assert told(visitor) == -1
    assert told(visitor, api="QELO.Test.Identity") == -4  # not for links
    mode = DATABASE.stat().st_mode
    DATABASE.chmod(0o602)
    try:
        assert told(visitor) == -7
    finally:
        DATABASE.chmod(mode)


def test_ResultOfTheApplication_IsNone(alice, visit, told):
    visitor = visit(alice.make())
    assert told(visitor, "asRoot", check="refuse") == -4
    assert told(visitor, "asRoot", check="allow") == 1
