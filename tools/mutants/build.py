"""What a build knows: how a file of it is compiled, how its test programs are linked."""

import functools
import json
import os
import re
import shlex
import subprocess
from pathlib import Path

COMPILERS = ("c++", "g++", "clang++")
INCLUDE = re.compile(r'^\s*#\s*include\s+([<"][^>"]+[>"])', re.MULTILINE)


class Build:
    """A build folder whose programs are up to date. `room` is the folder of the sources that are changed."""

    def __init__(self, root, folder, room, programs):
        self.root, self.folder, self.room = Path(root), Path(folder), room
        with open(self.folder / "compile_commands.json", encoding="utf-8") as file:
            entries = json.load(file)
        self._entries = {os.path.relpath(entry["file"], self.root): entry for entry in entries}
        self._links = {program: self._link_words(program) for program in programs}
        self._header = None

    def files(self, *suffixes):
        """The sources of the room that are no tests, as paths from the root."""
        found = (path for suffix in suffixes for path in (self.root / self.room).rglob("*" + suffix))
        return sorted(str(path.relative_to(self.root)) for path in found if not path.stem.endswith("_test"))

    def text(self, file):
        return (self.root / file).read_text(encoding="utf-8")

    # ---- compiling

    def flags(self, file):
        """The compiler and its flags, without what says where to write and what is only advice."""
        words = shlex.split(self._entries[file]["command"])
        while os.path.basename(words[0]) not in COMPILERS and not words[0].endswith(tuple("/" + c for c in COMPILERS)):
            words.pop(0)
        kept, skip = [], False
        for word in words:
            skip_next = word in ("-o", "-MT", "-MF", "-include")  # a precompiled header fits only the build's own flags
            if not (skip or skip_next or word in ("-c", "-MD") or word.startswith(("-W", "-O", "-g"))):
                kept.append(word)
            skip = skip_next
        return kept[:-1] + ["-w", "-g0"]

    def object_of(self, file):
        """Where the build puts the file's object, as its commands name it."""
        words = shlex.split(self._entries[file]["command"])
        return words[words.index("-o") + 1]

    def compile(self, file, source, output, headers=None, level="-O0"):
        """Compiles the source in the way of the file; headers are looked for in the folder `headers` first. What
        the compiler says; None when it is content."""
        compiler, *flags = self.flags(file)
        first = [f"-I{headers}"] if headers else []
        included = ["-include", self._header] if self._header and level == "-O0" else []
        command = [compiler, *first, *flags, level, *included, "-c", source, "-o", output]
        result = subprocess.run(list(map(str, command)), cwd=self.folder, capture_output=True, text=True, check=False)
        return result.stderr if result.returncode != 0 else None

    def precompile(self, folder):
        """Compiles once what the room's sources include from elsewhere."""
        own = f'"{self.room}/'
        included = sorted({name for file in self.files(".cpp", ".h") for name in INCLUDE.findall(self.text(file))
                           if not name.startswith(own)})
        header = Path(folder) / "included.h"
        header.write_text("".join(f"#include {name}\n" for name in included), encoding="utf-8")
        some_file = next(file for file in self.files(".cpp") if file in self._entries)
        command = [*self.flags(some_file), "-O0", "-x", "c++-header", header, "-o", f"{header}.gch"]
        subprocess.run(list(map(str, command)), cwd=self.folder, check=True)
        self._header = header

    def users_of(self, header):
        """The files of the room, tests that include it themselves among them, that must be compiled with it."""
        own = (file for file in self._entries if file.startswith(self.room + "/"))
        return [file for file in own if header in (
            self._own_includes(file) if file.endswith("_test.cpp") else self._included_by(file, set()))]

    def _included_by(self, file, seen):
        for path in self._own_includes(file):
            if path not in seen:
                seen.add(path)
                self._included_by(path, seen)
        return seen

    @functools.cache
    def _own_includes(self, file):
        quoted = (name.strip('"') for name in INCLUDE.findall(self.text(file)) if name.startswith('"'))
        return [path for path in quoted if (self.root / path).exists()]

    # ---- linking

    def program(self, name):
        """Where the build has put the program."""
        words = self._links[name]
        return self.folder / words[words.index("-o") + 1]

    def link(self, program, objects, output):
        """Links the program with other objects for some files. What the linker says; None when it is content."""
        replaced = {self.object_of(file): str(path) for file, path in objects.items()}
        words = [replaced.pop(word, word) for word in self._links[program]]
        words[words.index("-o") + 1] = str(output)
        words[1:1] = replaced.values()  # what the program takes from an archive it takes from these first
        result = subprocess.run([*words, "-fuse-ld=lld", "-Wl,--strip-all"], cwd=self.folder, capture_output=True,
                                text=True, check=False)
        return result.stderr if result.returncode != 0 else None

    def _link_words(self, program):
        """The linker's part of the build's last command for the program, which may stand between others."""
        commands = subprocess.run(["ninja", "-C", self.folder, "-t", "commands", program], check=True,
                                  capture_output=True, text=True).stdout
        for part in commands.splitlines()[-1].split("&&"):
            words = shlex.split(part)
            if "-o" in words and words[words.index("-o") + 1].endswith(program):
                return words
        raise ValueError(f"no command that links {program}")
