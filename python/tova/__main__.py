"""``python -m tova COMMAND ...``: the commands of the package that the
``tova`` tool hands over to Python. Each is a module of the package with a
``main(argv)`` that returns the exit status."""

import importlib
import sys

# Command -> module (relative to the package) and a line for the listing.
COMMANDS = {
    "plot": (".plot", "picture of an item at a time step (PNG)"),
}


def main(argv=None) -> int:
    argv = sys.argv[1:] if argv is None else list(argv)
    if not argv or argv[0] not in COMMANDS:
        listing = "\n".join(f"  {name:8} {line}" for name, (_, line) in COMMANDS.items())
        print(f"usage: python -m tova COMMAND ...\ncommands:\n{listing}", file=sys.stderr)
        return 2
    module = importlib.import_module(COMMANDS[argv[0]][0], __package__ or "tova")
    return module.main(argv[1:])


if __name__ == "__main__":
    sys.exit(main())
