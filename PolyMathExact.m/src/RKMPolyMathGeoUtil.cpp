#include "RKMPolyMathGeoUtil.h"

#include <algorithm>
#include <cmath>

#include "RKMMathBox.h"
#include "RKMMathBox2D.h"

HRESULT RKMPolyMathGeoUtil::GetMaximumCoordinate(const RKMMathBox2D &box, double &maxCoord)
{
  maxCoord = 0.0;
  double l[4];
  if (box.GetLimits(l[0], l[1], l[2], l[3]) != S_OK)
    return E_FAIL;
  for (double v : l)
    maxCoord = std::max(maxCoord, std::fabs(v));
  return S_OK;
}

HRESULT RKMPolyMathGeoUtil::GetMaximumCoordinate(const RKMMathBox &box, double &maxCoord)
{
  maxCoord = 0.0;
  double l[6];
  const HRESULT hr = box.GetLimits(l[0], l[1], l[2], l[3], l[4], l[5]);
  if (FAILED(hr))
    return hr;
  for (double v : l)
    maxCoord = std::max(maxCoord, std::fabs(v));
  return hr;
}
