"""How the library's functions are called, and its objects held."""

import ctypes
import threading
from datetime import timedelta
from typing import Any, Callable, List, Optional, Tuple

from ._errors import Error, error_of
from ._library import CError, library

# Error structures that are not in use, with their addresses. A call that is made inside another one, as by a callback or
# the garbage collector, takes one of its own.
_free: List[Tuple[CError, int]] = []


def _new_error() -> Tuple[CError, int]:
    error = CError()
    return error, ctypes.addressof(error)


def call(function: Any, *arguments: Any) -> Any:
    """Calls a function of the library, and raises what it reports as an error."""
    try:
        error = _free.pop()
    except IndexError:
        error = _new_error()
    result = function(*arguments, error[1])
    failure = None
    if not result and error[0].domain:
        failure = error_of(error[0].domain, error[0].code, error[0].message)
    _free.append(error)
    if interrupted:
        _raise_interrupt()
    if failure:
        raise failure
    return result


# Not empty after Ctrl-C in a callback that ran on the main thread, inside a call: it is raised behind that call.
interrupted: List[bool] = []


def _raise_interrupt() -> None:
    if threading.current_thread() is threading.main_thread():
        interrupted.clear()
        raise KeyboardInterrupt


def error_at(address: Optional[int]) -> Optional[Error]:
    """What a callback was told; None for success."""
    if not address:
        return None
    error = CError.from_address(address)
    return error_of(error.domain, error.code, error.message)


def text(given: str, what: str) -> bytes:
    """A text as the library takes it. Raises TypeError and ValueError."""
    if not isinstance(given, str):
        raise TypeError(f"{what}: expected str, got {type(given).__name__}")
    if "\0" in given:
        raise ValueError(f"{what}: the text contains a NUL character")
    try:
        return given.encode()
    except UnicodeEncodeError:
        raise ValueError(f"{what}: the text contains a lone surrogate") from None


def optional_text(given: Optional[str], what: str) -> Optional[bytes]:
    return None if given is None else text(given, what)


def number(given: int, bits: int, what: str) -> int:
    """A signed number as the library takes it; ctypes would cut it. Raises TypeError and ValueError."""
    if not isinstance(given, int):
        raise TypeError(f"{what}: expected int, got {type(given).__name__}")
    if not -(1 << bits - 1) <= given < 1 << bits - 1:
        raise ValueError(f"{what}: the number does not fit {bits} bits")
    return given


def milliseconds(given: Optional[timedelta], what: str) -> int:
    """A length of time as the library takes it, 0 for None. Raises TypeError and ValueError."""
    if given is None:
        return 0
    if not isinstance(given, timedelta):
        raise TypeError(f"{what}: expected timedelta, got {type(given).__name__}")
    whole = given // timedelta(milliseconds=1)
    if whole <= 0:
        raise ValueError(f"{what}: {given} is less than a millisecond")
    return whole


class Handle:
    """An object of the library's, which is let go of with this one."""

    __slots__ = ("_pointer", "__weakref__")

    def __init__(self, pointer: Optional[int]) -> None:
        self._pointer = pointer

    def _release(self, release: Callable[[Optional[int]], None] = library.corvane_release) -> None:
        pointer = getattr(self, "_pointer", None)  # there is none when the object could not be made
        self._pointer = None
        if pointer:
            release(pointer)

    def __del__(self) -> None:
        self._release()
