#!/usr/bin/env python3
"""Mutation testing of the library, run on demand (not part of CI).

Applies a fixed list of small faults ("mutants") to the sources, one at a time; for each it rebuilds the
test program of the mutated module, runs that module's CTest label and reports whether the tests notice:
killed (a test fails or times out), survived (the tests pass) or stillborn (the mutant does not compile;
a build that fails outside the mutated file stops the run as "broken").
Every mutated file is restored afterwards, also on Ctrl-C, and the test programs are rebuilt at the end.

    python3 tools/mutants.py [--source DIR] [--build DIR] [--only ID[,ID...]] [--list] [--jobs N]
                             [--timeout SECONDS] [--report FILE]

--report FILE writes the results as a Markdown table, or as JSON when FILE ends in .json.
"""

import argparse
import json
import os
import re
import signal
import subprocess
import sys
import time
from collections import Counter, namedtuple
from pathlib import Path

Mutant = namedtuple("Mutant", "id label file original replacement description")

EXACT, INTER, BV, COLL = "PolyMathExact", "PolyMathIntersectors", "PolyMathBV", "PolyMathCollections"
BUILD, OBJ, RT, SYS = "BVHBuilders", "BVHObjects", "PolyMathRuntime", "SystemInterfaces"
EXS, EXA = "PolyMathExact.m/src/RKMPolyExactPredicates.cpp", "PolyMathExact.m/src/RKMPolyExactArithmetic.cpp"
EXK, EXC = "PolyMathExact.m/src/RKMPolyAdaptivePredicates.cpp", "PolyMathExact.m/src/RKMPolyConstruction.cpp"
IS = "PolyMathIntersectors.m/src/"
T3, T2, S2 = IS + "RKMPolyTriangleIntersector.cpp", IS + "RKMPolyTriangleIntersector2D.cpp", IS + "RKMPolySegmentIntersector2D.cpp"
BX, BB, BA = "PolyMathBV.m/src/RKMPolyBoxf.cpp", "PolyMathBV.m/src/RKMPolyBVBVOperations.cpp", "PolyMathBV.m/src/RKMPolyBVAbsorb.cpp"
HC = "ProtectedInterfaces/PolyMathCollections/RKMHTableCore.h"
CS, II = "PolyMathCollections.m/src/", "PolyMathCollections.m/src/RKMHTableOfIntInt.cpp"
TB, DO = "BVHBuilders.m/src/RKMBVHTreeBuilder.cpp", "BVHObjects.m/src/RKMBVHDescentOperator.cpp"
TS, SI = "BVHObjects.m/src/RKMBVHTreeSet.cpp", "SystemInterfaces/src/"

