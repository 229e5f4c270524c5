#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMMathPoint;
class RKMMathPoint2D;
class RKMMathVector;
class RKMPolyExactArithmetic;

/// Exact collinearity through the orientation tests of an arithmetic, which must outlive it.
class RKM_EXPORT RKMPolyExactPredicates
{
public:
  explicit RKMPolyExactPredicates(const RKMPolyExactArithmetic &arithmetic);
  ~RKMPolyExactPredicates();

  /// 1 when the three points are collinear: their projections onto the three coordinate planes all
  /// are.
  unsigned char AreColinear(const RKMMathPoint &a, const RKMMathPoint &b, const RKMMathPoint &c) const;

private:
  const RKMPolyExactArithmetic *m_arithmetic;
};

/// Where p lies with respect to the closed polygon of count vertices (edge i runs from vertex i − 1,
/// or count − 1 for i = 0, to vertex i): +1 inside, -1 outside (also for no vertices), 0 on the
/// boundary. On the boundary, edge (when not null) receives the index of the first vertex of the
/// edge concerned.
RKM_EXPORT int RKMPolyIsInsidePolygon(const RKMMathPoint2D *vertices, int count, const RKMMathPoint2D &p,
                                      const RKMPolyExactArithmetic &arithmetic, int *edge);

/// Direction codes name a signed axis: ±1 for x, ±2 for y, ±3 for z, 0 for none.
/// The dominant axis of v (x on ties, then y; z only when strictly larger); 0 for a null vector.
RKM_EXPORT int RKMPolyGetMainAxisDirection(const RKMMathVector &v);
/// The dominant axis of the normal (b − a) × (c − a).
RKM_EXPORT int RKMPolyGetMainTriangleDirection(const RKMMathPoint &a, const RKMMathPoint &b, const RKMMathPoint &c);
/// Drops the code's axis so that a triangle whose normal points along the code projects
/// counter-clockwise: S_OK, or S_FALSE with q unchanged for a code outside ±1..±3.
RKM_EXPORT HRESULT RKMPolyProjectOntoCartesianPlane(int code, const RKMMathPoint &p, RKMMathPoint2D &q);
/// The 2D direction code (±1 for x, ±2 for y) of b − a; x wins ties; 0 when b equals a.
RKM_EXPORT int RKMPolyGetMainSegmentDirection(const RKMMathPoint2D &a, const RKMMathPoint2D &b);
/// The coordinate of p along a signed 2D axis; 0 for any other code.
RKM_EXPORT double RKMPolyProjectOnAxis(const RKMMathPoint2D &p, int code);
