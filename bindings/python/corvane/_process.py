"""What the whole process has one of: the log, the documents directory, the main queue, the kind of transfers."""

import asyncio
import ctypes
import logging
import os
from ctypes import byref, c_char_p, c_int32, c_void_p
from datetime import timedelta
from typing import Any, Optional, Sequence, Union

from . import _callbacks
from ._calls import call, milliseconds, optional_text, text
from ._library import CAgentOptions, library
from ._processors import kept_task


def _c_level(level: int) -> int:
    return 0 if level <= logging.DEBUG else 1 if level <= logging.INFO else 2


_PYTHON_LEVELS = (logging.DEBUG, logging.INFO, logging.ERROR)


@_callbacks.function(None, c_int32, c_char_p)
def _log(logger: logging.Logger, level: int, message: bytes) -> None:
    logger.log(_PYTHON_LEVELS[level], "%s", message.decode(errors="replace"))


@_callbacks.at_start
def _take_log() -> None:
    level = _callbacks.logger.getEffectiveLevel()
    call(library.corvane_log_set_sink, *_callbacks.register(_log, _callbacks.logger))
    call(library.corvane_log_set_level, _c_level(level))


def set_log_level(level: int) -> None:
    """Sets the level of the log, in the terms of `logging`: DEBUG has every event, INFO what happens to documents, and
    everything above it errors alone.

    The log goes to `logging.getLogger("corvane")`, on any thread. Its level is that logger's when the library is first
    used; of a later change only this tells the library, which does not even make the messages below its level.
    """
    _callbacks.start()
    _callbacks.logger.setLevel(level)
    call(library.corvane_log_set_level, _c_level(level))


def hide_private(hides: bool) -> None:
    """Whether the data of events in the log's messages is printed as "<private>"."""
    call(library.corvane_log_set_hides_private, hides)


def set_documents_directory(path: Union[str, "os.PathLike[str]"]) -> None:
    """Where databases, payloads and the signing key are kept. To be set before the first processor is made."""
    call(library.corvane_documents_directory_set, text(os.fspath(path), "the path"))


def documents_directory() -> str:
    """Where databases, payloads and the signing key are kept."""
    length = call(library.corvane_documents_directory_get, None, 0)
    buffer = ctypes.create_string_buffer(length + 1)
    call(library.corvane_documents_directory_get, buffer, length + 1)
    return os.fsdecode(buffer.value)


@_callbacks.function(None, c_void_p)
def _execute(loop: asyncio.AbstractEventLoop, pointer: int) -> None:
    task = kept_task(pointer)
    try:
        loop.call_soon_threadsafe(task.run)
    except RuntimeError:
        task.run()  # the loop is closed: rather here than never


def use_event_loop(loop: Optional[asyncio.AbstractEventLoop]) -> None:
    """Has the main queue, on which observers of deliveries are called, run by an event loop. None brings back a queue of
    the library's own. Do that before the loop is closed: what one that is closed had not run yet is lost.
    """
    call(library.corvane_main_queue_set_executor, *_callbacks.register(_execute, loop))


def agent_is_available() -> bool:
    """Whether the transfer agent, a process of its own that outlives this one, was installed with the library."""
    return bool(call(library.corvane_transfers_agent_is_available))


def upload_in_process() -> None:
    """Documents are uploaded inside this process, by processors that are added afterwards."""
    call(library.corvane_transfers_use_in_process)


def upload_by_default() -> None:
    """Documents are uploaded by the agent where it is available, and otherwise inside this process."""
    call(library.corvane_transfers_use_default)


def upload_by_agent(
    *,
    program: Optional[str] = None,
    directory: Optional[str] = None,
    wake_command: Optional[Sequence[str]] = None,
    deadline: Optional[timedelta] = None,
    hold_off: Optional[timedelta] = None,
    idle_time: Optional[timedelta] = None,
    retry_delay: Optional[timedelta] = None,
    patience: Optional[timedelta] = None,
    patience_without_host: Optional[timedelta] = None,
) -> None:
    """Documents are uploaded by the agent, by processors that are added afterwards.

    `program` is the one that was installed with the library, `directory`, of its journal, in the documents directory.
    `wake_command`, a program by its absolute path and its arguments, is run when outcomes wait for a host that is not
    running. `deadline` is that for the agent to start or to answer (5 s), and `hold_off` the time until it is tried again
    (30 s). The agent ends after `idle_time` with nothing to do (10 s); it tries a server again after `retry_delay` (1 s),
    doubling; it has `patience` with one that cannot be reached (24 h), and `patience_without_host` with such ones alone (1 h).
    """
    options = CAgentOptions(
        program=optional_text(program, "program"),
        directory=optional_text(directory, "directory"),
        deadline=milliseconds(deadline, "deadline"),
        hold_off=milliseconds(hold_off, "hold_off"),
        idle_time=milliseconds(idle_time, "idle_time"),
        retry_delay=milliseconds(retry_delay, "retry_delay"),
        patience=milliseconds(patience, "patience"),
        patience_without_host=milliseconds(patience_without_host, "patience_without_host"),
    )
    if wake_command is not None:
        parts: "list[Optional[bytes]]" = [text(part, "wake_command") for part in wake_command]
        command = (c_char_p * (len(parts) + 1))(*parts, None)
        options.wake_command = ctypes.addressof(command)
    call(library.corvane_transfers_use_agent, byref(options))
