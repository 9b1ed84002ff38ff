"""``python3 -m tova COMMAND ...``: the package's commands, which the
``tova`` tool hands over to Python. Each command is a module with
``main(argv) -> exit status``; ``COMMANDS`` lists them."""

from __future__ import annotations

import importlib
import sys

# name -> (module, one line of help)
COMMANDS = {
    "convert": ("tova.convert", "convert between netCDF (CF) and gridded data files"),
    "plot": ("tova.plot", "picture of an item at a time step (PNG)"),
}


def main(argv=None) -> int:
    argv = list(sys.argv[1:] if argv is None else argv)
    if not argv or argv[0] in ("-h", "--help"):
        lines = [f"  {name:10s} {text}" for name, (_, text) in COMMANDS.items()]
        print("usage: python3 -m tova COMMAND [ARGS...]\n\ncommands:\n" + "\n".join(lines))
        return 0 if argv else 2
    command = COMMANDS.get(argv[0])
    if command is None:
        print(f"tova: unknown command {argv[0]!r} ({', '.join(COMMANDS)})", file=sys.stderr)
        return 2
    return importlib.import_module(command[0]).main(argv[1:])


if __name__ == "__main__":
    sys.exit(main())
