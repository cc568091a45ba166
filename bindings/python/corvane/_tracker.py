"""Trackers: data in scope, events, timers, groups, transactions and snapshots."""

import asyncio
import contextlib
import ctypes
import functools
import inspect
import json
import os
import threading
import time as clock
from ctypes import byref, c_int32, c_void_p
from datetime import datetime
from enum import IntEnum
from types import TracebackType
from typing import (
    Any,
    Callable,
    Dict,
    Generator,
    Iterator,
    List,
    NamedTuple,
    Optional,
    Tuple,
    Type,
    TypeVar,
    Union,
    cast,
)

from . import _callbacks
from ._calls import Handle, call, error_at, optional_text, text
from ._declarations import AnyEvent, encoded, event_pointer
from ._encoding import checked, data_name, milliseconds_of
from ._errors import Error
from ._library import CEvaluated, CPushOptions, CSubmitOptions, CTimerOptions, library
from ._records import ProcessEvent, process_event_at

F = TypeVar("F", bound=Callable[..., Any])

#: Told the outcome of a submission: the event, by then stored, or the error that has stopped it; the other one is None.
Completion = Callable[[Optional[ProcessEvent], Optional[Error]], None]

_PUSH_OPTIONS = [CPushOptions(traits=traits) for traits in range(4)]
_push_options = [None] + [ctypes.addressof(options) for options in _PUSH_OPTIONS[1:]]


class Change(IntEnum):
    """A step of a session's life."""

    WILL_START = 0
    DID_START = 1
    WILL_END = 2
    DID_END = 3


@_callbacks.function(None, c_void_p, c_void_p)
def _completed(thing: Any, event: Optional[int], error: Optional[int]) -> None:
    outcome, failure = process_event_at(event) if event else None, error_at(error)
    if isinstance(thing, _callbacks.Outcome):
        thing.settle(outcome, failure)
    else:
        thing(outcome, failure)


@_callbacks.function(None, c_void_p)
def _block(block: "Callable[[Access], None]", pointer: int) -> None:
    with _lent(pointer) as access:
        block(access)


@_callbacks.function(None, c_void_p, c_int32)
def _changed(block: "Callable[[Access, Change], None]", pointer: int, change: int) -> None:
    with _lent(pointer) as access:
        block(access, Change(change))


@contextlib.contextmanager
def _lent(pointer: int) -> "Iterator[Access]":
    access = Access(pointer)
    try:
        yield access
    finally:
        access._pointer = None  # it is the library's, and good no longer


_completed_address = _callbacks.address(_completed)


def moment(time: datetime) -> int:
    """Raises TypeError, and ValueError for a time without a zone."""
    return checked(milliseconds_of, time, "time")


def _submit_options(completion: Any, only_if_timed: bool, time: Optional[datetime]) -> Optional[CSubmitOptions]:
    if completion is None and not only_if_timed and time is None:
        return None
    options = CSubmitOptions(only_if_timed=only_if_timed)
    if time is not None:
        options.has_time, options.time = True, moment(time)
    if completion is not None:
        options.completion = _completed_address
        options.context, options.destroy = _callbacks.keep(completion), _callbacks.destroy_address
    return options


class _Scope(Handle):
    """What trackers do outside of their queue and inside."""

    __slots__ = ()
    _push: Any
    _pop: Any
    _submit: Any
    _time: Any

    def push(
        self, data: object, *, only_once: bool = False, unique: bool = False, name: Optional[str] = None
    ) -> None:
        """Puts data in scope under its name, until it is popped: a dataclass's instance, or a dictionary, which needs a
        `name`. Data that is pushed `only_once` is used up by the first event that finds it; `unique` data takes the
        place of everything of its name on this tracker. Raises TypeError and ValueError for what cannot be written.
        """
        key, text = encoded(data, name)
        options = _push_options[(1 if only_once else 0) | (2 if unique else 0)]
        call(self._push, self._pointer, key, text, options)

    def pop(self, data: Union[str, type]) -> None:
        """Takes the newest data of a class or a name that was pushed here out of scope; nothing if there is none."""
        name = data_name(data) if isinstance(data, type) else data
        call(self._pop, self._pointer, text(name, "the name of data"))

    def time(self, event: AnyEvent, *, restart_with_session: bool = False) -> None:
        """Starts a timer, unless one runs for the event. It ends with the next submission of the event on this tracker.
        One that restarts with the session submits the event when the session is about to end.
        """
        options = CTimerOptions(restart_with_session=restart_with_session)
        call(self._time, self._pointer, event_pointer(event), byref(options))


