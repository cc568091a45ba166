"""Functions of the host's that the library calls.

A callback's context is a number under which what is to be called is kept here, until the library destroys the context.
There is one C function for each kind of callback, made once.
"""

import asyncio
import atexit
import contextlib
import ctypes
import itertools
import logging
from concurrent.futures import Future
from typing import Any, Callable, Dict, Generic, List, Optional, Tuple, TypeVar

from ._calls import call, interrupted
from ._errors import Error, ForkedError
from ._library import library

logger = logging.getLogger("corvane")

T = TypeVar("T")

_kept: Dict[int, Any] = {}
_numbers = itertools.count(1)


def keep(thing: Any) -> int:
    """Keeps what a callback needs; returns its context, to be passed on with `destroy`."""
    context = next(_numbers)
    _kept[context] = thing
    if _is_stopped and isinstance(thing, Outcome):
        thing.abandon()  # nobody would ever settle it
    return context


def function(result: Any, *parameters: Any) -> Callable[[Callable[..., Any]], Any]:
    """Makes a C function of one that is called with what was kept, and the arguments. What that raises is logged."""

    def decorate(body: Callable[..., Any]) -> Any:
        nothing = None if result is None else result(0).value

        def guarded(context: int, *arguments: Any) -> Any:
            try:
                return body(_kept[context], *arguments)
            except KeyboardInterrupt:
                interrupted.append(True)
            except BaseException:
                logger.exception("A callback has raised an exception")
            return nothing

        return ctypes.CFUNCTYPE(result, ctypes.c_void_p, *parameters)(guarded)

    return decorate


def address(c_function: Any) -> Optional[int]:
    return ctypes.cast(c_function, ctypes.c_void_p).value


class Outcome:
    """Something that a callback brings about, once. Fails when the library lets go of it before."""

    def __init__(self) -> None:
        self._is_settled = False

    def settle(self, value: Any, error: Optional[BaseException]) -> None:
        if not self._is_settled:
            self._is_settled = True
            self._tell(value, error)

    def abandon(self) -> None:
        if not self._is_settled:
            self.settle(None, Error("Corvane.CError", 1, "the library has let go of it without an outcome"))

    def _tell(self, value: Any, error: Optional[BaseException]) -> None:
        raise NotImplementedError


class Promise(Outcome, Generic[T]):
    """One that any thread may wait for."""

    def __init__(self) -> None:
        super().__init__()
        self.future: "Future[T]" = Future()
        self.future.set_running_or_notify_cancel()  # it cannot be cancelled: the library goes on anyhow

    def _tell(self, value: Any, error: Optional[BaseException]) -> None:
        if error is None:
            self.future.set_result(value)
        else:
            self.future.set_exception(error)


class LoopPromise(Outcome, Generic[T]):
    """One that an event loop waits for. Its future may be cancelled, and the loop may be closed by then."""

    def __init__(self, loop: asyncio.AbstractEventLoop) -> None:
        super().__init__()
        self._loop = loop
        self.future: "asyncio.Future[T]" = loop.create_future()

    def _tell(self, value: Any, error: Optional[BaseException]) -> None:
        try:
            self._loop.call_soon_threadsafe(self._fill, value, error)
        except RuntimeError:
            pass  # the loop is closed: nobody waits any more

    def _fill(self, value: Any, error: Optional[BaseException]) -> None:
        if self.future.done():
            return
        if error is None:
            self.future.set_result(value)
        else:
            self.future.set_exception(error)


def _let_go(context: int) -> None:
    thing = _kept.pop(context, None)
    if isinstance(thing, Outcome):
        thing.abandon()


destroy: Any = ctypes.CFUNCTYPE(None, ctypes.c_void_p)(_let_go)
destroy_address = address(destroy)


def register(c_function: Any, thing: Any) -> Tuple[Any, Optional[int], Any]:
    """The three arguments of a callback; a null pointer where there is nothing to call."""
    if thing is None:
        return None, None, None
    return c_function, keep(thing), destroy


_at_start: List[Callable[[], None]] = []
_is_started = _is_stopped = False


def may_call_back() -> bool:
    """Whether callbacks are called: not any more when the interpreter ends."""
    return not _is_stopped


def at_start(task: Callable[[], None]) -> Callable[[], None]:
    """Has a function called before the library is first used."""
    _at_start.append(task)
    return task


def start() -> None:
    """Called before the library is first used: not on import, so that processes that only import it may fork."""
    global _is_started
    if not _is_started:
        _is_started = True
        for task in _at_start:
            task()


@atexit.register
def _stop() -> None:
    # From here on nothing of the library's enters an interpreter that is being taken down.
    global _is_stopped
    if not _is_started:
        return
    _is_stopped = True
    try:
        call(library.corvane_log_set_level, 2)  # what goes to standard error now, without `logging`, is errors alone
        call(library.corvane_log_set_sink, None, None, None)
        call(library.corvane_callbacks_stop, destroy)
    except Error:
        pass  # the child of a fork, where nothing calls back
    for thing in list(_kept.values()):
        if isinstance(thing, Outcome):
            thing.abandon()


def unless_forked(function: Callable[..., Any], *arguments: Any) -> None:
    """Calls a function at the end of a block, which a child that was forked off inside it has no part in."""
    with contextlib.suppress(ForkedError):
        function(*arguments)
