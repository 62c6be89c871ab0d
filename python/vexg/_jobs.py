"""Job documents: chains of views as trees of nodes, and the steps of jobs."""

import functools
import json
import os
import threading
import weakref

import numpy

from . import _values
from ._library import library
from .errors import Error


class Node:
    """A command that opens a source or stands a view on others; nothing runs when one is made.

    Nodes are values: equal ones are the same object, so that a chain holds each once.

    Attributes:
        command: the class of the command.
        inputs: a tuple of (name, value); a value is a text, a Node or a tuple of Nodes.
        output: the output that gives the raster.
        keep: the Workspace of its file; None for none.
        recipe: the Drafts that made its file, in their order.
    """

    __slots__ = ("command", "inputs", "output", "keep", "recipe", "__weakref__", "_document")
    _known = weakref.WeakValueDictionary()
    _lock = threading.Lock()

    def __new__(cls, command, inputs, output="URI"):
        key = (command, inputs, output)
        with cls._lock:
            node = cls._known.get(key)
            if node is None:
                node = super().__new__(cls)
                node.command, node.inputs, node.output = key
                node.keep, node.recipe, node._document = None, (), None
                cls._known[key] = node
        return node

    def __reduce__(self):
        return Node, (self.command, self.inputs, self.output)

    def __hash__(self):
        return id(self) >> 4

    def __eq__(self, other):
        return self is other

    def below(self):
        """The nodes that it stands on."""
        for _, value in self.inputs:
            if isinstance(value, Node):
                yield value
            elif isinstance(value, tuple):
                yield from value

    def everything(self):
        """It and all nodes below it, each once, those below first."""
        found, waiting = {}, [(self, False)]
        while waiting:
            node, is_done = waiting.pop()
            if node in found:
                continue
            if is_done:
                found[node] = None
            else:
                waiting.append((node, True))
                waiting.extend((below, False) for below in node.below())
        return list(found)

    def document(self):
        """The job document that names the raster, in UTF-8."""
        if self._document is None:
            self._document = Draft().write([self], closes=False).encode()
        return self._document

    def with_sources(self, change):
        """The same chain on other sources: change(node) gives another node, or None to keep it."""
        made = {}
        for node in self.everything():
            changed = change(node)
            if changed is None:
                inputs = tuple((name, _exchange(value, made)) for name, value in node.inputs)
                same = inputs == node.inputs
                changed = node if same else type(node)(node.command, inputs, node.output)
            made[node] = changed
        return made[self]


def _exchange(value, made):
    if isinstance(value, Node):
        return made[value]
    if isinstance(value, tuple):
        return tuple(made[node] for node in value)
    return value


class ArrayNode(Node):
    """A source that is an array in memory."""

    __slots__ = ("array", "token", "rest")
    _tokens = iter(range(1, 1 << 62))

    def __new__(cls, array, geo_ref="", no_data=None):
        """
        Args:
            array: of bands, lines and samples; its memory is one block in some order of the axes.
            geo_ref: the text of its geo-reference; empty for none.
            no_data: a value for all bands, or None.
        """
        array, order = _as_block(array)
        token = next(cls._tokens)
        bands, lines, samples = array.shape
        rest = (f"SAMPLES={samples};LINES={lines};BANDS={bands};INTERLEAVE={order};PIXELTYPE="
                f"{_values.CODES[_values.type_word(array.dtype)]};PIXELSIZE=0,0;TIEPTMAP=0,0;COORDSYS= ")
        if no_data is not None:
            value = _values.number_text(no_data)
            rest += "|NODATA=" + ",".join(f"{band}:{value}" for band in range(bands))
        inputs = [("ConnStr", cls._conn_str(array, token, rest))]
        if geo_ref:
            inputs.append(("GeoRef", geo_ref))
        node = super().__new__(cls, "OpenRasterCommand", tuple(inputs), "URI")
        node.array, node.token, node.rest = array, token, (rest, geo_ref, no_data)
        return node

    @staticmethod
    def _conn_str(array, token, rest):
        # The name is another one for each array: memory is used again for other arrays.
        return f"MemoryRaster|PIXELDATA={hex(array.ctypes.data)};NAME=numpy{token};{rest}"

    def fresh(self):
        """The same array under another name, for work that must not find what was computed from its
        pixels before: a numpy array may change at any time."""
        _, geo_ref, no_data = self.rest
        return ArrayNode(self.array, geo_ref, no_data)

    def __reduce__(self):
        _, geo_ref, no_data = self.rest
        return ArrayNode, (self.array, geo_ref, no_data)


