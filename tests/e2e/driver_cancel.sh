# Ending a run from outside: the host's kill file and a termination signal.
# The runs are long (far more steps than they get to take); the script waits
# for their progress records instead of for a fixed time.
. ./driver_common.inc
unset TANO_PROGRESS

# wait_for FILE TEXT: polls up to 60 s until the file holds the text.
wait_for() {
  i=0
  while [ $i -lt 600 ]; do
    grep -qF -- "$2" "$1" 2>/dev/null && return 0
    sleep 0.1
    i=$((i + 1))
  done
  fail "timed out waiting for '$2' in $1"
  return 1
}

# A kill file made during the run ends it after the current step.
d=$(case_dir kill)
write_setup "$d/setup.toml" 2000000000
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1 &
pid=$!
# A full report after a step (it comes after 2 s of CPU time) shows that the
# loop is running.
wait_for "$d/setup._spi_" "COMSPD" && touch "$d/setup._kill_"
wait $pid
status_is 0 $? "kill file"
contains "$d/setup.log" "= COMPUTATION ENDED ="
tail -n 1 "$d/setup.log" > "$d/last"
contains "$d/last" "  Run cancelled by user"
# Record layout: a six-letter tag, one blank, the text; integers trimmed.
grep -vqE '^(STATUS|STALBL|MESSAG|MESLBL|COMSPD|TIMLFT|PROGRE) ' "$d/setup._spi_" &&
  fail "message file holds a record of unknown layout"
for tag in STATUS MESSAG PROGRE COMSPD TIMLFT; do
  contains "$d/setup._spi_" "$tag "
done
grep -E '^(COMSPD|TIMLFT|PROGRE) ' "$d/setup._spi_" | grep -vqE '^[A-Z]{6} [0-9]+$' &&
  fail "an integer record is not a trimmed integer"
grep -E '^STATUS ' "$d/setup._spi_" | grep -vqE '^STATUS [0-9]{4}-[0-9]{2}-[0-9]{2} [0-9]{2}:[0-9]{2}:[0-9]{2}$' &&
  fail "a STATUS record is not a date and time"

# SIGTERM: "Termination request" and the signal number as exit status.
d=$(case_dir sigterm)
write_setup "$d/setup.toml" 2000000000
"$VANTORHD" "$d/setup.toml" > "$d/out" 2>&1 &
pid=$!
wait_for "$d/setup._spi_" "Time step: 0" && kill -TERM $pid
wait $pid
status_is 15 $? "SIGTERM"
contains "$d/setup.log" "Termination request"
contains "$d/setup.log" "Abnormal completion"

finish
