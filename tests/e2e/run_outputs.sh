# Result files of whole runs: an area output (.zrnu) and a point output
# (.zrn0) of a channel flow fed by a discharge boundary, read back with
# Debian's xarray and netCDF4; the emergency record of a run that blows up;
# the maps left behind by a fatal stop and by a run killed with SIGKILL.
. ./driver_common.inc
export TANO_PROGRESS=NONE
PY=/usr/bin/python3

# write_channel DIR: a channel 1000 m x 100 m of 50 m cells, quadrilaterals in
# its western half and triangles in its eastern half, bed 2 m below datum;
# open in the west (code 2) and in the east (code 3), land elsewhere.
write_channel() {
  "$PY" - "$1/channel.mesh" <<'PYMESH'
import sys
nx, ny, d = 20, 2, 50.0
def code(i, j):
    if i == 0 and 0 < j < ny: return 2
    if i == nx and 0 < j < ny: return 3
    return 1 if i in (0, nx) or j in (0, ny) else 0
nodes = [(j * (nx + 1) + i + 1, i * d, j * d) for j in range(ny + 1) for i in range(nx + 1)]
elements = []
for j in range(ny):
    for i in range(nx):
        a = j * (nx + 1) + i + 1
        b, c, e = a + 1, a + nx + 2, a + nx + 1
        if i < nx // 2:
            elements.append((a, b, c, e))
        else:
            elements += [(a, b, c, 0), (a, c, e, 0)]
with open(sys.argv[1], "w") as f:
    f.write(f"100079 1000 {len(nodes)} UTM-32\n")
    for k, x, y in nodes:
        f.write(f"{k} {500000 + x:.1f} {6000000 + y:.1f} -2.0 {code(round(x / d), round(y / d))}\n")
    f.write(f"{len(elements)} 4 25\n")
    for k, el in enumerate(elements, 1):
        f.write(f"{k} {el[0]} {el[1]} {el[2]} {el[3]}\n")
PYMESH
}

# write_case FILE STEPS LEVEL SOFT FIRST LAST FREQUENCY: the setup of the
# channel run with STEPS steps of 30 s, 20 m3/s in the west and the level
# LEVEL in the east reached over SOFT seconds (linearly); maps at the steps
# FIRST, FIRST + FREQUENCY, ... up to LAST, points at every step.
write_case() {
  write_channel "$(dirname "$1")"
  cat > "$1" <<SETUP
[VantorHD]

[VantorHD.TIME]
start_time = [2004, 1, 1, 0, 0, 0]
time_step_interval = 30.0
number_of_time_steps = $2

[VantorHD.DOMAIN]
file_name = "channel.mesh"

[VantorHD.MODULE_SELECTION]
mode_of_hydrodynamic_module = 2

[VantorHD.HYDRODYNAMIC_MODULE]
mode = 2

[VantorHD.HYDRODYNAMIC_MODULE.SOLUTION_TECHNIQUE]
CFL_critical_HD = 0.5

[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE]
type = 4
[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.MANNING_NUMBER]
format = 0
constant_value = 30.0

[VantorHD.HYDRODYNAMIC_MODULE.INITIAL_CONDITIONS]
type = 1
surface_elevation_constant = 0.0

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_1]
type = 1

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_2]
type = 7
constant_value = 20.0
type_of_soft_start = 0

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_3]
type = 6
constant_value = $3
type_of_soft_start = 1
soft_time_interval = $4

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]
number_of_outputs = 2

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1]
file_name = "area.zrnu"
title = "Channel"
format = 2
first_time_step = $5
last_time_step = $6
time_step_frequency = $7
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.PARAMETERS_2D]
SURFACE_ELEVATION = true
TOTAL_WATER_DEPTH = true
STILL_WATER_DEPTH = true
CURRENT_SPEED = true
MAXIMUM_WATER_DEPTH = true

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2]
file_name = "points.zrn0"
format = 0
number_of_points = 2
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.POINT_1]
name = "Upstream"
x = 500210.0
y = 6000040.0
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.POINT_2]
name = "Downstream"
x = 500790.0
y = 6000060.0
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.PARAMETERS_2D]
SURFACE_ELEVATION = true
SETUP
}

