"""The session manager."""

import asyncio
import threading
from concurrent.futures import Future
from ctypes import byref, c_int64, c_void_p
from types import TracebackType
from typing import Any, Callable, Dict, Optional, Type

from . import _callbacks
from ._calls import Handle, call, error_at, optional_text, text
from ._declarations import encoded
from ._library import CSessionDataOptions, library
from ._processors import AnyProcessor
from ._records import Forgotten, Kind
from ._tracker import Tracker


class SessionAccess(Handle):
    """A session manager inside a transaction. Good for the length of the block."""

    __slots__ = ()

    @property
    def is_active(self) -> bool:
        """Whether a session runs."""
        return bool(call(library.corvane_session_access_is_active, self._pointer))

    def push(
        self,
        key: str,
        data: object,
        *,
        only_once: bool = False,
        unique: bool = False,
        submit_queues: bool = False,
        name: Optional[str] = None,
    ) -> None:
        """Puts data into this and later sessions; see `Sessions.push`. Done when this returns."""
        known, written = encoded(data, name)
        value = Handle(call(library.corvane_value_from_json, written))
        options = _data_options(only_once, unique, submit_queues)
        push = library.corvane_session_access_push
        call(push, self._pointer, text(key, "the key"), known, value._pointer, byref(options))

    def __del__(self) -> None:
        pass  # it is not this object's to release


def _data_options(only_once: bool, unique: bool, submit_queues: bool) -> CSessionDataOptions:
    return CSessionDataOptions(traits=(1 if only_once else 0) | (2 if unique else 0), submit_queues=submit_queues)


@_callbacks.function(None, c_void_p)
def _block(block: Callable[[SessionAccess], None], pointer: int) -> None:
    access = SessionAccess(pointer)
    try:
        block(access)
    finally:
        access._pointer = None


@_callbacks.function(None, c_void_p)
def _done(promise: "_callbacks.Promise[None]", error: Optional[int]) -> None:
    promise.settle(None, error_at(error))


@_callbacks.function(None, c_int64, c_int64, c_void_p)
def _forgotten(promise: "_callbacks.Promise[Forgotten]", events: int, documents: int, error: Optional[int]) -> None:
    promise.settle(Forgotten(events, documents), error_at(error))


