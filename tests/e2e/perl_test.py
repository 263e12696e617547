#!/usr/bin/env python3
"""A client in Perl."""

import os
import unittest

from doors import ClientTest, Scenes


class Perl(Scenes, ClientTest):
    command = ("perl", os.path.join(os.path.dirname(os.path.abspath(__file__)), "clients", "story.pl"))


if __name__ == "__main__":
    unittest.main()
