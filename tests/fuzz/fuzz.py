#!/usr/bin/python3
"""Runs the engine on malformed inputs derived from one small valid case.

    fuzz.py VANTORHD BIN_DIR WORK_DIR [--timeout S] [--jobs N] [--keep] [--only KIND]

The valid case: a 4 x 3 cell basin of 24 triangles with an open west side
driven by a water-level series (tide.zrn0), a map, a point and a line output,
four time steps. From it come, by a fixed (deterministic) recipe:

  setup    the setup file with values of the wrong type, out-of-range values
           (negative, zero, huge, NaN, infinite), keys and sections removed
           or misspelt;
  mesh.*   the mesh in every format the engine reads (mesh, zrnu, 2dm, 14,
           fem, geo, bat, node/topology) cut short, with counts changed,
           numbers replaced by NaN, infinite, huge or non-numeric values,
           and with zero-area, repeated-node, duplicated and out-of-range
           elements and coincident nodes;
  data     the water-level series with NaN values, times out of order or
           repeated, too short a span, wrong item numbers, files of the
           wrong kind, cut short or empty.

Every run must end with status 0 or 1 within the time limit, with no
sanitizer report on its error stream; a run that ends with status 1 must
name the file or the setup section (or keyword) that was changed in its
fatal error or the log lines just before it; every result file the run left
must open with `zrntool info`. The script prints the inputs tried by kind
and the failures, and exits with status 1 when there is any failure.
"""
import argparse
import concurrent.futures
import math
import os
import re
import shutil
import subprocess
import sys
import time

import netCDF4
import numpy as np

NX, NY, D = 4, 3, 100.0
X0, Y0 = 500000.0, 6000000.0
SETUP = """[VantorHD]

[VantorHD.TIME]
start_time = [2004, 1, 1, 0, 0, 0]
time_step_interval = 30.0
number_of_time_steps = 4

[VantorHD.DOMAIN]
file_name = "{mesh}"

[VantorHD.MODULE_SELECTION]
mode_of_hydrodynamic_module = 2

[VantorHD.HYDRODYNAMIC_MODULE]
mode = 2

[VantorHD.HYDRODYNAMIC_MODULE.SOLUTION_TECHNIQUE]
scheme_of_time_integration = 2
scheme_of_space_discretization_horizontal = 2
CFL_critical_HD = 0.8

[VantorHD.HYDRODYNAMIC_MODULE.FLOOD_AND_DRY]
type = 1

[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE]
type = 4
[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.MANNING_NUMBER]
format = 0
constant_value = 40.0

[VantorHD.HYDRODYNAMIC_MODULE.INITIAL_CONDITIONS]
type = 1
surface_elevation_constant = 0.0

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_1]
type = 1

[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS.CODE_2]
type = 6
format = 1
file_name = "tide.zrn0"
item_number = 1

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS]
number_of_outputs = 3

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1]
file_name = "area.zrnu"
format = 2
time_step_frequency = 2
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_1.PARAMETERS_2D]
SURFACE_ELEVATION = true
CURRENT_SPEED = true

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2]
file_name = "gauges.zrn0"
format = 0
number_of_points = 1
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.POINT_1]
name = "Middle"
x = 500150.0
y = 6000150.0
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_2.PARAMETERS_2D]
SURFACE_ELEVATION = true

[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_3]
file_name = "line.zrn0"
type = 4
format = 1
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_3.LINE]
x_first = 500200.0
y_first = 5999990.0
x_last = 500200.0
y_last = 6000310.0
[VantorHD.HYDRODYNAMIC_MODULE.OUTPUTS.OUTPUT_3.DISCHARGE]
DISCHARGE = true
"""
RESULTS = ("area.zrnu", "gauges.zrn0", "line.zrn0")


# ---- the valid mesh and its formats -------------------------------------------------------