# check_python DIR SCRIPT ARGS...: runs the check script; its output on failure.
check_python() {
  d=$1
  shift
  if ! "$PY" - "$@" > "$d/python.out" 2>&1; then
    fail "result check in $d"
    cat "$d/python.out"
  fi
}

# ---- a normal run: UGRID topology, CF time, the requested steps -------------

d=$(case_dir normal)
write_case "$d/setup.toml" 30 0.0 0.0 10 20 5
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "normal run"
[ "$(tail -n 1 "$d/setup.log")" = "  Normal run completion" ] || fail "normal run: last log line $(tail -n 1 "$d/setup.log")"
check_python "$d" "$d/area.zrnu" "$d/points.zrn0" <<'PYCHECK'
import sys
import numpy as np
import netCDF4
import xarray as xr

area, points = sys.argv[1], sys.argv[2]
start = np.datetime64("2004-01-01T00:00:00")
errors = []
def check(ok, what):
    if not ok:
        errors.append(what)

# The raw file: conventions, the mesh topology and the time coordinate.
with netCDF4.Dataset(area) as nc:
    check("UGRID-1.0" in nc.Conventions and "CF-1.8" in nc.Conventions, f"Conventions {nc.Conventions}")
    topo = [v for v in nc.variables.values() if getattr(v, "cf_role", "") == "mesh_topology"]
    check(len(topo) == 1, "one mesh_topology variable")
    mesh = topo[0]
    check(mesh.name == "mesh2d" and int(mesh.topology_dimension) == 2, "mesh2d of dimension 2")
    check(mesh.node_coordinates.split() == ["mesh2d_node_x", "mesh2d_node_y"], mesh.node_coordinates)
    for name in mesh.node_coordinates.split() + [mesh.face_node_connectivity] + mesh.face_coordinates.split():
        check(name in nc.variables, f"{name} named by the topology")
    faces = nc.variables[mesh.face_node_connectivity]
    check(int(faces.start_index) == 0 and int(faces._FillValue) == -1, "start_index 0, _FillValue -1")
    conn = faces[:]
    nnodes = nc.variables["mesh2d_node_x"].shape[0]
    counts = (~np.ma.getmaskarray(conn)).sum(axis=1)
    check(conn.shape[0] == 60 and nnodes == 63, f"60 elements and 63 nodes, found {conn.shape[0]} and {nnodes}")
    check(sorted(counts) == [3] * 40 + [4] * 20, "20 quadrilaterals, 40 triangles")
    check(conn.min() >= 0 and conn.max() < nnodes, "node numbers from 0")
    t = nc.variables["time"]
    check(t.units == "seconds since 2004-01-01 00:00:00", f"time units {t.units}")
    check(t.calendar == "standard", f"calendar {t.calendar}")
    check(list(t[:]) == [300.0, 450.0, 600.0], f"area times {list(t[:])}")
    check(nc.dimensions["time"].isunlimited(), "time unlimited")

# Through xarray: decoded CF time, items on the faces, and values that hang
# together (depth = elevation + still depth; the running maximum bounds the
# depths and never decreases).
ds = xr.open_dataset(area)
expected = start + np.array([10, 15, 20]) * np.timedelta64(30, "s")
check(np.array_equal(ds.time.values, expected), f"decoded times {ds.time.values}")
names = ["surface_elevation", "total_water_depth", "still_water_depth", "current_speed", "maximum_water_depth"]
for name in names:
    v = ds[name]
    check(v.dims[0] == "time" and v.shape == (3, 60), f"{name} dims {v.dims} shape {v.shape}")
    check(v.attrs.get("mesh") == "mesh2d" and v.attrs.get("location") == "face", f"{name} mesh/location")
    check(bool(np.isfinite(v.values).all()), f"{name} finite")
