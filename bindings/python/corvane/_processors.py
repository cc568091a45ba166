"""Processors of the host's, and those that come with the library but the batching one."""

import ctypes
from ctypes import c_bool, c_char_p, c_int32, c_int64, c_void_p
from datetime import datetime
from typing import Any, Callable, Mapping, NamedTuple, Optional, Union

from . import _callbacks
from ._calls import Handle, call, error_at, number
from ._encoding import dictionary_text, time_of
from ._errors import Error
from ._library import CProcessorCallbacks, library
from ._records import Forgotten, ProcessEvent, Rejection, Session, process_event_at, session_at


class AnyProcessor:
    """What can be added to a session manager, or wrapped by another processor."""

    def _make(self) -> Handle:
        raise NotImplementedError


class Processor(AnyProcessor):
    """A processor of yours: override what it is to be told of.

        class Counting(corvane.Processor):
            def process(self, event):
                counts[event.name] += 1

    Its methods are called on the queue of the session manager, one after the other, and must not take long; what they
    raise is logged. It is kept as long as the session manager it was added to.
    """

    def process(self, event: ProcessEvent) -> None:
        """An event was submitted."""

    def did_start_session(self, session: Session) -> None:
        """A session has started, or ran already when the processor was added."""

    def did_update_session(self, session: Session, submit_queues: bool) -> None:
        """The data of the session has changed; `submit_queues` asks for what is collected to be sent now."""

    def did_end_session(self, session: Session, end: datetime) -> None:
        """The session has ended."""

    def did_enter_group(self, name: Optional[str], start: datetime) -> None:
        """A group was entered; its name is None if it has none."""

    def did_leave_group(self, name: Optional[str], start: datetime) -> None:
        """The group that was entered at `start` was left."""

    def did_reject(self, name: str, reason: Rejection, error: Error) -> None:
        """A submission has failed."""

    def forget(self) -> Forgotten:
        """Everything that was recorded is to be forgotten; returns how much was dropped."""
        return Forgotten(0, 0)

    def resume_background(self, identifier: str, done: "Task") -> bool:
        """Whether the transfer session is this processor's: then it runs `done` when all of it is delivered."""
        return False

    def _make(self) -> Handle:
        _callbacks.start()
        callbacks = CProcessorCallbacks()
        for name, c_function in _CALLBACKS.items():
            if getattr(type(self), name) is not getattr(Processor, name):
                setattr(callbacks, name, _callbacks.address(c_function))
        arguments = _callbacks.register(ctypes.byref(callbacks), self)
        return Handle(call(library.corvane_processor_create, *arguments))


class Task(Handle):
    """Something to do, or to report as done."""

    __slots__ = ()

    def run(self) -> None:
        """Does it, once, on this thread."""
        call(library.corvane_task_run, self._pointer)


def kept_task(pointer: int) -> Task:
    """A task that a callback was given, for later."""
    return Task(library.corvane_retain(pointer))


def _name(name: Optional[bytes]) -> Optional[str]:
    return name.decode() if name else None


@_callbacks.function(None, c_void_p)
def _process(processor: Processor, event: int) -> None:
    processor.process(process_event_at(event))


@_callbacks.function(None, c_void_p)
def _did_start_session(processor: Processor, session: int) -> None:
    processor.did_start_session(session_at(session))


@_callbacks.function(None, c_void_p, c_bool)
def _did_update_session(processor: Processor, session: int, submit_queues: bool) -> None:
    processor.did_update_session(session_at(session), submit_queues)


@_callbacks.function(None, c_void_p, c_int64)
def _did_end_session(processor: Processor, session: int, end: int) -> None:
    processor.did_end_session(session_at(session), time_of(end))


@_callbacks.function(None, c_char_p, c_int64)
def _did_enter_group(processor: Processor, name: Optional[bytes], start: int) -> None:
    processor.did_enter_group(_name(name), time_of(start))


