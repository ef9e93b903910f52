"""Attributes as typed properties.

Each attribute of the library's attribute tables is a descriptor on the session or on a time
reference (tiktal/_attributes.py, generated from the tables). Reading one calls the accessor of
its type with the object's time-reference name (none on a session); writing one checks the value
in Python first, so that a value the C type cannot hold, or a write to a read-only attribute,
fails before anything is sent.
"""
from __future__ import annotations

import enum
import operator
from typing import TYPE_CHECKING, Any, Generic, Optional, Type, TypeVar, Union, overload

if TYPE_CHECKING:
    from .session import Session

T = TypeVar("T")
E = TypeVar("E", bound=enum.IntEnum)

INT32_MIN = -(1 << 31)
INT32_MAX = (1 << 31) - 1


def to_int32(value: Any, what: str) -> int:
    """`value` as a 32-bit signed integer; bool and other non-integers are refused."""
    if isinstance(value, bool):
        raise TypeError(f"{what} takes an integer, not a bool")
    try:
        number = operator.index(value)
    except TypeError:
        raise TypeError(f"{what} takes an integer, not {type(value).__name__}") from None
    if not INT32_MIN <= number <= INT32_MAX:
        raise ValueError(f"{what} takes an integer from {INT32_MIN} to {INT32_MAX}, not {number}")
    return number


def to_real64(value: Any, what: str) -> float:
    """`value` as a double. Its range is the library's to check (a timing module refuses what it
    cannot hold, NaN among it)."""
    if isinstance(value, bool) or not isinstance(value, (int, float)):
        raise TypeError(f"{what} takes a real number, not {type(value).__name__}")
    return float(value)


def to_boolean(value: Any, what: str) -> bool:
    """True or False; the integers 1 and 0 stand for them, nothing else does."""
    if isinstance(value, bool):
        return value
    if isinstance(value, int) and value in (0, 1):
        return bool(value)
    raise TypeError(f"{what} takes True or False, not {value!r}")


def to_text(value: Any, what: str) -> bytes:
    """`value` as the bytes of a C string: UTF-8, and no NUL, which would end it early. Text read
    from the library may hold bytes that are not UTF-8 (see from_text): they go back unchanged."""
    if not isinstance(value, str):
        raise TypeError(f"{what} takes a str, not {type(value).__name__}")
    if "\0" in value:
        raise ValueError(f"{what} cannot hold a NUL character")
    return value.encode("utf-8", "surrogateescape")


def from_text(data: bytes) -> str:
    """The library's text as str: UTF-8, with bytes that are not UTF-8 kept as lone surrogates."""
    return data.decode("utf-8", "surrogateescape")


class Attribute(Generic[T]):
    """One attribute of the C interface as a property of the type T.

    The object it is read from gives the session and the time-reference name of the call
    through its _attribute_access() method.
    """

    type_name = ""  # the C accessor's type: Int32, Real64, Boolean or String

    def __init__(self, attribute_id: int, constant: str, *, writable: bool) -> None:
        self.id = attribute_id
        self.constant = constant
        self.writable = writable
        self.name = constant
        access = "read and write" if writable else "read only"
        self.__doc__ = f"{constant} ({attribute_id}): {self.type_name}, {access}."

    def __set_name__(self, owner: type, name: str) -> None:
        self.name = name

    @overload
    def __get__(self, obj: None, owner: Optional[type] = None) -> "Attribute[T]": ...

    @overload
    def __get__(self, obj: object, owner: Optional[type] = None) -> T: ...

    def __get__(self, obj: Optional[object], owner: Optional[type] = None) -> Union["Attribute[T]", T]:
        if obj is None:
            return self
        session, item = obj._attribute_access()  # type: ignore[attr-defined]
        return self.read(session, item)

    def __set__(self, obj: object, value: T) -> None:
        if not self.writable:
            raise AttributeError(f"{self.name} ({self.constant}) is read only")
        converted = self.convert(value)
        session, item = obj._attribute_access()  # type: ignore[attr-defined]
        session._set_attribute(self.type_name, item, self.id, converted)

    def __delete__(self, obj: object) -> None:
        raise AttributeError(f"{self.name} cannot be deleted")

    def read(self, session: "Session", item: Optional[str]) -> T:
        return session._get_attribute(self.type_name, item, self.id)  # type: ignore[no-any-return]

    def convert(self, value: Any) -> Any:
        raise NotImplementedError

    def __repr__(self) -> str:
        return f"<{type(self).__name__} {self.name} {self.constant} ({self.id})>"


class Int32Attribute(Attribute[int]):
    type_name = "Int32"

    def convert(self, value: Any) -> int:
        return to_int32(value, self.name)


class Real64Attribute(Attribute[float]):
    type_name = "Real64"

    def convert(self, value: Any) -> float:
        return to_real64(value, self.name)


class BooleanAttribute(Attribute[bool]):
    type_name = "Boolean"

    def convert(self, value: Any) -> bool:
        return to_boolean(value, self.name)


class StringAttribute(Attribute[str]):
    type_name = "String"

    def convert(self, value: Any) -> bytes:
        return to_text(value, self.name)


class EnumAttribute(Attribute[Union[E, int]], Generic[E]):
    """An Int32 attribute whose numbers are the members of an enumeration. A number the
    enumeration lacks (a service may send any accuracy code) reads as a plain int."""

    type_name = "Int32"

    def __init__(self, attribute_id: int, constant: str, enumeration: Type[E], *, writable: bool) -> None:
        super().__init__(attribute_id, constant, writable=writable)
        self.enumeration = enumeration
        access = "read and write" if writable else "read only"
        self.__doc__ = f"{constant} ({attribute_id}): {enumeration.__name__} (Int32), {access}."

    def read(self, session: "Session", item: Optional[str]) -> Union[E, int]:
        number = session._get_attribute("Int32", item, self.id)
        try:
            return self.enumeration(number)
        except ValueError:
            return number  # type: ignore[no-any-return]

    def convert(self, value: Any) -> int:
        if isinstance(value, enum.Enum) and not isinstance(value, self.enumeration):
            raise TypeError(f"{self.name} takes a {self.enumeration.__name__} or an integer, not {value!r}")
        return to_int32(value, self.name)

