"""Arithmetic on rasters: formulas over bands, which become one view of expressions (docs/calc.md)."""

import math
import numbers

import numpy

from . import _values
from ._jobs import Node

_FUNCTIONS = {
    numpy.absolute: "abs", numpy.arccos: "acos", numpy.arcsin: "asin", numpy.arctan: "atan",
    numpy.arctan2: "atan2", numpy.ceil: "ceil", numpy.cos: "cos", numpy.exp: "exp", numpy.floor: "floor",
    numpy.log: "log", numpy.log10: "log10", numpy.log2: "log2", numpy.maximum: "max", numpy.minimum: "min",
    numpy.sin: "sin", numpy.sqrt: "sqrt", numpy.tan: "tan",
}  # fmt: skip
_OPERATORS = {
    numpy.add: "+", numpy.subtract: "-", numpy.multiply: "*", numpy.true_divide: "/", numpy.power: "^",
    numpy.less: "<", numpy.less_equal: "<=", numpy.greater: ">", numpy.greater_equal: ">=",
    numpy.equal: "==", numpy.not_equal: "!=", numpy.logical_and: "&&", numpy.logical_or: "||",
}  # fmt: skip


def _number_parts(value):
    """The text of a constant of a formula."""
    value = float(value)
    if math.isnan(value):
        return ("nan",)
    if math.isinf(value):
        raise ValueError("a formula has no infinite numbers")
    text = repr(value)
    return (f"({text})" if value < 0 else text,)


class Arithmetic:
    """The operators of rasters. Each gives a raster of type float32 that computes as it is read, in
    doubles; bands go together one by one, and a raster of one band goes with each of another's."""

    __array_priority__ = 100

    def _parts(self):
        """For each band the pieces of its formula: texts, and (node, band) for pixels."""
        node = self._chain()
        if node.command == "CreateSpectralSubsetRasterCommand":
            below = dict(node.inputs)
            chosen = _values.parse_array(below["Bands"], int)
            return [((below["SrcURI"], int(band)),) for band in chosen]
        return [((node, band),) for band in range(self.count)]

    def __add__(self, other):
        return _combine("+", self, other)

    def __radd__(self, other):
        return _combine("+", other, self)

    def __sub__(self, other):
        return _combine("-", self, other)

    def __rsub__(self, other):
        return _combine("-", other, self)

    def __mul__(self, other):
        return _combine("*", self, other)

    def __rmul__(self, other):
        return _combine("*", other, self)

    def __truediv__(self, other):
        return _combine("/", self, other)

    def __rtruediv__(self, other):
        return _combine("/", other, self)

    def __pow__(self, other):
        return _combine("^", self, other)

    def __rpow__(self, other):
        return _combine("^", other, self)

    def __lt__(self, other):
        return _combine("<", self, other)

    def __le__(self, other):
        return _combine("<=", self, other)

    def __gt__(self, other):
        return _combine(">", self, other)

    def __ge__(self, other):
        return _combine(">=", self, other)

    def __eq__(self, other):
        return _combine("==", self, other)

    def __ne__(self, other):
        return _combine("!=", self, other)

    def __and__(self, other):
        return _combine("&&", self, other)

    def __rand__(self, other):
        return _combine("&&", other, self)

    def __or__(self, other):
        return _combine("||", self, other)

    def __ror__(self, other):
        return _combine("||", other, self)

    def __neg__(self):
        return _build([self], lambda a: ("(-", *a, ")"))

    def __pos__(self):
        return self

    def __invert__(self):
        return _build([self], lambda a: ("(!", *a, ")"))

    def __abs__(self):
        return _call("abs", self)

    def __bool__(self):
        raise ValueError("whether a raster is true is not one answer: it has many pixels")

    __hash__ = object.__hash__

    def __array_ufunc__(self, ufunc, method, *inputs, **options):
        if method == "__call__" and not options:
            if ufunc in _OPERATORS:
                return _combine(_OPERATORS[ufunc], *inputs)
            if ufunc in _FUNCTIONS:
                return _call(_FUNCTIONS[ufunc], *inputs)
            if ufunc is numpy.negative:
                return -inputs[0]
            if ufunc in (numpy.rint,):
                return _call("round", inputs[0])
        # Other functions are computed by numpy, on the pixels.
        arrays = [numpy.asarray(each) if isinstance(each, Arithmetic) else each for each in inputs]
        return getattr(ufunc, method)(*arrays, **options)


