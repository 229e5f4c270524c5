#include "RKMMathTransformation.h"
#include "RKMMath3x3Matrix.h"
#include "RKMTolerance.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <limits>
#include <random>
#include <string>

namespace
{
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
using M = RKMMath3x3Matrix;
const M kZero(0, 0, 0, 0, 0, 0, 0, 0, 0);

double MaxDiff(const M &a, const M &b)
{
  double d = 0.0;
  for (int i = 0; i < 9; ++i)
    d = std::fmax(d, std::fabs(a(i / 3, i % 3) - b(i / 3, i % 3)));
  return d;
}

M Scaled(const M &a, double s) { return M::FromColumns(a.GetColumn(0) * s, a.GetColumn(1) * s, a.GetColumn(2) * s); }

struct Random
{
  std::mt19937 rng;
  std::uniform_real_distribution<double> u{-1.0, 1.0};
  RKMMathVector Vector() { return {u(rng), u(rng), u(rng)}; }
  M Matrix() { return M::FromColumns(Vector(), Vector(), Vector()); }
  // Rodrigues' formula about a random axis.
  M Rot()
  {
    RKMMathVector k = Vector() + RKMMathVector(0, 0, 2);
    k.Normalize();
    const double t = 3 * u(rng), c = std::cos(t), s = std::sin(t), v = 1 - c;
    return M(c + k.x * k.x * v, k.x * k.y * v - k.z * s, k.x * k.z * v + k.y * s, k.y * k.x * v + k.z * s,
             c + k.y * k.y * v, k.y * k.z * v - k.x * s, k.z * k.x * v - k.y * s, k.z * k.y * v + k.x * s,
             c + k.z * k.z * v);
  }
};
} // namespace

// Singularity is relative: rotation · diagonal of magnitudes in [1, 10] · rotation (condition number at
// most 10) inverts at any scale; determinants of 1e-330 or 1e360 leave the double range unless the
// matrix is scaled first.
TEST(RKMMath3x3Matrix, InverseOfRandomMatricesAtAnyScale)
{
  Random r{std::mt19937(31337)};
  for (int n = 0; n < 201; ++n)
  {
    const M d(1 + 9 * std::fabs(r.u(r.rng)), 0, 0, 0, 1 + 9 * std::fabs(r.u(r.rng)), 0, 0, 0, -1);
    const M m = Scaled(r.Rot() * d * r.Rot(), std::pow(10.0, n - 100));
    M inv;
    ASSERT_EQ(m.Inverse(inv), S_OK) << "seed 31337, n=" << n;
    EXPECT_TRUE(MaxDiff(inv * m, M()) < 1e-13 && MaxDiff(m * inv, M()) < 1e-13) << "seed 31337, n=" << n;
  }
  M out;
  EXPECT_TRUE(Scaled(M(), 1e-110).Inverse(out) == S_OK && Scaled(M(), 1e120).Inverse(out) == S_OK);
  EXPECT_EQ(M(2, 1, 0, 0, 3, 4, 0, 0, 5).Determinant(), 30.0);
  EXPECT_EQ(M(0, 0, 5, 0, 3, 4, 2, 1, 0).Determinant(), -30.0) << "a row swap flips the sign";
}

// Inverse, isometry and the transformation's inverse fail and change nothing.
TEST(RKMMath3x3Matrix, SingularOrNonFiniteFailsAndKeepsOutput)
{
  const M sentinel(9, 8, 7, 6, 5, 4, 3, 2, 1);
  for (const M &m :
       {kZero, M(1, 2, 3, 4, 5, 6, 7, 8, 9), M(4, 5, 6, 8, 10, 12, 12, 15, 18), M(1, 0, 0, 0, 1, 0, 1, 1, 1e-17),
        M(1, 0, 0, 0, kNaN, 0, 0, 0, 1), M(1, 0, 0, 0, HUGE_VAL, 0, 0, 0, 1)})
  {
    M out = sentinel;
    EXPECT_TRUE(m.Inverse(out) == E_FAIL && m.MakeIsometry(out) == 0 && out == sentinel);
    RKMMathTransformation t(m, RKMMathVector(1, 2, 3));
    const RKMMathTransformation before = t;
    EXPECT_LT(t.ComputeInverse(), 0);
    EXPECT_EQ(std::memcmp(&t, &before, sizeof t), 0) << "a failed inversion must change nothing";
  }
  M out = sentinel;
  EXPECT_EQ(M(1e-310, 0, 0, 0, 1, 0, 0, 0, 1).Inverse(out), E_FAIL) << "the inverse would overflow";
  EXPECT_EQ(out, sentinel);
}