MUTANTS = [
    # PolyMathExact: point in polygon, direction codes, snapping and SetMaxCoord, gridded filters and exact
    # stages, the adaptive kernel, constructions.
    Mutant("exact-01", EXACT, EXS, "if (cur.y <= p.y && p.y < prev.y)", "if (cur.y <= p.y && p.y <= prev.y)",
           "point in polygon: half-open crossing rule closed at the upper end (< made <=)"),
    Mutant("exact-02", EXACT, EXS, "Orientation2D(cur, prev, p);\n      onBoundary = o == 0;\n      if (o > 0)",
           "Orientation2D(cur, prev, p);\n      onBoundary = o == 0;\n      if (o < 0)",
           "point in polygon: a downward edge counts the crossing on the wrong side"),
    Mutant("exact-03", EXACT, EXS, "((cur.x <= p.x && p.x <= prev.x) ||", "((cur.x <= p.x || p.x <= prev.x) ||",
           "point in polygon: a horizontal edge claims points of its line beyond its ends (&& made ||)"),
    Mutant("exact-04", EXACT, EXS, "if (az > m)", "if (az >= m)",
           "main axis direction: z wins ties it must lose (> made >=)"),
    Mutant("exact-05", EXACT, EXA, "if (d > m_rangeBound || d < -m_rangeBound)",
           "if (d >= m_rangeBound || d < -m_rangeBound)",
           "snapping: +P itself is treated as beyond the range (> made >=)"),
    Mutant("exact-06", EXACT, EXA, "m_snapConstant = 1.125 * 0x1p53 * eps;", "m_snapConstant = 1.125 * 0x1p52 * eps;",
           "SetMaxCoord: snap constant halved, so values snap to multiples of eps instead of 2 eps"),
    Mutant("exact-07", EXACT, EXA, "static_cast<double>(a) : std::ldexp(1.0, e);",
           "static_cast<double>(a) : std::ldexp(1.0, e + 1);",
           "SetMaxCoord: P is the power of two one above the right one (exponent off by one)"),
    Mutant("exact-08", EXACT, EXA, "if (det < -bound)\n    return -1;", "if (det < bound)\n    return -1;",
           "gridded 3D orientation: dynamic filter answers -1 for everything it cannot decide (sign of the bound)"),
    Mutant("exact-09", EXACT, EXA, "(low1 * m.Bx - low2 * m.Cx + low3 * m.Dx)", "(low1 * m.Bx - low2 * m.Cx - low3 * m.Dx)",
           "gridded 3D orientation, exact stage: sign of the third low part flipped"),
    Mutant("exact-10", EXACT, EXA, "const double r = (low1 * u - low2 * w) + (high1 * u - high2 * w);",
           "const double r = (low2 * u - low1 * w) + (high1 * u - high2 * w);",
           "gridded 2D orientation, exact stage: low parts of the two differences swapped"),
    Mutant("exact-11", EXACT, EXK, "  y = ar + br;\n", "  y = ar - br;\n",
           "adaptive kernel: TwoSum error term computed with the wrong sign"),
    Mutant("exact-12", EXACT, EXK, "if (std::fabs(det) >= ccwerrboundA * detsum && detsum >= kUnderflowGuard)",
           "if (std::fabs(det) >= ccwerrboundA * detsum || detsum >= kUnderflowGuard)",
           "adaptive orient2d: fast filter trusts any product sum above the underflow guard (&& made ||)"),
    Mutant("exact-13", EXACT, EXK, "return (r < 0.0) - (r > 0.0);", "return (r > 0.0) - (r < 0.0);",
           "adaptive 3D orientation: the kernel's sign is not reversed"),
    Mutant("exact-14", EXACT, EXC, "t = std::fabs(d0) / sum;", "t = std::fabs(d1) / sum;",
           "constructions: crossing fraction measured from the wrong end"),
    Mutant("exact-15", EXACT, EXC, "if (v > l[2 * k + 1])", "if (v > l[2 * k])",
           "constructions: clamp into the box compares with the lower limit (index off by one)"),
    # PolyMathIntersectors.
    Mutant("inter-01", INTER, T3, "if (sum1 == 3 || sum1 == -3)", "if (sum1 == 3 || sum1 == -2)",
           "3D triangles: a vertex touching the plane from below is taken as disjoint (constant changed)"),
    Mutant("inter-02", INTER, T3, "  if (o1 > 0)\n    return apart;\n", "",
           "3D triangles: the first interval separation test deleted"),
    Mutant("inter-03", INTER, T3, "if (sq != 0 && sr == 0 && type == Pt::Bar && index == 2)",
           "if (sq != 0 && sr == 0 && type == Pt::Bar && index == 1)",
           "3D triangles: bar ending at a vertex on the plane is not turned into that vertex (index changed)"),
    Mutant("inter-04", INTER, T2, "if (s[0] < 0 || s[1] < 0 || s[2] < 0)", "if (s[0] < 0 || s[1] < 0 || s[2] <= 0)",
           "2D triangles: a vertex on the third edge is not a corner (< made <=)"),
    Mutant("inter-05", INTER, T2, "go(t, t == 0 ? i : j);", "go(t, t == 0 ? j : i);",
           "2D triangles: after a crossing the walk goes on along the other triangle's edge index (operands swapped)"),
    Mutant("inter-06", INTER, T2, "pt.index[t] = (3 - pt.index[t]) % 3;", "pt.index[t] = (4 - pt.index[t]) % 3;",
           "2D triangles: vertex index of a clockwise triangle mapped back off by one"),
    Mutant("inter-07", INTER, S2, "if (o1 + o2 == 2 || o1 + o2 == -2)", "if (o1 + o2 == 2 || o1 + o2 == -1)",
           "2D segments: an end touching the other segment's line from one side is disjoint (constant changed)"),
    Mutant("inter-08", INTER, S2, "SetFeature(1, 1, o3 == 0 ? 0 : 1);", "SetFeature(1, 1, o3 == 0 ? 1 : 0);",
           "2D segments: the touching end of the second segment reported as the other end (operands swapped)"),
    Mutant("inter-09", INTER, IS + "RKMPolyTriangleSegmentIntersector.cpp", "if (sp * sq > 0)", "if (sp * sq >= 0)",
           "triangle-segment 3D: a segment ending on the plane is disjoint (> made >=)"),
    Mutant("inter-10", INTER, IS + "RKMPolyTriangleSegmentIntersector2D.cpp", "if (t3 < 0)", "if (t3 <= 0)",
           "triangle-segment 2D: a segment end on bar 0's line taken as crossing it (< made <=)"),
    Mutant("inter-11", INTER, IS + "RKMPolyGeodesicSegmentIntersector.cpp", "  return s2 > 0;\n}", "  return s1 > 0;\n}",
           "geodesic: point within sector decided by the wrong side sign (operand swapped)"),
    Mutant("inter-12", INTER, IS + "RKMPolyIntersectionPointDefaultConstructor2D.cpp", "(d - c) * (sc / sum)",
           "(d - c) * (sd / sum)", "default point constructor: interpolation fraction from the wrong end"),
    Mutant("inter-13", INTER, IS + "RKMPolyIntersectionPointClosestPointConstructor2D.cpp",
           "const bool onAB = k < 2;", "const bool onAB = k < 1;",
           "closest point constructor: end b measured against its own segment's line (off by one)"),
    # PolyMathBV: the float box's outward rounding, overlap, distances, absorb, OBB sweep.
    Mutant("bv-01", BV, BX, "? -kInf : StepDown(RKMRoundToFloat(d)); }", "? -kInf : StepUp(RKMRoundToFloat(d)); }",
           "float box: a double lower bound is rounded inward (StepDown made StepUp)"),
    Mutant("bv-02", BV, BX, "    return FromBits(i - 1u);\n  if (f == 0.0f)\n    return FromBits(0x80000001u);",
           "    return FromBits(i + 1u);\n  if (f == 0.0f)\n    return FromBits(0x80000001u);",
           "float box: stepping a positive float down goes up instead (nextafter towards the other side)"),
    Mutant("bv-03", BV, BX, "if (other.m_max[i] + tolerance < m_min[i] ||", "if (other.m_max[i] + tolerance <= m_min[i] ||",
           "float box overlap: touching boxes are separated (< made <=)"),
    Mutant("bv-04", BV, BX, "UpperBound(static_cast<double>(m_max[i]) + d);", "UpperBound(static_cast<double>(m_max[i]) - d);",
           "float box: Inflate moves the upper bounds the wrong way (sign)"),
    Mutant("bv-05", BV, BB, "R * R >= s1->GetCenter().SquareDistanceTo(s2->GetCenter());",
           "R * R > s1->GetCenter().SquareDistanceTo(s2->GetCenter());",
           "overlap of unplaced spheres: touching spheres are disjoint (>= made >)"),
    Mutant("bv-06", BV, BB, "ft = std::nextafter(ft, HUGE_VALF);", "ft = std::nextafter(ft, -HUGE_VALF);",
           "overlap of unplaced boxes: float tolerance rounded down instead of up"),
    Mutant("bv-07", BV, BB, "x.c.DistanceTo(y.c) - (x.r + y.r));", "x.c.DistanceTo(y.c) - (x.r - y.r));",
           "minimum distance of two spheres: second radius subtracted (sign)"),
    Mutant("bv-08", BV, BB, "std::fmax(lo - s.t, -s.t - hi)", "std::fmax(lo - s.t, s.t - hi)",
           "minimum distance to a slab: gap below the slab measured from the wrong face (sign)"),
    Mutant("bv-09", BV, BB, "m = PointMaxDistance(x.c, y) + x.r;", "m = PointMaxDistance(x.c, y) - x.r;",
           "maximum distance from a sphere: its radius subtracted (sign)"),
    Mutant("bv-10", BV, BB, "dw >= 0.0 ? dw - h : dw + h;", "dw >= 0.0 ? dw + h : dw - h;",
           "directional distance of spheres: the far contact is taken instead of the near one"),
    Mutant("bv-11", BV, BA, "  if (r1 >= r2 && diff * diff >= d2)\n    return S_FALSE;\n", "",
           "absorb into a sphere: the 'other already inside' branch deleted"),
    Mutant("bv-12", BV, BA, "const double lo = std::fmin(a, -t), hi", "const double lo = std::fmax(a, -t), hi",
           "absorb into a slab: the lower face keeps the larger value (fmin made fmax)"),
    Mutant("bv-13", BV, BA, "c += u * ((reach - r) * 0.5);", "c -= u * ((reach - r) * 0.5);",
           "absorb into a capsule: the axis moves away from the ball (sign)"),
    Mutant("bv-14", BV, "PolyMathBV.m/src/RKMPolyOBBSweep.cpp", "const double t = lo > 0.0 ? lo : hi;",
           "const double t = lo > 0.0 ? hi : lo;", "OBB sweep: the far end of the travel interval is taken"),
    # PolyMathCollections: the hash table core and the tables built on it.
    Mutant("coll-01", COLL, HC, "for (int i = n - 1; i >= 0; --i)", "for (int i = n - 1; i > 0; --i)",
           "hash table core: relinking after growth or copy skips entry 0 (off by one)"),
    Mutant("coll-02", COLL, HC, "    if (hr == S_FALSE && e->data == data)\n      return S_FALSE;\n", "",
           "hash table core: InsertOrUpdate 'same data' branch deleted"),
    Mutant("coll-03", COLL, HC, "else if (hr == S_FALSE && out->data != data)", "else if (hr == S_FALSE && out->data == data)",
           "hash table core: InsertData reports a conflict for equal data (!= made ==)"),
    Mutant("coll-04", COLL, II, "static_cast<unsigned>(q->a) + static_cast<unsigned>(q->b)",
           "static_cast<unsigned>(q->a) - static_cast<unsigned>(q->b)",
           "int pair table: hash no longer symmetric (+ made -)"),
    Mutant("coll-05", COLL, II, "(p->a == q->b && p->b == q->a)", "(p->a == q->b || p->b == q->a)",
           "int pair table: unordered pairs equal when one crossed coordinate matches (&& made ||)"),
    Mutant("coll-06", COLL, CS + "RKMLexicographicOrder.h", "if (na || nb)", "if (na && nb)",
           "point comparisons: a NaN against a number falls to < and > and compares equal (|| made &&)"),
    Mutant("coll-07", COLL, CS + "RKMMapOfNFloatsToInt.cpp", "if (!(u == v) && std::memcmp(&u, &v, sizeof u) != 0)",
           "if (!(u == v) || std::memcmp(&u, &v, sizeof u) != 0)",
           "float key map: keys differ when either test says so; NaN and signed zeros break (&& made ||)"),
    Mutant("coll-08", COLL, CS + "RKMSetOfFloatPoints.cpp", "(slot - base) / 3) + 1;", "(slot - base) / 3);",
           "float point set: freed slot threaded into the free list off by one"),
    # BVHBuilders.
    Mutant("build-01", BUILD, TB, "scale[a] = res / (hi[a] - lo[a]);", "scale[a] = (res - 1) / (hi[a] - lo[a]);",
           "grid builder: centres binned into one cell fewer per axis (constant changed)"),
    Mutant("build-02", BUILD, TB, "for (size_t i = 0; i < count; ++i)\n      if (node->AbsorbChild(children[i]) <= 0)",
           "for (size_t i = 1; i < count; ++i)\n      if (node->AbsorbChild(children[i]) <= 0)",
           "new parent node skips its first child (off by one)"),
    Mutant("build-03", BUILD, TB, "if (count == 1)\n            result = gathered[0];",
           "if (count == 2)\n            result = gathered[0];",
           "grid reduction: a single node does not pass up, a pair passes up its first (constant changed)"),
    Mutant("build-04", BUILD, TB, "if (!found || less(cost, c.cost))", "if (!found && less(cost, c.cost))",
           "best builder: the first live cluster is every cluster's partner (|| made &&)"),
    Mutant("build-05", BUILD, TB, "? !std::isnan(a) : a < b; };", "? !std::isnan(a) : a > b; };",
           "best builder: cost order reversed, the largest union merges first"),
    Mutant("build-06", BUILD, TB, "const bool intoB = A.leaf || (!B.leaf", "const bool intoB = A.leaf && (!B.leaf",
           "best builder: an input leaf may be chosen to take the other as a child (|| made &&)"),
    # BVHObjects: descent, nodes.
    Mutant("objects-01", OBJ, DO, "    if (FAILED(result))\n      break;\n", "",
           "single descent: a failing leaf no longer ends the walk (branch deleted)"),
    Mutant("objects-02", OBJ, DO, "for (int j = 1; j <= cb.Size(); ++j)", "for (int j = 1; j < cb.Size(); ++j)",
           "pair descent: the last child of the second node is never paired (<= made <)"),
    Mutant("objects-03", OBJ, DO, "if (IsStopped() || !Filter(a, b))", "if (IsStopped() && !Filter(a, b))",
           "pair descent: the filter can no longer prune (|| made &&)"),
    Mutant("objects-04", OBJ, "BVHObjects.m/src/RKMBVHNodeConst.cpp", "for (int i = n.m_children.Size(); i >= 1; --i)",
           "for (int i = n.m_children.Size(); i > 1; --i)",
           "node destructor: the first child of each node is not deleted (off by one)"),
    Mutant("objects-05", OBJ, "BVHObjects.m/src/RKMBVHNode.cpp", "else if (SUCCEEDED(RKMPolyBVBVOperations::Absorb(volume, other)))",
           "else if (FAILED(RKMPolyBVBVOperations::Absorb(volume, other)))",
           "absorbing a child: a successful absorb is replaced by all of space (condition negated)"),
    # BVHTreeSets (its tests run under the BVHObjects label).
    Mutant("treeset-01", OBJ, TS, "if (!T->GetMatrix().IsScaling() && T->GetMatrix().MakeIsometry(iso))",
           "if (!T->GetMatrix().IsScaling() || T->GetMatrix().MakeIsometry(iso))",
           "tree set placement: a scaling is replaced by the identity (&& made ||)"),
    Mutant("treeset-02", OBJ, TS, "  attribute->position = placed ? P : _Identity;\n  OverAllTreeNeedsUpdate();\n  return S_OK;",
           "  attribute->position = placed ? _Identity : P;\n  OverAllTreeNeedsUpdate();\n  return S_OK;",
           "tree set: ModifyTreePosition records the position the other way round (operands swapped)"),
    Mutant("treeset-03", OBJ, TS, "  RKMBVHNode *leaf = Leaf(id);\n  if (!leaf)\n    return E_INVALIDARG;\n  OverAllTreeNeedsUpdate();",
           "  RKMBVHNode *leaf = Leaf(id);\n  OverAllTreeNeedsUpdate();",
           "tree set: removing an unknown id succeeds (branch deleted)"),
    # PolyMathRuntime.
    Mutant("runtime-01", RT, "PolyMathRuntime.m/src/RKMRefCounted.cpp", "if (count == 0)", "if (count < 0)",
           "reference counting: the last Release never deletes (== made <)"),
    Mutant("runtime-02", RT, "PolyMathRuntime.m/src/RKMPolyAtomicOperations.cpp", "before & ~bits, before", "before & bits, before",
           "atomic test-and-reset keeps only the given bits instead of clearing them"),
    Mutant("runtime-03", RT, "PolyMathRuntime.m/src/RKMPolyLittleTimer.cpp", "static_cast<double>(m_stop - m_start)",
           "static_cast<double>(m_start - m_stop)", "timer: elapsed time accumulated with the wrong sign (operands swapped)"),
    Mutant("runtime-04", RT, "PolyMathRuntime.m/src/RKMPolyDebugTraceProvider.h",
           "(type & RKMPolyDebugStackTrace::s_TypeMask) != 0 && (type", "(type & RKMPolyDebugStackTrace::s_TypeMask) != 0 || (type",
           "debug traces: one matching mask is enough to trace (&& made ||)"),
    # SystemInterfaces. The oriented box's tests live with the bounding volumes (label PolyMathBV).
    Mutant("sys-01", BV, SI + "RKMMathOBBBase.cpp", "if (!visit(t[i2] * R[i1][j] - t[i1] * R[i2][j],",
           "if (!visit(t[i2] * R[i1][j] + t[i1] * R[i2][j],",
           "OBB separating axes: the projection on the cross axes has a wrong sign"),
    Mutant("sys-02", SYS, SI + "RKMMath3x3Matrix.cpp", "c1 = r2 ^ r0,", "c1 = r0 ^ r2,",
           "3x3 matrix inverse: second cofactor column with the operands swapped"),
    Mutant("sys-03", SYS, SI + "RKMMathTransformation.cpp", "m_translation = -(inv * m_translation);",
           "m_translation = inv * m_translation;", "transformation inverse: translation not negated (sign)"),
    Mutant("sys-04", SYS, SI + "RKMMathBox.cpp", "if (b.m_max[i] + tolerance < m_min[i] ||",
           "if (b.m_max[i] + tolerance <= m_min[i] ||", "box overlap: touching boxes are separated (< made <=)"),
]