def _as_block(array):
    """The array itself, or a copy where its memory is not one block in some order of the axes, and
    the order: 0 BIP, 1 BIL, 2 BSQ."""
    for order, axes in ((2, (0, 1, 2)), (0, (1, 2, 0)), (1, (1, 0, 2))):
        if array.transpose(axes).flags.c_contiguous and array.dtype.isnative and array.flags.aligned:
            return array, order
    return numpy.ascontiguousarray(array, dtype=array.dtype.newbyteorder("=")), 2


class Draft:
    """A job document in the making. Its steps run one after the other, each whatever became of those
    before it, and what they open is closed at its end.

    Attributes:
        steps: tuples of name, command, inputs and outputs.
    """

    def __init__(self):
        self.steps = []

    def step(self, name, command, inputs, outputs=None):
        """Adds a command.

        Args:
            inputs: a dictionary of values; None leaves an input out, a Node is opened first, and a text
                that begins with a dollar sign is a variable.
            outputs: a dictionary from outputs to variables, without the dollar sign.
        """
        self.steps.append((name, command, dict(inputs), dict(outputs or {})))

    def extend(self, other, prefix):
        """Adds the steps of another draft, whose names and variables get a prefix."""
        def renamed(value):
            return f"${prefix}{value[1:]}" if isinstance(value, str) and value.startswith("$") else value

        for name, command, inputs, outputs in other.steps:
            self.steps.append((prefix + name, command, {key: renamed(value) for key, value in inputs.items()},
                               {key: prefix + variable for key, variable in outputs.items()}))

    def nodes(self):
        """The nodes that its steps work on."""
        for _, _, inputs, _ in self.steps:
            for value in inputs.values():
                if isinstance(value, Node):
                    yield value
                elif isinstance(value, (tuple, list)):
                    yield from (each for each in value if isinstance(each, Node))

    def write(self, opened=(), closes=True, channel=""):
        """The document.

        Args:
            opened: nodes that are opened behind the steps.
            closes: whether what was opened is closed at the end.
            channel: the element of a channel, for a server.
        """
        writer = _Writer()
        for step in self.steps:
            writer.add(*step)
        for node in opened:
            writer.open(node)
        if closes:
            writer.close()
        return f'<Job Checks="Strict"><Reasons/>{channel}{"".join(writer.commands)}</Job>'

    def command_of(self, step):
        """The class of the command of a step; empty for one that opens or closes."""
        return next((command for name, command, _, _ in self.steps if name == step), "")


class _Writer:
    """Writes the commands of a document."""

    def __init__(self):
        self.commands = []
        self._last = None
        self._opened = {}  # variables by node

    def add(self, name, command, inputs, outputs):
        """Adds a command, behind those that open what it works on."""
        parts, kinds = [], None
        for key, value in inputs.items():
            if value is None:
                continue
            if isinstance(value, Node):
                parts.append(f'<Input {key}="{self.open(value)}"/>')
                continue
            if isinstance(value, (tuple, list)) and value and isinstance(value[0], Node):
                variables = " ".join([self.open(node) for node in value])
                parts.append(f'<Input expand="1" {key}="{variables}"/>')
                continue
            if not isinstance(value, str):
                kinds = kinds if kinds is not None else input_kinds(command)
                value = _values.text_of(value, kinds.get(key, ""))
            parts.append(f'<Input {key}="{_values.escape(value)}"/>')
        for key, variable in outputs.items():
            parts.append(f'<Output {key}="${variable}"/>')
        depends = f'<DependsOn Name="{self._last}"/>' if self._last is not None else ""
        self.commands.append(f'<Command Name="{name}" ID="{command}">{depends}{"".join(parts)}</Command>')
        self._last = name

    def open(self, node):
        """Adds the commands that open a chain; gives the variable of its raster."""
        for each in node.everything():
            if each not in self._opened:
                name = f"n{len(self._opened)}"
                self.add(f"{name}.{each.command}", each.command, dict(each.inputs), {each.output: name})
                self._opened[each] = f"${name}"
        return self._opened[node]

    def close(self):
        """Adds the commands that close all that was opened, the last one first."""
        for variable in reversed(self._opened.values()):
            self.add("close." + variable[1:], "CloseRasterCommand", {"URI": variable}, {})