def _operand(value):
    """A raster of a value, or a number; NotImplemented for anything else."""
    from . import raster

    if isinstance(value, (raster.Raster, numbers.Real, numpy.bool_)):
        return value
    if isinstance(value, numpy.ndarray):
        return float(value) if value.ndim == 0 else raster.from_array(value)
    return NotImplemented


def _combine(sign, a, b):
    return _build([a, b], lambda x, y: ("(", *x, f" {sign} ", *y, ")"))


def _call(name, *operands):
    def join(*parts):
        pieces = [name + "("]
        for i, part in enumerate(parts):
            pieces += ([", "] if i else []) + list(part)
        return (*pieces, ")")

    return _build(operands, join)


def where(condition, a, b):
    """A raster of `a` where a condition holds, and `b` elsewhere; each a raster or a number."""
    return _call("where", condition, a, b)


def _build(operands, join):
    """The raster of what `join` makes of the formulas of each band of some operands."""
    from . import raster

    operands = [_operand(operand) for operand in operands]
    if any(operand is NotImplemented for operand in operands):
        return NotImplemented
    rasters = [operand for operand in operands if isinstance(operand, raster.Raster)]
    if not rasters:
        raise TypeError("a formula has one raster at least")
    parts = [operand._parts() if isinstance(operand, raster.Raster) else [_number_parts(operand)]
             for operand in operands]
    counts = {len(bands) for bands in parts} - {1}
    if len(counts) > 1:
        raise ValueError(f"the rasters have {' and '.join(map(str, sorted(counts)))} bands")
    count = counts.pop() if counts else 1
    formulas = [join(*(bands[band if len(bands) > 1 else 0] for bands in parts)) for band in range(count)]
    return raster.FormulaRaster(formulas, raster.door_of(rasters))


def node_of(formulas, type_word):
    """The node of the expressions of some formulas."""
    sources = {}
    for parts in formulas:
        for part in parts:
            if not isinstance(part, str):
                sources.setdefault(part[0], len(sources))
    if not sources:
        raise ValueError("a formula has one raster at least")
    texts = ["".join(part if isinstance(part, str) else _name(sources[part[0]], part[1]) for part in parts)
             for parts in formulas]
    inputs = [("SrcURI", tuple(sources)), ("Expressions", "; ".join(texts))]
    if len(sources) > 1:
        inputs.append(("Names", "|".join(f"r{i}" for i in range(1, len(sources)))))
    return Node("CreateExpressionRasterCommand", (*inputs, ("DataType", type_word)))


def _name(source, band):
    return f"b{band}" if source == 0 else f"r{source}_b{band}"


def calc(expressions, raster, *, dtype="float32", names=None, nir=None, red=None, green=None, blue=None, **others):
    """Shows what expressions make of the bands of rasters, as docs/calc.md tells.

        ndvi = vexg.calc("NDVI=(b3 - b2) / (b3 + b2)", scene)
        change = vexg.calc("b0 - then_b0", now, then=before)

    Args:
        expressions: one, or several with semicolons between them or in a list.
        raster: the bands of it are b0, b1 and so on.
        nir, red, green, blue: the bands of indices such as ndvi, as numbers.
        others: further rasters; the bands of `x` are x_b0 and so on.
    """
    from . import raster as rasters

    if not isinstance(expressions, str):
        expressions = "; ".join(expressions)
    used = [raster, *others.values()]
    inputs = [("SrcURI", tuple(each._chain() for each in used)), ("Expressions", expressions)]
    if others:
        inputs.append(("Names", "|".join(others)))
    roles = {"nir": nir, "red": red, "green": green, "blue": blue}
    roles = [f"{role}=b{band}" if isinstance(band, int) else f"{role}={band}"
             for role, band in roles.items() if band is not None]
    if roles:
        inputs.append(("Roles", "|".join(roles)))
    inputs.append(("DataType", _values.type_word(dtype)))
    return rasters.Raster(Node("CreateExpressionRasterCommand", tuple(inputs)), rasters.door_of(used))
