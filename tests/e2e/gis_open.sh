# The bundled example's result maps open as meshes in QGIS (its MDAL mesh
# provider, headless) and in ParaView's UGRID reader: vertex and face counts
# of the mesh, the coordinate reference, one dataset per item with one value
# set per written step, and values and times equal to those xarray reads.
# The example runs shortened to 30 steps, with a further map of a sub-area
# holding velocity components, the current direction and a maximum.
# Installs nothing: each viewer is checked where Debian's python3-qgis or
# python3-paraview is present; without either the test is skipped (77).
. ./driver_common.inc
export TANO_PROGRESS=NONE
export QT_QPA_PLATFORM=offscreen
export XDG_RUNTIME_DIR="$WORK/xdg"
PY=/usr/bin/python3
EXAMPLE=$(cd ../../examples/default && pwd)

have_qgis=0
have_paraview=0
"$PY" -c "import qgis.core" > /dev/null 2>&1 && have_qgis=1
"$PY" -c "from vtkmodules.vtkIONetCDF import vtkNetCDFUGRIDReader" > /dev/null 2>&1 && have_paraview=1
if [ "$have_qgis" -eq 0 ] && [ "$have_paraview" -eq 0 ]; then
  echo "skipped: neither python3-qgis nor python3-paraview is installed"
  exit 77
fi
[ "$have_qgis" -eq 1 ] || echo "python3-qgis not installed: QGIS not checked"
[ "$have_paraview" -eq 1 ] || echo "python3-paraview not installed: ParaView not checked"

d=$(case_dir example)
mkdir -p "$XDG_RUNTIME_DIR" && chmod 700 "$XDG_RUNTIME_DIR"
cp "$EXAMPLE/setup.toml" "$EXAMPLE/flat.mesh" "$EXAMPLE/tide.zrn0" "$d/"
sed -i -e 's/^number_of_time_steps = 720$/number_of_time_steps = 30/' \
  -e 's/^number_of_outputs = 3$/number_of_outputs = 4/' "$d/setup.toml"
cat >> "$d/setup.toml" <<'SETUP'

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_4]
file_name = "sub.zrnu"
title = "Middle of the basin"
format = 2
first_time_step = 5
time_step_frequency = 5
precision = 1
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_4.AREA]
x_min = 501500.0
x_max = 503000.0
y_min = 6000000.0
y_max = 6001000.0
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_4.PARAMETERS_2D]
U_VELOCITY = true
V_VELOCITY = true
CURRENT_DIRECTION = true
MAXIMUM_SURFACE_ELEVATION = true
SETUP
(cd "$d" && "$VANTORHD" setup.toml > out 2>&1)
status_is 0 $? "shortened example"