@_callbacks.function(None, c_char_p, c_int64)
def _did_leave_group(processor: Processor, name: Optional[bytes], start: int) -> None:
    processor.did_leave_group(_name(name), time_of(start))


@_callbacks.function(None, c_char_p, c_int32, c_void_p)
def _did_reject(processor: Processor, name: bytes, reason: int, error: int) -> None:
    processor.did_reject(name.decode(), Rejection(reason), error_at(error) or Error("", 0, ""))


@_callbacks.function(None, c_void_p, c_void_p)
def _forget(processor: Processor, events: int, documents: int) -> None:
    dropped = processor.forget()
    c_int64.from_address(events).value += dropped.events
    c_int64.from_address(documents).value += dropped.documents


@_callbacks.function(c_bool, c_char_p, c_void_p)
def _resume_background(processor: Processor, identifier: bytes, done: int) -> bool:
    return bool(processor.resume_background(identifier.decode(), kept_task(done)))


_CALLBACKS = {
    "process": _process,
    "did_start_session": _did_start_session,
    "did_update_session": _did_update_session,
    "did_end_session": _did_end_session,
    "did_enter_group": _did_enter_group,
    "did_leave_group": _did_leave_group,
    "did_reject": _did_reject,
    "forget": _forget,
    "resume_background": _resume_background,
}


class _Wrapping(AnyProcessor):
    """One that the library makes, once."""

    def __init__(self, handle: Handle) -> None:
        self._handle = handle

    def _make(self) -> Handle:
        return self._handle


class LoggingProcessor(_Wrapping):
    """Writes every event, session change and group to the log, at debug level: as JSON, or in the words of `formatter`,
    which gets an event, and is called on the queue.
    """

    def __init__(self, formatter: Optional[Callable[[ProcessEvent], str]] = None) -> None:
        _callbacks.start()
        kind = 0 if formatter is None else 1
        super().__init__(Handle(call(library.corvane_logging_create, kind, *_callbacks.register(_format, formatter))))


@_callbacks.function(None, c_void_p, c_void_p)
def _format(formatter: Callable[[ProcessEvent], str], event: int, line: int) -> None:
    written = formatter(process_event_at(event)).replace("\0", "\\0").encode(errors="replace")
    call(library.corvane_text_set, line, written)


class SamplingProcessor(_Wrapping):
    """Keeps the events of one session in `keep_one_in` for a processor, and drops those of the others. Which ones follows
    from the session's identifier. It is added in place of that processor.
    """

    def __init__(self, processor: AnyProcessor, keep_one_in: int) -> None:
        kept = number(keep_one_in, 32, "keep_one_in")
        inner = processor._make()
        super().__init__(Handle(call(library.corvane_sampling_create, inner._pointer, kept)))


#: Returns the event to keep it, a dictionary to replace its data, or None to drop it.
Filter = Callable[[ProcessEvent], Union[ProcessEvent, Mapping[str, Any], None]]


class FilteringProcessor(_Wrapping):
    """Drops or rewrites events before a processor gets them; it is added in place of that one. The filter is called on
    the queue. One that raises, or returns what cannot be written, drops the event, and the log says so.
    """

    def __init__(self, processor: AnyProcessor, filter: Filter) -> None:
        inner = processor._make()
        arguments = _callbacks.register(_filter, filter)
        super().__init__(Handle(call(library.corvane_filtering_create, inner._pointer, *arguments)))


@_callbacks.function(c_int32, c_void_p, c_void_p)
def _filter(filter: Filter, address: int, replacement: int) -> int:
    event = process_event_at(address)
    kept = filter(event)
    if kept is None:
        return 0
    if kept is event:
        return 1
    # An event of the filter's own has the name of the one that it replaces.
    text = kept.json.encode() if isinstance(kept, ProcessEvent) else dictionary_text(kept, event.name)
    call(library.corvane_text_set, replacement, text)
    return 2
