"""What a case is: a function of the running machine, with a name that reads as a sentence.

    @case()
    def an_unplugged_disk_is_gone_within_seconds(machine): ...

    @case(waits_for="what must be there first")
    def ...

    @case(full=True)
    def ...

A case that waits is not run; the run says so, with the reason. One that is for a full run alone takes long, and is left
out of others. `expect` has the assertions of unittest."""

import unittest

expect = unittest.TestCase()
expect.maxDiff = None


class Case:
    """One case; `name` is what it is chosen by and told by."""

    def __init__(self, function, waits_for, full=False):
        self.sentence = function.__name__.replace("_", " ")
        self.file = function.__module__.rpartition(".")[2]
        self.name = f"{self.file}: {self.sentence}"
        self.waits_for = waits_for
        self.full = full
        self.run = function


def case(waits_for=None, full=False):
    def mark(function):
        function.case = Case(function, waits_for, full)
        return function
    return mark


def cases_of(module):
    """In the order in which they stand in their file."""
    return [value.case for value in vars(module).values() if isinstance(getattr(value, "case", None), Case)
            and value.__module__ == module.__name__]


def chosen(cases, words):
    """Those that have the words in their names; spaces and underscores are the same."""
    wanted = words.replace("_", " ").lower()
    return [one for one in cases if wanted in one.name.replace("_", " ").lower()]
