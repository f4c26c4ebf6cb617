#!/usr/bin/python3
"""Plots of VantorHD result files.

  plot_result.py area.zrnu --item "Surface elevation" --step 12 -o eta.png
  plot_result.py area.zrnu --item "Current speed" --max -o speed_max.png
  plot_result.py points.zrn0 -o series.png
  plot_result.py points.zrn0 --item "A: Surface elevation" -o a.png
  plot_result.py tracks.nc --mesh area.zrnu -o tracks.png
  plot_result.py tracks.xml --mesh area.zrnu -o tracks.png

A .zrnu file gives a map of one element item on the mesh's triangles and
quadrilaterals, at a step (from 0; negative counts from the end, default the
last) or as its maximum over all steps. A .zrn0 file gives time series of its
items (all, or those named with --item), one panel per unit. Items are named
by their item name (the variable's zrn_item_name, else its long_name) or
their variable name. Delete
values are left blank. A particle track file (the CF trajectory .nc or the
XML track file) gives the tracks of its particles, each a line from its
first to its last position, over the mesh of a .zrnu file given with
--mesh. Writes a PNG.
"""

import argparse
import sys

import matplotlib

matplotlib.use("Agg")
import matplotlib.pyplot as plt  # noqa: E402
import netCDF4  # noqa: E402
import numpy as np  # noqa: E402
from matplotlib.collections import PolyCollection  # noqa: E402


def fail(message):
    print("plot_result.py: " + message, file=sys.stderr)
    sys.exit(1)


def item_variables(nc, spatial_dim=None):
    """Data variables of the file's items, in item order."""
    items = []
    for name, var in nc.variables.items():
        if "zrn_item" not in var.ncattrs() or var.dimensions[:1] != ("time",):
            continue
        if spatial_dim is not None and var.dimensions[1:] != (spatial_dim,):
            continue
        items.append((int(var.getncattr("zrn_item")), name))
    return [name for _, name in sorted(items)]


def item_name(var):
    """The item name: a mesh item named like a vector part has no long_name."""
    return getattr(var, "zrn_item_name", getattr(var, "long_name", var.name))


def find_item(nc, wanted, candidates):
    for name in candidates:
        if wanted in (name, item_name(nc.variables[name])):
            return name
    titles = ", ".join('"%s"' % item_name(nc.variables[n]) for n in candidates)
    fail('no item "%s" in %s; items: %s' % (wanted, nc.filepath(), titles))


def masked(nc, values):
    """Values with the file's delete value masked."""
    values = np.ma.masked_invalid(np.ma.asarray(values, dtype=float))
    delete = getattr(nc, "zrn_delete_value", None)
    if delete is not None:
        values = np.ma.masked_where(np.isclose(values, float(delete), rtol=1e-6, atol=0.0), values)
    return values


def times(nc):
    t = nc.variables["time"]
    calendar = getattr(t, "calendar", "standard")
    if "since" in getattr(t, "units", ""):
        return netCDF4.num2date(t[:], t.units, calendar, only_use_cftime_datetimes=False,
                                only_use_python_datetimes=True)
    return np.asarray(t[:], dtype=float)


def label(var):
    name = item_name(var)
    units = getattr(var, "units", "")
    return "%s (%s)" % (name, units) if units else name


def plot_map(nc, args):
    topo = [v for v in nc.variables.values() if getattr(v, "cf_role", "") == "mesh_topology"]
    if not topo:
        fail(nc.filepath() + " has no mesh topology")
    topo = topo[0]
    xname, yname = topo.node_coordinates.split()
    x = np.asarray(nc.variables[xname][:], dtype=float)
    y = np.asarray(nc.variables[yname][:], dtype=float)
    conn_var = nc.variables[topo.face_node_connectivity]
    conn = np.ma.filled(conn_var[:], -1).astype(int)
    start = int(getattr(conn_var, "start_index", 0))
    face_dim = topo.face_dimension
    candidates = item_variables(nc, face_dim)
    if not candidates:
        fail(nc.filepath() + " has no element items")
    name = find_item(nc, args.item, candidates) if args.item else candidates[0]
    var = nc.variables[name]
    nsteps = var.shape[0]
    if nsteps == 0:
        fail(nc.filepath() + " holds no time step")
    when = times(nc)
    if args.max:
        values = masked(nc, var[:]).max(axis=0)
        title = "Maximum of %s, %s to %s" % (item_name(var), when[0], when[-1])
    else:
        step = args.step if args.step is not None else -1
        if not -nsteps <= step < nsteps:
            fail("step %d is not in the file (steps 0 to %d)" % (step, nsteps - 1))
        values = masked(nc, var[step, :])
        title = "%s at %s" % (item_name(var), when[step])

    polygons = [np.column_stack((x[row[row >= start] - start], y[row[row >= start] - start])) for row in conn]
    fig, ax = plt.subplots(figsize=(9, 7))
    collection = PolyCollection(polygons, array=values, cmap=args.cmap, edgecolors="face", linewidths=0.2)
    if np.ma.count(values) > 0:
        collection.set_clim(values.min(), values.max())
    ax.add_collection(collection)
    ax.autoscale_view()
    ax.set_aspect("equal")
    bar = fig.colorbar(collection, ax=ax, shrink=0.8)
    bar.set_label(label(var))
    ax.set_title(title)
    ax.set_xlabel(getattr(nc.variables[xname], "long_name", xname))
    ax.set_ylabel(getattr(nc.variables[yname], "long_name", yname))
    return fig


