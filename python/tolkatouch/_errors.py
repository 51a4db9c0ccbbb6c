"""Errors as the command line prints them, for the package's command-line modules (no plotting
library imported, so that a module that prints no figure starts quickly)."""

from __future__ import annotations


def printable(text: str) -> str:
    """Control characters shown escaped, so that nothing quoted reaches the terminal as a command."""
    return "".join(f"\\x{ord(c):02x}" if ord(c) < 0x20 or ord(c) == 0x7F else c for c in text)


def error_lines(error: BaseException) -> str:
    """An error as the command line prints it: each line printable, a document's reason and
    position on a second line."""
    return "\n".join(printable(line) for line in str(error).split("\n"))
