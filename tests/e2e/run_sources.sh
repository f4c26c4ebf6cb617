# Rain, evaporation and point sources on 1 and 2 message-passing processes:
# a closed slope of quadrilaterals and triangles, wet in the west and dry in
# the east, with rain and evaporation, a source on the dry slope, a
# connected pair from the western water to the dry east (so across the
# sub-domains) and a jet across the middle. Both runs give the same result files (the source result file
# among them) and volume balance, and the balance books the exact volumes:
# precipitation r t A, evaporation e t A, source inflow Q t plus the volume
# moved by the pair, which the outflow matches. Skipped without mpirun.
. ./driver_common.inc
export TANO_PROGRESS=NONE
# Idle processes yield the core.
export OMPI_MCA_mpi_yield_when_idle=1
PY=/usr/bin/python3

if ! command -v mpirun > /dev/null 2>&1; then
  echo "mpirun not found: skipped"
  exit 0
fi
. ./processes_common.inc

d=$(case_dir sources)
write_slope "$d" closed
cat >> "$d/setup.toml" <<'SETUP'

[VantorHD.HYDRODYNAMIC_MODULE.PRECIPITATION_EVAPORATION]
type_of_precipitation = 1
type_of_evaporation = 1
[VantorHD.HYDRODYNAMIC_MODULE.PRECIPITATION_EVAPORATION.PRECIPITATION]
format = 0
constant_value = 2400.0
[VantorHD.HYDRODYNAMIC_MODULE.PRECIPITATION_EVAPORATION.EVAPORATION]
format = 0
constant_value = 240.0

[VantorHD.HYDRODYNAMIC_MODULE.SOURCES]
number_of_sources = 4
output_type = 1
[VantorHD.HYDRODYNAMIC_MODULE.SOURCES.SOURCE_1]
type = 1
coordinates = [501037.5, 6000112.5]
format = 0
constant_value = 10.0
[VantorHD.HYDRODYNAMIC_MODULE.SOURCES.SOURCE_2]
type = 3
connected_source = 3
coordinates = [500125.0, 6000125.0]
format = 0
constant_values = [3.0, 0.0, 0.0]
[VantorHD.HYDRODYNAMIC_MODULE.SOURCES.SOURCE_3]
type = 5
coordinates = [500837.5, 6000262.5]
[VantorHD.HYDRODYNAMIC_MODULE.SOURCES.SOURCE_4]
type = 4
interpolation_type = 2
coordinates = [500075.0, 6000175.0]
sigma = 90.0
diameter = 0.3
maximum_distance = 200.0
format = 0
constant_values = [1.0, 0.0, 0.0]

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]
number_of_outputs = 1

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1]
file_name = "area.zrnu"
format = 2
time_step_frequency = 10
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.PARAMETERS_2D]
SURFACE_ELEVATION = true
TOTAL_WATER_DEPTH = true
U_VELOCITY = true
WET_DRY_CODE = true
SETUP
run_case "$d" 1 1
run_case "$d" 2 1
same_results "${d}_n1_t1" "${d}_n2_t1"
[ -f "${d}_n1_t1/source_data.zrn0" ] || fail "no source result file"

# The balance: rain 100 mm/h and evaporation 10 mm/h over 360000 m2 for
# 1200 s wherever there is water to evaporate (the dry east has none at the
# start), 10 m3/s from source 1, 1 m3/s from the jet and 3 m3/s moved by
# the pair.
value() { sed -n "s/^ *$2 (m\*\*3) *: *//p" "$1/setup.log"; }
r="${d}_n2_t1"
"$PY" - "$(value "$r" Precipitation)" "$(value "$r" Evaporation)" "$(value "$r" "Source inflow")" \
  "$(value "$r" "Source outflow")" "$(value "$r" "Continuity balance")" "$(value "$r" "Final volume in model area")" <<'PY' ||
import sys
p, e, qin, qout, cont, final = map(float, sys.argv[1:])
bad = []
if abs(p - 12000.0) > 1e-6: bad.append(f"precipitation {p}, expected 12000")
if not -1200.0 <= e < 0.0: bad.append(f"evaporation {e}, expected in [-1200, 0)")
if abs(qin - 16800.0) > 1e-6: bad.append(f"source inflow {qin}, expected 12000 + 3600 + 1200")
if abs(qout + 3600.0) > 1e-6: bad.append(f"source outflow {qout}, expected -3600")
if abs(cont) > 1e-9 * final: bad.append(f"continuity balance {cont} of {final}")
print("\n".join(bad))
sys.exit(1 if bad else 0)
PY
  fail "$r: volume balance"
contains "$r/setup.log" "number_of_sources : 4"
contains "$r/setup.log" "Source information"

finish
