#include "RKMPolyExactBigSign.h"

#include <algorithm>
#include <climits>

namespace
{
// Signed integer of up to 280 32-bit limbs, enough for a fourth-degree polynomial in 2100-bit
// integers with a few carries.
class BigInt
{
public:
  static constexpr int kLimbs = 280;

  BigInt() = default;

  // m · 2^shift for |m| < 2^63 and shift >= 0.
  static BigInt FromScaled(std::int64_t m, int shift)
  {
    BigInt r;
    if (m == 0)
      return r;
    r.m_sign = m < 0 ? -1 : 1;
    std::uint64_t u = m < 0 ? static_cast<std::uint64_t>(-(m + 1)) + 1 : static_cast<std::uint64_t>(m);
    const int limb = shift / 32, bit = shift % 32;
    // Up to 63 + 31 bits spread over three limbs.
    const unsigned __int128 v = static_cast<unsigned __int128>(u) << bit;
    r.m_limb[limb] = static_cast<std::uint32_t>(v);
    r.m_limb[limb + 1] = static_cast<std::uint32_t>(v >> 32);
    r.m_limb[limb + 2] = static_cast<std::uint32_t>(v >> 64);
    r.m_size = limb + 3;
    r.Trim();
    return r;
  }

  int Sign() const { return m_sign; }

  friend BigInt operator-(const BigInt &a, const BigInt &b) { return Add(a, b, -1); }
  friend BigInt operator+(const BigInt &a, const BigInt &b) { return Add(a, b, 1); }

  friend BigInt operator*(const BigInt &a, const BigInt &b)
  {
    BigInt r;
    if (a.m_sign == 0 || b.m_sign == 0)
      return r;
    r.m_size = std::min(a.m_size + b.m_size, kLimbs);
    for (int i = 0; i < a.m_size; ++i)
    {
      std::uint64_t carry = 0;
      for (int j = 0; j < b.m_size && i + j < kLimbs; ++j)
      {
        const std::uint64_t t = static_cast<std::uint64_t>(a.m_limb[i]) * b.m_limb[j] + r.m_limb[i + j] + carry;
        r.m_limb[i + j] = static_cast<std::uint32_t>(t);
        carry = t >> 32;
      }
      if (i + b.m_size < kLimbs)
        r.m_limb[i + b.m_size] = static_cast<std::uint32_t>(carry);
    }
    r.m_sign = a.m_sign * b.m_sign;
    r.Trim();
    return r;
  }

private:
  // a + sb·b.
  static BigInt Add(const BigInt &a, const BigInt &b, int sb)
  {
    const int bs = b.m_sign * sb;
    if (bs == 0)
      return a;
    if (a.m_sign == 0)
    {
      BigInt r = b;
      r.m_sign = bs;
      return r;
    }
    BigInt r;
    if (a.m_sign == bs)
    {
      r.m_size = std::min(std::max(a.m_size, b.m_size) + 1, kLimbs);
      std::uint64_t carry = 0;
      for (int i = 0; i < r.m_size; ++i)
      {
        const std::uint64_t t = static_cast<std::uint64_t>(a.m_limb[i]) + b.m_limb[i] + carry;
        r.m_limb[i] = static_cast<std::uint32_t>(t);
        carry = t >> 32;
      }
      r.m_sign = bs;
    }
    else
    {
      const int c = CompareMagnitude(a, b);
      if (c == 0)
        return r;
      const BigInt &big = c > 0 ? a : b, &small = c > 0 ? b : a;
      r.m_size = big.m_size;
      std::int64_t borrow = 0;
      for (int i = 0; i < r.m_size; ++i)
      {
        std::int64_t t = static_cast<std::int64_t>(big.m_limb[i]) - small.m_limb[i] - borrow;
        borrow = t < 0;
        if (t < 0)
          t += std::int64_t(1) << 32;
        r.m_limb[i] = static_cast<std::uint32_t>(t);
      }
      r.m_sign = c > 0 ? a.m_sign : bs;
    }
    r.Trim();
    return r;
  }

