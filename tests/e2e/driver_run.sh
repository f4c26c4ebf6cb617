# Complete runs: no steps at all, a short run with its progress records, the
# command-line options, the progress modes and the bundled default case.
. ./driver_common.inc
unset TANO_PROGRESS

# number_of_time_steps = 0: both banners, normal completion, exit status 0.
d=$(case_dir zero)
write_setup "$d/setup.toml" 0
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "zero steps"
contains "$d/setup.log" "= COMPUTATION STARTED ="
contains "$d/setup.log" "= COMPUTATION ENDED ="
contains "$d/setup.log" "  Normal run completion"
contains "$d/setup.log" "Section: HYDRODYNAMIC_MODULE"
contains "$d/setup.log" "Number of time steps"

# Three steps of 30 s from 2004-02-28 23:59:00 (a leap year): the message
# file holds the records of the start, the start of the loop and the last
# step, which always reports. A stale kill file is removed at the start.
d=$(case_dir short)
write_setup "$d/setup.toml" 3
sed -i 's/start_time = .*/start_time = [2004, 2, 28, 23, 59, 0]/' "$d/setup.toml"
touch "$d/setup._kill_"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "short run"
contains "$d/setup.log" "  Normal run completion"
[ -e "$d/setup._kill_" ] && fail "the stale kill file was not removed"
cat > "$d/expected" <<'RECORDS'
MESSAG Initializing
PROGRE 0
STALBL Simulation date and time [YYYY-MM-DD hh:mm:ss]
MESLBL Simulation info
STATUS 2004-02-28 23:59:00
MESLBL Simulation time step
MESSAG Time step: 0
PROGRE 0
STATUS 2004-02-29 00:00:30
MESSAG Time step: 3
RECORDS
head -n 10 "$d/setup._spi_" > "$d/head"
cmp -s "$d/expected" "$d/head" || { fail "message file records"; diff "$d/expected" "$d/head"; }
# The last report: a computation speed (an integer), progress complete and
# no time left.
tail -n 3 "$d/setup._spi_" > "$d/tail"
grep -qE '^COMSPD [0-9]+$' "$d/tail" || fail "COMSPD record: $(cat "$d/tail")"
contains "$d/tail" "PROGRE 1000"
contains "$d/tail" "TIMLFT 0"
[ "$(wc -l < "$d/setup._spi_")" -eq 13 ] || fail "message file has $(wc -l < "$d/setup._spi_") records, expected 13"

# Arguments beginning with // are invisible; -gpu n d1..dn is consumed as
# one option and its devices reach the Performance block.
d=$(case_dir options)
write_setup "$d/setup.toml" 1
"$VANTORHD" //host-note "$d/setup.toml" -gpu 2 0 1 //another > "$d/out" 2>&1
status_is 0 $? "options"
contains "$d/setup.log" "Number of threads on CPU:"
contains "$d/setup.log" "GPU devices: 0 1"
contains "$d/setup.log" "  Normal run completion"

# hydrodynamic_features other than 1 switches off mud, sand and particles
# without reading their keywords (which are then reported as not used).
d=$(case_dir features)
write_setup "$d/setup.toml" 1
printf 'hydrodynamic_features = 2\nmode_of_particle_tracking_module = 1\n' >> "$d/setup.toml"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "hydrodynamic_features 2"
contains "$d/setup.log" "hydrodynamic_features : 2"
lacks "$d/setup.log" "mode_of_particle_tracking_module :"
lacks "$d/setup.log" "mode_of_mud_transport_module :"
contains "$d/setup.log" "mode_of_vitrax_module : 0 (default)"
contains_joined "$d/setup.log" "mode_of_particle_tracking_module in section VantorHD/MODULE_SELECTION"
contains "$d/setup.log" "  Normal run completion"

# STDOUT: the messages go to standard output, no message file is made.
d=$(case_dir stdout)
write_setup "$d/setup.toml" 2
TANO_PROGRESS=STDOUT "$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "STDOUT progress"
contains "$d/out" "Initializing"
contains "$d/out" "Time step: 2"
[ -e "$d/setup._spi_" ] && fail "STDOUT mode made a message file"

# NONE: no reports at all.
d=$(case_dir none)
write_setup "$d/setup.toml" 2
TANO_PROGRESS=NONE "$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "no progress"
lacks "$d/out" "Time step"
[ -e "$d/setup._spi_" ] && fail "NONE mode made a message file"

# The bundled default case.
d=$(case_dir default)
cp "$(dirname "$0")/../../examples/default/"* "$d/"
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1
status_is 0 $? "default case"
contains "$d/setup.log" "  Normal run completion"
lacks "$d/setup.log" "Warning"

finish
