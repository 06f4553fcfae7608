"""The device's services at their sockets: one query by hand, and many by the program that asks again and again."""

import os
import socket
import struct
import subprocess
import time

from . import handlers

TIME_LIMIT = 60


def framed(text):
    return len(text).to_bytes(8, "little") + text


def receive_text(connection):
    """The text that comes over the connection, which has to be whole."""
    data = b""
    while len(data) < 8 or len(data) < 8 + int.from_bytes(data[:8], "little"):
        part = connection.recv(1 << 16)
        if not part:
            raise RuntimeError(f"only {len(data)} bytes came")
        data += part
    return data[8:]


def ask(path, message):
    """The answer of the service to one message."""
    with socket.socket(socket.AF_UNIX) as connection:
        connection.settimeout(TIME_LIMIT)
        connection.connect(path)
        connection.sendall(framed(message))
        return receive_text(connection)


def ask_again(path, message, answer, clients, seconds):
    """Asks for so many seconds, or each client once for 0, and takes no answer but this one. Gives the seconds of each
    query, those of all together, and the processor time of the program that asks."""
    program = [handlers.PROGRAM_FOLDER + "/ask_service", path, str(clients), str(seconds), answer]
    done = subprocess.run(program, input=message, stdout=subprocess.PIPE, check=True, timeout=seconds + TIME_LIMIT)
    *times, (_, total, processor) = (line.split() for line in done.stdout.decode().splitlines())
    return [float(taken) for taken, in times], float(total), float(processor)


def processor_time(path):
    """Seconds of the service that listens there and of its children that have ended, in steps of the kernel's clock."""
    time.sleep(0.2)  # the children of the last calls end
    with socket.socket(socket.AF_UNIX) as connection:
        connection.connect(path)
        credentials = connection.getsockopt(socket.SOL_SOCKET, socket.SO_PEERCRED, struct.calcsize("3i"))
    process, _, _ = struct.unpack("3i", credentials)
    with open(f"/proc/{process}/stat", encoding="ascii") as file:
        fields = file.read().rpartition(") ")[2].split()
    return sum(map(int, fields[11:15])) / os.sysconf("SC_CLK_TCK")
