#include "RKMPolyTriangleIntersector2D.h"

#include "RKMMathPoint2D.h"
#include "RKMPolyExactArithmetic.h"

namespace
{
// Code of an edge against another edge's line from the signs of its start and end: 1 crosses,
// 2 ends on the line, 0 starts on it, 4 lies on it, 3 no contact.
int CrossingCode(int s, int e)
{
  if (s * e < 0)
    return 1;
  if (s != 0 && e == 0)
    return 2;
  if (s == 0 && e != 0)
    return 0;
  if (s == 0 && e == 0)
    return 4;
  return 3;
}

void SetFeature(RKMPolyIntersectionPoint &pt, int slot, int code, int edge)
{
  if (code == 0)
    pt.SetVertexIntersection(slot, edge);
  else if (code == 2)
    pt.SetVertexIntersection(slot, (edge + 1) % 3);
  else
    pt.SetBarIntersection(slot, edge);
}

bool SameFeatures(const RKMPolyIntersectionPoint &a, const RKMPolyIntersectionPoint &b)
{
  for (int s = 0; s < 2; ++s)
  {
    if (a.entityType[s] != b.entityType[s])
      return false;
    if (a.entityType[s] != RKMPolyIntersectionPoint::Triangle && a.index[s] != b.index[s])
      return false;
  }
  return true;
}
} // namespace

RKMPolyTriangleIntersector2D::RKMPolyTriangleIntersector2D(const RKMPolyExactArithmetic &arithmetic)
    : m_arithmetic(&arithmetic)
{
}

const RKMPolyIntersectionPoint *RKMPolyTriangleIntersector2D::GetIntersectionPoints(int &n) const
{
  n = m_count;
  return m_count > 0 ? m_points : nullptr;
}

int RKMPolyTriangleIntersector2D::Intersect(const RKMMathPoint2D &a1, const RKMMathPoint2D &b1,
                                            const RKMMathPoint2D &c1, const RKMMathPoint2D &a2,
                                            const RKMMathPoint2D &b2, const RKMMathPoint2D &c2)
{
  const RKMMathPoint2D t1[3] = {a1, b1, c1}, t2[3] = {a2, b2, c2};
  return Intersect(t1, t2);
}

int RKMPolyTriangleIntersector2D::IntersectInConvergence(const RKMMathPoint2D *t1, const RKMMathPoint2D *t2)
{
  return Intersect(t1, t2);
}

int RKMPolyTriangleIntersector2D::Inner(int i, int j) const
{
  return m_crossings[3 * ((i + 3) % 3) + (j + 3) % 3].inner;
}

bool RKMPolyTriangleIntersector2D::VertexPoint(int t, int v, RKMPolyIntersectionPoint &pt) const
{
  const int *s = m_sign[t][v];
  if (s[0] < 0 || s[1] < 0 || s[2] < 0)
    return false;
  pt = RKMPolyIntersectionPoint();
  pt.SetVertexIntersection(t, v);
  const int zeros = (s[0] == 0) + (s[1] == 0) + (s[2] == 0);
  if (zeros == 0)
    pt.SetTriangleIntersection(1 - t);
  else if (zeros == 1)
    pt.SetBarIntersection(1 - t, s[0] == 0 ? 0 : (s[1] == 0 ? 1 : 2));
  else
  {
    // Edges e and e + 1 meet at vertex e + 1.
    const int free = s[0] != 0 ? 0 : (s[1] != 0 ? 1 : 2);
    pt.SetVertexIntersection(1 - t, (free + 2) % 3);
  }
  return true;
}

RKMPolyIntersectionPoint RKMPolyTriangleIntersector2D::CrossingPoint(const Crossing &r) const
{
  RKMPolyIntersectionPoint pt;
  SetFeature(pt, 0, r.code[0], r.i);
  SetFeature(pt, 1, r.code[1], r.j);
  return pt;
}

