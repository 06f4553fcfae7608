"""What a call through the API daemon costs beside the same call in the front's own process."""

import concurrent.futures
import json
import os
import socket
import statistics

from . import handlers, instructions, services, system_calls

ROUNDS = 100
SOCKET = "/run/zovaapid.sock"
APIS = {"process": "ZOVA.Bench.Daemon.Process", "daemon": "ZOVA.Bench.Daemon.Socket"}


def forwarded_message(call):
    """What front.cgi sends the daemon for the call, as a listener in the daemon's place receives it. To whatever asks
    meanwhile there is no daemon."""
    aside = SOCKET + ".aside"
    os.rename(SOCKET, aside)
    try:
        with socket.socket(socket.AF_UNIX) as listening, concurrent.futures.ThreadPoolExecutor(1) as runner:
            listening.settimeout(services.TIME_LIMIT)
            listening.bind(SOCKET)
            listening.listen()
            running = runner.submit(call.run)
            with listening.accept()[0] as connection:
                connection.settimeout(services.TIME_LIMIT)
                message = services.receive_text(connection)
            running.result()
            return message
    finally:
        os.rename(aside, SOCKET)


def message_and_answer(call):
    """The forwarded message of the call, and the daemon's answer to it, whose body is what the front answers."""
    message = forwarded_message(call)
    answer = services.ask(SOCKET, message)
    if json.loads(answer)["body"] != call.expected:
        raise RuntimeError(f"the daemon answered {answer.decode()}")
    return message, answer


def measure(folder):
    """By way: seconds in each round; of the calls also processor time, system calls and instructions of the front's
    process. And the processor time of the daemon for one call."""
    calls = {way: handlers.front(api, "nothing", {}, expected={"success": True}) for way, api in APIS.items()}
    message, answer = message_and_answer(calls["daemon"])
    table = {way: {"seconds": [], "processor": []} for way in calls}
    straight = []
    before = services.processor_time(SOCKET)
    for _ in range(ROUNDS):
        for way, call in calls.items():
            times = handlers.times_of(call)
            table[way]["seconds"].append(times.wall)
            table[way]["processor"].append(times.processor)
        straight += services.ask_again(SOCKET, message, answer, 1, 0)[0]
    table["straight"] = {"seconds": straight}
    # Of each round, the call through front.cgi and the message sent straight.
    own = (services.processor_time(SOCKET) - before) / (2 * ROUNDS)
    for way, call in calls.items():
        table[way]["system calls"] = system_calls.total(call)
        table[way]["instructions"] = instructions.run(call, os.path.join(folder, f"daemon-{way}.out"))
    for way, measured in table.items():
        print(f"API daemon, {way}: {statistics.median(measured['seconds']) * 1e6:.0f} microseconds", flush=True)
    print(f"API daemon: {own * 1e6:.0f} microseconds of processor time for each call", flush=True)
    return {"ways": table, "processor": own}