// m = Q·H with Q orthonormal (a reflection stays one) and H symmetric positive definite (Sylvester's
// criterion); near a rotation, Q is that rotation; the scale is dropped. An unscaled Newton polar
// iteration needs about 100 steps to bring a 1e-30 singular value to 1.
TEST(RKMMath3x3Matrix, MakeIsometryIsThePolarFactor)
{
  Random r{std::mt19937(99)};
  for (int n = 0; n < 200; ++n)
  {
    SCOPED_TRACE("seed 99, n=" + std::to_string(n));
    const M rot = (n % 2) ? r.Rot() * M(1, 0, 0, 0, 1, 0, 0, 0, -1) : r.Rot();
    const M noisy = M::FromColumns(rot.GetColumn(0) + r.Vector() * 1e-6, rot.GetColumn(1) + r.Vector() * 1e-6,
                                   rot.GetColumn(2) + r.Vector() * 1e-6);
    const M m = (n % 4 < 2) ? noisy : r.Matrix();
    if (std::fabs(m.Determinant()) < 1e-2)
      continue; // a random matrix may be nearly singular
    M q;
    ASSERT_EQ(m.MakeIsometry(q), 1);
    EXPECT_LT(MaxDiff(q.Transpose() * q, M()), 1e-12);
    EXPECT_EQ(q.Determinant() > 0, m.Determinant() > 0);
    EXPECT_LT(MaxDiff(q, m == noisy ? rot : q), 1e-5);
    const M h = q.Transpose() * m;
    EXPECT_LT(MaxDiff(h, h.Transpose()), 1e-12);
    EXPECT_TRUE(h(0, 0) > 0 && h(0, 0) * h(1, 1) - h(0, 1) * h(1, 0) > 0 && h.Determinant() > 0);
    ASSERT_EQ(Scaled(rot, 1.0 + n).MakeIsometry(q), 1);
    EXPECT_LT(MaxDiff(q, rot), 1e-12);
  }
  for (double s : {1e-30, 1e30}) // whatever happens here, an answer given must be orthonormal
  {
    M q = kZero;
    EXPECT_TRUE(M(s, 0, 0, 0, 1, 0, 0, 0, 1).MakeIsometry(q) ? MaxDiff(q, M()) < 1e-12 : q == kZero) << s;
  }
  M out;
  EXPECT_EQ(M(1e-30, 0, 0, 0, 1, 0, 0, 0, 1).MakeIsometry(out), 1);
  EXPECT_EQ(out, M());
}

