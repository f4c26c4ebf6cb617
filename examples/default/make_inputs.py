#!/usr/bin/python3
"""Writes the inputs of the bundled case: a tidal basin over a sloping flat.

flat.mesh   4000 m x 1000 m, 100 m right triangles; the bed rises from 4 m
            below datum at the open west side (boundary code 2) to 1.5 m
            above datum at the east end, with a shallow channel along the
            middle, so that the eastern flat dries at low water.
tide.csv    a semi-diurnal tide of 1.2 m amplitude at the west side, every
            10 minutes over 13 hours; make tide.zrn0 from it with
            zrntool csv2zrn0 tide.csv tide.zrn0 --type 100000
"""
import math

LX, LY, D = 4000.0, 1000.0, 100.0
NX, NY = int(LX / D), int(LY / D)


def bed(x, y):
    slope = -4.0 + 5.5 * x / LX
    channel = -1.0 * math.exp(-((y - LY / 2) / 150.0) ** 2)
    return slope + channel


def code(i, j):
    # West side open (2) except its two corners, which stay land (1).
    if i == 0 and 0 < j < NY:
        return 2
    if i == 0 or i == NX or j == 0 or j == NY:
        return 1
    return 0


with open("flat.mesh", "w") as f:
    n = (NX + 1) * (NY + 1)
    f.write(f"100079 1000 {n} UTM-32\n")
    for j in range(NY + 1):
        for i in range(NX + 1):
            x, y = i * D, j * D
            k = j * (NX + 1) + i + 1
            f.write(f"{k} {500000.0 + x:.1f} {6000000.0 + y:.1f} {bed(x, y):.4f} {code(i, j)}\n")
    f.write(f"{2 * NX * NY} 3 21\n")
    e = 0
    for j in range(NY):
        for i in range(NX):
            a = j * (NX + 1) + i + 1
            b, c, d = a + 1, a + NX + 2, a + NX + 1
            e += 1
            f.write(f"{e} {a} {b} {c}\n")
            e += 1
            f.write(f"{e} {a} {c} {d}\n")

with open("tide.csv", "w") as f:
    f.write("time,Tide level\n")
    period = 12.42 * 3600.0
    for k in range(13 * 6 + 1):
        t = k * 600.0
        h, m = divmod(int(t) // 60, 60)
        f.write(f"2004-01-01 {h:02d}:{m:02d}:00,{1.2 * math.sin(2 * math.pi * t / period):.6f}\n")
