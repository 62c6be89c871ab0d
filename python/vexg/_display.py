"""Pictures and tables of rasters for notebooks, without a port or a file."""

import base64
import html
import struct
import zlib

import numpy

_SIDE = 256  # pixels of a picture in a notebook


def png_bytes(image):
    """A PNG of an array of lines and samples, grey or with 3 or 4 channels of 8 bits (ISO/IEC 15948)."""
    image = numpy.ascontiguousarray(image, dtype="uint8")
    height, width = image.shape[:2]
    channels = 1 if image.ndim == 2 else image.shape[2]
    kind = {1: 0, 2: 4, 3: 2, 4: 6}[channels]
    rows = numpy.zeros((height, 1 + width * channels), dtype="uint8")
    rows[:, 1:] = image.reshape(height, -1)

    def chunk(name, body):
        return struct.pack(">I", len(body)) + name + body + struct.pack(">I", zlib.crc32(name + body))

    head = struct.pack(">IIBBBBB", width, height, 8, kind, 0, 0, 0)
    body = zlib.compress(rows.tobytes(), 6)
    return b"\x89PNG\r\n\x1a\n" + chunk(b"IHDR", head) + chunk(b"IDAT", body) + chunk(b"IEND", b"")


def _natural(raster):
    """The bands that look natural: those with colours as their meaning, the first three, or the first."""
    details = raster.details
    meanings = [details.get(f"Bands/{band}/Meaning", "") for band in range(raster.count)]
    if all(color in meanings for color in ("Red", "Green", "Blue")):
        return [meanings.index(color) for color in ("Red", "Green", "Blue")]
    if raster.count >= 3:
        return [2, 1, 0] if raster.count > 4 else [0, 1, 2]
    return [0]


def image_of(raster, size, bands, stretch):
    """An array of red, green, blue and alpha of 8 bits, at most `size` pixels wide and high."""
    if bands is None:
        bands = _natural(raster)
    bands = [bands] if isinstance(bands, int) else list(bands)
    if len(bands) not in (1, 3):
        raise ValueError(f"a picture has one band, or three, and not {len(bands)}")
    level = max((n for n in raster.levels if max(raster.shape[1:]) >> n >= size), default=0)
    source = raster.level(level)
    step = max(1, -(-max(source.shape[1:]) // size))
    if numpy.issubdtype(source.dtype, numpy.complexfloating):
        source = source.magnitude()
        bands = bands[:1]
    if step > 1:
        source = source.skip(step) if min(source.shape[1:]) >= step else source
    block = source.read(bands, masked=True)
    valid = ~numpy.ma.getmaskarray(block) & numpy.isfinite(block.data)
    colors = raster.colormap if len(bands) == 1 else None
    if colors is not None and block.dtype.kind in "iu":
        indices = numpy.clip(block.data[0], 0, len(colors) - 1)
        picture = colors[indices].copy()
        picture[..., 3] = numpy.where(valid[0], picture[..., 3], 0)
        return picture
    channels = [_stretched(values, good, stretch) for values, good in zip(block.data, valid)]
    channels = channels * 3 if len(channels) == 1 else channels
    alpha = numpy.where(valid.all(axis=0), 255, 0).astype("uint8")
    return numpy.stack([*channels, alpha], axis=-1)


def _stretched(values, good, stretch):
    """Values as levels of grey, between two percentiles of the valid ones."""
    if not good.any():
        return numpy.zeros(values.shape, dtype="uint8")
    low, high = numpy.percentile(values[good].astype("float64"), stretch)
    scale = 255 / (high - low) if high > low else 0
    with numpy.errstate(invalid="ignore", over="ignore"):
        levels = numpy.clip((values.astype("float64") - low) * scale, 0, 255)
    return numpy.where(good, levels, 0).astype("uint8")


def png_of(raster, size, bands, stretch):
    """A picture of a raster as the bytes of a PNG."""
    return png_bytes(image_of(raster, size, bands, stretch))


def html_of(raster):
    """A table of what a raster is, with a picture inside the text."""
    bands, lines, samples = raster.shape
    rows = [("bands, lines, samples", f"{bands} x {lines} x {samples}"), ("dtype", raster.dtype),
            ("coordinate system", raster.crs or "none"), ("no data", raster.nodata)]
    if raster.bounds is not None:
        rows.append(("bounds", ", ".join(f"{bound:.10g}" for bound in raster.bounds)))
    if any(raster.names):
        rows.append(("names", ", ".join(raster.names)))
    cells = "".join(f"<tr><th style='text-align:left'>{html.escape(str(name))}</th>"
                    f"<td style='text-align:left'>{html.escape(str(value))}</td></tr>" for name, value in rows)
    picture = ""
    # A picture may take long where all pixels have to be computed for it.
    if raster.size <= 64 << 20 or raster.levels:
        try:
            data = base64.b64encode(png_of(raster, _SIDE, None, (2, 98))).decode()
            picture = f"<img alt='quicklook' src='data:image/png;base64,{data}'/>"
        except Exception as fault:  # a table without a picture is better than none
            picture = html.escape(str(fault))
    return f"<div style='display:flex;gap:1em'><table>{cells}</table>{picture}</div>"
