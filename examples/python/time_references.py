#!/usr/bin/env python3
"""The time and the time references of a time service.

    python3 time_references.py sync://HOST/DEVICE

prints the service's time, the selected time reference, and a line for each time reference: its
type, whether it is enabled and selected, its port state when its type has one, and its priority.
"""
import sys
from typing import Callable, List, Optional, TypeVar

import tiktal

T = TypeVar("T")

# tiktalerr_trTypeMismatch: the time reference's type has no such attribute.
TYPE_LACKS_ATTRIBUTE = 0xBFFA4065 - (1 << 32)


def unless_type_lacks(read: Callable[[], T]) -> Optional[T]:
    """The value `read` returns, or None when the time reference's type lacks the attribute."""
    try:
        return read()
    except tiktal.Error as error:
        if error.code != TYPE_LACKS_ATTRIBUTE:
            raise
        return None


def describe(reference: tiktal.TimeReference) -> List[str]:
    """The columns of one time reference."""
    kind = reference.time_reference_type
    state: Optional[int]
    priority: Optional[int]
    if kind.startswith("IEEE 1588"):
        state = unless_type_lacks(lambda: reference.ptp_port_state)
        priority = reference.ptp_priority1
    elif kind.startswith("IEEE 802.1AS"):
        state = unless_type_lacks(lambda: reference.gptp_port_state)
        priority = reference.gptp_priority1
    else:
        state = priority = None
    return [reference.name, kind, "yes" if reference.time_reference_enabled else "no",
            "yes" if reference.time_reference_selected else "no",
            "-" if state is None else f"{getattr(state, 'name', 'UNKNOWN')} ({int(state)})",
            "-" if priority is None else str(priority)]


def main() -> None:
    if len(sys.argv) != 2:
        sys.exit(__doc__)
    with tiktal.Session(sys.argv[1]) as session:
        now = session.get_time()
        print(f"time      {now.utc.isoformat()} ({now.seconds} s {now.nanoseconds} ns)")
        selected = session.selected_time_reference
        if selected:
            print(f"selected  {selected} ({session.selected_time_reference_type}), "
                  f"offset {session.selected_time_reference_offset:g} s")
        rows = [["NAME", "TYPE", "ENABLED", "SELECTED", "PORT STATE", "PRIORITY1"]]
        rows += [describe(reference) for reference in session.time_references]
        widths = [max(len(row[column]) for row in rows) for column in range(len(rows[0]))]
        for row in rows:
            print("  ".join(text.ljust(width) for text, width in zip(row, widths)).rstrip())


if __name__ == "__main__":
    main()