void RKMPolyTriangleIntersector2D::Continue(Crossing &r) const
{
  r.nextTriangle = r.nextEdge = -1;
  if (r.inner < 0 || r.code[0] >= 3 || r.code[1] >= 3)
    return;
  const int i = r.i, j = r.j, t = r.inner;
  const int cin = r.code[t], cout = r.code[1 - t];
  auto go = [&r](int tri, int edge) {
    r.nextTriangle = tri;
    r.nextEdge = (edge + 3) % 3;
  };
  if (cout == 1)
  {
    if (cin != 2)
      go(t, t == 0 ? i : j);
    else if (t == 0 && Inner(i + 1, j) == 0)
      go(0, i + 1);
    else if (t == 1 && Inner(i, j + 1) == 1)
      go(1, j + 1);
  }
  else if (cout == 0)
  {
    if (cin != 2)
    {
      if (t == 0 && Inner(i, j - 1) == 0)
        go(0, i);
      else if (t == 1 && Inner(i - 1, j) == 1)
        go(1, j);
    }
    else if (t == 0 && Inner(i + 1, j) == 0 && Inner(i + 1, j - 1) == 0)
      go(0, i + 1);
    else if (t == 1 && Inner(i, j + 1) == 1 && Inner(i - 1, j + 1) == 1)
      go(1, j + 1);
  }
  else if (cout == 2)
  {
    if (cin == 0)
    {
      if (t == 0)
      {
        if (Inner(i, j + 1) == 0)
          go(0, i);
        else if (Inner(i - 1, j + 1) == 1)
          go(1, j + 1);
      }
      else if (Inner(i + 1, j) == 1)
        go(1, j);
      else if (Inner(i + 1, j - 1) == 0)
        go(0, i + 1);
    }
    else if (cin == 1)
    {
      if (t == 0)
      {
        if (Inner(i, j + 1) == 0)
          go(0, i);
        else
          go(1, j + 1);
      }
      else if (Inner(i + 1, j) == 1)
        go(1, j);
      else
        go(0, i + 1);
    }
    else if (t == 0)
    {
      if (Inner(i + 1, j) == 0)
      {
        if (Inner(i + 1, j + 1) == 0)
          go(0, i + 1);
        else
          go(1, j + 1);
      }
    }
    else if (Inner(i, j + 1) == 1)
    {
      if (Inner(i + 1, j + 1) == 1)
        go(1, j + 1);
      else
        go(0, i + 1);
    }
  }
}

void RKMPolyTriangleIntersector2D::FillCrossings()
{
  for (int i = 0; i < 3; ++i)
    for (int j = 0; j < 3; ++j)
    {
      Crossing &r = m_crossings[3 * i + j];
      r = Crossing();
      r.i = i;
      r.j = j;
      const int s1 = m_sign[0][i][j], e1 = m_sign[0][(i + 1) % 3][j];
      const int s2 = m_sign[1][j][i], e2 = m_sign[1][(j + 1) % 3][i];
      r.code[0] = CrossingCode(s1, e1);
      r.code[1] = CrossingCode(s2, e2);
      if (e1 > s1)
        r.inner = 0;
      if (e2 > s2)
        r.inner = 1;
    }
  // Continuations read the inner indices of neighbouring records, so they come second.
  for (int k = 0; k < 3; ++k)
    m_enter[0][k] = m_enter[1][k] = m_exit[0][k] = m_exit[1][k] = -1;
  for (int k = 0; k < 9; ++k)
  {
    Crossing &r = m_crossings[k];
    Continue(r);
    if (r.nextTriangle < 0)
      continue;
    const int innerEdge = r.inner == 0 ? r.i : r.j;
    const int otherEdge = r.inner == 0 ? r.j : r.i;
    if (m_enter[r.inner][innerEdge] < 0)
      m_enter[r.inner][innerEdge] = k;
    if (m_exit[1 - r.inner][otherEdge] < 0)
      m_exit[1 - r.inner][otherEdge] = k;
  }
}

int RKMPolyTriangleIntersector2D::TouchingContact(RKMPolyIntersectionPoint *pts) const
{
  // The corners of the intersection are the vertices of either triangle lying in the other, and
  // the crossings of two edges through each other's interiors. With two corners or fewer the
  // triangles only touch, in a point or along a segment, and the boundary walk, which follows
  // entering and leaving crossings around an interior, has nothing to follow: the corners are the
  // answer. Two edges crossing through their interiors always leave an overlap of positive area.
  for (const Crossing &r : m_crossings)
    if (r.code[0] == 1 && r.code[1] == 1)
      return 0;
  RKMPolyIntersectionPoint corner[6];
  int n = 0;
  for (int t = 0; t < 2; ++t)
    for (int v = 0; v < 3; ++v)
    {
      RKMPolyIntersectionPoint pt;
      if (!VertexPoint(t, v, pt))
        continue;
      bool seen = false;
      for (int k = 0; k < n && !seen; ++k)
        seen = SameFeatures(corner[k], pt);
      if (!seen)
      {
        if (n == 2)
          return 0;
        corner[n++] = pt;
      }
    }
  for (int k = 0; k < n; ++k)
    pts[k] = corner[k];
  return n;
}

