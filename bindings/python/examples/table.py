#!/usr/bin/env python3
"""Reads the documents that the example collector has taken, and writes their events as a table.

    table.py collected/documents.ndjson
    table.py collected/documents.ndjson --event Play --csv > play.csv

Each event is a row, and each value in it a column, named by its path. Events that were delivered twice come once.
"""

import argparse
import csv
import json
import sys
from typing import Any, Dict, Iterable, Iterator, List, Set, TextIO

Row = Dict[str, Any]


def flat(value: Any, path: str) -> Iterator["tuple[str, Any]"]:
    """The values inside a JSON value, with their paths; a list is one."""
    if isinstance(value, dict):
        for key, member in value.items():
            yield from flat(member, f"{path}.{key}" if path else key)
    else:
        yield path, json.dumps(value, ensure_ascii=False) if isinstance(value, list) else value


def rows_of(lines: Iterable[str]) -> Iterator[Row]:
    """Raises ValueError, KeyError and TypeError for lines that are no documents."""
    seen: Set[str] = set()
    for line in lines:
        document = json.loads(line)
        session = document["data"]["session"]["sessionID"]
        for event in document["data"]["events"]:
            row = {"name": event["metadata"]["name"], "session": session, **dict(flat(event["data"], ""))}
            identifier = next((value for path, value in row.items() if path.endswith(".eventID")), None)
            if identifier is None or identifier not in seen:
                seen.add(str(identifier))
                yield row


def columns_of(rows: Iterable[Row]) -> List[str]:
    """In the order in which they come first."""
    return list(dict.fromkeys(column for row in rows for column in row))


def write_text(rows: List[Row], out: TextIO) -> None:
    columns = columns_of(rows)
    lines = [columns] + [["" if row.get(column) is None else str(row[column]) for column in columns] for row in rows]
    widths = [max(len(line[index]) for line in lines) for index in range(len(columns))]
    for line in lines:
        print("  ".join(cell.ljust(width) for cell, width in zip(line, widths)).rstrip(), file=out)


def write_csv(rows: List[Row], out: TextIO) -> None:
    writer = csv.DictWriter(out, columns_of(rows))
    writer.writeheader()
    writer.writerows(rows)


def main() -> None:
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("file", help="the documents, one a line; - for standard input")
    parser.add_argument("--event", help="only events of this name")
    parser.add_argument("--csv", action="store_true", help="comma-separated values, for other programs")
    arguments = parser.parse_args()

    with open(0 if arguments.file == "-" else arguments.file, encoding="utf-8") as lines:
        rows = [row for row in rows_of(lines) if arguments.event in (None, row["name"])]
    (write_csv if arguments.csv else write_text)(rows, sys.stdout)


if __name__ == "__main__":
    try:
        main()
    except (OSError, ValueError, KeyError, TypeError) as error:
        sys.exit(f"table.py: {error!r}")
