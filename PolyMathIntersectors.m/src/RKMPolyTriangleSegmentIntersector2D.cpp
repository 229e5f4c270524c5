#include "RKMPolyTriangleSegmentIntersector2D.h"

#include "RKMMathPoint2D.h"
#include "RKMPolyCanonicalStart.h"
#include "RKMPolyExactArithmetic.h"

RKMPolyTriangleSegmentIntersector2D::RKMPolyTriangleSegmentIntersector2D(const RKMPolyExactArithmetic &arithmetic)
    : m_arithmetic(&arithmetic)
{
}

const RKMPolyIntersectionPoint *RKMPolyTriangleSegmentIntersector2D::GetIntersectionPoints(int &n) const
{
  n = m_count;
  return m_count > 0 ? m_points : nullptr;
}

int RKMPolyTriangleSegmentIntersector2D::Intersect(const RKMMathPoint2D &a, const RKMMathPoint2D &b,
                                                   const RKMMathPoint2D &c, const RKMMathPoint2D &p,
                                                   const RKMMathPoint2D &q)
{
  m_count = 0;
  m_points[0] = m_points[1] = RKMPolyIntersectionPoint();
  const RKMPolyExactArithmetic &ar = *m_arithmetic;

  // The classification below assumes a counter-clockwise triangle: a clockwise one is taken as
  // a, c, b, and its indices are mapped back at the end.
  const int orientation = ar.Orientation2D(a, b, c);
  const RKMMathPoint2D *tri[3] = {&a, &b, &c};
  const int order[3] = {0, orientation < 0 ? 2 : 1, orientation < 0 ? 1 : 2};
  const RKMMathPoint2D *v[3] = {tri[order[0]], tri[order[1]], tri[order[2]]};

  int sigma[3];
  for (int k = 0; k < 3; ++k)
    sigma[k] = ar.Orientation2D(p, q, *v[k]);
  if (sigma[0] == 0 && sigma[1] == 0 && sigma[2] == 0)
    return p == q ? RKMPolyIntersection::ResultPointSegment : RKMPolyIntersection::ResultDegenerateTriangle;
  if (orientation == 0)
    return RKMPolyIntersection::ResultDegenerateTriangle;
  const int sum = sigma[0] + sigma[1] + sigma[2];
  if (sum == 3 || sum == -3)
    return RKMPolyIntersection::ResultDisjoint;

  const int s = RKMPolyCanonicalStartVertex(sigma[0], sigma[1], sigma[2]);
  const RKMMathPoint2D &p1 = *v[s], &q1 = *v[(s + 1) % 3], &r1 = *v[(s + 2) % 3];
  const int sp = sigma[s], sq = sigma[(s + 1) % 3], sr = sigma[(s + 2) % 3];
  // Directed so that p1 lies on the left of u → w, or on the line with q1 on the right.
  const bool reversed = sp < 0 || (sp == 0 && sq >= 1);
  const RKMMathPoint2D &u = reversed ? q : p, &w = reversed ? p : q;
  const int uIndex = reversed ? 1 : 0, wIndex = reversed ? 0 : 1;

  // Points in canonical numbering: the segment line enters the triangle across bar 0 (p1q1) and
  // leaves it across bar 2 (r1p1).
  RKMPolyIntersectionPoint pts[2];
  int n = 0;
  auto setTriangle = [&](RKMPolyIntersectionPoint &pt, int type, int index) {
    if (type == RKMPolyIntersectionPoint::Vertex)
      pt.SetVertexIntersection(0, index);
    else if (type == RKMPolyIntersectionPoint::Bar)
      pt.SetBarIntersection(0, index);
    else
      pt.SetTriangleIntersection(0);
  };
  // A crossing point on bar k, which is vertex 0 itself when p1 lies on the segment's line.
  auto onBarThroughP1 = [&](RKMPolyIntersectionPoint &pt, int bar) {
    if (sp == 0)
      pt.SetVertexIntersection(0, 0);
    else
      pt.SetBarIntersection(0, bar);
  };

  const int t1 = ar.Orientation2D(p1, r1, u);
  if (t1 == 1)
    return RKMPolyIntersection::ResultDisjoint;
  if (t1 == 0)
  {
    onBarThroughP1(pts[0], 2);
    pts[0].SetVertexIntersection(1, uIndex);
    n = 1;
  }
  else
  {
    const int t2 = ar.Orientation2D(p1, q1, w);
    if (t2 == -1)
      return RKMPolyIntersection::ResultDisjoint;
    if (t2 == 0)
    {
      onBarThroughP1(pts[0], 0);
      pts[0].SetVertexIntersection(1, wIndex);
      n = 1;
    }
    else if (sp == 0)
    {
      pts[0].SetVertexIntersection(0, 0);
      pts[0].SetBarIntersection(1, 0);
      n = 1;
    }
    else
    {
      RKMPolyIntersectionPoint first, second;
      const int t3 = ar.Orientation2D(p1, q1, u);
      if (t3 < 0)
      {
        first.SetBarIntersection(0, 0);
        first.SetBarIntersection(1, 0);
      }
      else
      {
        setTriangle(first, t3 == 0 ? RKMPolyIntersectionPoint::Bar : RKMPolyIntersectionPoint::Triangle, 0);
        first.SetVertexIntersection(1, uIndex);
      }
      const int t4 = ar.Orientation2D(p1, r1, w);
      if (t4 > 0)
      {
        second.SetBarIntersection(0, 2);
        second.SetBarIntersection(1, 0);
      }
      else
      {
        setTriangle(second, t4 == 0 ? RKMPolyIntersectionPoint::Bar : RKMPolyIntersectionPoint::Triangle, 2);
        second.SetVertexIntersection(1, wIndex);
      }
      // Stored in the segment's own direction, p to q.
      pts[0] = reversed ? second : first;
      pts[1] = reversed ? first : second;
      n = 2;
    }
  }

  // Vertices q1 and r1 on the segment's line turn the features through them into vertices.
  for (int i = 0; i < n; ++i)
  {
    RKMPolyIntersectionPoint &pt = pts[i];
    const int type = pt.GetEntityType(0);
    if (sq != 0 && sr == 0 && type == RKMPolyIntersectionPoint::Bar && pt.index[0] == 2)
      pt.SetVertexIntersection(0, 2);
    if (sq == 0)
    {
      if (type == RKMPolyIntersectionPoint::Bar && pt.index[0] == 0)
        pt.SetVertexIntersection(0, 1);
      if (sr == 0)
      {
        if (type == RKMPolyIntersectionPoint::Triangle)
          pt.SetBarIntersection(0, 1);
        else if (type == RKMPolyIntersectionPoint::Bar && pt.index[0] == 2)
          pt.SetVertexIntersection(0, 2);
      }
    }
  }

  // Canonical index i is vertex (s + i) mod 3 of the counter-clockwise triangle. A clockwise
  // caller's triangle was taken as a, c, b: its vertex k is the caller's order[k], and its bar k
  // (a→c, c→b, b→a) is the caller's bar 2 − k run backwards.
  for (int i = 0; i < n; ++i)
  {
    RKMPolyIntersectionPoint &pt = pts[i];
    const int k = (s + pt.index[0]) % 3;
    if (pt.GetEntityType(0) == RKMPolyIntersectionPoint::Vertex)
      pt.index[0] = order[k];
    else if (pt.GetEntityType(0) == RKMPolyIntersectionPoint::Bar)
      pt.index[0] = orientation < 0 ? 2 - k : k;
    m_points[i] = pt;
  }
  m_count = n;
  return n;
}