class Access(_Scope):
    """A tracker inside a transaction or an observation: its calls are done when they return. Good for the length of the
    block, and on its thread; the error of a later call has the code 0.
    """

    __slots__ = ()
    _push = library.corvane_access_push_json
    _pop = library.corvane_access_pop
    _submit = library.corvane_access_submit
    _time = library.corvane_access_time

    def submit(self, event: AnyEvent, completion: Optional[Completion] = None, *, only_if_timed: bool = False) -> None:
        """Submits an event; see `Tracker.submit`. The completion has run when this returns."""
        options = _submit_options(completion, only_if_timed, None)
        call(self._submit, self._pointer, event_pointer(event), options and byref(options))

    def __del__(self) -> None:
        pass  # it is not this object's to release


class Tracker(_Scope):
    """Data in scope, and the events that find it. Children find their own data first, then their parents'.

    Every call may be made on any thread, in callbacks too; it enqueues its work and returns at once, except `snapshot`.
    Calls raise `Error`, and TypeError and ValueError for arguments that cannot be used; then nothing has happened.
    """

    __slots__ = ()
    _push = library.corvane_tracker_push_json
    _pop = library.corvane_tracker_pop
    _submit = library.corvane_tracker_submit
    _time = library.corvane_tracker_time

    def chain(self, name: str) -> "Tracker":
        """A child."""
        return Tracker(call(library.corvane_tracker_chain, self._pointer, text(name, "the tracker's name")))

    @property
    def path(self) -> Tuple[str, ...]:
        """The names from the root down to this tracker."""
        names: List[str] = []
        while True:
            name = call(library.corvane_tracker_path, self._pointer, len(names))
            if name is None:
                return tuple(names)
            names.append(name.decode())

    def submit(
        self,
        event: AnyEvent,
        completion: Optional[Completion] = None,
        *,
        only_if_timed: bool = False,
        time: Optional[datetime] = None,
    ) -> None:
        """Submits an event, which carries the data that is in scope by then, and `time` or the time of this call.

        The completion is called on the queue of the session manager, a thread of the library's: it must not take long,
        and what it raises is logged. An event that is submitted `only_if_timed` does nothing unless a timer runs for it;
        then nobody is told.
        """
        options = _submit_options(completion, only_if_timed, time)
        call(self._submit, self._pointer, event_pointer(event), options and byref(options))

    def submit_async(self, event: AnyEvent, *, time: Optional[datetime] = None) -> "asyncio.Future[ProcessEvent]":
        """The same for coroutines: the event is submitted at once; awaited, it gives the event as it was stored, or
        raises the error that has stopped it. Cancelling what awaits takes nothing back. Needs a running event loop.
        """
        promise: "_callbacks.LoopPromise[ProcessEvent]" = _callbacks.LoopPromise(asyncio.get_running_loop())
        options = _submit_options(promise, False, time)
        try:
            call(self._submit, self._pointer, event_pointer(event), byref(options))  # type: ignore[arg-type]
        except BaseException:
            promise.future.cancel()
            raise
        return promise.future

    def submit_later(
        self, event: AnyEvent, completion: Optional[Completion] = None, *, only_if_timed: bool = False
    ) -> "Delayed":
        """Prepares a submission that has the time of this call, and the data in scope by now."""
        options = _submit_options(completion, only_if_timed, None)
        later = library.corvane_tracker_submit_later
        return Delayed(call(later, self._pointer, event_pointer(event), options and byref(options)))

    def timed(self, event: AnyEvent) -> "Timed":
        """Times a block, a function or a coroutine function, and submits the event when it ends, also by an exception.

            with tracker.timed(Play):
                ...

            @tracker.timed(Play)
            def play(): ...

        Each run is timed by itself, on several threads at once and in tasks that interleave. Runs should not be mixed
        with a timer of `time` for the same event on the same tracker: that one would end with the run's event.
        """
        return Timed(self, event)

    @contextlib.contextmanager
    def group(self, name: Optional[str] = None) -> Iterator[None]:
        """Events of this tracker, and of those below it, carry the group's name; they are sent in a document of their own
        when it is left. For calls that are not nested there are `enter_group` and `leave_group`.
        """
        self.enter_group(name)
        try:
            yield
        finally:
            _callbacks.unless_forked(self.leave_group)

    def enter_group(self, name: Optional[str] = None) -> None:
        call(library.corvane_tracker_enter_group, self._pointer, optional_text(name, "the group's name"))

    def leave_group(self) -> None:
        """Leaves the innermost group of the nearest tracker that has one; nothing if there is none."""
        call(library.corvane_tracker_leave_group, self._pointer)

    def transaction(self, block: Callable[[Access], None]) -> None:
        """Runs a block on the queue of the session manager, in one piece."""
        _enqueue(library.corvane_tracker_transaction, self, block)

    def when_session(self, block: Callable[[Access], None]) -> None:
        """Runs a block on the queue, in one piece: now, or as soon as a session runs."""
        _enqueue(library.corvane_tracker_when_session, self, block)

    def observe(self, block: Callable[[Access, Change], None]) -> "Observer":
        """Has a block run on the queue at each step of a session's life, until the observer is stopped or let go of."""
        arguments = _callbacks.register(_changed, _callable(block))
        return Observer(call(library.corvane_tracker_observe, self._pointer, *arguments))

    def snapshot(self, *, all: bool = False) -> "Snapshot":
        """Copies the data and timers in scope: of each name the one that an event would find, or `all` of every stack.
        Waits for the queue; refused inside a callback.
        """
        if threading.current_thread() is threading.main_thread() and _callbacks.may_call_back():
            # The library's own wait could not be interrupted by Ctrl-C, nor end while the queue is suspended.
            self._wait_for_queue()
        return Snapshot(call(library.corvane_tracker_snapshot, self._pointer, 1 if all else 0))

    def _wait_for_queue(self) -> None:
        reached = threading.Event()
        self.transaction(lambda _: reached.set())
        reached.wait()


