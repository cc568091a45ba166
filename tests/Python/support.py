"""What the tests of the Python package share: a collector, and processes that use the package."""

import gzip
import http.server
import json
import os
import subprocess
import sys
import tempfile
import threading
import unittest
from typing import Any, Dict, List, Optional

DEADLINE = 60

PREAMBLE = """
import atexit
atexit.register(lambda: late())
def late(): pass

import asyncio, gc, logging, multiprocessing, os, signal, sys, threading, time
import corvane

@corvane.data
class Screen:
    name: str

@corvane.event
class View:
    event: corvane.EventData
    screen: Screen

def begin(**options):
    corvane.set_documents_directory(os.environ["DOCUMENTS"])
    corvane.upload_in_process()
    uploads = corvane.Uploads(corvane.Client("com.example.test", "Test", "1", 1), os.environ["COLLECTOR"], "main", **options)
    return uploads, corvane.Sessions(uploads)
"""


class Collector:
    """Takes documents on loopback; while it `hangs` it does not answer."""

    def __init__(self) -> None:
        self.documents: List[Dict[str, Any]] = []
        self.headers: List[Dict[str, str]] = []
        self.hangs = False
        self._ended = threading.Event()
        collector = self

        class Handler(http.server.BaseHTTPRequestHandler):
            def do_PUT(self) -> None:
                body = self.rfile.read(int(self.headers["Content-Length"]))
                if collector.hangs:
                    collector._ended.wait(DEADLINE)
                collector.documents.append(json.loads(gzip.decompress(body)))
                collector.headers.append(dict(self.headers))
                self.send_response(200)
                self.end_headers()

            def log_message(self, *_: Any) -> None:
                pass

        self._server = http.server.ThreadingHTTPServer(("127.0.0.1", 0), Handler)
        self.url = f"http://127.0.0.1:{self._server.server_port}/events"
        threading.Thread(target=self._server.serve_forever, daemon=True).start()

    def close(self) -> None:
        self._ended.set()
        self._server.shutdown()
        self._server.server_close()


class ProcessTest(unittest.TestCase):
    def setUp(self) -> None:
        directory = tempfile.TemporaryDirectory()
        self.addCleanup(directory.cleanup)
        self.directory = directory.name
        self.collector = Collector()
        self.addCleanup(self.collector.close)

    def start(self, program: str, *arguments: str, preamble: str = PREAMBLE) -> "subprocess.Popen[str]":
        path = os.path.join(self.directory, "program.py")
        with open(path, "w", encoding="utf-8") as file:
            file.write(preamble + program)
        environment = {**os.environ, "PYTHONUNBUFFERED": "1", "COLLECTOR": self.collector.url}
        environment["DOCUMENTS"] = os.path.join(self.directory, "documents")
        pipe = subprocess.PIPE
        command = [sys.executable, "-X", "dev", path, *arguments]
        return subprocess.Popen(command, stdout=pipe, stderr=pipe, text=True, env=environment, cwd=self.directory)

    def finish(self, process: "subprocess.Popen[str]", errors: Optional[str] = "") -> str:
        """What it prints; it must end well, and write nothing to standard error but `errors`."""
        try:
            out, err = process.communicate(timeout=DEADLINE)
        except subprocess.TimeoutExpired:
            process.kill()
            self.fail(f"the process does not end: {process.communicate()}")
        self.assertEqual(process.returncode, 0, out + err)
        # What was under way when the process ended is sent by its next run.
        err = "".join(line for line in err.splitlines(True) if "the process is exiting" not in line)
        if errors == "":
            self.assertEqual(err, "", out)
        elif errors:
            self.assertIn(errors, err)
        return out

    def run_program(self, program: str, *arguments: str, errors: Optional[str] = "") -> str:
        return self.finish(self.start(program, *arguments), errors)


def plain_environment() -> Dict[str, str]:
    """For programs that are no Python: a sanitizer that is loaded into them sees half of what they do, and is mistaken."""
    return {name: value for name, value in os.environ.items() if name != "LD_PRELOAD"}
