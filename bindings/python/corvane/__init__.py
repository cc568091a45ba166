"""Corvane records what users do and delivers it to a collection server.

Data and events are declared as classes, checked against their annotations, kept on disk before they are acknowledged, and
uploaded in batches. See `Sessions` and `Tracker`.

Calls enqueue their work and return at once, on any thread; those that wait say so, and are refused inside callbacks. Callbacks
run on threads of the library's; none runs any more when the interpreter ends, which waits for those that do.
"""

from ._callbacks import logger
from ._declarations import AnyEvent, Event, EventData, TimedData, data, event
from ._errors import Error, ForkedError
from ._library import library as _library
from ._logging import EventHandler, Logged, LogRecord
from ._process import (
    agent_is_available,
    documents_directory,
    hide_private,
    set_documents_directory,
    set_log_level,
    upload_by_agent,
    upload_by_default,
    upload_in_process,
    use_event_loop,
)
from ._processors import AnyProcessor, FilteringProcessor, LoggingProcessor, Processor, SamplingProcessor, Task
from ._records import (
    Client,
    Count,
    DeliveryReport,
    DeliveryUpdate,
    Forgotten,
    Kind,
    Ledger,
    ProcessEvent,
    Reason,
    Rejection,
    Session,
    Step,
)
from ._sessions import SessionAccess, Sessions
from ._tracker import (
    Access,
    Change,
    Completion,
    Delayed,
    Evaluation,
    Missing,
    Observer,
    Snapshot,
    Tracker,
)
from ._uploads import Uploads

__version__: str = _library.corvane_version().decode()

__all__ = [
    "Access",
    "agent_is_available",
    "AnyEvent",
    "AnyProcessor",
    "Change",
    "Client",
    "Completion",
    "Count",
    "data",
    "Delayed",
    "DeliveryReport",
    "DeliveryUpdate",
    "documents_directory",
    "Error",
    "Evaluation",
    "event",
    "Event",
    "EventData",
    "EventHandler",
    "FilteringProcessor",
    "Forgotten",
    "ForkedError",
    "hide_private",
    "Kind",
    "Ledger",
    "Logged",
    "logger",
    "LoggingProcessor",
    "LogRecord",
    "Missing",
    "Observer",
    "ProcessEvent",
    "Processor",
    "Reason",
    "Rejection",
    "SamplingProcessor",
    "Session",
    "SessionAccess",
    "Sessions",
    "set_documents_directory",
    "set_log_level",
    "Snapshot",
    "Step",
    "Task",
    "TimedData",
    "Tracker",
    "upload_by_agent",
    "upload_by_default",
    "upload_in_process",
    "Uploads",
    "use_event_loop",
]
