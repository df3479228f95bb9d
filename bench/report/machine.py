"""What the figures were measured on. Nothing that names the machine or a place on it."""
import os
import pathlib
import re
import subprocess

from subject import ROOT


def describe():
    return {"processor": _first("/proc/cpuinfo", r"^model name\s*: (.*)$"), "cores": os.cpu_count(),
            "memory_gib": round(int(_first("/proc/meminfo", r"^MemTotal:\s+(\d+) kB$")) / 2**20, 1),
            "kernel": re.match(r"[\d.]*\d", os.uname().release)[0], "architecture": os.uname().machine,
            "system": _first("/etc/os-release", r'^PRETTY_NAME="(.*)"$'), "disk": _disk(),
            "compiler": _line("c++", "--version"), "sqlite": _line("sqlite3", "--version").split()[0],
            "daemon": _line("syslog-ng", "--version"), "receive_buffer_limit": _receive_buffer_limit(),
            "load": os.getloadavg()[0], "commit": _commit()}


def _first(file, pattern):
    found = re.search(pattern, pathlib.Path(file).read_text(), re.MULTILINE)
    return found[1] if found else "unknown"


def _line(*command):
    try:
        return subprocess.run(command, capture_output=True, text=True).stdout.splitlines()[0]
    except (OSError, IndexError):
        return "none"


def _receive_buffer_limit():
    file = pathlib.Path("/proc/sys/net/core/rmem_max")  # older kernels do not show it in a namespace
    return int(file.read_text()) if file.exists() else None


def _disk():
    """The file system that the measured stores are on, and the kind of its disk, which the device's name
    tells."""
    device = os.stat(ROOT).st_dev
    kinds = {"vd": "a virtual disk", "nvme": "an NVMe disk", "sd": "a disk", "xvd": "a virtual disk"}
    for line in pathlib.Path("/proc/self/mountinfo").read_text().splitlines():
        place, kind = (part.split() for part in line.split(" - "))
        if place[2] == f"{os.major(device)}:{os.minor(device)}":
            name = pathlib.Path(kind[1]).name
            disk = next((text for start, text in kinds.items() if name.startswith(start)), "another device")
            return f"{kind[0]} on {disk}"
    return "unknown"


def _commit():
    """Of the tree that was built; a tree with changes in it says so."""
    return _line("git", "-c", "safe.directory=*", "-C", str(ROOT), "describe", "--always", "--dirty",
                 "--abbrev=12")
