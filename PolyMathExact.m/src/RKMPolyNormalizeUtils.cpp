#include "RKMPolyNormalizeUtils.h"

#include <cfloat>
#include <cmath>
#include <new>

#include "RKMMathBox.h"
#include "RKMMathBox2D.h"
#include "RKMMathFloat.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyMathGeoUtil.h"

namespace
{
// Snaps n limits in place; E_FAIL, with the limits left as they were, when one of them moves by more
// than ε or is not a number (the difference is then NaN, which no bound accepts).
HRESULT SnapLimits(const RKMPolyExactArithmetic &arithmetic, double *limits, int n)
{
  const double eps = arithmetic.GetCoordinatePrecision();
  float snapped[6];
  HRESULT hr = S_OK;
  for (int i = 0; i < n; ++i)
  {
    const float f = RKMRoundToFloat(limits[i]);
    snapped[i] = f;
    arithmetic.Normalize(snapped[i]);
    const float moved = std::fabs(snapped[i] - f);
    if (!(moved <= eps))
      hr = E_FAIL;
  }
  if (hr == S_OK)
    for (int i = 0; i < n; ++i)
      limits[i] = snapped[i];
  return hr;
}

// Makes or reconfigures the arithmetic for a largest coordinate m.
HRESULT SetUp(double m, RKMPolyExactArithmetic *&arithmetic)
{
  if (!(m <= FLT_MAX))
    return E_FAIL;
  if (!arithmetic)
  {
    arithmetic = new (std::nothrow) RKMPolyExactArithmetic(RKMPolyExactArithmetic::Gridded);
    if (!arithmetic)
      return E_OUTOFMEMORY;
  }
  // A maximum of 0 (every limit at the origin) still gets a usable grid, the finest one.
  arithmetic->SetMaxCoord(RKMRoundToFloat(m));
  return S_OK;
}

template <class Box> HRESULT NormalizeBoundingBoxOf(Box &box, RKMPolyExactArithmetic *&arithmetic)
{
  double m;
  HRESULT hr = RKMPolyMathGeoUtil::GetMaximumCoordinate(box, m);
  if (FAILED(hr))
    return hr;
  hr = SetUp(m, arithmetic);
  if (FAILED(hr))
    return hr;
  return RKMPolyNormalizeUtils::Normalize(*arithmetic, box);
}

template <class Point, class Box>
HRESULT NormalizePointsOf(Point *points, int n, Box &box, RKMPolyExactArithmetic *&arithmetic)
{
  if (!points && n > 0)
    return E_INVALIDARG;
  box.SetToEmpty();
  for (int i = 0; i < n; ++i)
    box.AddInside(points[i]);
  const HRESULT hr = NormalizeBoundingBoxOf(box, arithmetic);
  if (FAILED(hr) || n < 1)
    return hr;
  for (int i = 0; i < n; ++i)
    arithmetic->Normalize(points[i]);
  return hr;
}
} // namespace

HRESULT RKMPolyNormalizeUtils::Normalize(const RKMPolyExactArithmetic &arithmetic, RKMMathBox2D &box)
{
  if (arithmetic.GetMode() != RKMPolyExactArithmetic::Gridded)
    return S_OK;
  double l[4];
  if (box.GetLimits(l[0], l[1], l[2], l[3]) != S_OK)
    return E_FAIL;
  const HRESULT hr = SnapLimits(arithmetic, l, 4);
  if (hr == S_OK)
    box.SetExtremities(l[0], l[1], l[2], l[3]);
  return hr;
}

HRESULT RKMPolyNormalizeUtils::Normalize(const RKMPolyExactArithmetic &arithmetic, RKMMathBox &box)
{
  if (arithmetic.GetMode() != RKMPolyExactArithmetic::Gridded)
    return S_OK;
  double l[6];
  box.GetExtremities(l[0], l[1], l[2], l[3], l[4], l[5]);
  const HRESULT hr = SnapLimits(arithmetic, l, 6);
  if (hr == S_OK)
    box.SetExtremities(l[0], l[1], l[2], l[3], l[4], l[5]);
  return hr;
}

HRESULT RKMPolyNormalizeUtils::NormalizeBoundingBox(RKMMathBox2D &box, RKMPolyExactArithmetic *&arithmetic)
{
  return NormalizeBoundingBoxOf(box, arithmetic);
}

HRESULT RKMPolyNormalizeUtils::NormalizeBoundingBox(RKMMathBox &box, RKMPolyExactArithmetic *&arithmetic)
{
  return NormalizeBoundingBoxOf(box, arithmetic);
}

HRESULT RKMPolyNormalizeUtils::NormalizePoints(RKMMathPoint2D *points, int n, RKMMathBox2D &box,
                                               RKMPolyExactArithmetic *&arithmetic)
{
  return NormalizePointsOf(points, n, box, arithmetic);
}

HRESULT RKMPolyNormalizeUtils::NormalizePoints(RKMMathPoint *points, int n, RKMMathBox &box,
                                               RKMPolyExactArithmetic *&arithmetic)
{
  return NormalizePointsOf(points, n, box, arithmetic);
}
