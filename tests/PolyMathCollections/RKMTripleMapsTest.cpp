#include "RKMCompareDoublePoints.h"
#include "RKMCompareFloatPoints.h"
#include "RKMMapOf3DoublesToInt.h"
#include "RKMMapOf3FloatsToInt.h"
#include "RKMMapOfFloatsToInt.h"
#include "RKMMapOfFloatsToPtr.h"
#include "RKMMapOfNFloatsToInt.h"
#include "RKMSetOf3Floats.h"
#include "RKMSetOfFloatPoints.h"

#include "HTableModel.h"

#include <climits>
#include <cmath>
#include <limits>
#include <map>

using htmodel::Keys;
using htmodel::Walked;

namespace
{
constexpr float kNaNF = std::numeric_limits<float>::quiet_NaN();

// Caller-owned triples: slot i holds value v = i % kValues, as (v % 17 - 8, v / 17 % 19 - 9, v / 323). The
// second copy (i >= kValues) holds the same value at another address, with -0 wherever the first holds +0.
constexpr unsigned kValues = 3000;
template <class T>
const T *Slot(RKMWord i)
{
  static const std::vector<T> pool = [] {
    std::vector<T> p(3 * 2 * kValues);
    for (unsigned s = 0; s < 2 * kValues; ++s)
    {
      const int v = static_cast<int>(s % kValues);
      const T c[3] = {T(v % 17 - 8), T(v / 17 % 19 - 9), T(v / 323)};
      for (int j = 0; j < 3; ++j)
        p[3 * s + j] = s >= kValues && c[j] == 0 ? -T(0) : c[j];
    }
    return p;
  }();
  return pool.data() + 3 * i;
}
template <class T>
bool IsSlot(const T *p) { return p >= Slot<T>(0) && p < Slot<T>(2 * kValues); }
template <class T>
unsigned ValueOf(const T *xyz)
{
  return static_cast<unsigned>(xyz[0] + 8) + 17 * (static_cast<unsigned>(xyz[1] + 9) + 19 * static_cast<unsigned>(xyz[2]));
}

// Keys are slots; equal values at the two slots of a value are the same key. Maps that keep the caller's
// triple must report the address first inserted; pool maps report their own copy.
template <class M, class T, class V, bool kPool>
struct Interning : htmodel::Plain
{
  static constexpr bool kExactKeys = !kPool;
  M t;
  static V Val(RKMWord w) { return htmodel::FromW<V>(w); }
  Keys Fresh(unsigned r) const { return {r, 0}; }
  Keys Variant(Keys k) const { return {(k.k1 + kValues) % (2 * kValues), 0}; }
  std::uint64_t Canon(Keys k) const { return k.k1 % kValues; }
  HRESULT Insert(Keys k, RKMWord d) { return t.Insert(Slot<T>(k.k1), Val(d)); }
  HRESULT InsertOrUpdate(Keys k, RKMWord d) { return t.InsertOrUpdate(Slot<T>(k.k1), Val(d)); }
  HRESULT Remove(Keys k, RKMWord &) { return t.Remove(Slot<T>(k.k1)); }
  bool Lookup(Keys k, Keys &stored, RKMWord &data) const
  {
    V v{};
    stored = k;
    return t.Locate(Slot<T>(k.k1), v) ? (data = htmodel::ToW(v), true) : false;
  }
  std::vector<Walked> Walk() const
  {
    std::vector<Walked> w;
    for (typename M::Iterator it(t); !it.End(); ++it)
    {
      const T *p = it.GetTriple();
      EXPECT_NE(IsSlot(p), kPool) << "whose triple is stored";
      w.push_back({{kPool ? ValueOf(p) : static_cast<RKMWord>(p - Slot<T>(0)) / 3, 0}, htmodel::ToW(it.GetData())});
    }
    return w;
  }
  int Size() const { return t.Size(); }
};

template <class A>
class RKMInterningMaps : public ::testing::Test
{
};
using InterningAdapters =
    ::testing::Types<Interning<RKMMapOf3DoublesToInt, double, int, false>, Interning<RKMMapOf3FloatsToInt, float, int, false>,
                     Interning<RKMMapOfFloatsToInt, float, int, true>, Interning<RKMMapOfFloatsToPtr, float, void *, true>>;
TYPED_TEST_SUITE(RKMInterningMaps, InterningAdapters);

// Keys of three floats, each of six values with -0 and NaN among them: digit d of r in base 6 picks
// kCoords[d]. Digit 5 is -0, the same key as digit 0.
const float kCoords[] = {0.0f, 1.0f, 2.5f, -7.0f, kNaNF, -0.0f};
RKMWord MapDigits(RKMWord r, bool swapZeros)
{
  RKMWord out = 0;
  for (RKMWord m = 1; m < 216; m *= 6, r /= 6)
    out += m * (r % 6 == 5 ? 0 : r % 6 == 0 && swapZeros ? 5 : r % 6);
  return out;
}
struct NFloats : htmodel::Plain
{
  static constexpr bool kWalk = false;
  RKMMapOfNFloatsToInt t{3};
  struct Key
  {
    float f[3];
  };
  static Key At(Keys k) { return {{kCoords[k.k1 % 6], kCoords[k.k1 / 6 % 6], kCoords[k.k1 / 36]}}; }
  Keys Fresh(unsigned r) const { return {r, 0}; }
  Keys Variant(Keys k) const { return {MapDigits(k.k1, true), 0}; }
  std::uint64_t Canon(Keys k) const { return MapDigits(k.k1, false); }
  HRESULT Insert(Keys k, RKMWord d) { return t.Insert(At(k).f, int(d)); }
  HRESULT InsertOrUpdate(Keys k, RKMWord d) { return t.InsertOrUpdate(At(k).f, int(d)); }
  HRESULT Remove(Keys k, RKMWord &) { return t.Remove(At(k).f); }
  bool Lookup(Keys k, Keys &stored, RKMWord &data) const
  {
    int v = 0;
    stored = k;
    return t.Locate(At(k).f, v) ? (data = RKMWord(v), true) : false;
  }
  std::vector<Walked> Walk() const { return {}; }
  int Size() const { return t.Size(); }
};
}

