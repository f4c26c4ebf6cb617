#!/bin/sh
# CSV -> .zrn0 -> CSV with zrntool gives back the same numbers, and bad CSV
# input is refused with a message naming the file and line.
# Arguments: path of vantorhd, build directory.
set -eu
tool="$2/bin/zrntool"
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

# Equidistant axis, double precision, a gap in the first item.
cat > "$work/eq.csv" <<'CSV'
time,Surface elevation,Discharge
2004-01-01 00:00:00,0.5,10
2004-01-01 00:30:00,,12.25
2004-01-01 01:00:00,0.123456789012,-3e-05
2004-01-01 01:30:00,-1.75,1e+20
CSV
"$tool" csv2zrn0 "$work/eq.csv" "$work/eq.zrn0" --type 100000,100010 > /dev/null
"$tool" zrn2csv "$work/eq.zrn0" "$work/eq.out.csv"
cmp "$work/eq.csv" "$work/eq.out.csv"
"$tool" info "$work/eq.zrn0" | grep -q "equidistant calendar"
"$tool" info "$work/eq.zrn0" | grep -q "Water Level (100000)"

# Non-equidistant axis, single precision, a unit given by identifier.
cat > "$work/neq.csv" <<'CSV'
time,Wind speed
1999-12-31 23:00:00,3.5
2000-01-01 00:00:00,0.1
2000-01-01 00:00:10,7
2000-03-01 00:00:00,12.75
CSV
"$tool" csv2zrn0 "$work/neq.csv" "$work/neq.zrn0" --type uvqIWindSpeed --unit uvqUknot --float > /dev/null
"$tool" zrn2csv "$work/neq.zrn0" "$work/neq.out.csv"
cmp "$work/neq.csv" "$work/neq.out.csv"
"$tool" info "$work/neq.zrn0" | grep -q "non-equidistant calendar"
"$tool" info "$work/neq.zrn0" | grep -q "knot"

# Bad input: a broken date, a wrong unit for the item type.
printf 'time,a\n2004-01-01 00:00:00,1\n2004-13-01 00:00:00,2\n' > "$work/bad.csv"
if "$tool" csv2zrn0 "$work/bad.csv" "$work/bad.zrn0" 2> "$work/err.txt"; then exit 1; fi
grep -q "bad.csv line 3" "$work/err.txt"
if "$tool" csv2zrn0 "$work/eq.csv" "$work/bad.zrn0" --type 100000 --unit 2000 2> "$work/err.txt"; then exit 1; fi
grep -q "does not have the required unit type" "$work/err.txt"
echo "zrntool CSV round trip: ok"
