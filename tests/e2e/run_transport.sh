# The bundled tracer example (examples/tracer), shortened to its first two
# hours: it runs, its results open with netCDF4 and xarray, its mass budget
# closes (the error of the tracer and of the water within 1e-10 of their
# amounts), the source brings 100 units with every m3 of its water and the
# tracer stays in the basin (none has reached the mouth yet), and the
# results are the same bits on 1 and 2 threads and, with mpirun, on 1 and 2
# message-passing processes.
. ./driver_common.inc
export TANO_PROGRESS=NONE
export OMPI_MCA_mpi_yield_when_idle=1
PY=/usr/bin/python3
. ./processes_common.inc

example="$(cd ../../examples && pwd)"
d=$(case_dir tracer)
cp "$example/tracer/setup.toml" "$example/tracer/outfall.zrn0" "$example/default/flat.mesh" \
  "$example/default/tide.zrn0" "$d/"
sed -i -e 's|"../default/|"|' -e 's|^number_of_time_steps = 720|number_of_time_steps = 120|' "$d/setup.toml"
contains "$d/setup.toml" "number_of_time_steps = 120"

run_case "$d" 1 1
run_case "$d" 1 2
same_results "${d}_n1_t1" "${d}_n1_t2"
if command -v mpirun > /dev/null 2>&1; then
  run_case "$d" 2 1
  same_results "${d}_n1_t1" "${d}_n2_t1"
else
  echo "mpirun not found: the run on 2 processes is skipped"
fi

r="${d}_n1_t1"
contains "$r/setup.log" "Transport Simulation Timings"
contains "$r/setup.log" "Solve Advection-Dispersion eq."
inflow=$(sed -n 's/^ *Source inflow (m\*\*3) *: *//p' "$r/setup.log")
"$PY" - "$r" "$inflow" <<'PY' || fail "$r: tracer results"
import sys
import numpy as np
import netCDF4
import xarray as xr
r = sys.argv[1]
bad = []
with xr.open_dataset(f"{r}/tracer.zrnu") as ds:
    names = {ds[v].attrs.get("zrn_item_name") for v in ds.data_vars}
    for item in ("Tracer concentration", "U-velocity", "V-velocity", "CFL number (AD)"):
        if item not in names:
            bad.append(f"tracer.zrnu: no item {item}")
with netCDF4.Dataset(f"{r}/tracer_budget.zrn0") as nc:
    items = {nc.variables[v].getncattr("zrn_item_name"): np.ma.getdata(nc.variables[v][:])
             for v in nc.variables if "zrn_item_name" in nc.variables[v].ncattrs()}
for name in ("Tracer", "Flow"):
    total, error = items[f"Total area, {name}"], items[f"Error, {name}"]
    scale = max(np.max(np.abs(total)), 1.0)
    if np.max(np.abs(error)) > 1e-10 * scale:
        bad.append(f"{name}: budget error {np.max(np.abs(error))} of {scale}")
# The water of the source holds 100 units per m3.
source = items["Source, Tracer"][-1]
expected = 100.0 * float(sys.argv[2])
if not expected > 0 or abs(source - expected) > 1e-9 * expected:
    bad.append(f"source mass {source}, expected {expected}")
if not 0.9 * expected < items["Total area, Tracer"][-1] <= expected:
    bad.append(f"tracer in the basin {items['Total area, Tracer'][-1]} of {expected} released")
print("\n".join(bad))
sys.exit(1 if bad else 0)
PY
finish