TEST(RKMComparePoints, LexicographicOrderNullElementsNaNAndSignedZeros)
{
  const double a[3] = {1, 2, 3}, b[3] = {1, 2, 4}, c[3] = {2, 0, 0}, d[3] = {1, 9, 9};
  const RKMCompareDoublePoints &cd = RKMCompareDoublePoints::Shared();
  const RKMCompareFloatPoints &cf = RKMCompareFloatPoints::Shared();
  EXPECT_TRUE(cd.Compare(a, b) == -1 && cd.Compare(b, a) == 1 && cd.Compare(a, a) == 0);
  EXPECT_EQ(RKMCompareDoublePoints::CompareLexicographic(c, d), 1) << "x decides before y and z";
  EXPECT_TRUE(cd.Compare(nullptr, a) == 0 && cd.Compare(a, nullptr) == 0);
  const float fa[3] = {1, 2, 3}, fb[3] = {1, 2, 4}, nan[3] = {kNaNF, 0, 0}, x[3] = {24, 0, 0};
  EXPECT_TRUE(cf.Compare(fa, fb) == -1 && cf.Compare(nullptr, fb) == 0);
  EXPECT_NE(cf.Compare(nan, x), 0) << "NaN is not equal to a number";
  // Else (NaN, 0, 0), in the bucket of (24, 0, 0) among 31, would take its place in a set.
  RKMSetOf3Floats s;
  ASSERT_EQ(RKMCompareFloatPoints::HashThreeFloats(nan) % 31, RKMCompareFloatPoints::HashThreeFloats(x) % 31);
  EXPECT_TRUE(s.Insert(nan) == S_OK && s.Insert(x) == S_OK);

  // Every mix of signed zeros is one point, and must hash as one.
  const double zd[3] = {0, 0, 0};
  const float zf[3] = {0, 0, 0};
  for (int signs = 1; signs < 8; ++signs)
  {
    const double sd[3] = {signs & 1 ? -0.0 : 0.0, signs & 2 ? -0.0 : 0.0, signs & 4 ? -0.0 : 0.0};
    const float sf[3] = {float(sd[0]), float(sd[1]), float(sd[2])};
    EXPECT_TRUE(cd.Compare(sd, zd) == 0 && cf.Compare(sf, zf) == 0) << signs;
    EXPECT_EQ(cd.Hash(sd), RKMCompareDoublePoints::HashThreeDoubles(zd)) << signs;
    EXPECT_EQ(RKMCompareFloatPoints::HashThreeFloats(sf), RKMCompareFloatPoints::HashThreeFloats(zf)) << signs;
    EXPECT_EQ(RKMHashFloatPoint::Hash(sf), RKMCompareFloatPoints::HashThreeFloats(zf)) << signs;
  }
  // Doubles hash as their float roundings, so values beyond the float range hash as the infinities.
  const double big[3] = {1e300, -1e300, 0.1};
  const float rounded[3] = {std::numeric_limits<float>::infinity(), -std::numeric_limits<float>::infinity(), 0.1f};
  EXPECT_EQ(RKMCompareDoublePoints::HashThreeDoubles(big), RKMCompareFloatPoints::HashThreeFloats(rounded));
}

