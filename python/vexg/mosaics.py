"""Mosaics of scenes (docs/mosaics.md)."""

import glob
import os

from ._doors import local
from ._jobs import Draft, Node, source_node
from ._saving import Staged
from ._watch import watch
from ._workspace import Workspace
from .raster import Raster

_SMOOTH = 3.1  # square pixels, as the verb has it


def mosaic(scenes, file=None, *, grid=None, like=None, pixel_size=None, resampling="nearest", reference=None,
           match=True, match_by="overlaps", seams=True, feather=None, nodata=None, overwrite=False,
           progress=False, door=local):
    """Joins scenes into one raster: footprints, colours, seams.

    Args:
        scenes: files, or a pattern such as ``scenes/*.tif``, in their order: of pixels that several have
            the first one's are shown.
        file: the definition to make, which ends in .vmosaic; its side files lie beside it. By default a
            temporary one, which goes with the raster.
        grid: the coordinate system; by default that of the first scene.
        like: a raster whose grid it gets.
        resampling: "nearest", "linear" or "cubic", of scenes that don't lie on the grid.
        reference: the scene that others are matched to, by its number; the first by default.
        match: False to keep the colours of all scenes.
        match_by: "overlaps" or "scenes".
        seams: False for no footprints and seams.
        feather: the width in which scenes go over into each other at seams, in pixels.
    """
    if isinstance(scenes, (str, os.PathLike)):
        scenes = sorted(glob.glob(os.fspath(scenes)))
    scenes = [os.path.abspath(os.fspath(scene)) for scene in scenes]
    if not scenes:
        raise ValueError("a mosaic has one scene at least")
    workspace = Workspace() if file is None else None
    name = workspace.path("mosaic.vmosaic") if workspace else os.path.abspath(os.fspath(file))
    if workspace is None:
        with Staged(name, overwrite, scenes):
            pass  # only refuses a name that is taken
    draft = Draft()
    draft.step("create", "CreateMosaicCommand", {
        "File": name, "Scenes": scenes, "CoordSys": grid, "LikeURI": None if like is None else like._chain(),
        "PixelSize": pixel_size, "Reference": reference, "MatchMode": match_by.capitalize(), "Bins": "Exact",
        "ResamplingMethod": resampling.capitalize(), "FeatherWidth": feather, "NoData": nodata})
    node = source_node(name)
    opened = Node("OpenRasterCommand", (("ConnStr", f"EXTERNAL|{name}"), ("CheckSource", "Compared")))
    if seams:
        draft.step("footprints", "MakeMosaicFootPrintsCommand", {"MosaicURI": opened, "SmoothParameter": _SMOOTH})
    if match:
        draft.step("match", "MosaicStatsCommand", {"MosaicURI": opened, "Level": 0})
    if seams:
        draft.step("seams", "MosaicAutoSeamGenCommand", {"MosaicURI": opened, "Sides": "Exact"})
    was_there = os.path.exists(name)

    def make(task):
        try:
            door.run(draft, task)
        except BaseException:
            if not was_there and os.path.exists(name):
                os.remove(name)  # a definition whose scenes are not all looked at
            raise

    watch(make, progress, "mosaic")
    if workspace is not None:
        node.keep, node.recipe = workspace, (draft,)
    return Raster(node, door)
