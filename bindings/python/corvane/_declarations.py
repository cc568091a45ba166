"""Data and events as the host declares them."""

import dataclasses
import functools
import sys
import typing
from typing import TYPE_CHECKING, Any, Callable, ClassVar, List, Mapping, Optional, Tuple, TypeVar, Union

from . import _encoding
from ._calls import Handle, call, text
from ._library import library

__all__ = ["AnyEvent", "Event", "EventData", "TimedData", "data", "event"]

C = TypeVar("C", bound=type)


class EventData:
    """Annotates the property of an event that holds what identifies it: its ID and time, the tracker's path, the session.

    The library fills it in. It has no instances.
    """


class TimedData:
    """Annotates the property of an event that says how long it took: its start, its end and its duration.

    The library fills it in, from a timer: see `Tracker.timed` and `Tracker.time`. It has no instances.
    """


if TYPE_CHECKING:
    from dataclasses import dataclass as data  # so that type checkers know what it makes of a class
else:

    def data(cls=None, **options):
        """Makes a dataclass whose instances are data for events: what a screen shows, who looks at it.

            @corvane.data
            class Screen:
                name: str
                depth: int = 0

        It takes the options of `dataclasses.dataclass`. Values are checked by their annotations when an instance is made,
        and again when it is pushed: TypeError for a value of another type, ValueError for one that JSON cannot hold
        (integers beyond 64 bits, numbers that are not finite, lone surrogates, times without a zone); each says where.

        Fields may be str, int, float, bool, datetime and timedelta (both as whole milliseconds), enumerations and Literal
        (as their values), Optional (left out while it is None), lists, tuples and dictionaries with str keys, other
        dataclasses, and Any. An annotation that cannot be written is a TypeError, here or with the first instance.

        The names of the fields are the keys of the JSON; `field(metadata={"corvane_key": "..."})` gives another one. The
        name of the class is that of the data; `corvane_name: ClassVar[str] = "..."` in the class gives another one. Any
        dataclass can be pushed; one that this has not made is checked when it is pushed alone.
        """
        local = sys._getframe(1).f_locals

        def decorate(cls):
            initialise = getattr(cls, "__post_init__", None)
            initialise = getattr(initialise, "__wrapped__", initialise)

            def check(self, *arguments):
                if initialise:
                    initialise(self, *arguments)
                _encoding.codec_of(made).verify(self)

            cls.__post_init__ = functools.wraps(initialise)(check) if initialise else check
            made = dataclasses.dataclass(**options)(cls)
            _resolve(_encoding.codec_of, made, local)
            return made

        return decorate if cls is None else decorate(cls)


def _resolve(function: Callable[..., Any], cls: type, local: Mapping[str, Any]) -> None:
    """Looks at the annotations of a class while what they name is in sight; those to come are left for the first use."""
    try:
        function(cls, local)
    except NameError:
        pass


class Event:
    """An event by its name, for hosts whose events are not classes: which properties it has, and by which data they are
    filled.

        view = corvane.Event("ScreenView", {"event": "EventData", "screen": "Screen"}, optional={"viewer": "Viewer"})

    Without data for a required property a submission fails; an optional one is left out. Best made once and submitted
    often; may be used on any thread. Raises TypeError and ValueError for names that are no text.
    """

    def __init__(self, name: str, required: Mapping[str, str], optional: Optional[Mapping[str, str]] = None) -> None:
        self.name = name
        self._name = text(name, "the event's name")
        properties = [(key, data, True) for key, data in required.items()]
        properties += [(key, data, False) for key, data in (optional or {}).items()]
        self._properties = _encoded(properties)
        self._handle: Optional[Handle] = None

    @classmethod
    def _declared(cls, name: str, properties: List[Tuple[str, str, bool]]) -> "Event":
        event = cls(name, {})
        event._properties = _encoded(properties)
        return event

    def _make(self) -> Handle:
        """Called with the first use: a process that has only declared events may fork."""
        handle = Handle(call(library.corvane_event_create, self._name))
        for key, data, is_required in self._properties:
            add = library.corvane_event_require if is_required else library.corvane_event_allow
            call(add, handle._pointer, key, data)
        self._handle = handle
        return handle


def _encoded(properties: List[Tuple[str, str, bool]]) -> List[Tuple[bytes, bytes, bool]]:
    return [(text(key, "a property"), text(data, f"the data of {key}"), need) for key, data, need in properties]


def _event_of(cls: type, local: Optional[Mapping[str, Any]] = None) -> Event:
    """Of a class that `event` has marked."""
    declared = cls.__dict__.get("__corvane_event__", NotImplemented)
    if declared is NotImplemented:
        raise TypeError(f"{cls.__name__} is no event: it was not declared by @corvane.event")
    if isinstance(declared, Event):
        return declared
    properties = []
    for key, hint in _encoding.hints_of(cls, local).items():
        if typing.get_origin(hint) is ClassVar:
            continue
        is_optional = _encoding.is_optional(hint)
        data = _encoding.without_none(hint) if is_optional else hint
        if not isinstance(data, type) or not (data in (EventData, TimedData) or dataclasses.is_dataclass(data)):
            raise TypeError(f"{cls.__name__}.{key}: {getattr(data, '__name__', data)} is no data")
        properties.append((key, _encoding.data_name(data), not is_optional))
    event = Event._declared(_encoding.data_name(cls), properties)
    setattr(cls, "__corvane_event__", event)
    return event


def event(cls: C) -> C:
    """Declares an event: each annotation is a property, and names the data that fills it.

        @corvane.event
        class ScreenView:
            event: corvane.EventData
            screen: Screen
            viewer: Optional[Viewer]

    Without data for it in scope a submission fails; an optional property is left out then. The class has no instances:
    it is itself what is submitted. Its name is that of the event; `corvane_name` in the class gives another one. An
    annotation that is no data is a TypeError.
    """
    setattr(cls, "__corvane_event__", None)
    _resolve(_event_of, cls, sys._getframe(1).f_locals)
    return cls


AnyEvent = Union[type, Event]


def event_pointer(event: AnyEvent) -> Optional[int]:
    """Raises TypeError for what is no event."""
    declared: Optional[Event] = event if isinstance(event, Event) else getattr(event, "__dict__", {}).get("__corvane_event__")
    if declared is None:
        if not isinstance(event, type):
            raise TypeError(f"{type(event).__name__} is no event")
        declared = _event_of(event)
    handle = declared._handle
    return handle._pointer if handle else declared._make()._pointer


def encoded(data: object, name: Optional[str]) -> Tuple[bytes, bytes]:
    """The name and the JSON of a dataclass's instance, or of a dictionary, which needs a name."""
    if isinstance(data, dict):
        if name is None:
            raise TypeError("a dictionary needs a name")
        return text(name, "the name of data"), _encoding.dictionary_text(data, name)
    codec = _encoding.codec_of(type(data))
    return codec.name if name is None else text(name, "the name of data"), codec.text(data)
