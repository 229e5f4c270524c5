#include "RKMPolyExactArithmetic.h"

#include <cfloat>
#include <cmath>
#include <new>

#include "RKMMathConstants.h"
#include "RKMMathFloat.h"
#include "RKMPolyAdaptivePredicates.h"

// Snapping and the split rely on each addition being rounded on its own, in double, with no excess
// precision.
static_assert(FLT_EVAL_METHOD == 0, "exact arithmetic needs double operations rounded to double");

RKMPolyExactArithmetic::RKMPolyExactArithmetic(Mode mode) : m_mode(mode)
{
  SetMaxCoord(100000.0f);
  m_kernel = new (std::nothrow) RKMPolyAdaptivePredicates();
}

RKMPolyExactArithmetic::~RKMPolyExactArithmetic()
{
  delete m_kernel;
  m_kernel = nullptr;
}

namespace
{
// The smallest power of two not below a, for 0 < a <= 2^127. This is the value that rounding
// a·(2^52 + 1) to float and taking ((c + a) − c) produces wherever c stays finite (checked over every
// float), computed here without the overflow that expression meets above 2^76.
double PowerOfTwoAbove(float a)
{
  int e;
  const double m = std::frexp(static_cast<double>(a), &e);
  return m == 0.5 ? static_cast<double>(a) : std::ldexp(1.0, e);
}
} // namespace

HRESULT RKMPolyExactArithmetic::SetMaxCoord(float M)
{
  m_maxCoord = M;
  const float a = std::fabs(M);
  HRESULT hr = S_OK;
  double r;
  if (!(M > 0.0f) || !(M <= 0x1p127f))
    hr = E_INVALIDARG;
  if (a == 0.0f)
    r = 0x1p-126;
  else if (!(a <= 0x1p127f))
    r = 0x1p127;
  else
    r = PowerOfTwoAbove(a);

  const double eps = r * 0x1p-24 * 2.0;
  m_precision = eps;
  m_rangeBound = 0x1p23 * eps;
  m_snapConstant = 1.125 * 0x1p53 * eps;
  m_splitConstant = 1.5 * 0x1p78 * eps * eps;
  m_staticFilter3 = 1.125 * 0x1p25 * eps * eps * eps;
  m_relativeError = 1.5 * 0x1p-52;
  m_filterFloor = 0.5 * eps * eps * eps;
  // The 2D exact stage splits coordinate differences, not products of two: its constant scales with
  // ε, its ulp 2^12 grid steps, so that both halves stay on the grid on every grid. The 3D split
  // constant, scaled with ε², would not dominate a difference when ε is below about 2^-54.
  m_splitConstant2D = 1.5 * 0x1p65 * eps;
  return hr;
}

float RKMPolyExactArithmetic::Snap(float v) const
{
  const double d = v;
  if (d > m_rangeBound || d < -m_rangeBound)
    return static_cast<float>(RKMMathInfinite);
  // The ulp of C is 2ε, so adding and removing it rounds d to the nearest multiple of 2ε.
  return RKMRoundToFloat((d + m_snapConstant) - m_snapConstant);
}

float RKMPolyExactArithmetic::GetMaxNormalizedCoord() const
{
  return m_mode == Gridded ? Snap(m_maxCoord) : m_maxCoord;
}

void RKMPolyExactArithmetic::Normalize(float &v) const
{
  if (m_mode == Gridded)
    v = Snap(v);
}

void RKMPolyExactArithmetic::Normalize(double &v) const
{
  if (m_mode == Gridded)
    v = Snap(RKMRoundToFloat(v));
}

void RKMPolyExactArithmetic::Normalize(RKMMathPoint2D &p) const
{
  Normalize(p.x);
  Normalize(p.y);
}

void RKMPolyExactArithmetic::Normalize(RKMMathPoint &p) const
{
  Normalize(p.x);
  Normalize(p.y);
  Normalize(p.z);
}

void RKMPolyExactArithmetic::Grid(float &v) const
{
  v = Snap(v);
}

int RKMPolyExactArithmetic::IsPointInMAX23Range(float x, float y, float z) const
{
  const double P = m_rangeBound;
  auto in = [P](double v) { return v >= -P && v <= P; };
  return in(x) && in(y) && in(z) ? 1 : 0;
}

int RKMPolyExactArithmetic::Compare(double a, double b) const
{
  if (a < b)
    return -1;
  if (a > b)
    return 1;
  return 0;
}

int RKMPolyExactArithmetic::Equal(double a, double b) const
{
  return a == b ? 1 : 0;
}

