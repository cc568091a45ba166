"""How values become JSON: for each dataclass a function is compiled that writes its fields, checked by their annotations.

The library reads the text and writes it anew, so that numbers and text come out as from every other host.
"""

import dataclasses
import enum
import json.encoder
import math
import types
import typing
from collections import abc
from datetime import datetime, timedelta, timezone
from typing import Any, Callable, Dict, List, Mapping, NamedTuple, Optional, Sequence, Tuple, Type, TypeVar, Union

quote: Callable[[str], str] = json.encoder.encode_basestring  # type: ignore[attr-defined]

T = TypeVar("T")

_EPOCH = datetime(1970, 1, 1, tzinfo=timezone.utc)
_MILLISECOND = timedelta(milliseconds=1)
_UNIONS = (Union, getattr(types, "UnionType", Union))


class Invalid(Exception):
    """A value that cannot be written; becomes a TypeError or a ValueError that says where it is."""

    def __init__(self, kind: Type[Exception], reason: str) -> None:
        super().__init__(reason)
        self.kind = kind
        self.reason = reason
        self.path: List[str] = []

    def within(self, place: str) -> "Invalid":
        self.path.append(place)
        return self

    def seen_from(self, root: str) -> Exception:
        return self.kind(f"{root}{''.join(reversed(self.path))}: {self.reason}")


def _mismatch(expected: str, value: object) -> Invalid:
    return Invalid(TypeError, f"expected {expected}, got {type(value).__name__}")


class Rule(NamedTuple):
    """How the values of an annotation are written.

    `encode` takes any value, and raises `Invalid`. `quick` is an expression that gives the same on the condition `test`,
    which holds for most values; in both `{0}` stands for a variable.
    """

    encode: Callable[[Any], str]
    test: str = ""
    quick: str = ""


def _text(value: Any) -> str:
    if not isinstance(value, str):
        raise _mismatch("str", value)
    try:
        value.encode()
    except UnicodeEncodeError:
        raise Invalid(ValueError, "the text contains a lone surrogate") from None
    return quote(str.__str__(value))


def _boolean(value: Any) -> str:
    if not isinstance(value, bool):
        raise _mismatch("bool", value)
    return "true" if value else "false"


def _integer(value: Any) -> str:
    if not isinstance(value, int) or isinstance(value, bool):
        raise _mismatch("int", value)
    if not -(2**63) <= value < 2**64:
        raise Invalid(ValueError, "the integer does not fit 64 bits")
    return int.__repr__(value)


def _real(value: Any) -> str:
    if isinstance(value, bool) or not isinstance(value, (int, float)):
        raise _mismatch("float", value)
    try:
        value = float(value)
    except OverflowError:
        raise Invalid(ValueError, "the number is beyond a float") from None
    if not math.isfinite(value):
        raise Invalid(ValueError, "the number is not finite")
    return repr(value)


def milliseconds_of(moment: datetime) -> int:
    """Whole milliseconds since 1970, truncated toward zero. Raises `Invalid` for a time without a zone."""
    if not isinstance(moment, datetime):
        raise _mismatch("datetime", moment)
    if moment.utcoffset() is None:
        raise Invalid(ValueError, "the time has no zone; datetime.now(timezone.utc) has one")
    return _whole_milliseconds(moment - _EPOCH)


def _whole_milliseconds(span: timedelta) -> int:
    return span // _MILLISECOND if span >= timedelta(0) else -(-span // _MILLISECOND)


def time_of(milliseconds: int) -> datetime:
    """The time of a number of milliseconds since 1970, in UTC; the first or the last one of Python's beyond those."""
    try:
        return _EPOCH + timedelta(milliseconds=milliseconds)
    except OverflowError:
        return (datetime.min if milliseconds < 0 else datetime.max).replace(tzinfo=timezone.utc)


def _moment(value: Any) -> str:
    return str(milliseconds_of(value))


def _span(value: Any) -> str:
    if not isinstance(value, timedelta):
        raise _mismatch("timedelta", value)
    return str(_whole_milliseconds(value))


def _null(value: Any) -> str:
    if value is not None:
        raise _mismatch("None", value)
    return "null"


def _array(value: Any, encode: Callable[[Any], str]) -> str:
    if not isinstance(value, (list, tuple)):
        raise _mismatch("list", value)
    texts = []
    for index, element in enumerate(value):
        try:
            texts.append(encode(element))
        except Invalid as invalid:
            raise invalid.within(f"[{index}]")
    return f"[{','.join(texts)}]"