class Results:
    """The results of a job by the names of its steps."""

    def __init__(self, document, draft):
        import xml.etree.ElementTree as ElementTree  # not needed before the first job

        self._draft = draft
        self._returns = {}
        failed = None
        root = ElementTree.fromstring(document)
        for fault in root.findall("Fault"):
            raise Error(fault.get("Reason", "the document is wrong"))
        for command in root.findall("Command"):
            name, result = command.get("Name", ""), command.get("Result")
            returned = command.find("Return")
            self._returns[name] = {} if returned is None else dict(returned.attrib)
            if result == "Success":
                continue
            reason = command.get("Reason", "aborted" if result == "Aborted" else "failed")
            # A step that was skipped has failed for another one, which stands before it.
            if failed is None:
                failed = Error(reason, draft.command_of(name) or name.partition(".")[2], name)
        if failed is not None:
            raise failed

    def text(self, step, output, otherwise=""):
        """An output as text; `otherwise` for one that wasn't given."""
        return self._returns.get(step, {}).get(output, otherwise)

    def value(self, step, output, otherwise=None):
        """An output as a value of its kind."""
        text = self._returns.get(step, {}).get(output)
        if text is None:
            return otherwise
        kinds = output_kinds(self._draft.command_of(step))
        return _values.value_of(text, kinds.get(output, ""))

    def values(self, step):
        """All outputs of a step as a dictionary."""
        return {output: self.value(step, output) for output in self._returns.get(step, {})}


@functools.lru_cache(maxsize=1)
def declarations():
    """What all commands declare, by their classes."""
    return {command["name"]: command for command in json.loads(library.commands())}


def input_kinds(command):
    """The kinds of the inputs of a command."""
    return {entry["name"]: entry["kind"] for entry in declarations().get(command, {}).get("inputs", ())}


def output_kinds(command):
    """The kinds of the outputs of a command."""
    return {entry["name"]: entry["kind"] for entry in declarations().get(command, {}).get("outputs", ())}


def named_inputs(command, options):
    """Options by Python names as inputs of a command: min_size becomes MinSize, and words are found
    in any case. Raises TypeError for a name that the command doesn't have."""
    inputs = declarations()[command]["inputs"]
    by_name = {entry["name"].lower(): entry for entry in inputs}
    found = {}
    for name, value in options.items():
        entry = by_name.get(name.replace("_", "").lower())
        if entry is None:
            raise TypeError(f"{command} has no input for the option {name!r}")
        if entry["words"] and isinstance(value, str):
            value = {word.lower(): word for word in entry["words"]}.get(value.lower(), value)
        found[entry["name"]] = value
    return found


def name_of(file):
    """The name of a file as a text. Raises Error for one that a document can't carry."""
    text = os.fspath(file)
    try:
        text.encode()
    except (UnicodeEncodeError, AttributeError):
        raise Error(f"{file!r}: the name is no UTF-8") from None
    return text


def source_node(file, format=None, levels="Best", **pieces):
    """The node that opens a file, with the pyramid file beside it.

    Args:
        file: a path, an address, or a connection string with pieces behind bars.
        pieces: further ones as NAME=VALUE.
    """
    text = name_of(file)
    name, _, rest = text.partition("|")
    if not name:
        raise ValueError("a file's name is empty")
    if "://" not in name and ":" not in name.split("/")[0]:
        name = os.path.abspath(name)
    conn = ([format] if format else []) + (["EXTERNAL"] if name.endswith(".vmosaic") and not format else [])
    conn += [name] + ([rest] if rest else []) + [f"{key.upper()}={value}" for key, value in pieces.items()]
    inputs = [("ConnStr", "|".join(conn)), ("CheckSource", "Compared")]
    if not rest and not pieces and os.path.isfile(name + ".pyr"):
        inputs += [("PyramidConnStr", f"Pyramid|{name}.pyr"), ("PyramidCheck", "Fitting"), ("Levels", levels)]
    return Node("OpenRasterCommand", tuple(inputs))


def files_of(node):
    """The files that the sources of a chain name."""
    found = []
    for each in node.everything():
        if each.command == "OpenRasterCommand" and not isinstance(each, ArrayNode):
            for piece in dict(each.inputs)["ConnStr"].split("|"):
                if "/" in piece and "=" not in piece:
                    found.append(piece)
    return found