def base_mesh():
    """Nodes (x, y, z, code) and triangles (node numbers from 1)."""
    nodes = []
    for j in range(NY + 1):
        for i in range(NX + 1):
            code = 0
            if i == 0 and 0 < j < NY:
                code = 2
            elif i in (0, NX) or j in (0, NY):
                code = 1
            nodes.append([X0 + i * D, Y0 + j * D, -3.0 + 0.2 * i, code])
    elems = []
    for j in range(NY):
        for i in range(NX):
            a = j * (NX + 1) + i + 1
            b, c, d = a + 1, a + NX + 2, a + NX + 1
            elems += [[a, b, c], [a, c, d]]
    return nodes, elems


def num(v):
    return v if isinstance(v, str) else repr(float(v)) if isinstance(v, float) else str(v)


def write_mesh(d, nodes, elems):
    out = ["100079 1000 %d UTM-32" % len(nodes)]
    out += ["%d %s %s %s %d" % (k + 1, num(n[0]), num(n[1]), num(n[2]), n[3]) for k, n in enumerate(nodes)]
    width = max(len(e) for e in elems)
    out.append("%d %d %d" % (len(elems), width, 21 if width == 3 else 25))
    out += ["%d " % (k + 1) + " ".join(str(v) for v in e + [0] * (width - len(e))) for k, e in enumerate(elems)]
    return {"grid.mesh": "\n".join(out) + "\n"}


def open_string(nodes):
    return [k + 1 for k, n in enumerate(nodes) if n[3] == 2] or [1]


def write_2dm(d, nodes, elems):
    out = ["MESH2D", "coordinate_type UTM-32"]
    out += ["E%dT %d %s 1" % (len(e), k + 1, " ".join(map(str, e))) if len(e) == 3 else
            "E4Q %d %s 1" % (k + 1, " ".join(map(str, e))) for k, e in enumerate(elems)]
    out += ["ND %d %s %s %s" % (k + 1, num(n[0]), num(n[1]), num(n[2])) for k, n in enumerate(nodes)]
    s = open_string(nodes)
    out.append("NS " + " ".join(map(str, s[:-1] + [-s[-1]])))
    return {"grid.2dm": "\n".join(out) + "\n"}


def write_adcirc(d, nodes, elems):
    out = ["basin", "%d %d" % (len(elems), len(nodes))]
    out += ["%d %s %s %s" % (k + 1, num(n[0]), num(n[1]), num(-n[2] if not isinstance(n[2], str) else n[2]))
            for k, n in enumerate(nodes)]
    out += ["%d %d %s" % (k + 1, len(e), " ".join(map(str, e))) for k, e in enumerate(elems)]
    s = open_string(nodes)
    out += ["1 = open boundaries", "%d = open boundary nodes" % len(s), "%d 0" % len(s)] + [str(v) for v in s]
    out += ["0 = land boundaries", "0 = land boundary nodes"]
    return {"grid.14": "\n".join(out) + "\n"}


def write_fem(d, nodes, elems):
    width = max(len(e) for e in elems)
    out = ["coordinate_type UTM-32", "DIMENS", "%d %d %d" % (len(nodes), len(elems), width), "NODE"]
    out += [" ".join(map(str, e + [0] * (width - len(e)))) for e in elems]
    out += ["COOR", " ".join(num(n[0]) for n in nodes), " ".join(num(n[1]) for n in nodes), "ELEV_I"]
    out += ["%s %d" % (num(n[2]), k + 1) for k, n in enumerate(nodes)]
    return {"grid.fem": "\n".join(out) + "\n"}


def write_geo(d, nodes, elems):
    out = ["coordinate_type UTM-32", "Vertices %d" % len(nodes)]
    out += ["%s %s %s %d" % (num(n[0]), num(n[1]), num(n[2]), n[3]) for n in nodes]
    tri = [e for e in elems if len(e) == 3]
    quad = [e for e in elems if len(e) == 4]
    out += ["Triangles %d" % len(tri)] + [" ".join(map(str, e)) for e in tri]
    if quad:
        out += ["Quadrilaterals %d" % len(quad)] + [" ".join(map(str, e)) for e in quad]
    out.append("End")
    return {"grid.geo": "\n".join(out) + "\n"}


