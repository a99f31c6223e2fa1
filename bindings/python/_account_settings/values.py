"""Properties as Python has them and as the library has them."""

from __future__ import annotations

import ctypes
from collections.abc import Callable, Iterator, Mapping, Sequence
from datetime import datetime, timedelta, timezone
from typing import Any, Union

from . import Handle, call, encoded, handle, text


class Opaque:
    """A value of a kind that nobody reads; it can be given back as it is."""

    def _holding(self, value: Handle) -> Opaque:
        self._handle = value
        return self


# What is read, and what can be set.
Property = Union[str, int, float, bool, datetime, bytes, Opaque, "list[Property]", "dict[str, Property]"]
Settable = Union[
    str, int, float, bool, datetime, bytes, bytearray, Opaque, "Sequence[Settable]", "Mapping[str, Settable]"
]

_EPOCH = datetime(2001, 1, 1, tzinfo=timezone.utc)


def _read(name: str, kind: Any, value: Handle) -> Any:
    place = kind()
    return place.value if call("value_" + name, value, ctypes.byref(place)) else None


def _data(value: Handle) -> bytes:
    size = ctypes.c_size_t()
    return ctypes.string_at(call("value_data", value, ctypes.byref(size)), size.value)


def _elements(value: Handle) -> Iterator[Property]:
    for place in range(call("value_count", value)):
        yield property_of(call("value_at", value, place))


def _dictionary(value: Handle) -> dict[str, Property]:
    return {text("value_key_at", value, place) or "": each for place, each in enumerate(_elements(value))}


def _integer(value: Handle) -> int:
    signed: int | None = _read("integer", ctypes.c_int64, value)
    return int(signed if signed is not None else _read("unsigned", ctypes.c_uint64, value))


def _date(value: Handle) -> Property:
    try:
        return _EPOCH + timedelta(seconds=float(_read("date", ctypes.c_double, value)))
    except (OverflowError, ValueError):  # no time of this calendar, or none at all
        return Opaque()._holding(value)


# By the number of the kind.
_READERS: tuple[Callable[[Handle], Property], ...] = (
    lambda value: text("value_text", value) or "",
    _integer,
    lambda value: float(_read("real", ctypes.c_double, value)),
    lambda value: bool(_read("boolean", ctypes.c_bool, value)),
    _date,
    _data,
    lambda value: list(_elements(value)),
    _dictionary,
    lambda value: Opaque()._holding(value),
)


def property_of(pointer: int | None) -> Property:
    """The value as Python has it; takes the handle over."""
    value = handle("value", pointer)
    return _READERS[int(call("value_kind", value))](value)


def properties_of(pointer: int | None) -> dict[str, Property]:
    """The same of a dictionary."""
    return _dictionary(handle("value", pointer))


def texts_of(pointer: int | None) -> list[str]:
    """The same of a list of texts."""
    return [str(each) for each in _elements(handle("value", pointer))]


def made(value: Settable) -> Handle:
    """The value as the library has it."""
    if isinstance(value, Opaque):
        return value._handle
    if isinstance(value, str):
        return handle("value", call("value_of_text", encoded(value)))
    if isinstance(value, bool):
        return handle("value", call("value_of_boolean", value))
    if isinstance(value, int):
        if not -(2**63) <= value < 2**64:
            raise OverflowError("an integer that no property list holds")
        return handle("value", call("value_of_integer" if value < 2**63 else "value_of_unsigned", value))
    if isinstance(value, float):
        return handle("value", call("value_of_real", value))
    if isinstance(value, datetime):
        return handle("value", call("value_of_date", (value.astimezone(timezone.utc) - _EPOCH).total_seconds()))
    if isinstance(value, (bytes, bytearray)):
        return handle("value", call("value_of_data", bytes(value), len(value)))
    return _filled(value)


def _filled(value: Mapping[str, Settable] | Sequence[Settable]) -> Handle:
    if isinstance(value, Mapping):
        dictionary = handle("value", call("value_of_dictionary"))
        for key, element in value.items():
            _check(call("value_set", dictionary, encoded(key), made(element)))
        return dictionary
    if isinstance(value, Sequence):
        elements = handle("value", call("value_of_list"))
        for element in value:
            _check(call("value_append", elements, made(element)))
        return elements
    raise TypeError(f"no property is a {type(value).__name__}")


def _check(is_done: bool) -> None:
    if not is_done:
        raise MemoryError
