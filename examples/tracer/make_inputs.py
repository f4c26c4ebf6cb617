#!/usr/bin/python3
"""Writes outfall.csv, the discharge of the outfall of the tracer case:
0 until 01:00, rising to 2 m3/s by 01:10, held until 07:00, back to 0 by
07:10, then 0 until 13:00 (every 10 minutes). Make outfall.zrn0 from it with
zrntool csv2zrn0 outfall.csv outfall.zrn0 --type 100010
"""

with open("outfall.csv", "w") as f:
    f.write("time,Outfall discharge\n")
    for k in range(13 * 6 + 1):
        minutes = 10 * k
        q = 2.0 if 70 <= minutes <= 420 else 0.0
        f.write(f"2004-01-01 {minutes // 60:02d}:{minutes % 60:02d}:00,{q:.6f}\n")
