#!/usr/bin/python3
"""Writes the inputs of the storm-surge case: a storm crossing a shelf.

shelf.mesh  60 km x 100 km of shelf and coast, 1 km cells: quadrilaterals in
            the deep water, triangles in the shallow eastern 15 km. The
            bed rises from 40 m below datum at the open west side (boundary
            code 2) to the coast at x = 54 km and to 6 m above datum at the
            east end, so the surge floods the coastal strip.
tide.csv    a semi-diurnal tide of 0.8 m amplitude at the west side, every
            10 minutes over 37 hours; make tide.zrn0 from it with
            zrntool csv2zrn0 tide.csv tide.zrn0 --type 100000
storm.zrn2  hourly air pressure (hPa) and wind (m/s, x and y) on a 10 km grid
            over 37 hours: a low of 970 hPa that comes in from the west,
            crosses the shelf and makes landfall at about 21:30 on the first
            day, 70 km up the coast; the onshore winds south of its track
            drive the surge. Written with netCDF4 as any meteorological input can be.
"""
import math

import netCDF4
import numpy as np

X0, Y0 = 500000.0, 6000000.0
LX, LY, D = 60000.0, 100000.0, 1000.0
NX, NY = int(LX / D), int(LY / D)
X_TRIANGLES = 45000.0  # triangles east of this line


def bed(x, y):
    if x <= 54000.0:
        return -40.0 + 40.0 * x / 54000.0
    return 6.0 * (x - 54000.0) / 6000.0


def code(i, j):
    # West side open (2) except its two corners, which stay land (1).
    if i == 0 and 0 < j < NY:
        return 2
    if i == 0 or i == NX or j == 0 or j == NY:
        return 1
    return 0


def node(i, j):
    return j * (NX + 1) + i + 1


elements = []
for j in range(NY):
    for i in range(NX):
        a, b, c, d = node(i, j), node(i + 1, j), node(i + 1, j + 1), node(i, j + 1)
        if i * D < X_TRIANGLES:
            elements.append((a, b, c, d))
        else:
            elements.append((a, b, c, 0))
            elements.append((a, c, d, 0))

with open("shelf.mesh", "w") as f:
    f.write(f"100079 1000 {(NX + 1) * (NY + 1)} UTM-32\n")
    for j in range(NY + 1):
        for i in range(NX + 1):
            x, y = i * D, j * D
            f.write(f"{node(i, j)} {X0 + x:.1f} {Y0 + y:.1f} {bed(x, y):.4f} {code(i, j)}\n")
    f.write(f"{len(elements)} 4 25\n")
    for e, nodes in enumerate(elements, 1):
        f.write(f"{e} {' '.join(str(n) for n in nodes)}\n")

HOURS = 37
with open("tide.csv", "w") as f:
    f.write("time,Tide level\n")
    period = 12.42 * 3600.0
    for k in range(HOURS * 6 + 1):
        t = k * 600.0
        day, rest = divmod(int(t), 86400)
        h, m = divmod(rest // 60, 60)
        f.write(f"2004-01-{1 + day:02d} {h:02d}:{m:02d}:00,{0.8 * math.sin(2 * math.pi * t / period):.6f}\n")

# The storm: a Holland pressure profile around a centre moving east-north-east
# at about 10 km/h, with cyclonic wind turned 20 degrees towards the centre.
P_NEUTRAL, DP, R_MAX, B = 1013.0, 43.0, 40000.0, 1.5
V_MAX, INFLOW = 32.0, math.radians(20.0)
GX = np.arange(X0 - 200000.0, X0 + 260000.0 + 1.0, 10000.0)
GY = np.arange(Y0 - 150000.0, Y0 + 250000.0 + 1.0, 10000.0)
XX, YY = np.meshgrid(GX, GY)


def storm(t):
    xc = X0 - 160000.0 + 10000.0 / 3600.0 * t
    yc = Y0 + 60000.0 + 500.0 / 3600.0 * t
    dx, dy = XX - xc, YY - yc
    r = np.maximum(np.hypot(dx, dy), 1.0)
    p = P_NEUTRAL - DP + DP * np.exp(-((R_MAX / r) ** B))
    speed = V_MAX * np.sqrt((R_MAX / r) ** B * np.exp(1.0 - (R_MAX / r) ** B))
    # Anticlockwise about the centre (northern hemisphere), turned inwards.
    ex, ey = -dy / r, dx / r
    c, s = math.cos(INFLOW), math.sin(INFLOW)
    wx = speed * (c * ex - s * dx / r)
    wy = speed * (c * ey - s * dy / r)
    return p, wx, wy


with netCDF4.Dataset("storm.zrn2", "w", format="NETCDF4_CLASSIC") as nc:
    nc.Conventions = "CF-1.8"
    nc.title = "Storm crossing the shelf"
    nc.zrn_projection = "UTM-32"
    nc.createDimension("time", None)
    nc.createDimension("y", len(GY))
    nc.createDimension("x", len(GX))
    time = nc.createVariable("time", "f8", ("time",))
    time.standard_name = "time"
    time.units = "seconds since 2004-01-01 00:00:00"
    time.calendar = "standard"
    x = nc.createVariable("x", "f8", ("x",))
    x.standard_name = "projection_x_coordinate"
    x.units = "m"
    y = nc.createVariable("y", "f8", ("y",))
    y.standard_name = "projection_y_coordinate"
    y.units = "m"
    x[:], y[:] = GX, GY
    items = []
    for name, long_name, units in (("air_pressure", "Air pressure", "hPa"),
                                   ("wind_x", "Wind x-velocity", "m s-1"),
                                   ("wind_y", "Wind y-velocity", "m s-1")):
        v = nc.createVariable(name, "f4", ("time", "y", "x"), zlib=True)
        v.long_name = long_name
        v.units = units
        items.append(v)
    for k in range(HOURS + 1):
        t = 3600.0 * k
        time[k] = t
        for v, values in zip(items, storm(t)):
            v[k, :, :] = values
