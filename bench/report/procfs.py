"""What the kernel knows about a process and about the report port."""
import os
import pathlib
import re
import subprocess
import time

PORT = ": 0100007F:270D "  # 127.0.0.1:9997, as the kernel writes it in its tables


def _line_of_the_port():
    for line in pathlib.Path("/proc/net/udp").read_text().splitlines():
        if PORT in line:
            return line.split()
    return None


def _read(file):
    """Nothing for a thread that ended meanwhile."""
    try:
        return file.read_text()
    except OSError:
        return ""


def is_bound():
    return _line_of_the_port() is not None


def waiting_bytes():
    """In the socket's buffer."""
    line = _line_of_the_port()
    return int(line[4].split(":")[1], 16) if line else 0


def socket_buffer_bytes():
    """What the kernel granted, its own bookkeeping included: twice what may be asked for."""
    listing = subprocess.run(["ss", "-uamn", "sport", "=", ":9997"], capture_output=True, text=True,
                             check=True)
    return int(re.search(r"skmem:\(r\d+,rb(\d+)", listing.stdout)[1])


def udp_counters():
    """Of this network namespace, so of the measured socket alone. InDatagrams counts what a program took."""
    names, values = [line.split()[1:] for line in pathlib.Path("/proc/net/snmp").read_text().splitlines()
                     if line.startswith("Udp:")]
    return dict(zip(names, map(int, values)))


def thread_ns(pid):
    """The processor time of each thread that lives."""
    texts = {task.name: _read(task / "schedstat") for task in pathlib.Path(f"/proc/{pid}/task").iterdir()}
    return {int(thread): int(text.split()[0]) for thread, text in texts.items() if text}


def waits_for_disk(pid):
    texts = [_read(task / "stat") for task in pathlib.Path(f"/proc/{pid}/task").iterdir()]
    return any(text.rpartition(")")[2].split()[0] == "D" for text in texts if text)


# The system calls in which a thread waits for a socket, on x86-64 and on arm64.
_SOCKET_WAITS = {"x86_64": {"7", "23", "45", "47", "232", "270", "271", "281", "299"},
                 "aarch64": {"22", "72", "73", "207", "212", "243"}}[os.uname().machine]


def receiving_thread(pid):
    """The one that waits for a socket while nothing comes. It may be between two waits, or just be
    starting."""
    deadline = time.monotonic() + 10
    while time.monotonic() < deadline:
        for task in pathlib.Path(f"/proc/{pid}/task").iterdir():
            if _read(task / "syscall").split(" ")[0] in _SOCKET_WAITS:
                return int(task.name)
        time.sleep(0.001)
    raise SystemExit("no thread of the measured program waits for the socket")


def memory_bytes(pid, which="VmHWM"):
    status = pathlib.Path(f"/proc/{pid}/status").read_text()
    return int(re.search(rf"^{which}:\s+(\d+) kB", status, re.MULTILINE)[1]) * 1024
