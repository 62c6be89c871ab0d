"""All commands of the library as functions, by their names.

    from vexg import commands

    commands.GetBasicRasterStatsCommand(URI=scene, Wait="Always")["Mean"]

A function takes the inputs of its command by name, as keyword arguments, and gives its outputs as a
dictionary. A Raster may stand where a URI is asked for; it is open while the command runs. A URI that a
command gives stays open until CloseRasterCommand closes it. `commands.pyi` has them all for editors, with
what they mean; docs/commands.md for people.
"""

from . import _values
from ._doors import job_node, local
from ._jobs import Draft, declarations
from ._watch import watch


def run(command, *, server=None, progress=False, **inputs):
    """Runs one command.

    Args:
        command: its class.
        server: a Server that runs it, in place of this process.
        progress: True for a bar, or a function that gets the fraction done.
    """
    from .raster import Raster

    known = declarations().get(command)
    if known is None:
        raise AttributeError(f"there is no command {command}")
    names = {entry["name"] for entry in known["inputs"]}
    for name in inputs:
        if name not in names:
            raise TypeError(f"{command} has no input {name}; there are {', '.join(sorted(names)) or 'none'}")
    missing = [entry["name"] for entry in known["inputs"] if entry["required"] and inputs.get(entry["name"]) is None]
    if missing:
        raise TypeError(f"{command} needs {', '.join(missing)}")

    kinds = {entry["name"]: entry["kind"] for entry in known["inputs"]}

    def opened(name, value):
        if kinds[name] == "URI" and isinstance(value, str) and not value.startswith("["):
            return _values.uri_text(value)
        if isinstance(value, Raster):
            return job_node(value._chain())
        if isinstance(value, (list, tuple)) and value and isinstance(value[0], Raster):
            return [job_node(raster._chain()) for raster in value]
        return value

    draft = Draft()
    draft.step("command", command, {name: opened(name, value) for name, value in inputs.items()})
    door = local if server is None else server._door
    return watch(lambda task: door.run(draft, task), progress, command).values("command")


def __getattr__(name):
    if name.startswith("__"):
        raise AttributeError(name)
    known = declarations().get(name)
    if known is None:
        raise AttributeError(f"there is no command {name}")

    def call(*, server=None, progress=False, **inputs):
        return run(name, server=server, progress=progress, **inputs)

    call.__name__ = call.__qualname__ = name
    call.__doc__ = _text_of(known)
    globals()[name] = call
    return call


def __dir__():
    return sorted({*globals(), *declarations()})


def _text_of(known):
    """The help of a command."""
    lines = [known["meaning"]]
    for title, entries in (("Args", known["inputs"]), ("Returns", known["outputs"])):
        if entries:
            lines += ["", f"{title}:"]
        for entry in entries:
            unit = f" in {entry['unit']}" if entry["unit"] else ""
            need = ", required" if entry.get("required") else ""
            lines.append(f"    {entry['name']}: {entry['kind']}{unit}{need}: {entry['meaning']}")
    return "\n".join(lines)