eta, h, d = ds.surface_elevation.values, ds.total_water_depth.values, ds.still_water_depth.values
check(np.abs(h - (eta + d)).max() < 1e-9, "total depth = elevation + still depth")
check(np.abs(d - 2.0).max() < 1e-12, "still depth 2 m")
hmax = ds.maximum_water_depth.values
check((hmax >= h - 1e-12).all() and (np.diff(hmax, axis=0) >= -1e-12).all(), "running maximum")
check(ds.current_speed.values[-1].max() > 0.01, "the inflow moves the water")
ds.close()

# The points: every step from 0 to 30, one item per point and item, and the
# same times as the maps where both have records.
pt = xr.open_dataset(points)
check(np.array_equal(pt.time.values, start + np.arange(31) * np.timedelta64(30, "s")), "point times")
items = sorted(v.attrs["long_name"] for v in pt.data_vars.values() if "time" in v.dims)
check(items == ["Downstream: Surface elevation", "Upstream: Surface elevation"], f"point items {items}")
up = [v for v in pt.data_vars.values() if v.attrs.get("long_name") == "Upstream: Surface elevation"][0]
down = [v for v in pt.data_vars.values() if v.attrs.get("long_name") == "Downstream: Surface elevation"][0]
check(float(up[0]) == 0.0 and float(down[0]) == 0.0, "still water at step 0")
# Interpolated from the node values around them, the point values lie
# within the range of the element values of the same step.
ds = xr.open_dataset(area)
for k, step in enumerate((10, 15, 20)):
    lo, hi = float(ds.surface_elevation[k].min()), float(ds.surface_elevation[k].max())
    for v in (up, down):
        check(lo - 1e-12 <= float(v[step]) <= hi + 1e-12, f"{v.attrs['long_name']} at step {step} outside [{lo}, {hi}]")
ds.close()
pt.close()

if errors:
    print("\n".join(errors))
    sys.exit(1)
PYCHECK

# ---- a run that blows up: the state at the failure as a last record ---------

# The eastern level climbs to 400 m over 3000 s: the water passes the limit
# of 100 m above the highest initial level after some maps were written.
d=$(case_dir blowup)
write_case "$d/setup.toml" 60 400.0 3000.0 0 60 5
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
rc=$?
contains "$d/setup.log" "BLOW-UP - Elevation too large"
[ "$(tail -n 1 "$d/setup.log")" = "  Abnormal run completion" ] ||
  fail "blow-up: last log line '$(tail -n 1 "$d/setup.log")'"
[ "$rc" -ne 0 ] || fail "blow-up: exit status 0 reports the failed run as a success"
check_python "$d" "$d/area.zrnu" <<'PYCHECK'
import sys
import numpy as np
import xarray as xr

ds = xr.open_dataset(sys.argv[1])
t = (ds.time.values - np.datetime64("2004-01-01T00:00:00")) / np.timedelta64(1, "s")
eta = ds.surface_elevation.values
errors = []
# Records of the regular steps 0, 5, 10 ... reached, then one more.
regular = [s * 30.0 for s in range(0, 61, 5) if s * 30.0 < t[-1]]
if len(regular) < 2 or len(t) != len(regular) + 1 or list(t[:-1]) != regular:
    errors.append(f"record times {list(t)}, regular steps {regular}")
if not np.all(np.diff(t) > 0):
    errors.append(f"times not increasing: {list(t)}")
if not eta[-1].max() > 100.0:
    errors.append(f"the last record is not the blown-up state: highest level {eta[-1].max()}")
if not eta[:-1].max() < 100.0:
    errors.append(f"a regular record holds the blow-up: highest level {eta[:-1].max()}")
if errors:
    print("\n".join(errors))
    sys.exit(1)
PYCHECK

# ---- a fatal stop: the process ends at once, the maps written stay readable --

