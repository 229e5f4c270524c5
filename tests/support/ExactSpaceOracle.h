#pragma once

// Exact rational reference for the space intersectors. Like the plane reference it works on the
// doubles the intersectors see, converted to mpq_class without rounding, so it holds in every
// arithmetic mode. Coplanar cases are handed to the plane reference after an exact projection.

#include <gmpxx.h>

#include <array>
#include <cmath>
#include <cstdint>
#include <random>
#include <sstream>
#include <string>
#include <vector>

#include "ExactPlaneOracle.h"
#include "RKMMathPoint.h"

namespace space
{
using oracle::Feature;

// Randomized sweeps run fewer cases under sanitizers and in builds with assertions, where every
// query costs several times more. The checks that a sweep met every kind of contact hold for the
// full counts only.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr int kScale = 10;
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
constexpr int kScale = 10;
#elif !defined(NDEBUG)
constexpr int kScale = 8;
#else
constexpr int kScale = 1;
#endif
#elif !defined(NDEBUG)
constexpr int kScale = 8;
#else
constexpr int kScale = 1;
#endif

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

// x on the closed segment ab, a != b.
inline bool OnClosedSegment(const Q3 &a, const Q3 &b, const Q3 &x)
{
  return Collinear(a, b, x) && sgn(Dot(x - a, x - b)) <= 0;
}

// x strictly between a and b on their line.
inline bool StrictlyBetween(const Q3 &a, const Q3 &b, const Q3 &x)
{
  return Collinear(a, b, x) && sgn(Dot(x - a, x - b)) < 0;
}

// The coordinate dropped by an exact projection of a plane with normal n: the largest component,
// so the projection is one to one on the plane.
inline int DominantAxis(const Q3 &n)
{
  const mpq_class ax = abs(n.x), ay = abs(n.y), az = abs(n.z);
  if (ax >= ay && ax >= az)
    return 0;
  return ay >= az ? 1 : 2;
}

inline oracle::QPoint Project(int axis, const Q3 &p)
{
  if (axis == 0)
    return {p.y, p.z};
  if (axis == 1)
    return {p.z, p.x};
  return {p.x, p.y};
}

inline std::string Str(const Q3 &p)
{
  std::ostringstream s;
  s << "(" << p.x.get_str() << "," << p.y.get_str() << "," << p.z.get_str() << ")";
  return s.str();
}

inline std::string Str(const RKMMathPoint &p)
{
  std::ostringstream s;
  s.precision(17);
  s << "(" << p.x << "," << p.y << "," << p.z << ")";
  return s.str();
}

inline std::string Str(const RKMMathPoint t[3])
{
  return Str(t[0]) + Str(t[1]) + Str(t[2]);
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

// Where a non-degenerate triangle meets a plane it crosses or touches, as the two ends of a segment
// on a line with direction dir (the ends may coincide): the vertices on the plane and the edge
// crossings, sorted by their position along dir.
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
  for (int e = 0; e < 3; ++e)
  {
    const int i = e, j = (e + 1) % 3;
    if (sgn(s[i]) * sgn(s[j]) < 0)
      pts.push_back(t[i] + (t[j] - t[i]) * mpq_class(s[i] / (s[i] - s[j])));
  }
  Section sec;
  for (size_t k = 0; k < pts.size(); ++k)
  {
    const mpq_class u = Dot(dir, pts[k]);
    if (k == 0 || u < sec.tlo)
    {
      sec.tlo = u;
      sec.lo = pts[k];
    }
    if (k == 0 || u > sec.thi)
    {
      sec.thi = u;
      sec.hi = pts[k];
    }
  }
  return sec;
}

// The intersection of two closed triangles in space, in the base numbering of the two triangles.
// For pairs that are not coplanar: result 0, 1 or 2 and the points, with their features. For
// coplanar pairs: the plane reference's result (3, 2, 1, 0) with the corners counter-clockwise in
// the projection that drops `axis`, and the triangles' orientations there. -6 when a triangle is
// degenerate.
struct SpaceAnswer
{
  int result = 0;
  bool coplanar = false;
  int axis = 2;
  int orient[2] = {0, 0};
  std::vector<Q3> points;                       // not coplanar only
  std::vector<std::array<Feature, 2>> features; // both cases
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
    ans.coplanar = true;
    ans.axis = DominantAxis(n1);
    const oracle::QPoint p1[3] = {Project(ans.axis, t1[0]), Project(ans.axis, t1[1]), Project(ans.axis, t1[2])};
    const oracle::QPoint p2[3] = {Project(ans.axis, t2[0]), Project(ans.axis, t2[1]), Project(ans.axis, t2[2])};
    const oracle::PolygonAnswer poly = oracle::IntersectTriangles(p1, p2);
    ans.result = poly.result;
    ans.orient[0] = oracle::Orient(p1[0], p1[1], p1[2]);
    ans.orient[1] = oracle::Orient(p2[0], p2[1], p2[2]);
    for (const oracle::QPoint &c : poly.corners)
      ans.features.push_back({oracle::TriangleFeature(p1, c), oracle::TriangleFeature(p2, c)});
    return ans;
  }
  if (pos1 == 3 || neg1 == 3 || pos2 == 3 || neg2 == 3)
    return ans;
  // Both triangles meet the line where the planes cross; their sections there overlap or not.
  const Q3 dir = Cross(n1, n2);
  const Section a = Cut(t1, s1, dir), b = Cut(t2, s2, dir);
  const Q3 &lo = a.tlo >= b.tlo ? a.lo : b.lo, &hi = a.thi <= b.thi ? a.hi : b.hi;
  const mpq_class tlo = a.tlo >= b.tlo ? a.tlo : b.tlo, thi = a.thi <= b.thi ? a.thi : b.thi;
  if (tlo > thi)
    return ans;
  ans.points.push_back(lo);
  if (tlo < thi)
    ans.points.push_back(hi);
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
    ans.coplanar = true;
    const int axis = DominantAxis(n);
    const oracle::QPoint pt[3] = {Project(axis, t[0]), Project(axis, t[1]), Project(axis, t[2])};
    const oracle::QPoint pp = Project(axis, p), pq = Project(axis, q);
    const oracle::ClipAnswer clip = oracle::ClipSegment(pt, pp, pq);
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
  if (f.type == 0)
    return ans;
  ans.result = 1;
  ans.features.push_back({f, SegmentFeature(p, q, x)});
  return ans;
}

// Point generators for space: one small integer grid pushed through one affine map per case, so
// shared vertices, coplanar pairs, edges in planes and vertices on edges stay frequent.
using oracle::Layout;

using PointSource = oracle::GridPointSource<3>;

} // namespace space
