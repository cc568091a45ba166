"""The batching processor."""

import time
from ctypes import byref, c_void_p
from concurrent.futures import Future
from datetime import timedelta
from typing import Callable, Mapping, Optional

from . import _callbacks
from ._calls import Handle, call, milliseconds, number, optional_text, text
from ._library import CDeliveryReport, CLedger, CUploadOptions, library
from ._processors import AnyProcessor
from ._records import Client, DeliveryReport, DeliveryUpdate, Ledger, ledger_of, report_of, update_at

#: How long Ctrl-C may have to wait. A thread that waits in the library's stead would be left behind by it.
_SLICE = 0.1


class Uploads(AnyProcessor):
    """The batching processor: keeps every event on disk until it is delivered.

    `url` is absolute, http or https; `endpoint` is the name that keys what is kept for the destination on disk.

    `batch_size` is the number of events in a document; `batch_debugging` keeps readable copies of documents and answers.
    `maximum_bytes_on_disk` is 1 GiB unless it is given, `maximum_age` of a stored document any. An open batch is sent when
    it has `maximum_delay`; what did not get through is sent again after `retry_delay` while the process runs, and otherwise
    with the next run. With `survives_power_cut` completions wait for the disk. `trusted_certificates` is the absolute path
    of a file or directory, in place of the system's.

    `headers` is asked for further headers whenever a document is handed over, as for an authorisation token: on threads of
    the library's, at most two at a time. What it raises is logged, and the document goes out without them.

    It is added to one session manager. Every call may be made on any thread; only `wait` waits.
    """

    def __init__(
        self,
        client: Client,
        url: str,
        endpoint: str,
        *,
        batch_size: Optional[int] = None,
        batch_debugging: bool = False,
        maximum_bytes_on_disk: Optional[int] = None,
        maximum_age: Optional[timedelta] = None,
        maximum_delay: Optional[timedelta] = None,
        retry_delay: Optional[timedelta] = None,
        survives_power_cut: bool = False,
        trusted_certificates: Optional[str] = None,
        headers: Optional[Callable[[], Mapping[str, str]]] = None,
    ) -> None:
        _callbacks.start()
        options = CUploadOptions(
            identifier=text(client.identifier, "client.identifier"),
            name=text(client.name, "client.name"),
            version=text(client.version, "client.version"),
            build=number(client.build, 64, "client.build"),
            url=text(url, "url"),
            endpoint=text(endpoint, "endpoint"),
            trusted_certificates=optional_text(trusted_certificates, "trusted_certificates"),
            batch_size=_positive(batch_size, 32, "batch_size"),
            batch_debugging=batch_debugging,
            maximum_bytes_on_disk=_positive(maximum_bytes_on_disk, 64, "maximum_bytes_on_disk"),
            maximum_age=milliseconds(maximum_age, "maximum_age"),
            maximum_delay=milliseconds(maximum_delay, "maximum_delay"),
            retry_delay=milliseconds(retry_delay, "retry_delay"),
            durability=1 if survives_power_cut else 0,
        )
        if headers is not None:
            options.headers, options.destroy = _callbacks.address(_headers), _callbacks.destroy_address
            options.context = _callbacks.keep(headers)
        self._handle = Handle(call(library.corvane_uploads_create, byref(options)))

    def _make(self) -> Handle:
        return self._handle

    def flush(self) -> None:
        """Hands the session's open batch over now; a group's events stay until it is left."""
        call(library.corvane_uploads_flush, self._handle._pointer)

    def wait(self, timeout: float, *, only_while_reachable: bool = False) -> DeliveryReport:
        """Waits until everything that was handed over before has an outcome, `timeout` seconds at most, and reports what
        became of it. See what is pending: that is kept, and goes out later. `only_while_reachable` ends the wait when all
        that is left waits for a server that is known to be unreachable. Ctrl-C ends it too. Refused inside a callback.
        """
        if not timeout >= 0:
            raise ValueError(f"timeout: {timeout} is negative or no number")
        deadline = time.monotonic() + timeout
        report = CDeliveryReport()
        flags = 1 if only_while_reachable else 0
        while True:
            began = time.monotonic()
            span = max(0.0, min(_SLICE, deadline - began))
            call(library.corvane_uploads_wait, self._handle._pointer, int(span * 1000), flags, byref(report))
            now = time.monotonic()
            if now - began < span or now >= deadline:
                return report_of(report)

    def ledger(self) -> Ledger:
        """What became of everything, as this process knows it. Cheap: it adds up numbers in memory."""
        ledger = CLedger()
        call(library.corvane_uploads_ledger, self._handle._pointer, byref(ledger))
        return ledger_of(ledger)

    def read_ledger(self) -> "Future[Ledger]":
        """The same as it is on disk, with what other processes did since."""
        promise: "_callbacks.Promise[Ledger]" = _callbacks.Promise()
        arguments = _callbacks.register(_ledger_read, promise)
        call(library.corvane_uploads_read_ledger, self._handle._pointer, *arguments)
        return promise.future

    def observe(self, observer: Optional[Callable[[DeliveryUpdate], None]]) -> None:
        """Has `observer` told of every document as it happens, on the main queue (see `use_event_loop`), in place of one
        that was set before. None ends that.
        """
        call(library.corvane_uploads_observe, self._handle._pointer, *_callbacks.register(_updated, observer))


def _positive(given: Optional[int], bits: int, what: str) -> int:
    """0, which is the default, for None."""
    if given is None:
        return 0
    if number(given, bits, what) < 1:
        raise ValueError(f"{what}: {given} is less than 1")
    return given


@_callbacks.function(None, c_void_p)
def _headers(headers: Callable[[], Mapping[str, str]], to: int) -> None:
    for name, value in headers().items():
        call(library.corvane_header_add, to, text(name, "a header"), text(value, f"the header {name}"))


@_callbacks.function(None, c_void_p)
def _ledger_read(promise: "_callbacks.Promise[Ledger]", ledger: int) -> None:
    promise.settle(ledger_of(CLedger.from_address(ledger)), None)


@_callbacks.function(None, c_void_p)
def _updated(observer: Callable[[DeliveryUpdate], None], update: int) -> None:
    observer(update_at(update))