# check_viewer VIEWER: the Python check below for QGIS or ParaView on both maps.
check_viewer() {
  "$PY" - "$1" "$d/area.zrnu" 4 7 "$d/sub.zrnu" 6 4 > "$d/check_$1.out" 2>&1 <<'PYCHECK'
import sys
import numpy as np
import xarray as xr

viewer = sys.argv[1]
errors = []


def check(ok, what):
    if not ok:
        errors.append(what)


def same(a, b):
    a, b = np.asarray(a, dtype=float), np.asarray(b, dtype=float)
    return a.shape == b.shape and bool(np.all((a == b) | (np.isnan(a) & np.isnan(b))))


def load(path, **options):
    # Read and closed: a file held open here makes QGIS crash on opening it.
    with xr.open_dataset(path, **options) as ds:
        return ds.load()


def reference(path, nsteps, nitems):
    """What xarray reads: sizes, item variables, raw times in seconds."""
    ds = load(path)
    raw = load(path, decode_times=False)
    items = [n for n, v in ds.data_vars.items() if "zrn_item" in v.attrs]
    check(ds.sizes["time"] == nsteps, f"{path}: xarray reads {ds.sizes['time']} steps, not {nsteps}")
    check(len(items) == nitems, f"{path}: xarray reads items {items}")
    for n in items:
        check(ds[n].dims == ("time", "mesh2d_nFaces"), f"{path}: {n} dims {ds[n].dims}")
    return ds, items, raw["time"].values


def check_qgis(path, nsteps, nitems):
    from qgis.core import QgsMeshDatasetIndex, QgsMeshLayer
    ds, items, seconds = reference(path, nsteps, nitems)
    layer = QgsMeshLayer(path, "results", "mdal")
    if not layer.isValid():
        error = layer.error()
        check(False, f"{path}: QGIS layer not valid: {error.summary()}")
        return
    dp = layer.dataProvider()
    check(dp.vertexCount() == ds.sizes["mesh2d_nNodes"], f"{path}: {dp.vertexCount()} vertices")
    check(dp.faceCount() == ds.sizes["mesh2d_nFaces"], f"{path}: {dp.faceCount()} faces")
    check(layer.crs().authid() == "EPSG:32632", f"{path}: CRS {layer.crs().authid()}")
    groups = {}
    for g in range(dp.datasetGroupCount()):
        groups.setdefault(dp.datasetGroupMetadata(g).name(), []).append(g)
    nfaces = dp.faceCount()
    for n in items:
        # The group takes the long_name; an item named like a vector part has none.
        name = ds[n].attrs.get("long_name", n)
        found = groups.get(name, [])
        check(len(found) == 1, f"{path}: {len(found)} dataset groups named {name!r}; groups {sorted(groups)}")
        if len(found) != 1:
            continue
        g = found[0]
        meta = dp.datasetGroupMetadata(g)
        check(meta.isScalar() and meta.dataType() == meta.DataOnFaces, f"{path}: {name} not scalar on faces")
        check(dp.datasetCount(g) == nsteps, f"{path}: {name} has {dp.datasetCount(g)} datasets")
        for k in range(min(dp.datasetCount(g), nsteps)):
            t = dp.datasetMetadata(QgsMeshDatasetIndex(g, k)).time()
            check(abs(t * 3600.0 - seconds[k]) < 1e-6, f"{path}: {name} step {k} at {t} h, not {seconds[k]} s")
        for k in (nsteps // 2, nsteps - 1):
            block = dp.datasetValues(QgsMeshDatasetIndex(g, k), 0, nfaces)
            values = [block.value(i).scalar() for i in range(nfaces)]
            check(same(values, ds[n].values[k]), f"{path}: {name} step {k} differs from xarray")


def check_paraview(path, nsteps, nitems):
    from vtkmodules.vtkCommonExecutionModel import vtkStreamingDemandDrivenPipeline as pipeline
    from vtkmodules.vtkIONetCDF import vtkNetCDFUGRIDReader
    ds, items, seconds = reference(path, nsteps, nitems)
    raw = load(path, mask_and_scale=False)
    reader = vtkNetCDFUGRIDReader()
    reader.SetFileName(path)
    reader.UpdateInformation()
    info = reader.GetOutputInformation(0)
    times = info.Get(pipeline.TIME_STEPS()) if info.Has(pipeline.TIME_STEPS()) else ()
    check(same(times, seconds), f"{path}: ParaView times {times}")
    arrays = [reader.GetCellArrayName(i) for i in range(reader.GetNumberOfCellArrays())]
    check(sorted(arrays) == sorted(items), f"{path}: ParaView cell arrays {arrays}")
    for k in (nsteps // 2, nsteps - 1):
        reader.UpdateTimeStep(seconds[k])
        grid = reader.GetOutput()
        check(grid.GetNumberOfPoints() == ds.sizes["mesh2d_nNodes"], f"{path}: {grid.GetNumberOfPoints()} points")
        check(grid.GetNumberOfCells() == ds.sizes["mesh2d_nFaces"], f"{path}: {grid.GetNumberOfCells()} cells")
        data = grid.GetCellData()
        for n in items:
            a = data.GetArray(n)
            check(a is not None and a.GetNumberOfTuples() == grid.GetNumberOfCells(), f"{path}: no array {n}")
            if a is not None:
                values = [a.GetValue(i) for i in range(a.GetNumberOfTuples())]
                check(same(values, raw[n].values[k]), f"{path}: {n} step {k} differs from the file")


if viewer == "qgis":
    from qgis.core import QgsApplication
    app = QgsApplication([], False)
    app.initQgis()
args = sys.argv[2:]
for i in range(0, len(args), 3):
    path, nsteps, nitems = args[i], int(args[i + 1]), int(args[i + 2])
    (check_qgis if viewer == "qgis" else check_paraview)(path, nsteps, nitems)
if errors:
    print("\n".join(errors))
    sys.exit(1)
print("ok")
PYCHECK
  rc=$?
  if [ "$rc" -ne 0 ]; then
    fail "$1 check, exit status $rc"
    grep -v -e '^HDF5-DIAG' -e '^  *#' -e '^  *major:' -e '^  *minor:' "$d/check_$1.out"
  fi
}

[ "$have_qgis" -eq 0 ] || check_viewer qgis
[ "$have_paraview" -eq 0 ] || check_viewer paraview

# The gauges stay a CF time series: one variable per gauge and item over time.
"$PY" - "$d/gauges.zrn0" > "$d/gauges.out" 2>&1 <<'PYCHECK'
import sys
import xarray as xr
ds = xr.open_dataset(sys.argv[1])
items = [v for v in ds.data_vars.values() if "zrn_item" in v.attrs]
assert len(items) == 9 and all(v.dims == ("time",) for v in items), [(v.name, v.dims) for v in items]
assert ds.sizes["time"] == 31, ds.sizes
assert all(v.attrs["long_name"] == v.attrs["zrn_item_name"] for v in items)
PYCHECK
status_is 0 $? "gauges as CF time series ($(cat "$d/gauges.out"))"

finish
