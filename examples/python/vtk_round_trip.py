"""Hands a surface of VTK to `modeling` and the result back to VTK, without copying an array.

    python3 vtk_round_trip.py surface.vtp --out clean.vtp

Without a file, VTK extracts a contour of a volume, which has many needles. Prints where each array is in memory on both sides.
Needs Debian's python3-vtk9. Nothing is written without --out.
"""

from __future__ import annotations

import argparse
import warnings
from pathlib import Path
from typing import Any

import modeling
import numpy as np
from numpy.typing import NDArray
from vtkmodules.util.numpy_support import numpy_to_vtk, vtk_to_numpy
from vtkmodules.vtkCommonCore import vtkPoints
from vtkmodules.vtkCommonDataModel import vtkCellArray, vtkPolyData, vtkQuadric
from vtkmodules.vtkFiltersCore import vtkFlyingEdges3D
from vtkmodules.vtkImagingHybrid import vtkSampleFunction
from vtkmodules.vtkIOXML import vtkXMLPolyDataReader, vtkXMLPolyDataWriter


def ellipsoid() -> vtkPolyData:
    function = vtkQuadric()
    function.SetCoefficients(1, 2, 3, 0, 0, 0, 0, 0, 0, -1)
    volume = vtkSampleFunction()
    volume.SetImplicitFunction(function)
    volume.SetModelBounds(-1.2, 1.2, -1, 1, -1, 1)
    volume.SetSampleDimensions(48, 40, 40)
    volume.ComputeNormalsOff()
    contour = vtkFlyingEdges3D()
    contour.SetInputConnection(volume.GetOutputPort())
    contour.SetValue(0, 0)
    contour.ComputeNormalsOff()
    contour.Update()
    return contour.GetOutput()


def handed_over(array: Any) -> NDArray[Any]:
    """The values of a VTK array. VTK could still write them, so `adopt` would copy: check=False says that it will not."""
    return modeling.adopt(vtk_to_numpy(array), check=False)


def mesh_of(surface: vtkPolyData) -> modeling.Mesh:
    """The polygons of a surface, with the numbers of its points. The surface must not be changed any more."""
    polygons = surface.GetPolys()
    polygons.ConvertTo32BitStorage()  # changes arrays of 64-bit numbers to 32 bits, which is what meshes have
    mesh = modeling.Mesh(
        handed_over(surface.GetPoints().GetData()),
        handed_over(polygons.GetConnectivityArray()).view(np.uint32),
        offsets=handed_over(polygons.GetOffsetsArray()).view(np.uint32),
    )
    data = surface.GetPointData()
    for i in range(data.GetNumberOfArrays()):
        mesh.point_data[data.GetArrayName(i)] = handed_over(data.GetArray(i))
    return mesh


def surface_of(mesh: modeling.Mesh) -> vtkPolyData:
    """The mesh as VTK has it. It shares the memory of the mesh, so that filters may read it, but nothing may write it."""
    points, polygons, surface = vtkPoints(), vtkCellArray(), vtkPolyData()
    points.SetData(numpy_to_vtk(mesh.points))
    polygons.SetData(numpy_to_vtk(mesh.face_offsets.view(np.int32)), numpy_to_vtk(mesh.face_vertices.view(np.int32)))
    surface.SetPoints(points)
    surface.SetPolys(polygons)
    for name, values in mesh.point_data.items():
        array = numpy_to_vtk(values)
        array.SetName(name)
        surface.GetPointData().AddArray(array)
    return surface


def addresses(shown: vtkPolyData | modeling.Mesh) -> dict[str, int]:
    """Where the arrays begin in memory."""
    if isinstance(shown, modeling.Mesh):
        arrays = {"points": shown.points, "corners": shown.face_vertices, "offsets": shown.face_offsets}
        arrays |= dict(shown.point_data)
    else:
        polygons, data = shown.GetPolys(), shown.GetPointData()
        arrays = {
            "points": vtk_to_numpy(shown.GetPoints().GetData()),
            "corners": vtk_to_numpy(polygons.GetConnectivityArray()),
            "offsets": vtk_to_numpy(polygons.GetOffsetsArray()),
        }
        arrays |= {data.GetArrayName(i): vtk_to_numpy(data.GetArray(i)) for i in range(data.GetNumberOfArrays())}
    return {name: array.__array_interface__["data"][0] for name, array in arrays.items()}


def compare(title: str, surface: vtkPolyData, mesh: modeling.Mesh) -> None:
    print(title)
    own, theirs = addresses(mesh), addresses(surface)
    for name, address in own.items():
        state = "same" if address == theirs[name] else "copied"
        print(f"  {name:8} VTK {theirs[name]:#x}, modeling {address:#x}: {state}")


def main(arguments: list[str] | None = None) -> None:
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("surface", nargs="?", help="a closed surface of triangles (VTP)")
    parser.add_argument("--out", type=Path, help="file of the result (VTP)")
    options = parser.parse_args(arguments)

    if options.surface:
        reader = vtkXMLPolyDataReader()
        reader.SetFileName(options.surface)
        reader.Update()
        surface = reader.GetOutput()
    else:
        surface = ellipsoid()
    mesh = mesh_of(surface)
    compare("from VTK", surface, mesh)

    warnings.simplefilter("ignore", modeling.GeometryWarning)  # needles take the numbers of points with them
    clean = modeling.smooth(modeling.remove_slivers(mesh, 0.2))
    clean.point_data["height"] = clean.points[:, 2].copy()
    back = surface_of(clean)
    compare("back to VTK", back, clean)
    needles = [modeling.topology(shown).slivers[0] for shown in (mesh, clean)]
    print(f"{mesh.face_count:,} faces with {needles[0]} needles, now {clean.face_count:,} with {needles[1]}")
    if options.out:
        writer = vtkXMLPolyDataWriter()
        writer.SetFileName(str(options.out))
        writer.SetInputData(back)
        if not writer.Write():
            raise SystemExit(f"{options.out} cannot be written")


if __name__ == "__main__":
    main()
