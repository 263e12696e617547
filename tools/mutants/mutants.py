#!/usr/bin/env python3
"""Changes the plug-in one place at a time and tells which changes its tests do not see.

    mutants.py BUILD_DIR TEST_PROGRAM... [--all] [--file PATH...] [--count N] [--jobs N]

The sources stay as they are: a changed copy is compiled, the test programs are linked with it and run. Places
are drawn by a seed, which is printed; KOVA_SEED brings a draw back. Status 1: a change survived that
equivalent.toml does not explain, or the list explains one that a test sees.
"""

import argparse
import os
import random
import resource
import shutil
import sys
import time
from collections import Counter
from concurrent.futures import ThreadPoolExecutor, as_completed
from pathlib import Path

import kept
import testrun
from build import Build
from places import changed, places_of

HERE = Path(__file__).resolve().parent
ROOT = HERE.parent.parent
ROOM = "kova/agentd"
KEPT = HERE / "equivalent.toml"
KILLED, SURVIVED, SAME_CODE, INVALID = "killed", "survived", "the same code", "does not compile"


class Trials:
    """Tries changes, each in a folder of its own."""

    def __init__(self, build, folder, programs):
        self._build, self._folder, self._unit_tests = build, folder, programs[0]
        self._order = testrun.Order(build.root, build.room)
        build.precompile(folder)
        self._limits = {name: 10 + 5 * testrun.whole_run(build.program(name), folder) for name in programs}

    def run(self, number, place):
        """The verdict on one place, and which test gave it."""
        folder = self._folder / str(number)
        folder.mkdir()
        try:
            return self._verdict(place, folder)
        finally:
            shutil.rmtree(folder)

    def _verdict(self, place, folder):
        source = folder / place.file
        source.parent.mkdir(parents=True)
        source.write_text(changed(self._build.text(place.file), place.edits), encoding="utf-8")
        objects = self._compiled(place, folder)
        if objects is None:
            return INVALID, ""
        for name in self._limits:
            if self._build.link(name, self._objects_of(name, objects), folder / name) is not None:
                return INVALID, ""
            why = self._failing_test(place, folder, name)
            if why is not None:
                return KILLED, why
        return (SAME_CODE if self._is_same_code(place, folder) else SURVIVED), ""

    def _compiled(self, place, folder):
        """The objects that the change makes other ones; None when the compiler refuses it."""
        objects = {}
        is_header = place.file.endswith(".h")
        for file in self._build.users_of(place.file) if is_header else [place.file]:
            source = self._build.root / file if is_header else folder / file
            objects[file] = folder / f"{len(objects)}.o"
            if self._build.compile(file, source, objects[file], folder if is_header else None) is not None:
                return None
        return objects

    def _objects_of(self, name, objects):
        """Those of the objects that belong into the program: unit tests stand in no other."""
        return {file: path for file, path in objects.items()
                if name == self._unit_tests or not file.endswith("_test.cpp")}

    def _failing_test(self, place, folder, name):
        first = self._order.first(place.file) if name == self._unit_tests else ""
        for chosen in filter(None, (first, f"-{first}" if first else "*")):
            outcome = testrun.run(folder / name, chosen, folder, self._limits[name])
            if outcome.failed:
                if name == self._unit_tests:
                    self._order.learn(place.file, outcome.why)
                return outcome.why
        return None

    def _is_same_code(self, place, folder):
        """Whether an optimizing compiler makes the same of it: then there is nothing to see."""
        if place.file.endswith(".h"):
            return False
        codes = []
        for name, source in (("before", self._build.root / place.file), ("after", folder / place.file)):
            output = folder / f"{name}.o"
            if self._build.compile(place.file, source, output, level="-O2") is not None:
                return False
            codes.append(output.read_bytes())
        return codes[0] == codes[1]


def all_places(build):
    return [place for file in build.files(".cpp", ".h") for place in places_of(file, build.text(file))]


def is_under(file, paths):
    return any(file == path or file.startswith(path.rstrip("/") + "/") for path in paths)