def write_quoddy(d, nodes, elems):
    return {"grid.nod": "".join("%d %s %s\n" % (k + 1, num(n[0]), num(n[1])) for k, n in enumerate(nodes)),
            "grid.ele": "".join("%d %s\n" % (k + 1, " ".join(map(str, e))) for k, e in enumerate(elems)),
            "grid.bat": "".join("%d %s\n" % (k + 1, num(-n[2] if not isinstance(n[2], str) else n[2]))
                                for k, n in enumerate(nodes))}


def write_nodetopo(d, nodes, elems):
    width = max(len(e) for e in elems)
    node = ["%d 2 1 1" % len(nodes)] + ["%d %s %s %s %d" % (k + 1, num(n[0]), num(n[1]), num(n[2]), n[3])
                                        for k, n in enumerate(nodes)]
    topo = ["%d %d 0" % (len(elems), width)] + ["%d %s" % (k + 1, " ".join(map(str, e))) for k, e in
                                                enumerate(elems)]
    return {"grid.node": "\n".join(node) + "\n", "grid.topo": "\n".join(topo) + "\n"}


FORMATS = {  # kind -> (writer of the files, mesh file named in the setup)
    "mesh": (write_mesh, "grid.mesh"),
    "2dm": (write_2dm, "grid.2dm"),
    "14": (write_adcirc, "grid.14"),
    "fem": (write_fem, "grid.fem"),
    "geo": (write_geo, "grid.geo"),
    "bat": (write_quoddy, "grid.bat"),
    "nodetopo": (write_nodetopo, "grid.nt"),
}


def mesh_variants():
    """(name, nodes, elements) of the mesh-level faults."""
    nodes, elems = base_mesh()
    def v(name, f):
        n, e = [list(x) for x in nodes], [list(x) for x in elems]
        f(n, e)
        return name, n, e
    out = [
        v("repeated_node", lambda n, e: e.__setitem__(2, [e[2][0], e[2][1], e[2][1]])),
        v("duplicated_element", lambda n, e: e.append(list(e[5]))),
        v("duplicated_reversed", lambda n, e: e.append(list(reversed(e[5])))),
        v("zero_area", lambda n, e: e.append([1, 2, 3])),
        v("coincident_nodes", lambda n, e: n[7].__setitem__(slice(0, 2), n[8][:2])),
        v("node_out_of_range", lambda n, e: e[4].__setitem__(2, 999)),
        v("node_zero", lambda n, e: e[4].__setitem__(1, 0)),
        v("node_negative", lambda n, e: e[4].__setitem__(1, -3)),
        v("unused_node", lambda n, e: n.append([X0 + 50, Y0 + 50, -1.0, 0])),
        v("nan_x", lambda n, e: n[6].__setitem__(0, "nan")),
        v("inf_z", lambda n, e: n[6].__setitem__(2, "inf")),
        v("neg_inf_y", lambda n, e: n[3].__setitem__(1, "-inf")),
        v("huge_x", lambda n, e: n[6].__setitem__(0, 1e308)),
        v("huge_z", lambda n, e: n[6].__setitem__(2, -1e300)),
        v("quad_last_repeated", lambda n, e: e.__setitem__(0, e[0] + [e[0][2]])),
        v("quad_first_repeated", lambda n, e: e.__setitem__(0, [e[0][0]] + e[0])),
        v("clockwise", lambda n, e: e.__setitem__(3, list(reversed(e[3])))),
        v("overlapping", lambda n, e: e.append([1, 3, 13])),
        v("tiny_element", lambda n, e: n[6].__setitem__(0, n[7][0] - 1e-9)),
        v("no_elements_of_node", lambda n, e: e.__delitem__(slice(0, 2))),
    ]
    return out


