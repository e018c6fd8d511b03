"""What programs show on a terminal."""

import os


def pieces(terminal):
    """What comes to the terminal, as it comes, until no program has it any more."""
    while True:
        try:
            piece = os.read(terminal, 65536)
        except OSError:
            return
        if not piece:
            return
        yield piece
