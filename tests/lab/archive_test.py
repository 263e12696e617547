#!/usr/bin/env python3
"""An archive holds what was put into it, in the order in which the kernel can unpack it."""

import io
import stat
import tempfile
import unittest

import archive


def entries(data):
    """[(path, mode, content)] of an archive, up to its end."""
    at, found = 0, []
    while True:
        fields = [int(data[at + 6 + 8 * i:at + 14 + 8 * i], 16) for i in range(13)]
        assert data[at:at + 6] == b"070701"
        name_end = at + 110 + fields[11]
        start = name_end + -name_end % 4
        name = data[at + 110:name_end - 1].decode()
        if name == "TRAILER!!!":
            return found
        found.append((name, fields[1], data[start:start + fields[6]]))
        at = start + fields[6] + -fields[6] % 4


def written(image):
    out = io.BytesIO()
    image.write(out)
    return entries(out.getvalue())


class Archives(unittest.TestCase):
    def test_hold_texts_links_and_folders(self):
        image = archive.Archive()
        image.text("init", "hello", 0o755)
        image.link("bin", "usr/bin")
        image.folder("proc")
        self.assertEqual(written(image), [("bin", stat.S_IFLNK | 0o777, b"usr/bin"),
                                          ("init", stat.S_IFREG | 0o755, b"hello"),
                                          ("proc", stat.S_IFDIR | 0o755, b"")])

    def test_have_folders_before_what_is_in_them(self):
        image = archive.Archive()
        image.text("usr/lib/a/b", "")
        self.assertEqual([path for path, _, _ in written(image)], ["usr", "usr/lib", "usr/lib/a", "usr/lib/a/b"])

    def test_hold_contents_of_any_length(self):
        image = archive.Archive()
        for length in range(9):
            image.text(f"f{length}", "x" * length)
        self.assertEqual([len(content) for _, _, content in written(image)], list(range(9)))

    def test_take_files_with_their_modes(self):
        with tempfile.NamedTemporaryFile() as file:
            file.write(b"\0binary\xff")
            file.flush()
            image = archive.Archive()
            image.file("f", file.name)
            self.assertEqual(written(image), [("f", stat.S_IFREG | 0o600, b"\0binary\xff")])

    def test_know_what_they_hold(self):
        image = archive.Archive()
        image.text("usr/bin/a", "")
        self.assertIn("usr/bin", image)
        self.assertNotIn("usr/bin/b", image)


if __name__ == "__main__":
    unittest.main()
