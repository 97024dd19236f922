"""What a program showed on a pseudo-terminal."""

import os


def read_to_end(leader):
    """All that was written to the other side, which must be closed by now, as bytes. One read may
    give a part only: the kernel passes it on when it finds the time."""
    shown = b""
    while True:
        try:
            shown += os.read(leader, 65536)
        except OSError:  # EIO: the end
            return shown
