#include "RKMPolyTriangleIntersector.h"

#include <new>
#include <utility>

#include "RKMMathPoint.h"
#include "RKMMathPoint2D.h"
#include "RKMPolyCanonicalStart.h"
#include "RKMPolyExactDirection.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyExactPredicates.h"
#include "RKMPolyTriangleIntersector2D.h"

namespace
{
using Pt = RKMPolyIntersectionPoint;

// Features in canonical numbering: V0 the start vertex p, B0 the bar p→q, B2 the bar r→p, I the
// interior.
enum Feature
{
  V0,
  B0,
  B2,
  I
};

void SetFeature(Pt &pt, int slot, Feature f)
{
  switch (f)
  {
  case V0:
    pt.SetVertexIntersection(slot, 0);
    break;
  case B0:
    pt.SetBarIntersection(slot, 0);
    break;
  case B2:
    pt.SetBarIntersection(slot, 2);
    break;
  case I:
    pt.SetTriangleIntersection(slot);
    break;
  }
}

// Features through a vertex lying on the other triangle's plane are that vertex: with the signs of
// the canonical q and r, a bar ending there or an interior along an edge in the plane gives way.
void VerticesOnPlane(Pt *pts, int n, int slot, int sq, int sr)
{
  for (int k = 0; k < n; ++k)
  {
    Pt &pt = pts[k];
    const int type = pt.entityType[slot], index = pt.index[slot];
    if (sq != 0 && sr == 0 && type == Pt::Bar && index == 2)
      pt.SetVertexIntersection(slot, 2);
    if (sq == 0)
    {
      if (type == Pt::Bar && index == 0)
        pt.SetVertexIntersection(slot, 1);
      if (sr == 0)
      {
        if (type == Pt::Triangle)
          pt.SetBarIntersection(slot, 1);
        else if (type == Pt::Bar && index == 2)
          pt.SetVertexIntersection(slot, 2);
      }
    }
  }
}

// Undoes the exchange of q and r: vertices 1 and 2 trade places, and bars 0 and 2.
void Unexchange(Pt *pts, int n, int slot)
{
  for (int k = 0; k < n; ++k)
  {
    Pt &pt = pts[k];
    int &index = pt.index[slot];
    if (pt.entityType[slot] == Pt::Vertex && index != 0)
      index = 3 - index;
    else if (pt.entityType[slot] == Pt::Bar && index != 1)
      index = 2 - index;
  }
}

void ToCaller(Pt *pts, int n, int slot, int s)
{
  for (int k = 0; k < n; ++k)
    if (pts[k].entityType[slot] == Pt::Vertex || pts[k].entityType[slot] == Pt::Bar)
      pts[k].index[slot] = (s + pts[k].index[slot]) % 3;
}
} // namespace

RKMPolyTriangleIntersector::RKMPolyTriangleIntersector(const RKMPolyExactArithmetic &arithmetic)
    : RKMPolyTriangleIntersector(&arithmetic)
{
}

RKMPolyTriangleIntersector::RKMPolyTriangleIntersector(const RKMPolyExactArithmetic *arithmetic)
    : m_arithmetic(arithmetic),
      m_intersector2D(arithmetic ? new (std::nothrow) RKMPolyTriangleIntersector2D(*arithmetic) : nullptr)
{
}

RKMPolyTriangleIntersector::RKMPolyTriangleIntersector(const RKMPolyTriangleIntersector &other)
    : m_arithmetic(other.m_arithmetic),
      m_intersector2D(other.m_intersector2D ? new (std::nothrow) RKMPolyTriangleIntersector2D(*other.m_intersector2D)
                                            : nullptr),
      m_count(other.m_count), m_planarAnswer(other.m_planarAnswer && m_intersector2D)
{
  m_points[0] = other.m_points[0];
  m_points[1] = other.m_points[1];
}

RKMPolyTriangleIntersector &RKMPolyTriangleIntersector::operator=(const RKMPolyTriangleIntersector &other)
{
  if (this != &other)
  {
    RKMPolyTriangleIntersector copy(other);
    std::swap(m_arithmetic, copy.m_arithmetic);
    std::swap(m_intersector2D, copy.m_intersector2D);
    m_count = copy.m_count;
    m_planarAnswer = copy.m_planarAnswer;
    m_points[0] = copy.m_points[0];
    m_points[1] = copy.m_points[1];
  }
  return *this;
}

RKMPolyTriangleIntersector::~RKMPolyTriangleIntersector()
{
  delete m_intersector2D;
}

const RKMPolyIntersectionPoint *RKMPolyTriangleIntersector::GetIntersectionPoints(int &n) const
{
  if (m_count == -1 && m_planarAnswer)
    return m_intersector2D->GetIntersectionPoints(n);
  if (m_count >= 1)
  {
    n = m_count;
    return m_points;
  }
  n = 0;
  return nullptr;
}

unsigned char RKMPolyTriangleIntersector::HaveSameOrientation() const
{
  return m_count == -1 && m_planarAnswer ? m_intersector2D->HaveSameOrientation() : 0;
}

