"""What the library hands out: events, sessions, reports and the ledger."""

import ctypes
import json
from dataclasses import dataclass
from datetime import datetime
from enum import IntEnum
from typing import Any, ClassVar, Dict, List, NamedTuple, Optional

from ._encoding import time_of
from ._library import CCount, CDeliveryReport, CDeliveryUpdate, CLedger, CProcessEvent, CSession


@dataclass(frozen=True)
class Client:
    """Whom documents come from: the application's identifier ("com.example.player"), its name, version and build."""

    identifier: str
    name: str
    version: str
    build: int


@dataclass(frozen=True)
class Kind:
    """What a session is for: one of `Kind.USER_EVENTS`, `Kind.TELEMETRY`, `Kind.REALTIME`, or `Kind.custom("kiosk")`."""

    USER_EVENTS: ClassVar["Kind"]
    TELEMETRY: ClassVar["Kind"]
    REALTIME: ClassVar["Kind"]

    code: int
    name: Optional[str] = None

    @staticmethod
    def custom(name: str) -> "Kind":
        return Kind(3, name)


Kind.USER_EVENTS, Kind.TELEMETRY, Kind.REALTIME = Kind(0), Kind(1), Kind(2)


class ProcessEvent:
    """An event that was submitted."""

    __slots__ = ("name", "version", "json", "group")

    def __init__(self, name: str, version: str, json: str, group: Optional[str]) -> None:
        self.name = name
        self.version = version  #: of the format of events
        self.json = json  #: compact; an object
        self.group = group  #: the innermost group that its tracker was in

    @property
    def data(self) -> Dict[str, Any]:
        """The JSON as a dictionary, by the properties of the event; a new one each time."""
        parsed: Dict[str, Any] = json.loads(self.json)
        return parsed

    def __repr__(self) -> str:
        return f"ProcessEvent({self.name!r}, {self.json})"


@dataclass(frozen=True)
class Session:
    """A session as processors see it. `json` is an object: "sessionID" and one entry for each session data in effect."""

    identifier: str
    kind: Kind
    start: datetime
    json: str

    @property
    def data(self) -> Dict[str, Any]:
        parsed: Dict[str, Any] = json.loads(self.json)
        return parsed


class Count(NamedTuple):
    events: int = 0
    documents: int = 0


class DeliveryReport(NamedTuple):
    """What became of the documents of this run and earlier ones; of those the events are not known."""

    delivered: Count
    pending: Count  #: kept, and sent again, or under way
    given_up: Count


class Forgotten(NamedTuple):
    """How much was dropped."""

    events: int
    documents: int


class Ledger(NamedTuple):
    """What became of everything that was ever recorded for the endpoint: every event that was accepted is in exactly one
    of those from `open` to `unknown`."""

    open: Count  #: in batches that are not handed over
    waiting: Count  #: in documents that are stored
    delivered: Count
    refused_4xx: Count
    refused_3xx: Count
    refused_other: Count
    given_up_attempts: Count
    given_up_age: Count
    given_up_size: Count
    given_up_payload_missing: Count
    given_up_forgotten: Count
    unknown: Count
    sent_again: Count  #: attempts that have failed; in no sum
    rejected_no_session: int
    rejected_missing_data: int
    rejected_encoding: int
    rejected_not_recording: int
    rejected_other: int
    accepted_in_run: int
    unaccounted: int  #: of those that were accepted in this run; 0


class Rejection(IntEnum):
    """Why an event was not accepted. Later versions may know more reasons, which come as OTHER."""

    NO_SESSION = 0
    MISSING_DATA = 1
    ENCODING = 2
    NOT_RECORDING = 3
    OTHER = 4

    @classmethod
    def _missing_(cls, value: object) -> "Rejection":
        return cls.OTHER


class Step(IntEnum):
    """A step of a document's delivery."""

    UNDER_WAY = 0
    PROGRESS = 1
    DELIVERED = 2
    DEFERRED = 3
    GIVEN_UP = 4


class DeliveryUpdate(NamedTuple):
    """A document on its way."""

    step: Step
    reason: int  #: what decided on an outcome: a value of `Reason`, or one of a later version
    document: str  #: the identifier in its metadata
    events: Optional[int]  #: in the document; None where an earlier run or another process made it
    status: Optional[int]  #: of HTTP; None without an answer
    problem: str  #: in words, where a transfer has failed; otherwise empty
    bytes_sent: int  #: of the compressed document; for PROGRESS
    bytes_expected: int  #: for PROGRESS


class Reason(IntEnum):
    """What decided on the outcome of a document's delivery."""

    NONE = 0
    ANSWER = 1
    UNREACHABLE = 2
    BLOCKED = 3
    FAILED = 4
    TOO_MANY_ATTEMPTS = 5
    PAYLOAD_MISSING = 6
    FORGOTTEN = 7
    TOO_OLD = 8
    NO_ROOM = 9
    CANCELLED = 10


def process_event_at(address: int) -> ProcessEvent:
    event = CProcessEvent.from_address(address)
    group = event.group
    return ProcessEvent(
        event.name.decode(), event.version.decode(), event.json.decode(), None if group is None else group.decode()
    )


def session_at(address: int) -> Session:
    session = CSession.from_address(address)
    name = session.name
    kind = Kind(session.kind, None if name is None else name.decode())
    return Session(session.identifier.decode(), kind, time_of(session.start), session.json.decode())


def _values(structure: ctypes.Structure) -> List[Any]:
    """The members behind the size."""
    values = [getattr(structure, field[0]) for field in structure._fields_[1:]]
    return [Count(value.events, value.documents) if isinstance(value, CCount) else value for value in values]


def report_of(report: CDeliveryReport) -> DeliveryReport:
    return DeliveryReport(*_values(report))


def ledger_of(ledger: CLedger) -> Ledger:
    return Ledger(*_values(ledger))


def update_at(address: int) -> DeliveryUpdate:
    update = CDeliveryUpdate.from_address(address)
    events = None if update.events < 0 else update.events
    return DeliveryUpdate(
        Step(update.step),
        update.reason,
        update.document.decode(),
        events,
        update.status or None,
        update.problem.decode(),
        update.bytes_sent,
        update.bytes_expected,
    )
