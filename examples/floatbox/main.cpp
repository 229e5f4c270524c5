// Builds single-precision boxes around double-precision geometry and shows that the rounding always
// goes outward: each float bound is printed next to the double it encloses.
#include "RKMMathBox.h"
#include "RKMMathPoint.h"
#include "RKMPolyBoxf.h"

#include <cstdio>
#include <cstdlib>
#include <vector>

namespace
{
const char *Side(double value, float bound, bool isMin)
{
  return (isMin ? static_cast<double>(bound) <= value : static_cast<double>(bound) >= value) ? "encloses"
                                                                                               : "MISSES";
}

bool Report(const char *name, const std::vector<RKMMathPoint> &points, const RKMPolyBoxf &box)
{
  RKMMathBox exact;
  for (const RKMMathPoint &p : points)
    exact.AddInside(p);
  double lo[3], hi[3];
  exact.GetLimits(lo[0], hi[0], lo[1], hi[1], lo[2], hi[2]);
  const float flo[3] = {box.GetXMin(), box.GetYMin(), box.GetZMin()};
  const float fhi[3] = {box.GetXMax(), box.GetYMax(), box.GetZMax()};
  std::printf("%s\n", name);
  bool ok = true;
  for (int a = 0; a < 3; ++a)
  {
    std::printf("  %c  min %-24.17g -> %-16.9g (%s)   max %-24.17g -> %-16.9g (%s)\n", "xyz"[a], lo[a],
                static_cast<double>(flo[a]), Side(lo[a], flo[a], true), hi[a], static_cast<double>(fhi[a]),
                Side(hi[a], fhi[a], false));
    ok = ok && static_cast<double>(flo[a]) <= lo[a] && static_cast<double>(fhi[a]) >= hi[a];
  }
  for (const RKMMathPoint &p : points)
    ok = ok && box.IsContaining(p);
  return ok;
}
}

int main()
{
  bool ok = true;

  // Decimal fractions that no float or double holds exactly.
  const std::vector<RKMMathPoint> triangle = {{0.1, 0.2, 0.3}, {1.7, -0.35, 2.05}, {-0.9, 1.1, 0.45}};
  RKMPolyBoxf triangleBox;
  for (const RKMMathPoint &p : triangle)
    triangleBox.AddInside(p);
  ok = Report("triangle with decimal coordinates", triangle, triangleBox) && ok;

  // Small integers are exact in float, yet every bound still moves one step outward.
  const std::vector<RKMMathPoint> unitCube = {{0, 0, 0}, {1, 1, 1}};
  const RKMPolyBoxf cubeBox(RKMMathBox(0, 1, 0, 1, 0, 1));
  ok = Report("unit cube: exact values, still stepped (0 becomes the smallest subnormal)", unitCube, cubeBox) && ok;

  // Geometry far from the origin and below the float range.
  const std::vector<RKMMathPoint> wide = {{1e-300, -3e38, 123456789.123456789}, {-1e-45, 3e38, 123456789.5}};
  RKMPolyBoxf wideBox;
  for (const RKMMathPoint &p : wide)
    wideBox.AddInside(p);
  ok = Report("tiny, huge and large-offset coordinates", wide, wideBox) && ok;

  // A box that touches another only after rounding is still found by the overlap tests.
  const RKMPolyBoxf left(0.0, 0.1, 0.0, 1.0, 0.0, 1.0);
  const RKMPolyBoxf right(0.1, 0.2, 0.0, 1.0, 0.0, 1.0);
  const bool touching = left.IsIntersecting(right, 0.0f) && left.FastIsIntersecting(right) &&
                        left.UltraFastIsIntersecting(left.GetAxisTestOrder(), right);
  std::printf("boxes sharing the face x = 0.1 overlap: %s\n", touching ? "yes" : "no");
  ok = ok && touching;

  std::printf("%s\n", ok ? "every float box encloses its double geometry" : "ENCLOSURE FAILED");
  return ok ? EXIT_SUCCESS : EXIT_FAILURE;
}