int RKMPolyExactArithmetic::Equal(const RKMMathPoint2D &a, const RKMMathPoint2D &b) const
{
  return a.x == b.x && a.y == b.y ? 1 : 0;
}

int RKMPolyExactArithmetic::Equal(const RKMMathPoint &a, const RKMMathPoint &b) const
{
  return a.x == b.x && a.y == b.y && a.z == b.z ? 1 : 0;
}

int RKMPolyExactArithmetic::CompareBelowAbove(const RKMMathPoint2D &a, const RKMMathPoint2D &b) const
{
  return RKMPolyCompareBelowAbove(a, b);
}

int RKMPolyExactArithmetic::CompareLeftRight(const RKMMathPoint2D &a, const RKMMathPoint2D &b) const
{
  return RKMPolyCompareLeftRight(a, b);
}

void RKMPolyExactArithmetic::Split(double a, double &high, double &low, const double &S) const
{
  high = (S + a) - S;
  low = a - high;
}

int RKMPolyExactArithmetic::GriddedOrientation2D(const double *a, const double *b, const double *c) const
{
  const double u = b[0] - a[0];
  const double w = c[0] - a[0];
  const double s1 = c[1] - a[1];
  const double s2 = b[1] - a[1];
  double high1, low1, high2, low2;
  Split(s1, high1, low1, m_splitConstant2D);
  Split(s2, high2, low2, m_splitConstant2D);
  const double r = (low1 * u - low2 * w) + (high1 * u - high2 * w);
  return r > 0.0 ? 1 : (r < 0.0 ? -1 : 0);
}

int RKMPolyExactArithmetic::GriddedOrientation3D(const double *a, const double *b, const double *c,
                                                 const double *d) const
{
  // The static filter of the inline test has already failed; the minors are recomputed here, where
  // the module's own flags fix the roundings the dynamic bound counts.
  const Minors3D m(a, b, c, d);
  const double t1 = m.m1 * m.Bx, t2 = m.m2 * m.Cx, t3 = m.m3 * m.Dx;
  const double det = (t1 - t2) + t3;
  // Dynamic filter: three roundings of relative size 2^-53 each bound the error of det. Below the
  // floor every term is an exact multiple of the grid's cube far under 2^53 of them, so det itself
  // is exact and its sign final.
  double bound = (std::fabs(t2) + std::fabs(t1) + std::fabs(t3)) * m_relativeError;
  if (bound < m_filterFloor)
    bound = 0.0;
  if (det > bound)
    return 1;
  if (det < -bound)
    return -1;
  if (bound == 0.0)
    return 0;
  return ExactOrientation3D(m);
}

int RKMPolyExactArithmetic::ExactOrientation3D(const Minors3D &m) const
{
  // Splitting a minor at 2^24 grid units squared leaves two parts whose products with a difference
  // are exact, and whose group sums are exact too. Only the final addition rounds, which keeps the
  // sign.
  double high1, low1, high2, low2, high3, low3;
  Split(m.m1, high1, low1, m_splitConstant);
  Split(m.m2, high2, low2, m_splitConstant);
  Split(m.m3, high3, low3, m_splitConstant);
  const double r =
      (low1 * m.Bx - low2 * m.Cx + low3 * m.Dx) + (high1 * m.Bx - high2 * m.Cx + high3 * m.Dx);
  return r > 0.0 ? 1 : (r < 0.0 ? -1 : 0);
}

namespace
{
// For each key the greater-second test comes first, so a NaN coordinate compares equal.
inline int CompareKey(double a, double b)
{
  if (b > a)
    return -1;
  if (a > b)
    return 1;
  return 0;
}
} // namespace

int RKMPolyCompareBelowAbove(const RKMMathPoint2D &a, const RKMMathPoint2D &b)
{
  if (const int k = CompareKey(a.y, b.y))
    return k;
  return CompareKey(a.x, b.x);
}

int RKMPolyCompareBelowAbove(const RKMMathPoint &a, const RKMMathPoint &b)
{
  if (const int k = CompareKey(a.z, b.z))
    return k;
  if (const int k = CompareKey(a.y, b.y))
    return k;
  return CompareKey(a.x, b.x);
}

int RKMPolyCompareLeftRight(const RKMMathPoint2D &a, const RKMMathPoint2D &b)
{
  if (const int k = CompareKey(a.x, b.x))
    return k;
  return CompareKey(a.y, b.y);
}

int RKMPolyCompareLeftRight(const RKMMathPoint &a, const RKMMathPoint &b)
{
  if (const int k = CompareKey(a.x, b.x))
    return k;
  if (const int k = CompareKey(a.y, b.y))
    return k;
  return CompareKey(a.z, b.z);
}
