# SPDX-License-Identifier: MIT
"""Work that the caller shares with threads of its own."""
import collections
import os
import threading

from lumra import _lumra


def useful_threads(threads):
    """How many of the threads that are wanted, None for any, have a processor."""
    processors = len(os.sched_getaffinity(0))
    return min(_lumra.number_of_threads(threads) or processors, processors)


def share(works):
    """What the works give, in their order. They are called with a function that says whether nobody wants them any more,
    by the caller and by a thread for each other work; where no thread begins, the caller does them all.
    """
    left, given, failures = collections.deque(enumerate(works)), {}, []

    def take_turns():
        while left and not failures:
            try:
                number, work = left.popleft()
            except IndexError:  # another was first
                return
            try:
                given[number] = work(lambda: bool(failures))
            except BaseException as reason:  # of any thread: the caller raises it
                failures.append(reason)

    others = []
    try:
        try:
            for _ in works[1:]:
                thread = threading.Thread(target=take_turns)
                thread.start()
                others.append(thread)
        except RuntimeError:  # the system or an interpreter that ends refuses it
            pass
        take_turns()
        for thread in others:
            thread.join()
    except BaseException as reason:  # of a signal
        failures.append(reason)
        for thread in others:
            thread.join()
        raise
    if failures:
        raise failures[0]
    return [given[number] for number in range(len(works))]