NUMBER = re.compile(r"-?\d+(\.\d*)?([eE][-+]?\d+)?")
REPLACEMENTS = ["nan", "-1", "200000000", "x"]


def text_variants(text):
    """(name, text) of text-level faults: truncation and numbers replaced."""
    out = []
    for frac in (0.3, 0.6, 0.97):
        out.append(("cut%d" % int(frac * 100), text[:int(len(text) * frac)]))
    lines = text.split("\n")
    numbered = [k for k, l in enumerate(lines) if NUMBER.search(l)]
    picks = sorted(set([numbered[0], numbered[len(numbered) // 2], numbered[-1]]))
    for k in picks:
        m = NUMBER.search(lines[k])
        for r in REPLACEMENTS:
            changed = list(lines)
            changed[k] = lines[k][:m.start()] + r + lines[k][m.end():]
            out.append(("line%d_%s" % (k + 1, r), "\n".join(changed)))
    out.append(("empty", ""))
    return out


# ---- running -----------------------------------------------------------------------------------

class Harness:
    def __init__(self, args):
        self.args = args
        self.work = os.path.abspath(args.work)
        self.bin = os.path.abspath(args.bin)
        self.engine = os.path.abspath(args.engine)
        self.tried = {}
        self.failures = []  # appended from several threads (list.append is atomic)
        self.jobs = []

    def tool(self, *argv):
        return subprocess.run([os.path.join(self.bin, argv[0])] + list(argv[1:]), capture_output=True,
                              text=True, timeout=60)

    def case(self, kind, name, files, names, mesh="grid.mesh", setup=None, expect_ok=False):
        """Writes `files` (name -> text, bytes or a path to copy) beside the
        base inputs and runs the engine; `names` are the texts of which one
        must appear in a fatal error."""
        if self.args.only and not kind.startswith(self.args.only):
            return
        d = os.path.join(self.work, "%s__%s" % (kind, name))
        if any(job[2] == d for job in self.jobs):
            sys.exit("fuzz: two cases named " + d)
        shutil.rmtree(d, ignore_errors=True)
        shutil.copytree(self.base, d)
        for f, content in files.items():
            path = os.path.join(d, f)
            if isinstance(content, bytes):
                open(path, "wb").write(content)
            elif content is None:
                os.remove(path)
            elif os.path.isabs(content):
                shutil.copy(content, path)
            else:
                open(path, "w").write(content)
        if setup is None:
            setup = SETUP.format(mesh=mesh)
        open(os.path.join(d, "setup.toml"), "w").write(setup)
        self.tried[kind] = self.tried.get(kind, 0) + 1
        self.jobs.append((kind, name, d, names, expect_ok))

    def run_all(self):
        """Runs the cases written so far, several at a time."""
        def one(job):
            failed = len(self.failures)
            self.run(*job)
            if not self.args.keep and len(self.failures) == failed:
                shutil.rmtree(job[2], ignore_errors=True)
        with concurrent.futures.ThreadPoolExecutor(self.args.jobs) as pool:
            list(pool.map(one, self.jobs))
        self.jobs = []

    def run(self, kind, name, d, names, expect_ok):
        label = "%s/%s" % (kind, name)
        # A single process without the MPI launcher's helper daemon: most of
        # a run's time is the message-passing start otherwise.
        env = dict(os.environ, TANO_PROGRESS="NONE", OMP_NUM_THREADS="1", OMPI_MCA_ess_singleton_isolated="1")
        for attempt in range(3):
            try:
                p = subprocess.run([self.engine, "setup.toml"], cwd=d, capture_output=True, text=True,
                                   errors="replace", timeout=self.args.timeout, env=env)
            except subprocess.TimeoutExpired:
                self.failures.append((label, "hang (more than %g s)" % self.args.timeout, d))
                return
            # Now and then the message-passing start fails when several
            # single processes start at once; the input was not read then.
            if "before MPI_INIT completed" not in p.stderr + p.stdout:
                break
        out = p.stdout + p.stderr
        if re.search(r"runtime error:|AddressSanitizer|LeakSanitizer|UndefinedBehaviorSanitizer", p.stderr):
            self.failures.append((label, "sanitizer report:\n" + p.stderr[-3000:], d))
            return
        if p.returncode not in (0, 1):
            self.failures.append((label, "status %d\n%s" % (p.returncode, out[-2000:]), d))
            return
        if expect_ok and p.returncode != 0:
            self.failures.append((label, "the valid case failed:\n" + out[-2000:], d))
            return
        if p.returncode == 1:
            # The message: the last lines the run printed, the log lines
            # around its first fatal error and the section open then
            # (wrapped lines joined again).
            log = os.path.join(d, "setup.log")
            logtext = open(log, errors="replace").read() if os.path.exists(log) else ""
            printed = [l for l in re.sub(r"\n +", "", out).split("\n") if l.strip()]
            lines = re.sub(r"\n {6,}", "", logtext).split("\n")
            at = next((k for k, l in enumerate(lines) if "Fatal error" in l), len(lines))
            section = [l for l in lines[:at] if l.strip().startswith("Section:")][-1:]
            message = "\n".join(printed[-4:] + lines[max(0, at - 4):at + 1] + section)
            if not printed:
                self.failures.append((label, "status 1 without a message", d))
                return
            if not any(n in message for n in names):
                self.failures.append((label, "the message names none of %s:\n%s" % (names, message), d))
                return
        for r in RESULTS:
            path = os.path.join(d, r)
            if os.path.exists(path):
                q = self.tool("zrntool", "info", path)
                if q.returncode != 0:
                    self.failures.append((label, "result %s unreadable: %s" % (r, q.stderr.strip()), d))
                    return

    # ---- the base case -----------------------------------------------------------------------

    def make_base(self):
        self.base = os.path.join(self.work, "base")
        shutil.rmtree(self.base, ignore_errors=True)
        os.makedirs(self.base)
        nodes, elems = base_mesh()
        for writer, _ in FORMATS.values():
            for f, text in writer(self.base, nodes, elems).items():
                open(os.path.join(self.base, f), "w").write(text)
        q = self.tool("meshconvert", os.path.join(self.base, "grid.mesh"), os.path.join(self.base, "grid.zrnu"))
        if q.returncode != 0:
            sys.exit("fuzz: meshconvert failed: " + q.stderr)
        rows = ["time,level"]
        for k in range(13):
            rows.append("2004-01-01 00:%02d:00,%.3f" % (k, 0.1 * math.sin(k / 3.0)))
        open(os.path.join(self.base, "tide.csv"), "w").write("\n".join(rows) + "\n")
        self.csv("tide.csv", "tide.zrn0", self.base)

    def csv(self, src, dst, d):
        q = self.tool("zrntool", "csv2zrn0", os.path.join(d, src), os.path.join(d, dst), "--type", "100000")
        return q.returncode == 0

    # ---- the kinds of inputs ------------------------------------------------------------------

    def valid(self):
        for kind, (_, mesh) in FORMATS.items():
            self.case("valid", kind, {}, [], mesh=mesh, expect_ok=True)
        self.case("valid", "zrnu", {}, [], mesh="grid.zrnu", expect_ok=True)

    def setup_cases(self):
        text = SETUP.format(mesh="grid.mesh")
        lines = text.split("\n")
        keys = [(k, l.split("=")[0].strip()) for k, l in enumerate(lines) if "=" in l]
        sections = [(k, l.strip("[]")) for k, l in enumerate(lines) if l.startswith("[")]
        values = ['"text"', "2.5", "-1", "1e308", "nan"]
        # A fault may show in a later section that depends on the value (a
        # module mode checked against the module's own mode): any section
        # named counts.
        every_section = [s.split(".")[-1] for _, s in sections]
        for k, key in keys:
            section = [s for j, s in sections if j < k][-1]
            names = [key, section] + every_section
            for i, v in enumerate(values):
                changed = list(lines)
                changed[k] = "%s = %s" % (key, v)
                self.case("setup.value", "line%d_%s_%d" % (k + 1, key, i), {}, names, setup="\n".join(changed))
            changed = list(lines)
            del changed[k]
            self.case("setup.missing_key", "line%d_%s" % (k + 1, key), {}, names, setup="\n".join(changed))
            changed = list(lines)
            misspelt = key[:-2] + key[-1] + key[-2] if len(key) > 1 else key + key
            changed[k] = changed[k].replace(key, misspelt, 1)
            self.case("setup.misspelt_key", "line%d_%s" % (k + 1, key), {}, names, setup="\n".join(changed))
        for k, section in sections:
            end = next((j for j, l in sections if j > k), len(lines))
            names = [section.split(".")[-1], section]
            changed = lines[:k] + lines[end:]
            self.case("setup.missing_section", section, {}, names, setup="\n".join(changed))
            changed = list(lines)
            last = section.split(".")[-1]
            changed[k] = "[%s]" % (section[:-len(last)] + last[:-2] + last[-1] + last[-2])
            self.case("setup.misspelt_section", section, {}, names, setup="\n".join(changed))
        for k, bad in enumerate(["[VantorHD.TIME\nx = 1", "[VantorHD]\n[VantorHD]", "= 3", "\x00\x01",
                                 "[VantorHD.TIME]\nstart_time = [2004, 13, 45, 25, 61, 61]"]):
            self.case("setup.syntax", str(k), {}, ["setup.toml", "TIME", "start_time"],
                      setup=text + "\n" + bad + "\n")

    def mesh_cases(self):
        for kind, (writer, mesh) in FORMATS.items():
            names = [os.path.basename(mesh), os.path.splitext(os.path.basename(mesh))[0]]
            for name, nodes, elems in mesh_variants():
                self.case("mesh." + kind, name, writer(None, nodes, elems), names, mesh=mesh)
            for f, text in writer(None, *base_mesh()).items():
                for name, changed in text_variants(text):
                    self.case("mesh." + kind, "%s_%s" % (f.replace(".", "_"), name), {f: changed},
                              names + [f], mesh=mesh)
        self.zrnu_cases()

    def zrnu_cases(self):
        src = os.path.join(self.base, "grid.zrnu")
        names = ["grid.zrnu"]
        edits = {
            "nan_x": lambda n: n["mesh2d_node_x"].__setitem__(3, np.nan),
            "inf_y": lambda n: n["mesh2d_node_y"].__setitem__(3, np.inf),
            "nan_z": lambda n: n["mesh2d_node_z"].__setitem__(5, np.nan),
            "huge_x": lambda n: n["mesh2d_node_x"].__setitem__(5, 1e308),
            "coincident": lambda n: n["mesh2d_node_x"].__setitem__(7, n["mesh2d_node_x"][8]),
            "repeated_node": lambda n: n["mesh2d_face_nodes"].__setitem__((2, 2), n["mesh2d_face_nodes"][2, 1]),
            "duplicated_element": lambda n: n["mesh2d_face_nodes"].__setitem__(3, n["mesh2d_face_nodes"][2]),
            "zero_area": lambda n: n["mesh2d_face_nodes"].__setitem__(0, [0, 1, 2]),
            "node_out_of_range": lambda n: n["mesh2d_face_nodes"].__setitem__((1, 1), 500),
            "node_negative": lambda n: n["mesh2d_face_nodes"].__setitem__((1, 1), -7),
            "node_ids_shuffled": lambda n: n["mesh2d_node_id"].__setitem__(slice(0, 3), [3, 1, 2]),
            "node_ids_repeated": lambda n: n["mesh2d_node_id"].__setitem__(slice(0, 2), [1, 1]),
            "node_ids_huge": lambda n: n["mesh2d_node_id"].__setitem__(0, 2147483647),
            "element_type_bad": lambda n: n["mesh2d_face_type"].__setitem__(4, 99),
            "element_type_quad": lambda n: n["mesh2d_face_type"].__setitem__(4, 25),
            "element_ids_repeated": lambda n: n["mesh2d_face_id"].__setitem__(slice(0, 2), [1, 1]),
            "code_huge": lambda n: n["mesh2d_node_code"].__setitem__(0, 2147483647),
            "code_negative": lambda n: n["mesh2d_node_code"].__setitem__(0, -5),
            "block_counts": lambda n: n.setncattr("zrn_block_TANO_KX", np.array([200000000, 2, 2, 0, 0], "i4")),
            "block_ndim": lambda n: n.setncattr("zrn_block_TANO_KX", np.array([20, 24, 3, 5, 2], "i4")),
            "no_topology": lambda n: n["mesh2d"].delncattr("cf_role"),
            "no_coordinates": lambda n: n["mesh2d"].setncattr("node_coordinates", "nothing"),
        }
        for name, edit in edits.items():
            path = os.path.join(self.work, "edit.zrnu")
            shutil.copy(src, path)
            try:
                with netCDF4.Dataset(path, "a") as n:
                    n.set_auto_mask(False)
                    edit(n)
            except (KeyError, IndexError, AttributeError) as e:
                sys.exit("fuzz: cannot make the zrnu case %s: %s" % (name, e))
            self.case("mesh.zrnu", name, {"grid.zrnu": open(path, "rb").read()}, names, mesh="grid.zrnu")
        data = open(src, "rb").read()
        for frac in (0.1, 0.5, 0.9, 0.99):
            self.case("mesh.zrnu", "cut%d" % int(frac * 100), {"grid.zrnu": data[:int(len(data) * frac)]}, names,
                      mesh="grid.zrnu")
        for k in range(8):  # single bytes changed across the file
            b = bytearray(data)
            b[(k * 7919 + 101) % len(b)] ^= 0x5A
            self.case("mesh.zrnu", "byte%d" % k, {"grid.zrnu": bytes(b)}, names, mesh="grid.zrnu")

    def data_cases(self):
        names = ["tide.zrn0", "CODE_2", "BOUNDARY_CONDITIONS"]
        rows = open(os.path.join(self.base, "tide.csv")).read().split("\n")
        csv_cases = {
            "nan_value": rows[:5] + [rows[5].split(",")[0] + ",NaN"] + rows[6:],
            "all_nan": [rows[0]] + [r.split(",")[0] + ",NaN" for r in rows[1:] if r],
            "one_step": rows[:2],
            "short_span": rows[:3],
            "starts_late": [rows[0]] + rows[4:],
            "missing_value": rows[:5] + [rows[5].split(",")[0] + ","] + rows[6:],
            "huge_value": rows[:5] + [rows[5].split(",")[0] + ",1e38"] + rows[6:],
            "two_items": [rows[0] + ",b"] + [r + ",1.0" for r in rows[1:] if r],
        }
        for name, lines in csv_cases.items():
            d = os.path.join(self.work, "csv")
            os.makedirs(d, exist_ok=True)
            open(os.path.join(d, "t.csv"), "w").write("\n".join(lines) + "\n")
            if os.path.exists(os.path.join(d, "t.zrn0")):
                os.remove(os.path.join(d, "t.zrn0"))
            if self.csv("t.csv", "t.zrn0", d):
                self.case("data", "csv_" + name, {"tide.zrn0": open(os.path.join(d, "t.zrn0"), "rb").read()}, names)
        src = os.path.join(self.base, "tide.zrn0")
        edits = {
            "time_reversed": lambda n: n["time"].__setitem__(slice(None), n["time"][::-1]),
            "time_repeated": lambda n: n["time"].__setitem__(3, n["time"][2]),
            "time_out_of_order": lambda n: n["time"].__setitem__(slice(2, 4), n["time"][2:4][::-1]),
            "time_nan": lambda n: n["time"].__setitem__(4, np.nan),
            "time_huge": lambda n: n["time"].__setitem__(4, 1e300),
            "values_nan": lambda n: [v.__setitem__(slice(None), np.nan) for k, v in n.variables.items()
                                     if k != "time" and v.dimensions == ("time",)],
            "values_inf": lambda n: [v.__setitem__(3, np.inf) for k, v in n.variables.items()
                                     if k != "time" and v.dimensions == ("time",)],
        }
        for name, edit in edits.items():
            path = os.path.join(self.work, "edit.zrn0")
            shutil.copy(src, path)
            with netCDF4.Dataset(path, "a") as n:
                n.set_auto_mask(False)
                edit(n)
            self.case("data", name, {"tide.zrn0": open(path, "rb").read()}, names)
        data = open(src, "rb").read()
        for frac in (0.0, 0.2, 0.6, 0.95):
            self.case("data", "cut%d" % int(frac * 100), {"tide.zrn0": data[:int(len(data) * frac)]}, names)
        self.case("data", "missing", {"tide.zrn0": None}, names)
        self.case("data", "text", {"tide.zrn0": "time,level\n"}, names)
        self.case("data", "mesh_file", {"tide.zrn0": os.path.join(self.base, "grid.zrnu")}, names)
        setup = SETUP.format(mesh="grid.mesh")
        for item in ("0", "2", "-1", "2147483647"):
            self.case("data", "item_" + item, {}, names + ["item_number"],
                      setup=setup.replace("item_number = 1", "item_number = " + item))
        for fmt in ("2", "3", "4", "5", "-1"):
            self.case("data", "format_" + fmt, {}, names + ["format"],
                      setup=setup.replace("type = 6\nformat = 1", "type = 6\nformat = " + fmt))
        for other in ("grid.zrnu", "grid.mesh", "nothere.zrn0", "", "tide.csv"):
            self.case("data", "file_" + (other or "blank"), {}, names + [other or "file_name"],
                      setup=setup.replace('file_name = "tide.zrn0"', 'file_name = "%s"' % other))


def main():
    p = argparse.ArgumentParser()
    p.add_argument("engine")
    p.add_argument("bin")
    p.add_argument("work")
    p.add_argument("--timeout", type=float, default=30.0)
    p.add_argument("--keep", action="store_true")
    p.add_argument("--only", default="")
    # Most of a run's time is spent waiting in the message-passing start:
    # twice as many runs as processors keep them busy.
    p.add_argument("--jobs", type=int, default=2 * (os.cpu_count() or 1))
    args = p.parse_args()
    h = Harness(args)
    os.makedirs(h.work, exist_ok=True)
    start = time.time()
    h.make_base()
    h.valid()
    h.run_all()
    if h.failures:
        print("fuzz: the valid case fails; nothing else is tried")
        for label, what, d in h.failures:
            print("---- %s (%s)\n%s" % (label, d, what))
        return 1
    h.setup_cases()
    h.mesh_cases()
    h.data_cases()
    h.run_all()
    print("fuzz: inputs tried by kind")
    groups = {}
    for kind, n in sorted(h.tried.items()):
        print("  %-24s %5d" % (kind, n))
        groups[kind.split(".")[0]] = groups.get(kind.split(".")[0], 0) + n
    print("  %-24s %5d  (%s)" % ("total", sum(h.tried.values()),
                                 ", ".join("%s %d" % g for g in sorted(groups.items()))))
    print("fuzz: %d failures in %.0f s" % (len(h.failures), time.time() - start))
    for label, what, d in h.failures:
        print("---- %s (%s)\n%s" % (label, d, what))
    return 1 if h.failures else 0


if __name__ == "__main__":
    sys.exit(main())
