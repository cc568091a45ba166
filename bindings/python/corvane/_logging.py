"""Log records as events."""

import logging
from datetime import timedelta
from typing import Optional

from ._declarations import EventData, data, event
from ._encoding import time_of
from ._errors import ForkedError
from ._tracker import Tracker


@data
class LogRecord:
    """A log record. `exception` is its traceback."""

    logger: str
    level: str
    message: str
    file: str
    line: int
    exception: Optional[str] = None


@event
class Logged:
    """Something was logged."""

    event: EventData
    record: LogRecord


class EventHandler(logging.Handler):
    """Records log records as the event `Logged`, whose property `record` is a `LogRecord`.

        logging.getLogger().addHandler(corvane.EventHandler(sessions.tracker, level=logging.WARNING))

    What the library itself logs is left out: an event that fails would be logged, and so on. A process that was forked
    off is told so once, and drops its records.
    """

    def __init__(self, tracker: Tracker, level: int = logging.NOTSET) -> None:
        super().__init__(level)
        self._tracker = tracker.chain("log")
        self._is_forked = False

    def emit(self, record: logging.LogRecord) -> None:
        if self._is_forked or record.name.partition(".")[0] == "corvane":
            return
        try:
            # Nobody comes between both: the handler's lock is held.
            self._tracker.push(self._data(record), only_once=True)
            self._tracker.submit(Logged, time=time_of(int(record.created * 1000)))
        except Exception as error:
            self._is_forked = isinstance(error, ForkedError)
            self.handleError(record)

    def _data(self, record: logging.LogRecord) -> LogRecord:
        exception = None
        if record.exc_info and record.exc_info[0]:
            exception = (self.formatter or logging.Formatter()).formatException(record.exc_info)
        return LogRecord(
            _clean(record.name),
            _clean(record.levelname),
            _clean(record.getMessage()),
            _clean(record.pathname),
            record.lineno,
            exception and _clean(exception),
        )


def _clean(text: str) -> str:
    """What is logged may have any text in it."""
    return text.encode(errors="replace").decode()
