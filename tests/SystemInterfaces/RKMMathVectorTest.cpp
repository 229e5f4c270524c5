#include "RKMMathVector.h"
#include "RKMMathConstants.h"
#include "RKMMathPoint.h"
#include "RKMMathPoint2D.h"
#include "RKMMathPointf.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <limits>
#include <random>

namespace
{
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kInf = std::numeric_limits<double>::infinity();
} // namespace

TEST(RKMMathVector, ArithmeticAndCrossProduct)
{
  const RKMMathVector a(1, 2, 3), b(-4, 5, 0.5), c = a ^ b;
  EXPECT_EQ(a + b, RKMMathVector(-3, 7, 3.5));
  EXPECT_EQ(a - b, RKMMathVector(5, -3, 2.5));
  EXPECT_EQ(2.0 * a / 4.0, RKMMathVector(0.5, 1, 1.5));
  EXPECT_EQ(a * b, -4 + 10 + 1.5);
  // The cross product is orthogonal to both factors, anti-commutes and follows the right hand.
  EXPECT_TRUE(c * a == 0.0 && c * b == 0.0 && (b ^ a) == -c);
  EXPECT_EQ(RKMMathVector(0, 1, 0) ^ RKMMathVector(0, 0, 1), RKMMathVector(1, 0, 0));
}

// The norm neither overflows nor underflows, and a NaN beside finite components is not hidden (std::fmax
// skips a NaN, so a scaled norm must look for NaN components itself).
TEST(RKMMathVector, NormAndNormalizeAtAnyScale)
{
  EXPECT_EQ(RKMMathVector(3, 4, 12).Norm(), 13.0);
  EXPECT_DOUBLE_EQ(RKMMathVector(1e200, -1e200, 1e200).Norm(), std::sqrt(3.0) * 1e200);
  EXPECT_DOUBLE_EQ(RKMMathVector(1e-200, 1e-200, -1e-200).Norm(), std::sqrt(3.0) * 1e-200);
  EXPECT_EQ(RKMMathVector(0, 0, 5e-324).Norm(), 5e-324);
  EXPECT_EQ(RKMMathPoint(-1e200, 0, 0).DistanceTo(RKMMathPoint(1e200, 0, 0)), 2e200);
  EXPECT_EQ(RKMMathVector(0, -kInf, 1).Norm(), kInf);
  EXPECT_TRUE(std::isnan(RKMMathVector(kNaN, 1, 0).Norm()) && std::isnan(RKMMathVector(kNaN, 0, 0).Norm()));
  for (double s : {1e-300, 1e-200, 1.0, 1e200, 1e300})
  {
    RKMMathVector v(3 * s, -4 * s, 12 * s);
    ASSERT_EQ(v.Normalize(), S_OK) << s;
    EXPECT_NEAR((v - RKMMathVector(3, -4, 12) / 13).Norm(), 0, 1e-15) << s;
  }
  for (const RKMMathVector &bad : {RKMMathVector(), RKMMathVector(kNaN, kNaN, kNaN), RKMMathVector(kInf, 1, 2),
                                   RKMMathVector(1, -kInf, kNaN), RKMMathVector(kNaN, 1, 0)})
  {
    RKMMathVector v = bad;
    EXPECT_EQ(v.Normalize(), E_FAIL) << bad.x << " " << bad.y << " " << bad.z;
    EXPECT_EQ(std::memcmp(&v, &bad, sizeof v), 0) << "the vector must be left as it was";
  }
}

TEST(RKMMathVector, AngleAgreesWithAcosOfUnitDot)
{
  std::mt19937 rng(20240611);
  std::uniform_real_distribution<double> u(-10, 10);
  for (int n = 0; n < 200; ++n)
  {
    const RKMMathVector a(u(rng), u(rng), u(rng)), b(u(rng), u(rng), u(rng));
    EXPECT_NEAR(a.GetAngleTo(b), std::acos((a * b) / (a.Norm() * b.Norm())), 1e-7) << "seed 20240611, n=" << n;
  }
  // atan2 stays exact where acos loses half the digits.
  const RKMMathVector x(1e-9, 0, 0);
  EXPECT_TRUE(x.GetAngleTo(x * 7) == 0.0 && RKMMathVector().GetAngleTo(x) == 0.0);
  EXPECT_DOUBLE_EQ(x.GetAngleTo(-x), RKMPI);
  EXPECT_DOUBLE_EQ(x.GetAngleTo(RKMMathVector(1, 1e-12, 0)), 1e-12);
}

TEST(RKMMathPoint, PointsVectorsIn2DAnd3DAndFloat)
{
  const RKMMathPoint p(1, 2, 3), q(4, 6, 15);
  EXPECT_EQ(q - p, RKMMathVector(3, 4, 12));
  EXPECT_TRUE(p + (q - p) == q && q - (q - p) == p);
  EXPECT_TRUE(p.DistanceTo(q) == 13.0 && p.SquareDistanceTo(q) == 169.0);
  RKMMathPoint r = p;
  r += RKMMathVector(1, 1, 1);
  r[2] = -1;
  EXPECT_EQ(r, RKMMathPoint(2, 3, -1));
  const RKMMathPoint2D o(1, 1), a(3, 1), b(1, 4);
  EXPECT_GT((a - o) ^ (b - o), 0.0) << "b is counter-clockwise from a";
  EXPECT_LT((b - o) ^ (a - o), 0.0);
  EXPECT_TRUE((a - o) * (b - o) == 0.0 && a.SquareDistanceTo(b) == 13.0);
  const RKMMathVectorf i(1, 0, 0), j(0, 1, 0);
  EXPECT_EQ(i ^ j, RKMMathVectorf(0, 0, 1));
  EXPECT_EQ(-(i - j) * 2.0f, RKMMathVectorf(-2, 2, 0));
  EXPECT_EQ(RKMMathVectorf(2, 3, 6).Norm(), 7.0f);
  EXPECT_EQ(RKMMathPointf(1, 2, 3) + (RKMMathPointf(4, 4, 4) - RKMMathPointf(1, 2, 3)), RKMMathPointf(4, 4, 4));
}