# The test programs of a label; the runtime's traced tests are a program of their own.
EXTRA_TARGETS = {RT: ["rkm_tests_PolyMathRuntimeTrace"]}


def targets(label):
    return ["rkm_tests_" + label] + EXTRA_TARGETS.get(label, [])


def run(cmd, log):
    """Runs cmd in its own process group, appending its output to log; the group is killed if we are interrupted."""
    log.write(("$ " + " ".join(cmd) + "\n").encode())
    log.flush()
    with subprocess.Popen(cmd, stdout=log, stderr=subprocess.STDOUT, start_new_session=True) as proc:
        try:
            return proc.wait()
        except BaseException:
            os.killpg(proc.pid, signal.SIGKILL)
            proc.wait()
            raise


def detail(log_path, verdict):
    """The first compiler error of a stillborn mutant, or the tests that killed a mutant."""
    lines = log_path.read_text(errors="replace").splitlines()
    if verdict == "stillborn":
        return next((l.strip() for l in lines if "error:" in l), "build failed")
    marker = "The following tests FAILED:"
    tail = lines[lines.index(marker) + 1:] if verdict == "killed" and marker in lines else []
    failed = [m.group(1) for m in (re.match(r"\s*\d+ - (.*)$", l) for l in tail) if m]
    return f"{len(failed)} failed: {failed[0]}" if failed else ""


