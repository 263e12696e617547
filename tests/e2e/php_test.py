#!/usr/bin/env python3
"""A client in PHP."""

import os
import unittest

from doors import ClientTest, Scenes


class Php(Scenes, ClientTest):
    command = ("php", os.path.join(os.path.dirname(os.path.abspath(__file__)), "clients", "story.php"))


if __name__ == "__main__":
    unittest.main()