def _callable(block: F) -> F:
    if not callable(block):
        raise TypeError(f"{type(block).__name__} cannot be called")
    return block


def _enqueue(function: Any, tracker: Tracker, block: Callable[[Access], None]) -> None:
    call(function, tracker._pointer, *_callbacks.register(_block, _callable(block)))


class Delayed(Handle):
    """A submission that waits for its word. One that is let go of before submits nothing."""

    __slots__ = ()

    def commit(self) -> None:
        """Makes the submission; once."""
        call(library.corvane_delayed_commit, self._pointer)


class Observer(Handle):
    """An observation of sessions."""

    __slots__ = ()

    def stop(self) -> None:
        self._release()


# A timer belongs to a tracker and an event, and one that runs is not started again: the two calls below must not be parted
# by another thread's.
_timing = threading.Lock()


def _renew_lock() -> None:
    global _timing
    _timing = threading.Lock()


os.register_at_fork(after_in_child=_renew_lock)


class Timed:
    """What `Tracker.timed` returns: a context manager and a decorator."""

    def __init__(self, tracker: Tracker, event: AnyEvent) -> None:
        self._tracker = tracker
        self._event = event
        self._starts: List[int] = []

    def __enter__(self) -> None:
        event_pointer(self._event)  # so that what is no event is not found out at the end
        self._starts.append(clock.time_ns() // 1_000_000)

    def __exit__(
        self, kind: Optional[Type[BaseException]], raised: Optional[BaseException], trace: Optional[TracebackType]
    ) -> None:
        _callbacks.unless_forked(self._submit, self._starts.pop())

    def _submit(self, start: int) -> None:
        options = CTimerOptions(has_start=True, start=start)
        event, pointer = event_pointer(self._event), self._tracker._pointer
        with _timing:
            call(library.corvane_tracker_time, pointer, event, byref(options))
            call(library.corvane_tracker_submit, pointer, event, None)

    def __call__(self, function: F) -> F:
        """Raises TypeError for generators: their calls take no time."""
        if inspect.isgeneratorfunction(function) or inspect.isasyncgenfunction(function):
            raise TypeError(f"{function.__name__} is a generator, which cannot be timed by its call")

        @functools.wraps(function)
        async def run_async(*arguments: Any, **named: Any) -> Any:
            with Timed(self._tracker, self._event):
                return await function(*arguments, **named)

        @functools.wraps(function)
        def run(*arguments: Any, **named: Any) -> Any:
            with Timed(self._tracker, self._event):
                return function(*arguments, **named)

        return cast(F, run_async if inspect.iscoroutinefunction(function) else run)


class Missing(NamedTuple):
    """A property without data."""

    property: str
    is_optional: bool


class Evaluation(NamedTuple):
    """An event held against a snapshot: what it would carry, and what it lacks."""

    is_valid: bool  #: whether nothing that is required is missing; never for events with EventData, which come with it
    data: Dict[str, Any]  #: by property, in the order of the declaration
    missing: List[Missing]


class Snapshot(Handle):
    """A copy of the data and timers that were in scope."""

    __slots__ = ()

    def evaluate(self, event: AnyEvent) -> Evaluation:
        held = Handle(call(library.corvane_snapshot_evaluate, self._pointer, event_pointer(event)))
        data: Dict[str, Any] = {}
        missing: List[Missing] = []
        for name, is_optional, value in _properties(held):
            if value is None:
                missing.append(Missing(name, is_optional))
            else:
                data[name] = json.loads(value)
        return Evaluation(call(library.corvane_evaluation_is_valid, held._pointer), data, missing)


def _properties(held: Handle) -> Generator[Tuple[str, bool, Optional[bytes]], None, None]:
    found, index = CEvaluated(), 0
    while call(library.corvane_evaluation_property, held._pointer, index, byref(found)):
        yield found.property.decode(), found.is_optional, None if found.is_missing else found.json
        index += 1