def check(source, mutants):
    """Every mutant's original text must occur exactly once in its file: returns the problems found."""
    problems, seen = [], set()
    for m in mutants:
        path = source / m.file
        count = path.read_bytes().count(m.original.encode()) if path.is_file() else -1
        if m.id in seen:
            problems.append(f"{m.id}: duplicate id")
        seen.add(m.id)
        if count != 1:
            where = "file not found" if count < 0 else f"original text found {count} times"
            problems.append(f"{m.id}: {m.file}: {where} (expected exactly once)")
    return problems


class Runner:
    def __init__(self, args):
        self.source, self.build, self.args = args.source, args.build, args
        self.logs = self.build / "mutant-logs"

    def build_targets(self, label, log):
        cmd = ["cmake", "--build", str(self.build), f"-j{self.args.jobs}", "--target", *targets(label)]
        return run(cmd, log) == 0

    def test(self, label, log):
        cmd = ["ctest", "--test-dir", str(self.build), "-L", f"^{label}$", f"-j{self.args.jobs}",
               "--timeout", str(self.args.timeout), "--no-tests=error", "--output-on-failure"]
        return run(cmd, log) == 0

    def prepare(self, labels):
        self.logs.mkdir(parents=True, exist_ok=True)
        with open(self.logs / "baseline.log", "wb") as log:
            if not (self.build / "CMakeCache.txt").is_file():
                print(f"configuring {self.build}", flush=True)
                cmd = ["cmake", "-S", str(self.source), "-B", str(self.build), "-DRKM_BUILD_BENCHMARKS=OFF",
                       "-DRKM_BUILD_EXAMPLES=OFF", "-DRKM_LAYER_CHECK=OFF", "-DCMAKE_BUILD_TYPE=RelWithDebInfo"]
                if run(cmd, log) != 0:
                    sys.exit(f"configuration failed, see {log.name}")
            for label in labels:
                start = time.monotonic()
                ok = self.build_targets(label, log)
                ok = ok and (self.args.compile_only or self.test(label, log))
                print(f"baseline {label:<22} {'ok' if ok else 'FAILED'} {time.monotonic() - start:7.1f}s", flush=True)
                if not ok:
                    sys.exit(f"the unmutated tree does not build or pass the {label} tests, see {log.name}; "
                             "refusing to go on")

    def mutate(self, m):
        path = self.source / m.file
        original = path.read_bytes()
        result = {"id": m.id, "label": m.label, "file": m.file, "description": m.description}
        start = time.monotonic()
        with open(self.logs / f"{m.id}.log", "wb") as log:
            try:
                path.write_bytes(original.replace(m.original.encode(), m.replacement.encode(), 1))
                built = self.build_targets(m.label, log)
                result["build_seconds"] = round(time.monotonic() - start, 1)
                if not built:
                    result["verdict"] = "stillborn"
                elif self.args.compile_only:
                    result["verdict"] = "compiles"
                else:
                    result["verdict"] = "survived" if self.test(m.label, log) else "killed"
            finally:
                # Written anew, the file is newer than anything built from the mutant, so make recompiles
                # it; should the file system's clock lag, the time is set explicitly.
                written = time.time_ns()
                path.write_bytes(original)
                if path.stat().st_mtime_ns < written:
                    os.utime(path, ns=(written, written))
        result["seconds"] = round(time.monotonic() - start, 1)
        result["detail"] = detail(self.logs / f"{m.id}.log", result["verdict"])
        if result["verdict"] == "stillborn" and Path(m.file).name not in result["detail"]:
            result["verdict"] = "broken"  # the build failed elsewhere: the tree itself no longer builds
        return result


