"""QR codes of links, read by the library of a scanner."""

from conftest import answer_of, run_entry
from qr import painted, read_codes
from sharing import API, Visitor, alice, bob, stranger, visit  # noqa: F401


def test_Code_LeadsToTheLink(alice):
    link = alice.make(project="files", path="/own")
    data = alice.call("qr", link=link["link"]).data
    assert data["id"] == link["id"] and data["url"] == link["url"]
    assert read_codes(data["svg"]) == [link["url"]]


def test_Code_HasAnEmptyBorder(alice):
    rows = painted(alice.call("qr", link=alice.make()["link"]).data["svg"])
    white = b"\xff" * 4
    assert all(row == b"\xff" * len(row) for row in rows[:4] + rows[-4:])
    assert all(row[:4] == white and row[-4:] == white for row in rows)
    assert rows[4][4] == 0


def test_OfALinkThatIsNotTheCallers_ThereIsNone(alice, bob):
    link = alice.make()
    assert bob.call("qr", link=link["link"]).code == 400
    for wrong in ("A" * 43, link["link"][1:], "", str(link["id"]), '["x"]', "../" + link["link"][3:]):
        assert alice.call("qr", link=wrong).code == 400
    assert alice.call("remove", id=link["id"]).code == 0
    assert alice.call("qr", link=link["link"]).code == 400


def test_Visitor_GetsNone(alice, visit):
    link = alice.make(protect="owner")
    assert visit(link).call("qr", API, link=link["link"]).code == 126


def test_AddressThatNoCodeHolds_Is408(alice):
    """The address is the one that the client called by, which may be of any length."""
    link = alice.make()["link"]
    query = f"api={API}&version=1&method=qr&_sid={alice.sid}&link={link}"
    for length, code in ((1000, 0), (4000, 408)):
        answer = answer_of(run_entry(query, HTTP_HOST="h" * length))
        assert answer.get("error", {}).get("code", 0) == code
