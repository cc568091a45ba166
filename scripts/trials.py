"""What the scripts that try hosts share: the server to which a trial delivers, a trial with a documents directory of its
own, and what must hold at its end."""

import collections
import contextlib
import gzip
import http.server
import json
import os
import pathlib
import re
import signal
import sqlite3
import subprocess
import threading
import time
import zlib

ROOT = pathlib.Path(__file__).resolve().parent.parent
BUILD = ROOT / "build/dev"
HOST, STEPS, AGENT = (BUILD / path for path in ("tests/Kill/kill_host", "tests/Kill/libkill_steps.so",
                                                "corvane/Agent/Daemon/corvane-transferd"))
DEADLINE = 30  # seconds, for what takes milliseconds

# What a host is told in a run (see tests/Kill/host.cpp). Events that are at hand together share a write, so that some wait
# for the one before.
END = ["end", "wait", "read", "told"]
SEVEN = 7 * ["submit before"]
PAUSE = 7 * ["submit before", "told"] + ["sleep 1200", "say later"]
MODES = {
    "leave": SEVEN,
    "record": 12 * ["submit before", "told"] + END,
    "pauses": 2 * PAUSE + END,
    "forget": SEVEN + ["forget", "told"] + 3 * ["submit after"] + END,
    "collect": ["submit after"] + END,
}
Scenario = collections.namedtuple("Scenario", "agent mode left options", defaults=[()])
SCENARIOS = {
    "first run": Scenario(False, "record", False),
    "later run": Scenario(False, "record", True),
    "forget": Scenario(False, "forget", True),
    "first run with agent": Scenario(True, "record", False),
    "later run with agent": Scenario(True, "record", True),
    "forget with agent": Scenario(True, "forget", True),
}


class Server:
    """What the trials deliver to."""

    def __init__(self):
        self.trials = {}
        owner = self

        class Handler(http.server.BaseHTTPRequestHandler):
            protocol_version = "HTTP/1.1"

            def do_PUT(self):
                try:
                    length = int(self.headers["Content-Length"])
                    body = self.rfile.read(length)
                    if len(body) < length:
                        raise ConnectionError("the client has gone")
                    status = owner.take(self.path, self.headers, body)
                    self.send_response(status)
                    self.send_header("Content-Length", "0")
                    self.end_headers()
                except OSError:
                    self.close_connection = True

            def log_message(self, *_):
                pass

        http.server.ThreadingHTTPServer.request_queue_size = 128  # many trials at a time
        self.http = http.server.ThreadingHTTPServer(("127.0.0.1", 0), Handler)
        self.http.handle_error = lambda *_: None
        threading.Thread(target=self.http.serve_forever, daemon=True).start()

    def url(self, number, phase):
        """Says of which run of which trial a document comes, however late it is read."""
        return f"http://127.0.0.1:{self.http.server_port}/{number}/{phase}"

    def take(self, path, headers, body):
        _, number, phase = path.split("/")
        trial = self.trials[int(number)]
        try:
            document = json.loads(gzip.decompress(body))
        except (OSError, EOFError, ValueError, zlib.error) as error:
            trial.garbage.append(repr(error))
            return 400
        if not re.fullmatch("[A-Za-z0-9+/]{86}==|SigningFailure=.*", headers["X-Veskar-ActionSignature"] or ""):
            trial.garbage.append("a signature that is none")
        return trial.receive(document, int(phase))


class Failure(Exception):
    """What was promised, and is not so."""