def _object(value: Any, encode: Callable[[Any], str]) -> str:
    if not isinstance(value, abc.Mapping):
        raise _mismatch("dict", value)
    texts = []
    for key, member in value.items():
        try:
            name = _text(key)
        except Invalid as invalid:
            raise invalid.within(" (a key)")
        try:
            texts.append(f"{name}:{encode(member)}")
        except Invalid as invalid:
            raise invalid.within(f".{key}")
    return f"{{{','.join(texts)}}}"


def _anything(value: Any) -> str:
    if value is None:
        return "null"
    if isinstance(value, enum.Enum):
        return _anything(value.value)
    if dataclasses.is_dataclass(value) and not isinstance(value, type):
        return codec_of(type(value)).encode(value)
    for kind, encode in _BY_KIND:
        if isinstance(value, kind):
            return encode(value)
    raise Invalid(TypeError, f"{type(value).__name__} cannot be written")


_BY_KIND: Tuple[Tuple[Any, Callable[[Any], str]], ...] = (
    (str, _text),
    (bool, _boolean),
    (int, _integer),
    (float, _real),
    (datetime, _moment),
    (timedelta, _span),
    ((list, tuple), lambda value: _array(value, _anything)),
    (abc.Mapping, lambda value: _object(value, _anything)),
)

_RULES: Dict[Any, Rule] = {
    str: Rule(_text, "type({0}) is str and {0}.isascii()", "quote({0})"),
    bool: Rule(_boolean, "{0} is True or {0} is False", "'true' if {0} else 'false'"),
    int: Rule(_integer, "type({0}) is int and -0x8000000000000000 <= {0} < 0x10000000000000000", "repr({0})"),
    float: Rule(_real, "type({0}) is float and -1e300 < {0} < 1e300", "repr({0})"),
    datetime: Rule(_moment),
    timedelta: Rule(_span),
    type(None): Rule(_null),
    Any: Rule(_anything),
    object: Rule(_anything),
    list: Rule(lambda value: _array(value, _anything)),
    tuple: Rule(lambda value: _array(value, _anything)),
    dict: Rule(lambda value: _object(value, _anything)),
}


def _optional(encode: Callable[[Any], str]) -> Rule:
    return Rule(lambda value: "null" if value is None else encode(value))


def _one_of(values: Sequence[Any], expected: str) -> Rule:
    texts = [(value, _anything(value)) for value in values]

    def encode(value: Any) -> str:
        for known, text in texts:
            if known is value or (type(known) is type(value) and known == value):
                return text
        raise _mismatch(expected, value)

    return Rule(encode)


def _record(cls: type) -> Rule:
    def encode(value: Any) -> str:
        if not isinstance(value, cls):
            raise _mismatch(cls.__name__, value)
        return codec_of(cls).encode(value)

    return Rule(encode)


def is_optional(hint: Any) -> bool:
    return typing.get_origin(hint) in _UNIONS and type(None) in typing.get_args(hint)


def without_none(hint: Any) -> Any:
    """What an optional annotation is about."""
    return Union[tuple(kind for kind in typing.get_args(hint) if kind is not type(None))]


def rule_for(hint: Any) -> Rule:
    """Raises `Invalid` for an annotation whose values cannot be written."""
    origin, arguments = typing.get_origin(hint), typing.get_args(hint)
    if hint in _RULES:
        return _RULES[hint]
    if is_optional(hint) and len(arguments) == 2:
        return _optional(rule_for(without_none(hint)).encode)
    if origin is typing.Literal:
        return _one_of(arguments, str(hint))
    if origin in (list, abc.Sequence) or (origin is tuple and arguments[1:] == (Ellipsis,)):
        element = rule_for(arguments[0]).encode
        return Rule(lambda value: _array(value, element))
    if origin in (dict, abc.Mapping) and arguments[0] is str:
        member = rule_for(arguments[1]).encode
        return Rule(lambda value: _object(value, member))
    if hasattr(hint, "__supertype__"):
        return rule_for(hint.__supertype__)
    if isinstance(hint, type) and issubclass(hint, enum.Enum):
        return _one_of(list(hint), hint.__name__)
    if isinstance(hint, type) and dataclasses.is_dataclass(hint):
        return _record(hint)
    raise Invalid(TypeError, f"{getattr(hint, '__name__', hint)} cannot be written")