def chosen_places(places, options, seed):
    """The places to try; the seed mixes them also where all are tried, so that like ones do not crowd."""
    if options.file:
        places = [place for place in places if is_under(place.file, options.file)]
        if not places:
            raise SystemExit(f"there is nothing to change in {', '.join(options.file)}")
    chosen = list(places)
    random.Random(seed).shuffle(chosen)
    return chosen if options.all or options.file else chosen[:options.count]


def show(place, verdict, note=""):
    print(f"{place.file}:{place.line}: {place.function}: {place.kind}: {verdict}")
    print(f"  - {place.before}\n  + {place.after}")
    if note:
        print(f"  ({note})")
    sys.stdout.flush()


def judge(place, verdict, why, explained):
    """The verdict in the light of the kept list, and whether it is a bad one; tells of it if it needs a word."""
    entry = explained.get(place.key())
    if entry and verdict == KILLED:
        show(place, f"is kept as equivalent, but {why} sees it", entry["why"])
        return KILLED, True
    if entry and verdict == SURVIVED:
        show(place, "equivalent", entry["why"])
        return "equivalent", False
    if verdict == SURVIVED:
        show(place, verdict)
    return verdict, verdict == SURVIVED


def try_all(trials, chosen, explained, options):
    """Tries the places; the verdicts counted, and how many are bad. All are written to a file."""
    counts, bad = Counter(), 0
    with ThreadPoolExecutor(options.jobs) as pool, open(options.build / "verdicts", "w", encoding="utf-8") as file:
        waiting = {pool.submit(trials.run, number, place): place for number, place in enumerate(chosen)}
        try:
            for done, future in enumerate(as_completed(waiting), 1):
                place, (verdict, why) = waiting[future], future.result()
                verdict, is_bad = judge(place, verdict, why, explained)
                counts[verdict] += 1
                bad += is_bad
                at = f"{place.file}:{place.line}"
                print(verdict, why, at, place.kind, place.before, place.after, sep="\t", file=file)
                if done % 50 == 0:
                    print(f"{done} of {len(chosen)} tried", file=sys.stderr, flush=True)
        except BaseException:
            pool.shutdown(wait=False, cancel_futures=True)
            raise
    return counts, bad


def summary(counts, chosen, places, start):
    used = resource.getrusage(resource.RUSAGE_CHILDREN)
    seconds = used.ru_utime + used.ru_stime
    parts = ", ".join(f"{count} {verdict}" for verdict, count in counts.most_common())
    return (f"{len(chosen)} of {len(places)} places: {parts}. {time.monotonic() - start:.0f} s, "
            f"{seconds / max(1, len(chosen)):.1f} s of processor time each")


def options_of(arguments):
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("build", type=Path)
    parser.add_argument("tests", nargs="+", help="programs of the build; the unit tests come first")
    parser.add_argument("--all", action="store_true", help="every place")
    parser.add_argument("--file", nargs="+", help="every place of these files or folders")
    parser.add_argument("--count", type=int, default=200, help="places to draw")
    parser.add_argument("--jobs", type=int, default=os.cpu_count())
    return parser.parse_args(arguments)


def main(arguments):
    options, start = options_of(arguments), time.monotonic()
    options.build = options.build.resolve()
    seed = int(os.environ.setdefault("KOVA_SEED", str(random.randrange(1 << 31))))
    print(f"KOVA_SEED={seed}", flush=True)
    build = Build(ROOT, options.build, ROOM, options.tests)
    places, explained = all_places(build), kept.read(KEPT)
    kept.check(explained, places)
    chosen = chosen_places(places, options, seed)
    folder = build.folder / "mutants"
    shutil.rmtree(folder, ignore_errors=True)
    folder.mkdir()
    counts, bad = try_all(Trials(build, folder, options.tests), chosen, explained, options)
    print(summary(counts, chosen, places, start))
    return 1 if bad else 0


if __name__ == "__main__":
    try:
        sys.exit(main(sys.argv[1:]))
    except kept.Faulty as fault:
        sys.exit(f"{KEPT}: {fault}")