int RKMPolyTriangleIntersector::GetPosition(const RKMMathPoint &a, const RKMMathPoint &b, const RKMMathPoint &c,
                                            const RKMMathPoint &d) const
{
  return m_arithmetic ? m_arithmetic->Orientation3D(a, b, c, d) : 0;
}

int RKMPolyTriangleIntersector::Intersect(const RKMMathPoint &a1, const RKMMathPoint &b1, const RKMMathPoint &c1,
                                          const RKMMathPoint &a2, const RKMMathPoint &b2, const RKMMathPoint &c2)
{
  const RKMMathPoint t1[3] = {a1, b1, c1}, t2[3] = {a2, b2, c2};
  return Intersect(t1, t2);
}

int RKMPolyTriangleIntersector::Coplanar(const RKMMathPoint *T1, const RKMMathPoint *T2)
{
  m_count = -1;
  m_planarAnswer = false;
  if (!m_intersector2D)
    return RKMPolyIntersection::ResultUndetermined;
  const int code = RKMPolyExactTriangleDirection(*m_arithmetic, T1[0], T1[1], T1[2]);
  if (code == 0)
    return RKMPolyIntersection::ResultDegenerateTriangle;
  m_planarAnswer = true;
  RKMMathPoint2D p1[3], p2[3];
  for (int k = 0; k < 3; ++k)
  {
    RKMPolyProjectOntoCartesianPlane(code, T1[k], p1[k]);
    RKMPolyProjectOntoCartesianPlane(code, T2[k], p2[k]);
  }
  return m_intersector2D->Intersect(p1, p2);
}

int RKMPolyTriangleIntersector::Intersect(const RKMMathPoint *T1, const RKMMathPoint *T2)
{
  m_count = 0;
  m_points[0] = m_points[1] = Pt();
  if (!m_arithmetic || !T1 || !T2)
    return RKMPolyIntersection::ResultUndetermined;
  const RKMPolyExactArithmetic &ar = *m_arithmetic;
  int sigma1[3], sigma2[3];
  for (int k = 0; k < 3; ++k)
    sigma1[k] = ar.Orientation3D(T2[0], T2[1], T2[2], T1[k]);
  const int sum1 = sigma1[0] + sigma1[1] + sigma1[2];
  if (sum1 == 3 || sum1 == -3)
    return RKMPolyIntersection::ResultDisjoint;
  if (sigma1[0] == 0 && sigma1[1] == 0 && sigma1[2] == 0)
    return Coplanar(T1, T2);
  for (int k = 0; k < 3; ++k)
    sigma2[k] = ar.Orientation3D(T1[0], T1[1], T1[2], T2[k]);
  const int sum2 = sigma2[0] + sigma2[1] + sigma2[2];
  if (sum2 == 3 || sum2 == -3)
    return RKMPolyIntersection::ResultDisjoint;
  if (sigma2[0] == 0 && sigma2[1] == 0 && sigma2[2] == 0)
    return RKMPolyIntersection::ResultDegenerateTriangle;
  return Classify(T1, T2, sigma1, sigma2, false);
}

int RKMPolyTriangleIntersector::Intersect(const RKMMathPoint &s, const RKMMathPoint &b1, const RKMMathPoint &c1,
                                          const RKMMathPoint &b2, const RKMMathPoint &c2)
{
  m_count = 0;
  m_points[0] = m_points[1] = Pt();
  if (!m_arithmetic)
    return RKMPolyIntersection::ResultUndetermined;
  const RKMPolyExactArithmetic &ar = *m_arithmetic;
  const RKMMathPoint T1[3] = {s, b1, c1}, T2[3] = {s, b2, c2};
  const int sigma1[3] = {0, ar.Orientation3D(s, b2, c2, b1), ar.Orientation3D(s, b2, c2, c1)};
  if (sigma1[1] == 0 && sigma1[2] == 0)
    return Coplanar(T1, T2);
  const int sigma2[3] = {0, ar.Orientation3D(s, b1, c1, b2), ar.Orientation3D(s, b1, c1, c2)};
  if (sigma2[1] == 0 && sigma2[2] == 0)
    return RKMPolyIntersection::ResultDegenerateTriangle;
  return Classify(T1, T2, sigma1, sigma2, true);
}

