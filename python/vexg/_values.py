"""The text forms of values in job and result documents (docs/job-documents.md)."""

import math
import os

import numpy

DTYPES = {
    "Byte": numpy.dtype("uint8"),
    "Char": numpy.dtype("int8"),
    "UInt16": numpy.dtype("uint16"),
    "Int16": numpy.dtype("int16"),
    "UInt32": numpy.dtype("uint32"),
    "Int32": numpy.dtype("int32"),
    "Single": numpy.dtype("float32"),
    "Double": numpy.dtype("float64"),
    "UInt64": numpy.dtype("uint64"),
    "Int64": numpy.dtype("int64"),
    "ComplexSingle": numpy.dtype("complex64"),
    "ComplexDouble": numpy.dtype("complex128"),
}
"""The numpy type of each pixel type."""

CODES = {
    "Byte": 1, "Int16": 2, "Int32": 3, "Single": 4, "Double": 5, "ComplexSingle": 6,
    "ComplexDouble": 9, "UInt16": 12, "UInt32": 13, "Int64": 14, "UInt64": 15, "Char": 99,
}  # fmt: skip
_WORDS = {dtype: word for word, dtype in DTYPES.items()}


def type_word(dtype):
    """The pixel type of a numpy type. Raises TypeError for one that no raster has."""
    dtype = numpy.dtype(dtype)
    word = _WORDS.get(dtype.newbyteorder("="))
    if word is None:
        raise TypeError(f"no raster has pixels of type {dtype}; there are "
                        + ", ".join(str(known) for known in _WORDS))
    return word


def number_text(value):
    """A number with the fewest digits that give the same value back."""
    if isinstance(value, (bool, numpy.bool_)):
        return "1" if value else "0"
    if isinstance(value, numpy.integer):
        value = int(value)
    elif isinstance(value, numpy.floating):
        # numpy's own digits: 0.1 of 32 bits is 0.1, not 0.10000000149011612.
        return repr(float(str(value))) if math.isfinite(value) else str(float(value))
    if isinstance(value, (int, float)):
        return repr(value)
    raise TypeError(f"{value!r} is no number")


def array_text(values):
    """The text of an array of numbers, of up to eight dimensions."""
    array = numpy.asarray(values)
    if array.dtype == bool:
        array = array.astype("uint8")
    if array.dtype.kind not in "iuf":
        raise TypeError(f"{values!r} holds other things than numbers")
    extents = "".join(f"{extent} " for extent in array.shape)
    elements = " ".join(number_text(value) for value in array.ravel().tolist())
    return f"{array.ndim}:{extents}[{elements}] "


def uri_text(uri):
    """The text of a URI."""
    return f"[{uri}] "


def list_text(texts):
    """The text of a list of texts. Raises ValueError for one with a bar, which parts them."""
    texts = [os.fspath(text) if isinstance(text, os.PathLike) else str(text) for text in texts]
    for text in texts:
        if "|" in text:
            raise ValueError(f"{text!r}: a text of a list can't hold a bar")
    return "|".join(texts)


def text_of(value, kind=""):
    """The text of a value for an input of a command.

    Args:
        kind: as the command declares it; needed for URIs, rectangles and palettes alone.
    """
    if isinstance(value, os.PathLike):
        value = os.fspath(value)
    if kind == "URI" and isinstance(value, str):
        return value if value.startswith("$") else uri_text(value)
    if isinstance(value, str):
        return value
    if kind == "URI array":
        return f"1:{len(value)} [{''.join(uri_text(uri) for uri in value)}] "
    if kind in ("rectangle", "tiles") and not isinstance(value, str):
        return " ".join(str(part) for part in value)
    if kind == "palette":
        colors = "".join(f"({name} {r} {g} {b} {a} 0) " for name, r, g, b, a in value)
        return f"{len(value)} [{colors}] "
    if isinstance(value, (list, tuple)) and value and isinstance(value[0], (str, os.PathLike)):
        return list_text(value)
    if isinstance(value, (list, tuple, numpy.ndarray)):
        return array_text(value)
    return number_text(value)


def _number(text):
    try:
        return int(text)
    except ValueError:
        return float(text)


def parse_array(text, dtype=None):
    """The array of numbers in a text."""
    head, _, rest = text.partition("[")
    rank, _, extents = head.partition(":")
    shape = [int(extent) for extent in extents.split()]
    if int(rank) != len(shape):
        raise ValueError(f"{text!r} is no array")
    elements = rest.rpartition("]")[0].split()
    if dtype is None:
        values = numpy.array([_number(element) for element in elements])
        return values.reshape(shape) if elements else values
    return numpy.array(elements, dtype=dtype).reshape(shape)


def _brackets(text):
    """The texts in brackets, one after the other."""
    found, at = [], text.find("[")
    while at >= 0:
        end = text.index("]", at)
        found.append(text[at + 1:end])
        at = text.find("[", end)
    return found


def value_of(text, kind):
    """The value in the text of an output. A text that holds none stays as it is."""
    try:
        if kind == "boolean":
            return text.strip() == "1"
        if kind in ("integer", "number"):
            return _number(text)
        if kind in ("integer array", "number array"):
            return parse_array(text)
        if kind == "boolean array":
            return parse_array(text).astype(bool)
        if kind == "text list":
            return [piece for piece in text.split("|") if piece]
        if kind == "URI":
            return text.strip()[1:-1]
        if kind == "URI array":
            return _brackets(text.partition("[")[2])
        if kind == "rectangle":
            return tuple(int(part) for part in text.split())
    except ValueError:
        pass
    return text


def escape(text):
    """A text as an attribute of an XML document holds it."""
    text = text.replace("&", "&amp;").replace("<", "&lt;").replace('"', "&quot;")
    if "\n" in text or "\t" in text or "\r" in text:
        text = text.replace("\n", "&#10;").replace("\t", "&#9;").replace("\r", "&#13;")
    return text