def mesh_polygons(path):
    """The elements of the mesh of a .zrnu file as polygons."""
    with netCDF4.Dataset(path) as nc:
        topo = [v for v in nc.variables.values() if getattr(v, "cf_role", "") == "mesh_topology"]
        if not topo:
            fail(path + " has no mesh topology")
        xname, yname = topo[0].node_coordinates.split()
        x = np.asarray(nc.variables[xname][:], dtype=float)
        y = np.asarray(nc.variables[yname][:], dtype=float)
        conn_var = nc.variables[topo[0].face_node_connectivity]
        conn = np.ma.filled(conn_var[:], -1).astype(int)
        start = int(getattr(conn_var, "start_index", 0))
    return [np.column_stack((x[row[row >= start] - start], y[row[row >= start] - start])) for row in conn]


def read_tracks(path):
    """Per particle number, its x and y positions in time order."""
    tracks = {}
    if path.endswith(".nc"):
        with netCDF4.Dataset(path) as nc:
            if getattr(nc, "featureType", "") != "trajectory":
                fail(path + " is not a trajectory file")
            ids = nc.variables["trajectory"][:]
            index = nc.variables["trajectory_index"][:]
            xname, yname = ("lon", "lat") if "lon" in nc.variables else ("x", "y")
            x, y = nc.variables[xname][:], nc.variables[yname][:]
            for k, particle in enumerate(ids):
                mine = index == k
                if mine.any():
                    tracks[int(particle)] = (np.asarray(x[mine]), np.asarray(y[mine]))
        return tracks
    import gzip
    import xml.etree.ElementTree as ET
    opener = gzip.open if path.endswith(".gz") else open
    with opener(path, "rb") as f:
        for _, element in ET.iterparse(f):
            if element.tag != "Particle":
                continue
            values = "".join(element.itertext()).split()
            xs, ys = tracks.setdefault(int(element.get("Nr")), ([], []))
            xs.append(float(values[0]))
            ys.append(float(values[1]))
            element.clear()
    return {k: (np.array(v[0]), np.array(v[1])) for k, v in tracks.items()}


def plot_tracks(args):
    tracks = read_tracks(args.file)
    if not tracks:
        fail(args.file + " holds no particle positions")
    fig, ax = plt.subplots(figsize=(10, 6))
    if args.mesh:
        ax.add_collection(PolyCollection(mesh_polygons(args.mesh), facecolors="none", edgecolors="0.8",
                                         linewidths=0.3))
    colours = plt.get_cmap(args.cmap)
    for k, (particle, (x, y)) in enumerate(sorted(tracks.items())):
        colour = colours(k / max(1, len(tracks) - 1))
        ax.plot(x, y, color=colour, linewidth=0.6)
        ax.plot(x[-1:], y[-1:], marker=".", color=colour, markersize=3)
    ax.autoscale_view()
    ax.set_aspect("equal")
    ax.set_title("Tracks of %d particles (%s)" % (len(tracks), args.file.rsplit("/", 1)[-1]))
    ax.set_xlabel("x")
    ax.set_ylabel("y")
    return fig


def plot_series(nc, args):
    candidates = [n for n in item_variables(nc) if nc.variables[n].dimensions == ("time",)]
    if not candidates:
        fail(nc.filepath() + " has no time series items")
    names = [find_item(nc, item, candidates) for item in args.item_list] if args.item_list else candidates
    units = []
    for name in names:
        unit = getattr(nc.variables[name], "units", "")
        if unit not in units:
            units.append(unit)
    when = times(nc)
    fig, axes = plt.subplots(len(units), 1, figsize=(10, 3.5 * len(units)), sharex=True, squeeze=False)
    for panel, unit in zip(axes[:, 0], units):
        for name in names:
            var = nc.variables[name]
            if getattr(var, "units", "") == unit:
                panel.plot(when, masked(nc, var[:]), marker="." if len(when) < 50 else None,
                           label=item_name(var))
        panel.set_ylabel(unit)
        panel.grid(True, alpha=0.3)
        panel.legend(fontsize="small")
    axes[0, 0].set_title(getattr(nc, "title", "") or nc.filepath())
    axes[-1, 0].set_xlabel("time")
    fig.autofmt_xdate()
    return fig


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("file", help="a .zrnu (map) or .zrn0 (time series) result file, or a particle track file")
    parser.add_argument("--mesh", help="a .zrnu file whose mesh is drawn under particle tracks")
    parser.add_argument("--item", action="append", dest="item_list",
                        help="item name or variable name (map: one; series: repeat for several)")
    parser.add_argument("--step", type=int, help="step of a map, from 0; negative from the end (default: last)")
    parser.add_argument("--max", action="store_true", help="map the maximum over all steps")
    parser.add_argument("--cmap", default="viridis", help="matplotlib colour map of a map")
    parser.add_argument("-o", "--output", help="PNG file (default: the result file's name with .png)")
    args = parser.parse_args()
    args.item = args.item_list[0] if args.item_list else None
    output = args.output or args.file.rsplit(".", 1)[0] + ".png"
    if args.file.endswith((".xml", ".xml.gz")):
        fig = plot_tracks(args)
    else:
        try:
            nc = netCDF4.Dataset(args.file)
        except OSError as error:
            fail("cannot open %s: %s" % (args.file, error))
        with nc:
            trajectory = getattr(nc, "featureType", "") == "trajectory"
            is_mesh = any(getattr(v, "cf_role", "") == "mesh_topology" for v in nc.variables.values())
            if not trajectory:
                fig = plot_map(nc, args) if is_mesh else plot_series(nc, args)
        if trajectory:
            fig = plot_tracks(args)
    fig.tight_layout()
    fig.savefig(output, dpi=120)
    print(output)


if __name__ == "__main__":
    main()