def summary(results):
    """Markdown: the counts per label, then the survivors and the stillborn mutants with their descriptions."""
    labels = {}
    for r in results:
        labels.setdefault(r["label"], Counter())[r["verdict"]] += 1
    lines = ["| label | mutants | killed | survived | stillborn | score |", "|---|---:|---:|---:|---:|---:|"]
    for label, c in labels.items():
        judged = c["killed"] + c["survived"]
        score = f"{100 * c['killed'] / judged:.0f}%" if judged else "-"
        lines.append(f"| {label} | {sum(c.values())} | {c['killed']} | {c['survived']} | {c['stillborn']} | {score} |")
    for verdict, title in (("survived", "Survivors"), ("stillborn", "Stillborn (did not compile)")):
        rows = [r for r in results if r["verdict"] == verdict]
        if rows:
            lines += ["", f"{title}:", ""]
            lines += [f"- {r['id']} (`{r['file']}`): {r['description']}" +
                      (f"\n  `{r['detail']}`" if verdict == "stillborn" else "") for r in rows]
    return lines, labels


def write_report(path, results):
    lines, labels = summary(results)
    if path.suffix == ".json":
        survivors = [r["id"] for r in results if r["verdict"] == "survived"]
        path.write_text(json.dumps({"mutants": results, "labels": labels, "survivors": survivors}, indent=2) + "\n")
        return
    table = ["# Mutation testing", "", "| mutant | label | verdict | seconds | file | description | detail |",
             "|---|---|---|---:|---|---|---|"]
    for r in results:
        description, detail = (r[key].replace("|", r"\|") for key in ("description", "detail"))
        table.append(f"| {r['id']} | {r['label']} | {r['verdict']} | {r['seconds']} | `{r['file']}` | "
                     f"{description} | {detail} |")
    path.write_text("\n".join(table + ["", "## Summary", ""] + lines) + "\n")