class Codec:
    """How the instances of a dataclass are written.

    `encode` raises `Invalid`, `check` too where `encode` would; `name` is that of the data.
    """

    __slots__ = ("cls", "name", "encode", "check")

    def __init__(self, cls: type, hints: Mapping[str, Any]) -> None:
        self.cls = cls
        self.name = data_name(cls).encode()
        self.encode, self.check = _compile(cls, hints)

    def text(self, value: object) -> bytes:
        """The JSON of an instance. Raises TypeError and ValueError."""
        return checked(self.encode, value, self.cls.__name__).encode()

    def verify(self, value: object) -> None:
        """The same without the JSON."""
        checked(self.check, value, self.cls.__name__)


def dictionary_text(value: Mapping[str, Any], name: str) -> bytes:
    return checked(_anything, value, name).encode()


def checked(function: Callable[[Any], T], value: object, name: str) -> T:
    """What a function gives that raises `Invalid`. Raises TypeError and ValueError."""
    try:
        return function(value)
    except Invalid as invalid:
        raise invalid.seen_from(name) from None
    except RecursionError:
        raise ValueError(f"{name}: the value is nested too deeply") from None


def data_name(cls: type) -> str:
    """The name of a class's data or event: its own, unless `corvane_name` says another."""
    name = cls.__dict__.get("corvane_name", cls.__name__)
    if not isinstance(name, str):
        raise TypeError(f"{cls.__name__}.corvane_name: expected str, got {type(name).__name__}")
    return name


def hints_of(cls: type, local: Optional[Mapping[str, Any]] = None) -> Dict[str, Any]:
    """The annotations of a class. Raises NameError for one that is not defined yet."""
    return typing.get_type_hints(cls, localns=None if local is None else dict(local))


def codec_of(cls: type, local: Optional[Mapping[str, Any]] = None) -> Codec:
    """Raises TypeError for what is no dataclass, and for annotations whose values cannot be written."""
    found = cls.__dict__.get("__corvane_codec__")
    if isinstance(found, Codec):
        return found
    if not dataclasses.is_dataclass(cls):
        raise TypeError(f"{cls.__name__} is no dataclass")
    try:
        codec = Codec(cls, hints_of(cls, local))
    except Invalid as invalid:
        raise invalid.seen_from(cls.__name__) from None
    setattr(cls, "__corvane_codec__", codec)
    return codec


def _named(encode: Callable[[Any], str], name: str) -> Callable[[Any], str]:
    def named(value: Any) -> str:
        try:
            return encode(value)
        except Invalid as invalid:
            raise invalid.within("." + name)

    return named


def _compile(cls: type, hints: Mapping[str, Any]) -> Tuple[Callable[[Any], str], Callable[[Any], None]]:
    """Functions that write and check an instance. An optional field without a value is left out."""
    scope: Dict[str, Any] = {"quote": quote}
    encode, check = ["def encode(value):"], ["def check(value):"]
    parts: List[str] = []
    for index, field in enumerate(dataclasses.fields(cls)):
        hint, variable = hints[field.name], f"v{index}"
        may_be_left_out = is_optional(hint)
        try:
            rule = rule_for(without_none(hint) if may_be_left_out else hint)
        except Invalid as invalid:
            raise invalid.within("." + field.name)
        scope[f"f{index}"] = _named(rule.encode, field.name)
        test, write = rule.test.format(variable) or "False", f"f{index}({variable})"
        if rule.test:
            write = f"({rule.quick.format(variable)} if {test} else {write})"
        # Where the first one may be left out, the comma before whichever comes first is cut off again.
        before = "{" if not parts and not may_be_left_out else ","
        part = f"{before + quote(field.metadata.get('corvane_key', field.name)) + ':'!r} + {write}"
        if may_be_left_out:
            part, test = f"('' if {variable} is None else {part})", f"{variable} is None or {test}"
        parts.append(part)
        get = f"    {variable} = value.{field.name}"
        encode.append(get)
        check += [get, f"    if not ({test}): f{index}({variable})"]
    written = " + ".join(parts) or "'{'"
    cut = not written.startswith("'{")
    encode.append(f"    return '{{' + ({written})[1:] + '}}'" if cut else f"    return {written} + '}}'")
    exec("\n".join(encode + check + ["    return None"]), scope)  # names of fields are identifiers
    return scope["encode"], scope["check"]
