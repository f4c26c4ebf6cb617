# The bundled storm-surge example (examples/storm) over its first 24 hours,
# with and without its storm: the run completes, its maps open in xarray,
# and the storm raises the high water at the southern coastal gauge, right
# of the track where the wind blows onshore, by more than it raises it at
# the northern gauge, left of the track where the wind blows offshore.
. ./driver_common.inc
export TANO_PROGRESS=NONE
# One thread: ctest runs two scripts at once on two cores.
PY=/usr/bin/python3
EXAMPLE=../../examples/storm

for c in storm calm; do
  d=$(case_dir $c)
  cp "$EXAMPLE/shelf.mesh" "$EXAMPLE/tide.zrn0" "$EXAMPLE/storm.zrn2" "$d/"
  sed -e 's/^number_of_time_steps = 432/number_of_time_steps = 288/' "$EXAMPLE/setup.toml" > "$d/setup.toml"
  if [ $c = calm ]; then
    sed -i -e '/^\[VantorHD.HYDRODYNAMIC_MODULE.WIND_FORCING\]/,/^type = 1/s/^type = 1/type = 0/' "$d/setup.toml"
  fi
  OMP_NUM_THREADS=1 timeout 900 "$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
  status_is 0 $? "$c"
done
contains "$WORK/storm/setup.log" "storm/storm.zrn2"

if $PY -c 'import xarray' 2> /dev/null; then
  $PY - "$WORK/storm" "$WORK/calm" <<'PY' || fail "storm surge"
import sys
import numpy as np
import xarray as xr

storm, calm = (xr.open_dataset(f"{d}/coast.zrn0") for d in sys.argv[1:])
rise = {g: float(storm[f"{g}__surface_elevation"].max() - calm[f"{g}__surface_elevation"].max())
        for g in ("south", "north")}
print("rise of the high water by the storm (m):", rise)
area = xr.open_dataset(f"{sys.argv[1]}/area.zrnu")
assert area["surface_elevation"].dims == ("time", "mesh2d_nFaces")
assert np.isfinite(area["maximum_surface_elevation"][-1]).any()
assert rise["south"] > 0.2 and rise["south"] > rise["north"] + 0.2, rise
PY
fi
finish