TEST(RKMSetOfFloatPoints, OwnCopiesStayPutUntilRemovedFreedSlotsComeFirstAndCopiesAreDeep)
{
  RKMSetOfFloatPoints s;
  float buffer[3] = {1, 2, 3};
  const float *stored = nullptr, *again = nullptr;
  ASSERT_EQ(s.Insert(buffer, &stored), S_OK);
  ASSERT_TRUE(stored && stored != buffer);
  buffer[0] = 9;
  EXPECT_EQ(stored[0], 1.0f) << "the set keeps its own copy";
  EXPECT_TRUE(s.Insert(1, 2, 3, &again) == S_FALSE && again == stored);
  EXPECT_TRUE(s.Insert(0.0f, -0.0f, 0.0f) == S_OK && s.Insert(-0.0f, 0.0f, -0.0f) == S_FALSE);
  EXPECT_TRUE(s.Insert(nullptr, &again) == E_INVALIDARG && again == nullptr);
  s.RemoveAll();

  // Thousands of triples cross several pool blocks and table growths without moving.
  std::map<const float *, unsigned> live;
  for (unsigned v = 0; v < kValues; ++v)
  {
    ASSERT_EQ(s.Insert(Slot<float>(v), &stored), S_OK);
    ASSERT_TRUE(live.emplace(stored, v).second) << "two triples share an address";
  }
  std::mt19937 rng(7);
  for (int round = 0; round < 2000; ++round)
  {
    const auto victim = std::next(live.begin(), static_cast<long>(rng() % live.size()));
    const unsigned v = victim->second;
    const float *freed = victim->first;
    ASSERT_EQ(s.Remove(Slot<float>(v + kValues)), S_OK);
    live.erase(victim);
    if (round % 2)
      continue;
    ASSERT_EQ(s.Insert(Slot<float>(v), &stored), S_OK);
    EXPECT_EQ(stored, freed) << "the slot just freed is reused first";
    live.emplace(stored, v);
  }
  ASSERT_EQ(s.Size(), static_cast<int>(live.size()));
  for (const auto &e : live)
    ASSERT_TRUE(ValueOf(e.first) == e.second && s.Find(Slot<float>(e.second)) == e.first) << e.second;

  std::vector<unsigned> order;
  for (RKMSetOfFloatPoints::Iterator it(s); !it.End(); ++it)
    order.push_back(ValueOf(*it));
  RKMSetOfFloatPoints assigned;
  assigned.Insert(100, 100, 100);
  htmodel::CheckCopies(s, assigned, [&](const RKMSetOfFloatPoints &c) {
    ASSERT_TRUE(c.IsValid());
    std::vector<unsigned> walked;
    for (RKMSetOfFloatPoints::Iterator it(c); !it.End(); ++it)
      walked.push_back(live.emplace(it.GetFloats(), 0).second ? ValueOf(*it) : kValues);
    EXPECT_EQ(walked, order) << "a copy keeps the entry order, in triples of its own";
  });
  RKMSetOfFloatPoints failed(INT_MAX);
  EXPECT_TRUE(!failed.IsValid() && failed.Insert(1, 2, 3, &again) == E_OUTOFMEMORY && again == nullptr);
}

