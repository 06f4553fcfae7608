"""Queries a second at the fast API service, and how long each takes, with one client and with several at once."""

import json
import statistics

from . import daemon, services

SOCKET = "/run/zovascgi-fastapi.sock"
CLIENTS = (1, 4, 16)
QUERY = {"params": {"api": daemon.APIS["process"], "version": 1, "method": "nothing"},
         "runner": {"username": "alice"}}


def one_round(message, answer, clients, seconds):
    times, total, processor = services.ask_again(SOCKET, message, answer, clients, seconds)
    cuts = statistics.quantiles(times, n=100)
    return {"rate": len(times) / total, "median": statistics.median(times), "99th percentile": cuts[98],
            "client": processor / len(times)}


def measure(seconds, rounds):
    """By number of clients: the figures of each round. They take turns, so that a slow spell hits all of them."""
    message = json.dumps(QUERY).encode()
    answer = services.ask(SOCKET, message)
    if json.loads(answer) != {"success": True}:
        raise RuntimeError(f"the fast API answered {answer.decode()}")
    table = {clients: [] for clients in CLIENTS}
    services.ask_again(SOCKET, message, answer, max(CLIENTS), 1)
    for _ in range(rounds):
        for clients, measured in table.items():
            measured.append(one_round(message, answer, clients, seconds))
            print(f"fast API, {clients} clients: {measured[-1]['rate']:.0f} queries a second, "
                  f"median {measured[-1]['median'] * 1e3:.1f} ms, 99th percentile "
                  f"{measured[-1]['99th percentile'] * 1e3:.1f} ms", flush=True)
    return table
