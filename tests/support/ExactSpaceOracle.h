#pragma once

// Exact rational reference for the space intersectors. Like the plane reference it works on the
// doubles the intersectors see, converted to mpq_class without rounding, so it holds in every
// arithmetic mode. Coplanar cases are handed to the plane reference after an exact projection.

#include <gmpxx.h>

#include <array>
#include <string>
#include <vector>

#include "ExactPlaneOracle.h"
#include "RKMMathPoint.h"

namespace space
{
using oracle::Feature;
using oracle::Str;

// Randomized sweeps in space run fewer cases under sanitizers and in builds with assertions, where
// every query costs several times more. The checks that a sweep met every kind of contact hold for
// the full counts only.
#ifdef NDEBUG
constexpr int kScale = RKM_EXACT_ORACLE_SANITIZED ? 10 : 1;
#else
constexpr int kScale = RKM_EXACT_ORACLE_SANITIZED ? 10 : 8;
#endif

using PointSource = oracle::GridPointSource<3>;

struct Q3
{
  mpq_class x, y, z;
};

inline Q3 Q(const RKMMathPoint &p)
{
  return {mpq_class(p.x), mpq_class(p.y), mpq_class(p.z)};
}

inline bool operator==(const Q3 &a, const Q3 &b)
{
  return a.x == b.x && a.y == b.y && a.z == b.z;
}
inline bool operator!=(const Q3 &a, const Q3 &b)
{
  return !(a == b);
}
inline Q3 operator-(const Q3 &a, const Q3 &b)
{
  return {a.x - b.x, a.y - b.y, a.z - b.z};
}
inline Q3 operator+(const Q3 &a, const Q3 &b)
{
  return {a.x + b.x, a.y + b.y, a.z + b.z};
}
inline Q3 operator*(const Q3 &a, const mpq_class &t)
{
  return {a.x * t, a.y * t, a.z * t};
}
inline mpq_class Dot(const Q3 &a, const Q3 &b)
{
  return a.x * b.x + a.y * b.y + a.z * b.z;
}
inline Q3 Cross(const Q3 &a, const Q3 &b)
{
  return {a.y * b.z - a.z * b.y, a.z * b.x - a.x * b.z, a.x * b.y - a.y * b.x};
}
inline bool IsZero(const Q3 &v)
{
  return sgn(v.x) == 0 && sgn(v.y) == 0 && sgn(v.z) == 0;
}
inline Q3 Normal(const Q3 t[3])
{
  return Cross(t[1] - t[0], t[2] - t[0]);
}

// The sign Orientation3D(a, b, c, d) must give.
inline int Orient(const Q3 &a, const Q3 &b, const Q3 &c, const Q3 &d)
{
  return sgn(Dot(Cross(b - a, c - a), d - a));
}

inline bool Degenerate(const Q3 t[3])
{
  return IsZero(Normal(t));
}

inline bool Collinear(const Q3 &a, const Q3 &b, const Q3 &c)
{
  return IsZero(Cross(b - a, c - a));
}

// x on the closed segment ab, a != b; strictly between a and b.
inline bool OnClosedSegment(const Q3 &a, const Q3 &b, const Q3 &x)
{
  return Collinear(a, b, x) && sgn(Dot(x - a, x - b)) <= 0;
}
inline bool StrictlyBetween(const Q3 &a, const Q3 &b, const Q3 &x)
{
  return Collinear(a, b, x) && sgn(Dot(x - a, x - b)) < 0;
}

// An exact projection of the plane with normal n that is one to one on it: the largest component of
// n is dropped.
inline oracle::QPoint Project(const Q3 &n, const Q3 &p)
{
  const mpq_class ax = abs(n.x), ay = abs(n.y), az = abs(n.z);
  if (ax >= ay && ax >= az)
    return {p.y, p.z};
  return ay >= az ? oracle::QPoint{p.z, p.x} : oracle::QPoint{p.x, p.y};
}

inline std::string Str(const Q3 &p)
{
  return "(" + p.x.get_str() + "," + p.y.get_str() + "," + p.z.get_str() + ")";
}

// The lowest-dimensional feature of the non-degenerate triangle t holding x; type 0 when x is not
// in the closed triangle.
inline Feature TriangleFeature(const Q3 t[3], const Q3 &x)
{
  for (int v = 0; v < 3; ++v)
    if (t[v] == x)
      return {1, v};
  for (int e = 0; e < 3; ++e)
    if (OnClosedSegment(t[e], t[(e + 1) % 3], x))
      return {2, e};
  const Q3 n = Normal(t);
  if (sgn(Dot(n, x - t[0])) != 0)
    return {0, 0};
  for (int e = 0; e < 3; ++e)
    if (sgn(Dot(Cross(t[(e + 1) % 3] - t[e], x - t[e]), n)) <= 0)
      return {0, 0};
  return {3, 0};
}

inline Feature SegmentFeature(const Q3 &p, const Q3 &q, const Q3 &x)
{
  if (x == p)
    return {1, 0};
  if (x == q)
    return {1, 1};
  return OnClosedSegment(p, q, x) ? Feature{2, 0} : Feature{0, 0};
}

// Where a non-degenerate triangle meets a plane it crosses or touches (s: its vertices' sides), as
// the two ends of a segment on a line with direction dir (the ends may coincide): the vertices on
// the plane and the edge crossings, the lowest and the highest along dir.
struct Section
{
  Q3 lo, hi;
  mpq_class tlo, thi;
};

inline Section Cut(const Q3 t[3], const mpq_class s[3], const Q3 &dir)
{
  std::vector<Q3> pts;
  for (int v = 0; v < 3; ++v)
    if (sgn(s[v]) == 0)
      pts.push_back(t[v]);
  for (int i = 0; i < 3; ++i)
  {
    const int j = (i + 1) % 3;
    if (sgn(s[i]) * sgn(s[j]) < 0)
      pts.push_back(t[i] + (t[j] - t[i]) * mpq_class(s[i] / (s[i] - s[j])));
  }
  Section sec;
  for (size_t k = 0; k < pts.size(); ++k)
  {
    const mpq_class u = Dot(dir, pts[k]);
    if (k == 0 || u < sec.tlo)
      sec.tlo = u, sec.lo = pts[k];
    if (k == 0 || u > sec.thi)
      sec.thi = u, sec.hi = pts[k];
  }
  return sec;
}

// The intersection of two closed triangles in space, in the base numbering of the two triangles:
// -6 when a triangle is degenerate. For pairs that are not coplanar: result 0, 1 or 2, the points and
// their features. For coplanar pairs: the plane reference's result (3, 2, 1, 0) with the corners'
// features, counter-clockwise in a projection one to one on the plane, and the triangles'
// orientations there.
struct SpaceAnswer
{
  int result = 0;
  bool coplanar = false;
  int orient[2] = {0, 0};
  std::vector<Q3> points; // not coplanar only
  std::vector<std::array<Feature, 2>> features;
};

inline SpaceAnswer IntersectTriangles(const Q3 t1[3], const Q3 t2[3])
{
  SpaceAnswer ans;
  if (Degenerate(t1) || Degenerate(t2))
  {
    ans.result = -6;
    return ans;
  }
  const Q3 n1 = Normal(t1), n2 = Normal(t2);
  mpq_class s1[3], s2[3];
  int pos1 = 0, neg1 = 0, pos2 = 0, neg2 = 0;
  for (int k = 0; k < 3; ++k)
  {
    s1[k] = Dot(n2, t1[k] - t2[0]);
    s2[k] = Dot(n1, t2[k] - t1[0]);
    pos1 += sgn(s1[k]) > 0;
    neg1 += sgn(s1[k]) < 0;
    pos2 += sgn(s2[k]) > 0;
    neg2 += sgn(s2[k]) < 0;
  }
  if (pos1 == 0 && neg1 == 0)
  {
    const oracle::QPoint p1[3] = {Project(n1, t1[0]), Project(n1, t1[1]), Project(n1, t1[2])};
    const oracle::QPoint p2[3] = {Project(n1, t2[0]), Project(n1, t2[1]), Project(n1, t2[2])};
    const oracle::PolygonAnswer poly = oracle::IntersectTriangles(p1, p2);
    ans.coplanar = true;
    ans.result = poly.result;
    ans.orient[0] = poly.orient[0];
    ans.orient[1] = poly.orient[1];
    ans.features = poly.features;
    return ans;
  }
  if (pos1 == 3 || neg1 == 3 || pos2 == 3 || neg2 == 3)
    return ans;
  // Both triangles meet the line where the planes cross; their sections there overlap or not.
  const Q3 dir = Cross(n1, n2);
  const Section a = Cut(t1, s1, dir), b = Cut(t2, s2, dir);
  const bool aLo = a.tlo >= b.tlo, aHi = a.thi <= b.thi;
  if ((aLo ? a.tlo : b.tlo) > (aHi ? a.thi : b.thi))
    return ans;
  ans.points.push_back(aLo ? a.lo : b.lo);
  if ((aLo ? a.tlo : b.tlo) < (aHi ? a.thi : b.thi))
    ans.points.push_back(aHi ? a.hi : b.hi);
  ans.result = static_cast<int>(ans.points.size());
  for (const Q3 &x : ans.points)
    ans.features.push_back({TriangleFeature(t1, x), TriangleFeature(t2, x)});
  return ans;
}

// The overlap of segment p → q with a closed triangle in space: for a segment off the triangle's
// plane 0 or 1 with the point's features; for one in it, the plane reference's answer ordered from p
// to q. -6 for a degenerate triangle, -5 for p == q in the plane.
struct SegmentAnswer
{
  int result = 0;
  bool coplanar = false;
  std::vector<std::array<Feature, 2>> features;
};

inline SegmentAnswer IntersectSegment(const Q3 t[3], const Q3 &p, const Q3 &q)
{
  SegmentAnswer ans;
  if (Degenerate(t))
  {
    ans.result = -6;
    return ans;
  }
  const Q3 n = Normal(t);
  const mpq_class sp = Dot(n, p - t[0]), sq = Dot(n, q - t[0]);
  if (sgn(sp) == 0 && sgn(sq) == 0)
  {
    const oracle::QPoint pt[3] = {Project(n, t[0]), Project(n, t[1]), Project(n, t[2])};
    const oracle::QPoint pp = Project(n, p), pq = Project(n, q);
    const oracle::ClipAnswer clip = oracle::ClipSegment(pt, pp, pq);
    ans.coplanar = true;
    ans.result = clip.result;
    for (const mpq_class &u : clip.t)
    {
      const oracle::QPoint x = oracle::Lerp(pp, pq, u);
      ans.features.push_back({oracle::TriangleFeature(pt, x), oracle::SegmentFeature(pp, pq, x)});
    }
    return ans;
  }
  if (sgn(sp) * sgn(sq) > 0)
    return ans;
  const Q3 x = p + (q - p) * mpq_class(sp / (sp - sq));
  const Feature f = TriangleFeature(t, x);
  if (f.type != 0)
  {
    ans.result = 1;
    ans.features.push_back({f, SegmentFeature(p, q, x)});
  }
  return ans;
}

// Segments ab and cd seen from the apex o, as the geodesic intersector answers: -8 when o lies
// strictly inside a segment on its line, -5 for a segment otherwise on a line through o (ab decides
// first); else the triangles o a b and o c d less o meet in nothing (0), a ray from o (1) or, in one
// plane, a sector (2). For a ray, the feature of each segment it reaches: vertex 0 or 1, or bar 0.
struct ApexAnswer
{
  int result = 0;
  bool coplanar = false;
  Feature f[2];
};

inline int ThroughApex(const Q3 &o, const Q3 &a, const Q3 &b)
{
  if (!Collinear(o, a, b))
    return 0;
  return a != b && StrictlyBetween(a, b, o) ? -8 : -5;
}

// The feature of segment ab that the ray from o through x reaches, x in the sector o a b.
inline Feature RayFeature(const Q3 &o, const Q3 &a, const Q3 &b, const Q3 &x)
{
  for (int v = 0; v < 2; ++v)
  {
    const Q3 w = (v ? b : a) - o;
    if (IsZero(Cross(x - o, w)) && sgn(Dot(x - o, w)) > 0)
      return {1, v};
  }
  return {2, 0};
}

inline ApexAnswer IntersectFromApex(const Q3 &o, const Q3 &a, const Q3 &b, const Q3 &c, const Q3 &d)
{
  ApexAnswer ans;
  ans.result = ThroughApex(o, a, b) ? ThroughApex(o, a, b) : ThroughApex(o, c, d);
  if (ans.result)
    return ans;
  const Q3 t1[3] = {o, a, b}, t2[3] = {o, c, d};
  const SpaceAnswer tt = IntersectTriangles(t1, t2);
  ans.coplanar = tt.coplanar;
  // Both triangles hold o, so they meet in a point at least; -100 would be a fault of this reference.
  ans.result = tt.result >= 1 ? tt.result - 1 : -100;
  if (ans.result != 1)
    return ans;
  // The end of the common segment other than o: off the plane a section point; in it the corner that
  // is not vertex 0 of both, a vertex of one triangle.
  Q3 x = tt.coplanar ? o : (tt.points[0] == o ? tt.points[1] : tt.points[0]);
  for (const auto &f : tt.features)
    if (tt.coplanar && !(f[0].type == 1 && f[0].index == 0))
      x = f[0].type == 1 ? t1[f[0].index] : f[1].type == 1 ? t2[f[1].index] : o;
  if (x == o)
    ans.result = -100;
  ans.f[0] = RayFeature(o, a, b, x);
  ans.f[1] = RayFeature(o, c, d, x);
  return ans;
}

// p in the closed sector at o between the rays towards a and b: p - o = α(a - o) + β(b - o) with
// α, β ≥ 0, for p in the plane of o, a, b and other than o.
inline bool InSector(const Q3 &o, const Q3 &a, const Q3 &b, const Q3 &p)
{
  const Q3 n = Cross(a - o, b - o);
  return sgn(Dot(Cross(p - o, b - o), n)) >= 0 && sgn(Dot(Cross(a - o, p - o), n)) >= 0;
}

} // namespace space
