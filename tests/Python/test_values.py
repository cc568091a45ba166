"""Values, and the documents that they become."""

import dataclasses
import enum
import os
import struct
import subprocess
import unittest
from datetime import datetime, timedelta, timezone
from typing import Any, ClassVar, Dict, List, Literal, Optional, Tuple, Union, cast

import corvane
from support import plain_environment


class Quality(enum.Enum):
    STANDARD = "standard"
    HIGH = "high"


@corvane.data
class Artist:
    name: str
    label: Optional[str] = None


@corvane.data
class Track:
    subtitle: Optional[str]
    title: str
    isLive: bool
    plays: int
    bytes: int
    released: datetime
    length: timedelta
    quality: Quality
    artists: List[Artist]
    ranks: Dict[str, Optional[int]]
    samples: List[float]


@corvane.event
class Played:
    track: Track
    guest: Optional[Artist]


@corvane.data
class Values:
    corvane_name: ClassVar[str] = "Other"
    text: str = ""
    number: int = 0
    real: float = 0.5
    flag: bool = False
    choice: Literal["a", 1] = "a"
    when: Optional[datetime] = None
    pair: Tuple[int, ...] = ()
    nested: Dict[str, List[Artist]] = dataclasses.field(default_factory=dict)
    anything: Any = dataclasses.field(default=None, metadata={"corvane_key": "any thing"})


class Recording(corvane.Processor):
    def __init__(self) -> None:
        self.events: List[corvane.ProcessEvent] = []

    def process(self, event: corvane.ProcessEvent) -> None:
        self.events.append(event)


def samples() -> List[float]:
    found = [0.0, -0.0, 1.0, 1e5, 123456.0, 0.1, 1e-4, 1e16, 1e22, 1e23, 5e-324, 1.7976931348623157e308]
    bits = 1
    while len(found) < 1000:
        bits = (bits * 6364136223846793005 + 1442695040888963407) % 2**64
        value = struct.unpack("d", struct.pack("Q", bits))[0]
        if value - value == 0:
            found.append(value)
    return found


class ValuesTest(unittest.TestCase):
    def recorded(self, data: object, event: corvane.AnyEvent, name: Optional[str] = None) -> str:
        recording = Recording()
        with corvane.Sessions(recording) as sessions, sessions.session():
            sessions.tracker.push(data, name=name)
            sessions.tracker.submit(event)
        return recording.events[0].json

    def typed(self) -> str:
        command = [os.environ["CORVANE_TYPED"]]
        return subprocess.run(command, check=True, capture_output=True, env=plain_environment()).stdout.decode()

    @unittest.skipUnless("CORVANE_TYPED" in os.environ, "CORVANE_TYPED names the program of typed.cpp")
    def test_events_are_those_of_typed_declarations_to_the_byte(self) -> None:
        typed = self.typed()
        released = datetime(1970, 1, 1, tzinfo=timezone.utc) - timedelta(microseconds=1500900)
        track = Track(
            None, 'Pr\u00e9lude "n\u00ba 1"\\\n\t\x01\x7f\U0001f3b9', True, -(2**63), 2**64 - 1, released,
            -timedelta(microseconds=2999), Quality.HIGH, [Artist("Z"), Artist("", "L")], {"a": 1, "b": None}, samples(),
        )  # fmt: skip
        self.assertEqual(self.recorded(track, Played) + "\n", typed)

    def test_what_is_written_of_the_other_kinds(self) -> None:
        seen = corvane.Event("Seen", {"data": "Other"})
        values = Values("ü\0", 3, 2, True, 1, nested={"k": [Artist("x")]}, anything=(1, {"y": None}, Quality.HIGH))
        written = '"ü\\u0000","number":3,"real":2.0,"flag":true,"choice":1,"pair":[],"nested":{"k":[{"name":"x"}]}'
        expected = '{"data":{"text":' + written + ',"any thing":[1,{"y":null},"high"]}}'
        self.assertEqual(self.recorded(values, seen), expected)
        self.assertEqual(self.recorded({"é": [1.5]}, seen, "Other"), '{"data":{"é":[1.5]}}')

    def test_what_cannot_be_written_is_refused_with_its_place(self) -> None:
        changed = Values()
        changed.nested = {"k": [Artist("x"), 3]}  # type: ignore[list-item]
        loop: List[Any] = []
        loop.append(loop)
        deep: Any = None
        for _ in range(200):
            deep = [deep]
        tracker, make = corvane.Sessions().tracker, cast(Any, Values)
        for wrong, kind, message in (
            (lambda: make(text=3), TypeError, "Values.text: expected str, got int"),
            (lambda: make(number=True), TypeError, "Values.number: expected int, got bool"),
            (lambda: make(number=2**64), ValueError, "Values.number: the integer does not fit 64 bits"),
            (lambda: make(real=float("nan")), ValueError, "Values.real: the number is not finite"),
            (lambda: make(real=10**400), ValueError, "Values.real: the number is beyond a float"),
            (lambda: make(text="\ud800"), ValueError, "Values.text: the text contains a lone surrogate"),
            (lambda: make(when=datetime(2026, 1, 1)), ValueError, "Values.when: the time has no zone"),
            (lambda: make(choice="b"), TypeError, "Values.choice: expected"),
            (lambda: make(anything=loop), ValueError, "Values: the value is nested too deeply"),
            (lambda: make(anything={1: 2}), TypeError, r"Values.anything \(a key\): expected str, got int"),
            (lambda: tracker.push(changed), TypeError, r"Values.nested.k\[1\]: expected Artist, got int"),
            (lambda: tracker.push({"a": deep}, name="Deep"), corvane.Error, "not JSON"),
            (lambda: tracker.push({"a": b""}, name="Bytes"), TypeError, "Bytes.a: bytes cannot be written"),
            (lambda: tracker.push({}), TypeError, "needs a name"),
            (lambda: tracker.push({}, name="a\0b"), ValueError, "NUL"),
            (lambda: tracker.submit(Artist), TypeError, "Artist is no event"),
            (lambda: corvane.data(type("C", (), {"__annotations__": {"u": Union[int, str]}})), TypeError, "C.u: "),
            (lambda: corvane.event(type("E", (), {"__annotations__": {"u": int}})), TypeError, "E.u: int is no data"),
        ):
            with self.subTest(message), self.assertRaisesRegex(kind, message):
                wrong()  # type: ignore[no-untyped-call]


if __name__ == "__main__":
    unittest.main()
