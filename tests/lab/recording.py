"""A tree of files in one text: what a kernel shows under /sys and /proc, for tests that need it without the kernel.

One line per entry, sorted by path; lines that start with # are comments:

    file PATH CONTENT       the content to the end of the line
    link PATH TARGET
    dir PATH                a folder with nothing in it

Paths have no leading slash and no space. In contents, \\n is the end of a line, \\\\ a backslash, and \\xNN any byte
that is not printable ASCII, and a space at the very end."""

import os

ESCAPES = {ord("\n"): "\\n", ord("\\"): "\\\\"}


def escape(content):
    text = "".join(ESCAPES.get(byte) or (chr(byte) if 0x20 <= byte < 0x7F else f"\\x{byte:02x}") for byte in content)
    return text[:-1] + "\\x20" if text.endswith(" ") else text


def lines(root):
    """The entries of what stands in a folder."""
    found = []
    for folder, folders, files in os.walk(root):
        for name in folders + files:
            line = entry(root, os.path.relpath(os.path.join(folder, name), root))
            if line:
                found.append(line)
    return sorted(found, key=lambda line: line.split(" ")[1])


def entry(root, path):
    """The line of a path; none of a folder that has something in it."""
    full = os.path.join(root, path)
    if " " in path or "\n" in path:
        raise ValueError(f"a path that cannot be recorded: {path}")
    if os.path.islink(full):
        return f"link {path} {os.readlink(full)}"
    if os.path.isdir(full):
        return None if os.listdir(full) else f"dir {path}"
    with open(full, "rb") as file:
        return f"file {path} {escape(file.read())}".rstrip(" ")


def write(root, title, path):
    head = [title, "Recorded in the lab by tests/lab/record.py, which says what is taken; tests/lab/recording.py tells",
            "the format: file PATH CONTENT, link PATH TARGET, dir PATH; escapes are \\n, \\\\ and \\xNN."]
    with open(path, "w", encoding="utf-8") as file:
        file.writelines(f"# {line}\n" for line in head)
        file.writelines(f"{line}\n" for line in lines(root))