// Through growth and draining and copies, with -0 and +0 one key; pool maps copy their triples, so no
// address is seen twice among a map and its copies; null is refused.
TYPED_TEST(RKMInterningMaps, FollowModelAndRefuseNull)
{
  TypeParam a;
  htmodel::Run(a, {201, 30000, 2 * kValues});
  using M = decltype(a.t);
  std::map<const void *, int> seen;
  for (typename M::Iterator it(a.t); !it.End(); ++it)
    seen[it.GetTriple()];
  htmodel::CheckCopies(a.t, M(), [&](const M &c) {
    for (typename M::Iterator it(c); !it.End(); ++it)
      EXPECT_EQ(seen.emplace(it.GetTriple(), 0).second, !TypeParam::kExactKeys);
  });
  auto v = TypeParam::Val(0);
  EXPECT_TRUE(a.t.Insert(nullptr, v) == E_INVALIDARG && a.t.InsertOrUpdate(nullptr, v) == E_INVALIDARG);
  EXPECT_TRUE(!a.t.Locate(nullptr, v) && a.t.Remove(nullptr) == S_FALSE);
}

TEST(RKMMapOfNFloatsToInt, KeysAreCopiedAndComparedOnAllFloats)
{
  EXPECT_EQ(RKMMapOfNFloatsToInt(0).GetN(), 1);
  EXPECT_EQ(RKMMapOfNFloatsToInt(-3).GetN(), 1);
  // Beyond 16 floats the lookup builds its probe on the heap; the last float must still count.
  for (int n : {5, 20})
  {
    SCOPED_TRACE(n);
    RKMMapOfNFloatsToInt m(n);
    std::vector<float> key(static_cast<std::size_t>(n), 0.0f);
    ASSERT_EQ(m.Insert(key.data(), 1), S_OK);
    key.back() = 1;
    ASSERT_EQ(m.Insert(key.data(), 2), S_OK);
    key.back() = 0;
    key.front() = -0.0f;
    EXPECT_EQ(m.Insert(key.data(), 3), E_FAIL) << "-0 and +0 are one key";
    EXPECT_EQ(m.Insert(key.data(), 1), S_FALSE);
    key.front() = kNaNF;
    ASSERT_EQ(m.Insert(key.data(), 4), S_OK);
    int v = 0;
    EXPECT_TRUE(m.Locate(key.data(), v) && v == 4) << "a NaN key is found again";
    key.front() = std::nanf("7");
    EXPECT_FALSE(m.Locate(key.data(), v)) << "another NaN pattern is another key";
    EXPECT_EQ(m.Insert(nullptr, 1), E_INVALIDARG);
    EXPECT_FALSE(m.Locate(nullptr, v));
    EXPECT_EQ(m.Remove(nullptr), S_FALSE);
  }
}

// Through growth and draining, with -0 and NaN in the keys; copies and assignment, across key lengths too.
TEST(RKMMapOfNFloatsToInt, FollowsModelAndCopiesDeeply)
{
  NFloats a;
  htmodel::Run(a, {301, 20000, 216});
  RKMMapOfNFloatsToInt wider(7);
  wider.Insert(std::vector<float>(7, 1.0f).data(), 9);
  htmodel::CheckCopies(a.t, wider, [&](const RKMMapOfNFloatsToInt &c) {
    EXPECT_EQ(c.GetN(), 3);
    EXPECT_EQ(c.Size(), a.Size());
    for (RKMWord r = 0; r < 216; ++r)
    {
      int v = -1, w = -1;
      EXPECT_TRUE(c.Locate(NFloats::At({r, 0}).f, v) == a.t.Locate(NFloats::At({r, 0}).f, w) && v == w) << r;
    }
  });
  a.t.RemoveAll();
  EXPECT_EQ(a.Size(), 0);
}