def interrupt(*_):
    raise KeyboardInterrupt


def main():
    here = Path(__file__).resolve().parent.parent
    p = argparse.ArgumentParser(description="Mutation testing: apply each mutant, rebuild, run its label's tests.")
    p.add_argument("--source", type=Path, default=here, help="source tree to mutate (default: this repository)")
    p.add_argument("--build", type=Path, help="build directory (default: <source>/build-mutants)")
    p.add_argument("--only", help="comma-separated mutant ids to run")
    p.add_argument("--list", action="store_true", help="list the mutants and exit")
    p.add_argument("--jobs", type=int, default=os.cpu_count() or 1, help="parallel build and test jobs")
    p.add_argument("--timeout", type=int, default=120, help="per-test timeout in seconds (default 120)")
    p.add_argument("--report", type=Path, help="write a report: Markdown, or JSON when the name ends in .json")
    p.add_argument("--compile-only", action="store_true", help=argparse.SUPPRESS)
    args = p.parse_args()
    args.source = args.source.resolve()
    args.build = (args.build or args.source / "build-mutants").resolve()

    problems = check(args.source, MUTANTS)
    if problems:
        sys.exit("mutant table does not match the sources:\n  " + "\n  ".join(problems))
    selected = MUTANTS
    if args.only:
        wanted = [i.strip() for i in args.only.split(",") if i.strip()]
        unknown = sorted(set(wanted) - {m.id for m in MUTANTS})
        if unknown:
            sys.exit("unknown mutant ids: " + ", ".join(unknown))
        selected = [m for m in MUTANTS if m.id in wanted]
    if args.list:
        for m in selected:
            print(f"{m.id:<11} {m.label:<21} {m.file}\n{'':<11} {m.description}")
        print(f"{len(selected)} mutants")
        return

    # Ctrl-C, and a termination request alike, unwind so that the file being mutated is restored (installed
    # explicitly, as a shell leaves SIGINT ignored in the jobs it starts in the background).
    for sig in (signal.SIGINT, signal.SIGTERM):
        signal.signal(sig, interrupt)
    runner = Runner(args)
    labels = list(dict.fromkeys(m.label for m in selected))
    results, mutated, interrupted = [], False, False
    try:
        runner.prepare(labels)
        for m in selected:
            mutated = True
            r = runner.mutate(m)
            results.append(r)
            print(f"{m.id:<11} {m.label:<21} {r['verdict']:<9} {r['seconds']:7.1f}s  (build {r['build_seconds']:5.1f}s)  "
                  f"{r['detail'][:100]}", flush=True)
            if r["verdict"] == "broken":
                print(f"\nthe build failed outside {m.file}, see {runner.logs / m.id}.log: has the source tree "
                      "changed since the baseline? stopping", file=sys.stderr)
                break
    except KeyboardInterrupt:
        interrupted = True
        print("\ninterrupted" + (": the mutated file was restored" if mutated else ""), file=sys.stderr)
    finally:
        if mutated:
            print("\nrebuilding the test programs over the restored sources", flush=True)
            with open(runner.logs / "final-build.log", "wb") as log:
                for label in labels:
                    if not runner.build_targets(label, log):
                        print(f"warning: the final rebuild of {label} failed, see {log.name}", file=sys.stderr)
    if results:
        print("\n" + "\n".join(summary(results)[0]))
        if args.report:
            write_report(args.report, results)
            print(f"\nreport written to {args.report}")
    if interrupted:
        sys.exit(130)


if __name__ == "__main__":
    main()