int RKMPolyTriangleIntersector2D::Intersect(const RKMMathPoint2D *t1, const RKMMathPoint2D *t2)
{
  m_count = 0;
  m_orientation[0] = m_orientation[1] = 0;
  if (!t1 || !t2)
    return RKMPolyIntersection::ResultDegenerateTriangle;
  const RKMPolyExactArithmetic &ar = *m_arithmetic;
  m_orientation[0] = ar.Orientation2D(t1[0], t1[1], t1[2]);
  m_orientation[1] = ar.Orientation2D(t2[0], t2[1], t2[2]);
  if (m_orientation[0] == 0 || m_orientation[1] == 0)
    return RKMPolyIntersection::ResultDegenerateTriangle;

  // Both triangles counter-clockwise: a clockwise a, b, c is used as a, c, b.
  const RKMMathPoint2D *T[2][3];
  const RKMMathPoint2D *given[2] = {t1, t2};
  for (int t = 0; t < 2; ++t)
  {
    const bool cw = m_orientation[t] < 0;
    T[t][0] = &given[t][0];
    T[t][1] = &given[t][cw ? 2 : 1];
    T[t][2] = &given[t][cw ? 1 : 2];
  }
  for (int t = 0; t < 2; ++t)
    for (int v = 0; v < 3; ++v)
      for (int e = 0; e < 3; ++e)
        m_sign[t][v][e] = ar.Orientation2D(*T[1 - t][e], *T[1 - t][(e + 1) % 3], *T[t][v]);
  FillCrossings();

  RKMPolyIntersectionPoint pts[6];
  int n = TouchingContact(pts);
  int curT = -1, curE = -1;
  if (n == 0 && VertexPoint(0, 0, pts[0]))
  {
    n = 1;
    curT = 0;
    curE = 0;
  }
  else if (n == 0)
  {
    for (int e = 0; e < 3 && n == 0; ++e)
      if (m_enter[0][e] >= 0)
      {
        const Crossing &r = m_crossings[m_enter[0][e]];
        pts[0] = CrossingPoint(r);
        n = 1;
        curT = r.nextTriangle;
        curE = r.nextEdge;
      }
    if (n == 0)
    {
      const int *s = m_sign[1][0];
      if (s[0] > 0 && s[1] > 0 && s[2] > 0)
      {
        for (int v = 0; v < 3; ++v)
        {
          pts[v] = RKMPolyIntersectionPoint();
          pts[v].SetTriangleIntersection(0);
          pts[v].SetVertexIntersection(1, v);
        }
        n = 3;
      }
    }
  }

  // The walk around the intersection's boundary, when it has an interior. Each step either crosses
  // to the other triangle or moves to the next vertex, so it meets point 0 again within a bounded number of steps; the bound
  // and the six slots are enforced all the same.
  if (n == 1 && curT >= 0)
    for (int step = 0; step < 12 && n < 6 && curT >= 0; ++step)
    {
      RKMPolyIntersectionPoint next;
      const int x = m_exit[curT][curE];
      if (x >= 0)
      {
        const Crossing &r = m_crossings[x];
        next = CrossingPoint(r);
        curT = r.nextTriangle;
        curE = r.nextEdge;
      }
      else
      {
        const int v = (curE + 1) % 3;
        if (!VertexPoint(curT, v, next))
          break;
        curE = v;
      }
      if (SameFeatures(next, pts[0]))
      {
        if (n == 1)
          continue;
        break;
      }
      pts[n++] = next;
    }

  // Back to the caller's numbering: in a clockwise triangle vertex v is (3 − v) mod 3 and bar b is
  // 2 − b.
  for (int k = 0; k < n; ++k)
    for (int t = 0; t < 2; ++t)
      if (m_orientation[t] < 0)
      {
        RKMPolyIntersectionPoint &pt = pts[k];
        if (pt.entityType[t] == RKMPolyIntersectionPoint::Vertex)
          pt.index[t] = (3 - pt.index[t]) % 3;
        else if (pt.entityType[t] == RKMPolyIntersectionPoint::Bar)
          pt.index[t] = 2 - pt.index[t];
      }
  const bool reverse = m_orientation[0] < 0 && n >= 3;
  for (int k = 0; k < n; ++k)
    m_points[k] = pts[reverse ? n - 1 - k : k];
  m_count = n;
  // Up to two corners the answer is their count; more make a polygon.
  if (n >= 3)
    return RKMPolyIntersection::ResultPolygon;
  return n;
}