class Sessions(Handle):
    """The session manager: the object that is made first. Events belong to a session; without one a submission fails.

        with corvane.Sessions(corvane.Uploads(client, url, "main")) as sessions:
            with sessions.session():
                ...

    Every call may be made on any thread, in callbacks too; it enqueues its work and returns at once, except
    `end_and_wait` and the end of a `with`. Calls that have a result later return a future: its `result()` waits, and must
    not be asked for in a callback; `asyncio.wrap_future` makes it awaitable. They raise `Error`, and TypeError and
    ValueError for arguments that cannot be used; then nothing has happened.
    """

    __slots__ = ("_processors", "_suspensions")

    def __init__(self, *processors: AnyProcessor) -> None:
        _callbacks.start()
        super().__init__(call(library.corvane_sessions_create))
        self._processors: Dict[AnyProcessor, Handle] = {}
        self._suspensions = 0
        for processor in processors:
            self.add(processor)

    def add(self, processor: AnyProcessor) -> None:
        """Adds a processor, behind those that were added before; it learns of a session that runs."""
        handle = processor._make()
        call(library.corvane_sessions_add_processor, self._pointer, handle._pointer)
        self._processors[processor] = handle

    def remove(self, processor: AnyProcessor) -> None:
        """Removes a processor: it is not called any more by what is enqueued afterwards. Nothing if it is not there."""
        handle = self._processors.pop(processor, None)
        if handle is not None:
            call(library.corvane_sessions_remove_processor, self._pointer, handle._pointer)

    @property
    def tracker(self) -> Tracker:
        """The root tracker."""
        return Tracker(call(library.corvane_sessions_tracker, self._pointer))

    def start(self, kind: Kind = Kind.USER_EVENTS) -> None:
        """Starts a session, unless one runs."""
        call(library.corvane_sessions_start, self._pointer, kind.code, optional_text(kind.name, "the kind's name"))

    def end(self) -> "Future[None]":
        """Ends the session, if one runs; the future is done when it has ended."""
        return self._later(library.corvane_sessions_end)

    def end_and_wait(self) -> None:
        """The same; waits. Does nothing while the queue is suspended. Refused inside a callback."""
        is_main = threading.current_thread() is threading.main_thread()
        if is_main and self._suspensions == 0 and _callbacks.may_call_back():
            self.end().result()  # which Ctrl-C can interrupt
        else:
            call(library.corvane_sessions_end_and_wait, self._pointer)

    def session(self, kind: Kind = Kind.USER_EVENTS) -> "RunningSession":
        """A session for the length of a block: `with` waits for its end, `async with` lets the loop go on meanwhile."""
        return RunningSession(self, kind)

    def push(
        self,
        key: str,
        data: object,
        *,
        only_once: bool = False,
        unique: bool = False,
        submit_queues: bool = False,
        name: Optional[str] = None,
    ) -> None:
        """Puts data into this and later sessions under `key`: a dataclass's instance, or a dictionary, which needs a
        `name`. Data of one name shares a stack, of which a session carries the newest. `submit_queues` has processors
        send first what they have collected under the data before.
        """
        known, written = encoded(data, name)
        options = _data_options(only_once, unique, submit_queues)
        push = library.corvane_sessions_push_json
        call(push, self._pointer, text(key, "the key"), known, written, byref(options))

    def transaction(self, block: Callable[[SessionAccess], None]) -> None:
        """Runs a block on the queue, in one piece."""
        call(library.corvane_sessions_transaction, self._pointer, *_callbacks.register(_block, block))

    @property
    def is_recording(self) -> bool:
        """Whether events are recorded. See `set_recording`."""
        return bool(call(library.corvane_sessions_is_recording, self._pointer))

    def set_recording(self, is_on: bool) -> "Future[None]":
        """Consent. Switches recording on or off at once, for all session managers of all processes that use the
        documents directory, and for later runs; the future is done when the choice is on disk.
        """
        return self._later(library.corvane_sessions_set_recording, is_on)

    def forget(self) -> "Future[Forgotten]":
        """Forgets everything that was recorded in the documents directory and is not delivered; tells how much that was.
        With an error, something may be left, and goes with the next start.
        """
        promise: "_callbacks.Promise[Forgotten]" = _callbacks.Promise()
        call(library.corvane_sessions_forget, self._pointer, *_callbacks.register(_forgotten, promise))
        return promise.future

    @property
    def waiting_count(self) -> int:
        """How many calls wait in memory, for a producer that slows down."""
        return int(call(library.corvane_sessions_waiting_count, self._pointer))

    def suspend(self) -> None:
        """Stops the queue after the task that runs, until as many calls of `resume`."""
        call(library.corvane_sessions_suspend, self._pointer)
        self._suspensions += 1

    def resume(self) -> None:
        """To resume what is not suspended is refused."""
        call(library.corvane_sessions_resume, self._pointer)
        self._suspensions -= 1

    def resume_background(self, identifier: str) -> "Future[None]":
        """Hands on that the host was woken for the transfer session `identifier`, the last argument of the wake command.
        The future is done once everything that was pending there is delivered.
        """
        return self._later(library.corvane_sessions_resume_background, text(identifier, "the identifier"))

    def close(self) -> None:
        """Lets go of the session manager. Everything that was called before still reaches the processors, no session is
        ended, and its trackers' submissions fail from then on. Happens by itself when nobody has it any more.
        """
        self._release()
        self._processors.clear()

    def __enter__(self) -> "Sessions":
        return self

    def __exit__(
        self, kind: Optional[Type[BaseException]], raised: Optional[BaseException], trace: Optional[TracebackType]
    ) -> None:
        _callbacks.unless_forked(self.end_and_wait)
        self.close()

    def _later(self, function: Any, *arguments: Any) -> "Future[None]":
        promise: "_callbacks.Promise[None]" = _callbacks.Promise()
        call(function, self._pointer, *arguments, *_callbacks.register(_done, promise))
        return promise.future


class RunningSession:
    """What `Sessions.session` returns."""

    def __init__(self, sessions: Sessions, kind: Kind) -> None:
        self._sessions = sessions
        self._kind = kind

    def __enter__(self) -> Sessions:
        self._sessions.start(self._kind)
        return self._sessions

    def __exit__(
        self, kind: Optional[Type[BaseException]], raised: Optional[BaseException], trace: Optional[TracebackType]
    ) -> None:
        _callbacks.unless_forked(self._sessions.end_and_wait)

    async def __aenter__(self) -> Sessions:
        return self.__enter__()

    async def __aexit__(
        self, kind: Optional[Type[BaseException]], raised: Optional[BaseException], trace: Optional[TracebackType]
    ) -> None:
        await asyncio.wrap_future(self._sessions.end())
