# Particle tracking in a run of the program: the example at the mouth of the
# tidal basin, shortened to two hours. On 1 and 2 threads the track files
# (XML and CF trajectories) are the same bytes; the XML file parses and the
# trajectory file opens in xarray with the particles the log counts. A run
# on two message-passing processes is refused with its message (skipped
# without mpirun).
. ./driver_common.inc
export TANO_PROGRESS=NONE
PY=/usr/bin/python3
EXAMPLES=$(cd ../../examples && pwd)

for threads in 1 2; do
  d=$(case_dir "threads$threads")
  sed -e "s|\"../default/|\"$EXAMPLES/default/|" -e 's/number_of_time_steps = 720/number_of_time_steps = 120/' \
    "$EXAMPLES/particles/setup.toml" > "$d/setup.toml"
  OMP_NUM_THREADS=$threads "$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
  status_is 0 $? "particles on $threads thread(s)"
  contains "$d/setup.log" "Particle Tracking Statistics"
  contains "$d/setup.log" "Number of particles from sources          : 1200"
done
a="$WORK/threads1"
b="$WORK/threads2"
cmp -s "$a/tracks.xml" "$b/tracks.xml" || fail "the XML track files of 1 and 2 threads differ"
# The netCDF files hold no time of writing: their data are compared.
$PY - "$a/tracks.nc" "$b/tracks.nc" <<'PY' || fail "the trajectory files of 1 and 2 threads differ"
import sys, xarray as xr
a, b = xr.open_dataset(sys.argv[1]), xr.open_dataset(sys.argv[2])
assert a.identical(b)
PY
[ -e "$a/QRVRenderParticelTrack.xsl" ] || fail "no style sheet beside the track file"

$PY - "$a/tracks.xml" "$a/tracks.nc" <<'PY' || fail "the track files do not read back"
import sys, xml.etree.ElementTree as ET, xarray as xr
root = ET.parse(sys.argv[1]).getroot()
assert root.tag == 'qrvdata'
steps = root.findall('TimeStep')
assert [int(s.get('nr')) for s in steps] == list(range(0, 121, 30)), [s.get('nr') for s in steps]
classes = root.findall('ParticleClassDefinition')
assert [c.find('Name').text for c in classes] == ['Drifter', 'Silt']
# particle_frequency 10: particles 1, 11, 21, ...
for s in steps:
    for p in s.iter('Particle'):
        assert (int(p.get('Nr')) - 1) % 10 == 0
ds = xr.open_dataset(sys.argv[2])
assert ds.attrs['featureType'] == 'trajectory'
assert ds.sizes['trajectory'] == 60
assert float(ds['x'].min()) >= 500000.0 and float(ds['x'].max()) <= 504000.0
PY

if command -v mpirun > /dev/null 2>&1; then
  export OMPI_MCA_mpi_yield_when_idle=1
  d=$(case_dir mpi)
  cp "$a/setup.toml" "$d/setup.toml"
  mpirun --allow-run-as-root --oversubscribe -np 2 "$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
  status_is 1 $? "particles on two processes"
  contains "$d/setup.log" "particle tracking runs on one process only"
fi

[ "$FAILURES" -eq 0 ] || exit 1
echo "run_particles: all checks passed"
