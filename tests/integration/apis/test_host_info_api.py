"""QELO.Host.Info: the host's state, for administrators."""

import os
import shutil
import socket

from conftest import ROOT

API = "QELO.Host.Info"


def test_Get_ByAnOrdinaryUser_IsRefused(client, alice):
    assert client.call(API, "get", _sid=alice["sid"]).code == 105


def test_Get_WithoutLogin_IsRefused(client):
    assert client.call(API, "get").refusal == (105, "noprivilege")


def test_Get_TellsTheHostsState(client, admin):
    data = client.call(API, "get", _sid=admin["sid"]).data
    assert data["hostName"] == socket.gethostname()
    with open("/proc/uptime", encoding="ascii") as uptime:
        assert abs(data["uptime"] - float(uptime.read().split()[0])) < 60
    assert len(data["load"]) == 3 and all(load >= 0 for load in data["load"])
    memory = data["memory"]
    assert memory["total"] == int(
        next(line for line in open("/proc/meminfo", encoding="ascii") if "MemTotal" in line)
        .split()[1]
    ) * 1024
    assert 0 < memory["free"] <= memory["total"]
    assert 0 < memory["available"] <= memory["total"]


def test_Get_TellsTheVolumeOfThePrivateRoot(client, admin):
    volumes = client.call(API, "get", _sid=admin["sid"]).data["volumes"]
    device = os.stat(ROOT).st_dev
    own = [volume for volume in volumes if os.stat(volume["mountPoint"]).st_dev == device]
    assert len(own) == 1
    assert own[0]["total"] == shutil.disk_usage(ROOT).total
    assert 0 < own[0]["free"] <= own[0]["total"]
    pseudo = {"proc", "sysfs", "devpts", "cgroup2", "mqueue"}
    assert not pseudo & {volume["fileSystem"] for volume in volumes}
    points = [volume["mountPoint"] for volume in volumes]
    assert len(points) == len(set(points))