int RKMPolyTriangleIntersector::Classify(const RKMMathPoint *T1, const RKMMathPoint *T2, const int *sigma1,
                                         const int *sigma2, bool sharedApex)
{
  const RKMPolyExactArithmetic &ar = *m_arithmetic;
  const int s1 = RKMPolyCanonicalStartVertex(sigma1[0], sigma1[1], sigma1[2]);
  const int s2 = RKMPolyCanonicalStartVertex(sigma2[0], sigma2[1], sigma2[2]);
  // Canonical vertices and their signs, q and r possibly exchanged below.
  const RKMMathPoint *v1[3] = {&T1[s1], &T1[(s1 + 1) % 3], &T1[(s1 + 2) % 3]};
  const RKMMathPoint *v2[3] = {&T2[s2], &T2[(s2 + 1) % 3], &T2[(s2 + 2) % 3]};
  int g1[3] = {sigma1[s1], sigma1[(s1 + 1) % 3], sigma1[(s1 + 2) % 3]};
  int g2[3] = {sigma2[s2], sigma2[(s2 + 1) % 3], sigma2[(s2 + 2) % 3]};

  // Orient both so that p1 and p2 see the other triangle from the same side.
  const bool f1 = g2[0] < 0 || (g2[0] == 0 && g2[1] > 0);
  if (f1)
  {
    std::swap(v1[1], v1[2]);
    std::swap(g1[1], g1[2]);
  }
  const bool f2 = g1[0] < 0 || (g1[0] == 0 && g1[1] > 0);
  if (f2)
  {
    std::swap(v2[1], v2[2]);
    std::swap(g2[1], g2[2]);
  }
  const RKMMathPoint &p1 = *v1[0], &q1 = *v1[1], &r1 = *v1[2];
  const RKMMathPoint &p2 = *v2[0], &q2 = *v2[1], &r2 = *v2[2];

  const int apart = sharedApex ? RKMPolyIntersection::ResultInadmissible : RKMPolyIntersection::ResultDisjoint;
  const int o1 = ar.Orientation3D(p1, q1, p2, q2);
  if (o1 > 0)
    return apart;
  const int o2 = ar.Orientation3D(p1, r1, r2, p2);
  if (o2 > 0)
    return apart;
  const int o3 = ar.Orientation3D(p1, r1, q2, p2);
  const int o4 = ar.Orientation3D(p1, q1, r2, p2);
  const int alpha = g1[0], beta = g2[0];

  Pt pts[2];
  int n = 0;
  auto add = [&](Feature a, Feature b) {
    SetFeature(pts[n], 0, a);
    SetFeature(pts[n], 1, b);
    ++n;
  };
  if (o3 < 0)
  {
    if (o2 == 0 || alpha == 0)
      return RKMPolyIntersection::ResultInadmissible;
    if (o4 < 0 && beta != 0 && o1 != 0)
    {
      add(I, B0);
      add(B0, I);
    }
    else if (o4 < 0 && beta != 0 && o1 == 0)
      add(B0, B0);
    else if (o4 == 0 && o1 != 0 && beta != 0)
    {
      add(I, B0);
      add(B0, B2);
    }
    else if (o4 == 0 && o1 == 0 && beta == 0)
      add(B0, V0);
    else if (o4 > 0 && o1 != 0 && beta == 0)
      add(I, V0);
    else if (o4 > 0 && o1 != 0 && beta != 0)
    {
      add(I, B0);
      add(I, B2);
    }
    else
      return RKMPolyIntersection::ResultInadmissible;
  }
  else if (o3 > 0)
  {
    if (o1 == 0 || beta == 0)
      return RKMPolyIntersection::ResultInadmissible;
    if (o4 < 0 && o2 != 0 && alpha == 0)
      add(V0, I);
    else if (o4 < 0 && o2 != 0 && alpha != 0)
    {
      add(B2, I);
      add(B0, I);
    }
    else if (o4 == 0 && o2 != 0 && alpha != 0)
    {
      add(B2, I);
      add(B0, B2);
    }
    else if (o4 == 0 && o2 == 0 && alpha == 0)
      add(V0, B2);
    else if (o4 > 0 && alpha != 0 && o2 == 0)
      add(B2, B2);
    else if (o4 > 0 && alpha != 0 && o2 != 0)
    {
      add(B2, I);
      add(I, B2);
    }
    else
      return RKMPolyIntersection::ResultInadmissible;
  }
  else
  {
    if (o4 < 0 && o2 != 0 && beta != 0 && o1 == 0 && alpha == 0)
      add(V0, B0);
    else if (o4 < 0 && o2 != 0 && beta != 0 && o1 != 0 && alpha != 0)
    {
      add(B2, B0);
      add(B0, I);
    }
    else if (o4 > 0 && o1 != 0 && alpha != 0 && o2 == 0 && beta == 0)
      add(B2, V0);
    else if (o4 > 0 && o1 != 0 && alpha != 0 && o2 != 0 && beta != 0)
    {
      add(B2, B0);
      add(I, B2);
    }
    else if (o4 == 0 && o1 != 0 && o2 != 0 && alpha != 0 && beta != 0)
    {
      add(B2, B0);
      add(B0, B2);
    }
    else if (o4 == 0 && o1 == 0 && o2 == 0 && alpha == 0 && beta == 0)
      add(V0, V0);
    else
      return RKMPolyIntersection::ResultInadmissible;
  }

  VerticesOnPlane(pts, n, 0, g1[1], g1[2]);
  VerticesOnPlane(pts, n, 1, g2[1], g2[2]);
  if (f1)
    Unexchange(pts, n, 0);
  if (f2)
    Unexchange(pts, n, 1);
  ToCaller(pts, n, 0, s1);
  ToCaller(pts, n, 1, s2);
  if (n == 2 && f1 != f2)
    std::swap(pts[0], pts[1]);
  m_points[0] = pts[0];
  m_points[1] = pts[1];
  m_count = n;
  return n;
}
