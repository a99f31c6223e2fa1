"""A program on a pseudo-terminal of a given width."""

import fcntl
import os
import pty
import struct
import termios

from device import plain_environment

LANGUAGES = ("C", "de_DE.UTF-8", "ja_JP.UTF-8")


def on_terminal(*command, columns=80, environment=None):
    """The program's exit status, and all that it wrote to the terminal."""
    arguments = [str(word) for word in command]
    child, terminal = pty.fork()
    if child == 0:
        fcntl.ioctl(0, termios.TIOCSWINSZ, struct.pack("HHHH", 24, columns, 0, 0))
        os.execvpe(arguments[0], arguments, {**plain_environment(), "TERM": "xterm", **(environment or {})})
    shown = b""
    while True:
        try:
            shown += os.read(terminal, 65536)
        except OSError:
            break
    os.close(terminal)
    status = os.waitstatus_to_exitcode(os.waitpid(child, 0)[1])
    return status, shown.decode().replace("\r\n", "\n")