TEST(RKMMath3x3Matrix, SimilitudeAndScalingRecognition)
{
  Random r{std::mt19937(5)};
  double k = 0;
  for (double s : {2.5, 1e-3, 1e4})
  {
    const M rot = r.Rot(), mirror = rot * M(-1, 0, 0, 0, 1, 0, 0, 0, 1);
    EXPECT_TRUE(RKMMathTransformation(Scaled(rot, s), RKMMathVector(1, 2, 3)).IsSimilitude(k));
    EXPECT_NEAR(k, s, 1e-12 * s);
    EXPECT_TRUE(Scaled(mirror, s).IsSimilitude(k));
    EXPECT_NEAR(k, -s, 1e-12 * s) << "a reflection has a negative scale";
    // A shear, det 1 but not uniform, and unit columns 1e-6 rad from orthogonal (lengths and the
    // determinant alone cannot tell).
    for (const M &no : {M(1, 1e-4, 0, 0, 1, 0, 0, 0, 1), M(1, 0, 0, 0, 2, 0, 0, 0, 0.5),
                        M(1, std::sin(1e-6), 0, 0, std::cos(1e-6), 0, 0, 0, 1)})
      EXPECT_FALSE(Scaled(rot * no, s).IsSimilitude(k)) << s;
  }
  EXPECT_TRUE(Scaled(M(), 1e120).IsSimilitude(k));
  k = 77;
  EXPECT_FALSE(kZero.IsSimilitude(k) || M(1, 0, 0, 0, kNaN, 0, 0, 0, 1).IsSimilitude(k));
  EXPECT_EQ(k, 77) << "a rejection leaves the scale alone";
  EXPECT_TRUE(Scaled(M(), -2).IsScaling(&k) && k == -2);
  EXPECT_TRUE(Scaled(M(), 1e-200).IsScaling());
  for (const M &m : {M(3, 0, 0, 0, 3, 0, 0, 0, 3.000001), M(3, 0, 0, 0, 3, 1e-6, 0, 0, 3), kZero, r.Rot(),
                     M(1, 0, kNaN, 0, 1, 0, 0, 0, 1)})
    EXPECT_FALSE(m.IsScaling(&k));
  EXPECT_EQ(k, -2);
}

TEST(RKMMathTransformation, ApplyComposeAndInvert)
{
  Random r{std::mt19937(2718)};
  const RKMMathVector t(1, -2, 3);
  const RKMMathTransformation a(Scaled(r.Rot(), 2), t), b(r.Rot() * M(1, 0.3, 0, 0, 2, 0, 0, 0, 3), -t);
  const RKMMathPoint p(0.5, 0.25, -4);
  EXPECT_EQ(RKMMathTransformation(t) * p, p + t);
  EXPECT_EQ(RKMMathTransformation(t) * t, t) << "vectors are not translated";
  EXPECT_NEAR(((a * b) * p).DistanceTo(a * (b * p)), 0, 1e-12) << "(a*b) applies b first";
  RKMMathTransformation ai = a;
  ASSERT_EQ(ai.ComputeInverse(), S_OK);
  EXPECT_NEAR((ai * (a * p)).DistanceTo(p), 0, 1e-12);
  EXPECT_TRUE(MaxDiff((a * ai).GetMatrix(), M()) < 1e-14 && (a * ai).GetTranslation().Norm() < 1e-14);
  EXPECT_TRUE(RKMMathTransformation().IsIdentity());
  EXPECT_FALSE(RKMMathTransformation(RKMMathVector(0, 0, 1e-300)).IsIdentity());
}

TEST(RKMTolerance, DefaultsAndUsability)
{
  const RKMTolerance &d = RKMGetDefaultTolerance();
  EXPECT_EQ(&d, &RKMGetDefaultTolerance());
  EXPECT_TRUE(d.GetResolution() == 1e-3 && d.GetSmallLength() == 1e-6 && d.GetNumericalEpsilon() == 1e-12);
  EXPECT_DOUBLE_EQ(d.GetSquareResolution(), 1e-6);
  EXPECT_DOUBLE_EQ(d.GetSquareSmallLength(), 1e-12);
  EXPECT_EQ(RKMToleranceError(d), S_OK);
  EXPECT_TRUE(RKMTolerance(1, 1, 1e-9).IsUsable()) << "the small length may equal the resolution";
  for (const RKMTolerance &bad :
       {RKMTolerance(1e-3, 1e-2, 1e-12), RKMTolerance(1e-3, 0, 1e-12), RKMTolerance(1e-3, 1e-6, 0),
        RKMTolerance(kNaN, 1e-6, 1e-12), RKMTolerance(HUGE_VAL, 1e-6, 1e-12), RKMTolerance(1e-3, -1e-6, 1e-12)})
    EXPECT_EQ(RKMToleranceError(bad), E_INVALIDARG) << bad.IsUsable();
}