class Trial:
    """A documents directory of its own, and what arrives from it."""

    def __init__(self, server, scenario, directory, number):
        self.server, self.scenario, self.directory, self.number = server, scenario, directory, number
        self.home = directory / "documents"
        self.acknowledged = set()
        self.after = set()  # of those, what was recorded after forgetting
        self.has_forgotten = False
        self.errors = ""
        self.lock = threading.Condition()
        self.documents = {}  # the events of each document that was answered with 200
        self.garbage = []  # what was no document
        self.received = []  # each time that a document came
        self.late = []  # what was recorded before forgetting, and handed over behind it
        self.phase = 0 if scenario.left else 1
        self.released = threading.Event()
        server.trials[number] = self
        if scenario.left:
            self.leave()

    def receive(self, document, submitted):
        identifier = document["metadata"]["identifier"]
        events = [event["data"]["event"]["eventID"] for event in document["data"]["events"]]
        is_before = any(event["data"]["screen"]["name"] == "before" for event in document["data"]["events"])
        with self.lock:
            phase, is_first = self.phase, not self.received
            self.received.append(identifier)
            if is_before and submitted == 2:
                self.late.append(identifier)
            self.lock.notify_all()
            released = self.released
        if phase == 0:
            released.wait(DEADLINE)
            raise ConnectionError("never answered")
        if phase == 1 and self.scenario.mode == "forget" and is_before:
            released.wait(DEADLINE)  # under way all the time
        elif phase == 1 and is_first:
            return 503
        with self.lock:
            if self.documents.setdefault(identifier, events) != events:
                self.documents[identifier] = ["another document of the same name"]
        return 200

    def start(self, mode, environment=None):
        arguments = [HOST, self.server.url(self.number, self.phase), self.home, AGENT if self.scenario.agent else "-"]
        process = subprocess.Popen(arguments + ["batchSize=5", *self.scenario.options], text=True, stdin=subprocess.PIPE,
                                   stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                                   env={**os.environ, **(environment or {})})
        with contextlib.suppress(BrokenPipeError):  # it was killed at once
            process.stdin.write("\n".join(["start", *MODES[mode], ""]))
            process.stdin.flush()
        return process

    def finish(self, process):
        try:
            output, errors = process.communicate(timeout=DEADLINE)
        except subprocess.TimeoutExpired:
            process.kill()
            process.communicate()
            raise Failure(f"the host does not end within {DEADLINE} seconds") from None
        self.errors += errors
        for line in output.splitlines():
            self.read(line)
        return process.returncode

    def read(self, line):
        word, _, rest = line.partition(" ")
        if word == "forgotten":
            self.has_forgotten = True
        elif word == "ledger" and rest != "0":
            raise Failure(f"{rest} events are unaccounted for")
        elif word == "ack":
            when, event = rest.split()
            self.acknowledged.add(event)
            if when == "after":
                self.after.add(event)

    def leave(self):
        """A run that is killed together with its agent, with a document under way and a batch open."""
        host = self.start("leave")
        for _ in range(7):
            self.read(host.stdout.readline().strip())
        with self.lock:
            expect(self.lock.wait_for(lambda: self.received, DEADLINE), "nothing was sent")
        if agent := self.agent():
            os.kill(agent, signal.SIGKILL)
        host.kill()
        host.communicate()
        self.begin(1)
        self.received.clear()

    def begin(self, phase):
        with self.lock:
            self.phase = phase
        self.released.set()
        self.released = threading.Event()

    def end_agent(self):
        """Waits for an agent with nothing to do, which ends, and kills one that does not."""
        deadline = time.monotonic() + DEADLINE
        while (agent := self.agent()) and time.monotonic() < deadline:
            if self.waiting_with_agent() == 0:
                os.kill(agent, signal.SIGKILL)
            time.sleep(0.005)
        if agent:
            os.kill(agent, signal.SIGKILL)
            raise Failure("the agent goes on")

    def agent(self):
        """The process of this trial's agent, or None."""
        try:
            process = int((self.home / "agent/agent.lock").read_text())
            command = pathlib.Path(f"/proc/{process}/cmdline").read_bytes()
            return process if str(self.home).encode() in command else None
        except (OSError, ValueError):
            return None

    def has_more(self):
        return self.scenario.agent and (self.count_rows("signed_requests") or self.waiting_with_agent())

    def waiting_with_agent(self):
        """How many tasks the agent has that no host has acknowledged."""
        try:
            marks = set(os.listdir(self.home / "agent/withdrawn"))
            tokens = {row[0] for row in self.ask("agent/journal.db", "SELECT token FROM tasks")}
            spooled = {name for name in os.listdir(self.home / "agent/spool") if not name.startswith(".")}
            return len((tokens | spooled) - marks)
        except FileNotFoundError:  # no agent was ever needed
            return 0

    def ask(self, database, question):
        connection = sqlite3.connect(self.home / database, timeout=DEADLINE)
        try:
            return connection.execute(question).fetchall()
        finally:
            connection.close()

    def count_rows(self, table):
        return self.ask("com.veskar.corvane.main.db", f"SELECT count(*) FROM {table}")[0][0]

    def payloads(self):
        """The documents in the payload directory, as text, also the half-written ones."""
        for file in self.home.glob("*.upload-dropbox/*"):
            try:
                yield zlib.decompressobj(31).decompress(file.read_bytes()).decode(errors="replace")
            except (OSError, zlib.error):  # gone meanwhile, or torn
                pass

    def has_raised_epoch(self):
        try:
            return len((self.home / "com.veskar.corvane.recording").read_text().split()) == 3
        except FileNotFoundError:
            return False


def expect(condition, what):
    if not condition:
        raise Failure(what)


def check(trial, is_exact, forgets):
    expect(not trial.garbage, f"what was no document has arrived: {trial.garbage}")
    acknowledged = trial.acknowledged
    arrived = [event for events in trial.documents.values() for event in events]
    due = trial.after if forgets else acknowledged
    lost = due - set(arrived)
    expect(not lost, f"{len(lost)} of {len(due)} acknowledged events are lost")

    database = "com.veskar.corvane.main.db"
    counts = {row[0]: row[1:] for row in trial.ask(database, "SELECT entry, events, documents FROM ledger")}
    total = sum(row[0] for entry, row in counts.items() if not entry.startswith(("sent again", "not accepted")))
    for table in ("upload_batches", "signed_requests", "documents"):
        rows = trial.count_rows(table)
        expect(rows == 0, f"{rows} rows are left in {table}")
    is_in_memory = "Failed to create store" in trial.errors
    if not is_in_memory:
        expect(len(acknowledged) <= total, f"the ledger has {total} of {len(acknowledged)} acknowledged events")
    if is_exact:
        expect(len(arrived) == len(set(arrived)), "events have come in two documents")
        unknown = counts.get("unknown", (0, 0))
        expect(unknown == (0, 0), f"the ledger does not know what became of {unknown}")
        delivered = counts.get("delivered", (0, 0))
        # Of what was to be forgotten the server may have more than its answer told.
        is_balanced = delivered == (len(arrived), len(trial.documents))
        expect(is_balanced or forgets, f"the ledger has {delivered} delivered of {len(arrived)} in "
                                       f"{len(trial.documents)} documents")
    if trial.scenario.agent:
        tasks = trial.waiting_with_agent()
        expect(tasks == 0, f"{tasks} tasks are left with the agent")
    if forgets:
        expect(not trial.late, f"{len(trial.late)} documents that were to be forgotten have come after the restart")
        left = [payload for payload in trial.payloads() if '"before"' in payload]
        expect(not left, f"{len(left)} payloads are left of what was to be forgotten")
