"""What an event costs from Python; see scripts/bench-languages, and measure_languages.cpp for the same work.

Prints nanoseconds of the caller for data that is pushed and an event that is submitted (the median of bursts of 1,000,
between which the queue comes to rest), and microseconds of CPU for each until it is processed.
"""

import statistics
import time

import corvane

BURSTS, BURST = 100, 1000


@corvane.data
class Screen:
    name: str
    depth: int = 0
    ratio: float = 0.0


@corvane.event
class ScreenView:
    event: corvane.EventData
    screen: Screen


accepted = 0


def count(event: object, error: object) -> None:
    global accepted
    accepted += event is not None


sessions = corvane.Sessions()
tracker = sessions.tracker.chain("player")
nanoseconds = []
cpu = 0
for _ in range(BURSTS):
    with sessions.session():
        begun, begun_cpu = time.perf_counter_ns(), time.process_time_ns()
        for i in range(BURST):
            tracker.push(Screen("home", i, 0.5), unique=True)
            tracker.submit(ScreenView)
        nanoseconds.append((time.perf_counter_ns() - begun) / BURST)
        sessions.end_and_wait()
        cpu += time.process_time_ns() - begun_cpu
with sessions.session():
    tracker.submit(ScreenView, count)
assert accepted == 1
print(f"{statistics.median(nanoseconds):.1f} {cpu / (BURSTS * BURST) / 1000:.3f}")