# error_level 2 stops at the first CFL violation, which a smallest step of
# 25 s (about ten times the CFL step) forces in step 1, after the map of step 0.
d=$(case_dir cfl)
write_case "$d/setup.toml" 30 0.0 0.0 0 30 1
sed -i 's/^CFL_critical_HD = 0.5/CFL_critical_HD = 0.5\ndt_min_HD = 25.0\nerror_level = 2/' "$d/setup.toml"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 1 $? "fatal CFL stop"
contains "$d/setup.log" "CFL condition violated in HD calculation"
contains "$d/setup.log" "Fatal error: Simulation stopped due to CFL violation"
[ "$(tail -n 1 "$d/setup.log")" = "Abnormal completion" ] || fail "CFL stop: last log line '$(tail -n 1 "$d/setup.log")'"
check_python "$d" "$d/area.zrnu" <<'PYCHECK'
import sys
import numpy as np
import xarray as xr

ds = xr.open_dataset(sys.argv[1])
if not (ds.sizes["time"] == 1 and ds.time.values[0] == np.datetime64("2004-01-01T00:00:00")
        and bool((ds.surface_elevation.values == 0.0).all())):
    print(f"expected the still water of step 0 only, found times {ds.time.values}")
    sys.exit(1)
PYCHECK

# ---- a run killed in the middle: the records so far stay readable -----------

# Every step writes a map; the run is far longer than it is allowed to live.
d=$(case_dir killed)
write_case "$d/setup.toml" 2000000000 0.0 0.0 0 2000000000 1
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1 &
pid=$!
# Wait (up to 20 s) until the map holds 20 records, then kill the run at once.
i=0
while [ $i -lt 200 ]; do
  n=$(ncdump -h "$d/area.zrnu" 2>/dev/null | sed -n 's/.*UNLIMITED ; \/\/ (\([0-9]*\) currently).*/\1/p')
  [ "${n:-0}" -ge 20 ] && break
  sleep 0.1
  i=$((i + 1))
done
kill -KILL $pid
wait $pid 2>/dev/null
status_is 137 $? "SIGKILL"
[ "${n:-0}" -ge 20 ] || fail "killed run: the map never reached 20 records"
lacks "$d/setup.log" "run completion"
check_python "$d" "$d/area.zrnu" "$n" <<'PYCHECK'
import sys
import numpy as np
import xarray as xr

ds = xr.open_dataset(sys.argv[1])
seen = int(sys.argv[2])
t = (ds.time.values - np.datetime64("2004-01-01T00:00:00")) / np.timedelta64(1, "s")
errors = []
# At least the records seen before the kill, one per step from step 0.
if len(t) < seen or not np.array_equal(t, 30.0 * np.arange(len(t))):
    errors.append(f"{len(t)} records (seen {seen}), times {list(t[:5])} ...")
# Every record flushed is complete: all but the last, which the kill may
# have cut in the middle of its items.
for name in ("surface_elevation", "total_water_depth", "maximum_water_depth"):
    if not np.isfinite(ds[name].values[:-1]).all():
        errors.append(f"{name} holds missing values before the last record")
if errors:
    print("\n".join(errors))
    sys.exit(1)
PYCHECK

# A boundary series read from a data file is closed at the end of the run,
# and its "Data File Summary" reaches the log.
d=$(case_dir input_summary)
printf 'time,Surface elevation\n2004-01-01 00:00:00,0.0\n2004-01-01 00:10:00,0.2\n' > "$d/level.csv"
"$BUILD_DIR/bin/zrntool" csv2zrn0 "$d/level.csv" "$d/level.zrn0" --type 100000 > /dev/null
write_case "$d/setup.toml" 10 "$(printf '0.0\nformat = 1\nfile_name = "level.zrn0"\nitem_number = 1')" 0.0 0 10 10
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "run with a boundary series"
grep -A 2 "^Data File Summary" "$d/setup.log" | grep -q "File .*level.zrn0" ||
  fail "no Data File Summary of the boundary series in $d/setup.log"

finish