  static int CompareMagnitude(const BigInt &a, const BigInt &b)
  {
    if (a.m_size != b.m_size)
      return a.m_size > b.m_size ? 1 : -1;
    for (int i = a.m_size - 1; i >= 0; --i)
      if (a.m_limb[i] != b.m_limb[i])
        return a.m_limb[i] > b.m_limb[i] ? 1 : -1;
    return 0;
  }

  void Trim()
  {
    while (m_size > 0 && m_limb[m_size - 1] == 0)
      --m_size;
    if (m_size == 0)
      m_sign = 0;
  }

  std::array<std::uint32_t, kLimbs> m_limb{};
  int m_size = 0;
  int m_sign = 0;
};

// Converts n doubles to integers sharing one power-of-two scale; false when one is not finite.
template <int N> bool ToIntegers(const double *const *coords, BigInt *out)
{
  for (int i = 0; i < N; ++i)
    if (!std::isfinite(*coords[i]))
      return false;
  std::int64_t mant[N];
  int exps[N];
  int emin = INT_MAX;
  for (int i = 0; i < N; ++i)
  {
    int e = 0;
    const double f = std::frexp(*coords[i], &e);
    mant[i] = static_cast<std::int64_t>(std::ldexp(f, 53));
    exps[i] = e - 53;
    if (mant[i] != 0)
      emin = std::min(emin, exps[i]);
  }
  for (int i = 0; i < N; ++i)
    out[i] = mant[i] == 0 ? BigInt() : BigInt::FromScaled(mant[i], exps[i] - emin);
  return true;
}
} // namespace

int RKMPolyExactBigSign::Orient2D(const double *a, const double *b, const double *c)
{
  const double *coords[6] = {&a[0], &a[1], &b[0], &b[1], &c[0], &c[1]};
  BigInt v[6];
  if (!ToIntegers<6>(coords, v))
    return 0;
  const BigInt acx = v[0] - v[4], acy = v[1] - v[5], bcx = v[2] - v[4], bcy = v[3] - v[5];
  return (acx * bcy - acy * bcx).Sign();
}

int RKMPolyExactBigSign::Orient3D(const double *a, const double *b, const double *c, const double *d)
{
  const double *coords[12] = {&a[0], &a[1], &a[2], &b[0], &b[1], &b[2], &c[0], &c[1], &c[2], &d[0], &d[1], &d[2]};
  BigInt v[12];
  if (!ToIntegers<12>(coords, v))
    return 0;
  BigInt B[3], C[3], D[3];
  for (int k = 0; k < 3; ++k)
  {
    B[k] = v[3 + k] - v[k];
    C[k] = v[6 + k] - v[k];
    D[k] = v[9 + k] - v[k];
  }
  const BigInt nx = B[1] * C[2] - B[2] * C[1];
  const BigInt ny = B[2] * C[0] - B[0] * C[2];
  const BigInt nz = B[0] * C[1] - B[1] * C[0];
  return (nx * D[0] + ny * D[1] + nz * D[2]).Sign();
}

int RKMPolyExactBigSign::InCircle(const double *a, const double *b, const double *c, const double *d)
{
  const double *coords[8] = {&a[0], &a[1], &b[0], &b[1], &c[0], &c[1], &d[0], &d[1]};
  BigInt v[8];
  if (!ToIntegers<8>(coords, v))
    return 0;
  const BigInt adx = v[0] - v[6], ady = v[1] - v[7];
  const BigInt bdx = v[2] - v[6], bdy = v[3] - v[7];
  const BigInt cdx = v[4] - v[6], cdy = v[5] - v[7];
  const BigInt alift = adx * adx + ady * ady;
  const BigInt blift = bdx * bdx + bdy * bdy;
  const BigInt clift = cdx * cdx + cdy * cdy;
  const BigInt det =
      alift * (bdx * cdy - cdx * bdy) + blift * (cdx * ady - adx * cdy) + clift * (adx * bdy - bdx * ady);
  return det.Sign();
}
