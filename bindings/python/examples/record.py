#!/usr/bin/env python3
"""Records what happens in a small player, and waits until a server has it.

    collector --port 8080 &
    record.py http://127.0.0.1:8080/events
"""

import argparse
import asyncio
import enum
import logging
import random
import sys
from typing import List, Optional

import corvane


class Quality(enum.Enum):
    STANDARD = "standard"
    HIGH = "high"


@corvane.data
class Viewer:
    id: str
    plan: Optional[str] = None


@corvane.data
class Track:
    title: str
    quality: Quality = Quality.STANDARD
    tags: Optional[List[str]] = None


@corvane.event
class Play:
    event: corvane.EventData
    track: Track
    span: corvane.TimedData
    viewer: Optional[Viewer]


async def play(tracker: corvane.Tracker, title: str) -> None:
    own = tracker.chain("play")  # the tracks are played at the same time: each has its data to itself
    own.push(Track(title, random.choice(list(Quality))))
    with own.timed(Play):
        await asyncio.sleep(random.uniform(0.01, 0.05))


async def listen(sessions: corvane.Sessions, titles: List[str]) -> None:
    async with sessions.session():
        tracker = sessions.tracker.chain("player")
        tracker.push(Viewer("viewer-1", plan="family"))
        await asyncio.gather(*(play(tracker, title) for title in titles))
        logging.warning("that was all")  # an event as well


def main() -> int:
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0] if __doc__ else None)
    parser.add_argument("url", help="of the collector, such as http://127.0.0.1:8080/events")
    parser.add_argument("--directory", default="corvane-record", help="where what is not delivered stays (%(default)s)")
    parser.add_argument("--events", type=int, default=20, help="how many tracks are played (%(default)s)")
    arguments = parser.parse_args()

    corvane.set_documents_directory(arguments.directory)
    corvane.upload_in_process()  # it waits for its delivery, so nothing needs to go on when it has ended
    uploads = corvane.Uploads(corvane.Client("com.example.record", "Record", "1.0", 1), arguments.url, "main")
    with corvane.Sessions(uploads) as sessions:
        logging.getLogger().addHandler(corvane.EventHandler(sessions.tracker, level=logging.WARNING))
        asyncio.run(listen(sessions, [f"Étude No. {number}" for number in range(1, arguments.events + 1)]))

    report = uploads.wait(30, only_while_reachable=True)
    print(f"{report.delivered.events} events delivered, {report.pending.documents} documents pending")
    return 0 if report.delivered.documents and not report.pending.documents and not report.given_up.documents else 1


if __name__ == "__main__":
    try:
        sys.exit(main())
    except (corvane.Error, ValueError) as error:
        sys.exit(f"record.py: {error}")
