#include "RKMCompareDoublePoints.h"
#include "RKMCompareFloatPoints.h"
#include "RKMMapOf3DoublesToInt.h"
#include "RKMMapOf3FloatsToInt.h"
#include "RKMMapOfFloatsToInt.h"
#include "RKMMapOfFloatsToPtr.h"
#include "RKMMapOfNFloatsToInt.h"
#include "RKMSetOf3Doubles.h"
#include "RKMSetOf3Floats.h"
#include "RKMSetOfFloatPoints.h"

#include "HTableModel.h"

#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <limits>
#include <map>
#include <memory>
#include <random>
#include <set>
#include <vector>

using htmodel::Keys;
using htmodel::Walked;

namespace
{
constexpr float kNaNF = std::numeric_limits<float>::quiet_NaN();

std::uint32_t Bits(float f)
{
  std::uint32_t i;
  std::memcpy(&i, &f, sizeof i);
  return i;
}

// Caller-owned triples: slot i holds value v = i % kValues, as (v % 17 - 8, v / 17 % 19 - 9, v / 323). The
// second copy (i >= kValues) holds the same value at another address, with -0 wherever the first holds +0.
constexpr unsigned kValues = 3000;
template <class T>
const std::vector<T> &Triples()
{
  static const std::vector<T> pool = [] {
    std::vector<T> p(3 * 2 * kValues);
    for (unsigned i = 0; i < 2 * kValues; ++i)
    {
      const int v = static_cast<int>(i % kValues);
      const T c[3] = {T(v % 17 - 8), T(v / 17 % 19 - 9), T(v / 323)};
      for (int j = 0; j < 3; ++j)
        p[3 * i + j] = i >= kValues && c[j] == 0 ? -T(0) : c[j];
    }
    return p;
  }();
  return pool;
}
template <class T>
unsigned ValueOf(const T *xyz)
{
  return static_cast<unsigned>(xyz[0] + 8) + 17 * (static_cast<unsigned>(xyz[1] + 9) + 19 * static_cast<unsigned>(xyz[2]));
}

// Keys are slots of Triples<T>(); equal values at the two slots of a value are the same key. Maps that keep
// the caller's triple must report the address first inserted; pool maps report their own copy.
template <class M, class T, class V, bool kPool>
struct Interning
{
  static constexpr bool kHasData = true, kHandles = false, kExactKeys = !kPool, kCapacity = false;
  M t;
  static const T *At(Keys k) { return Triples<T>().data() + 3 * k.k1; }
  static V Val(RKMWord w) { return RKMWordCast<V>::From(w); }
  Keys Fresh(unsigned r) const { return {r, 0}; }
  Keys Variant(Keys k) const { return {(k.k1 + kValues) % (2 * kValues), 0}; }
  std::uint64_t Canon(Keys k) const { return k.k1 % kValues; }
  HRESULT Insert(Keys k, RKMWord d, const RKMWord *&) { return t.Insert(At(k), Val(d)); }
  HRESULT InsertOrUpdate(Keys k, RKMWord d) { return t.InsertOrUpdate(At(k), Val(d)); }
  HRESULT Remove(Keys k, RKMWord &, bool &) { return t.Remove(At(k)); }
  bool Lookup(Keys k, Keys &stored, RKMWord &data) const
  {
    V v{};
    const bool found = t.Locate(At(k), v);
    stored = k, data = RKMWordCast<V>::To(v);
    return found;
  }
  std::vector<Walked> Walk() const
  {
    const T *base = Triples<T>().data();
    std::vector<Walked> w;
    for (typename M::Iterator it(t); !it.End(); ++it)
    {
      const T *p = it.GetTriple();
      EXPECT_NE(p >= base && p < base + Triples<T>().size(), kPool) << "whose triple is stored";
      const RKMWord key = kPool ? ValueOf(p) : static_cast<RKMWord>(p - base) / 3;
      w.push_back({{key, 0}, RKMWordCast<V>::To(it.GetData()), nullptr});
    }
    return w;
  }
  int Size() const { return t.Size(); }
  int Capacity() const { return 0; }
};

template <class A>
class RKMInterningMaps : public ::testing::Test
{
};
using InterningAdapters =
    ::testing::Types<Interning<RKMMapOf3DoublesToInt, double, int, false>, Interning<RKMMapOf3FloatsToInt, float, int, false>,
                     Interning<RKMMapOfFloatsToInt, float, int, true>, Interning<RKMMapOfFloatsToPtr, float, void *, true>>;
TYPED_TEST_SUITE(RKMInterningMaps, InterningAdapters);
}

TEST(RKMComparePoints, LexicographicOrderNullElementsAndSignedZeros)
{
  const double a[3] = {1, 2, 3}, b[3] = {1, 2, 4}, c[3] = {2, 0, 0}, d[3] = {1, 9, 9};
  const RKMCompareDoublePoints &cd = RKMCompareDoublePoints::Shared();
  EXPECT_EQ(cd.Compare(a, b), -1);
  EXPECT_EQ(cd.Compare(b, a), 1);
  EXPECT_EQ(cd.Compare(a, a), 0);
  EXPECT_EQ(RKMCompareDoublePoints::CompareLexicographic(c, d), 1) << "x decides before y and z";
  EXPECT_EQ(cd.Compare(nullptr, a), 0);
  EXPECT_EQ(cd.Compare(a, nullptr), 0);
  const float fa[3] = {1, 2, 3}, fb[3] = {1, 2, 4};
  EXPECT_EQ(RKMCompareFloatPoints::Shared().Compare(fa, fb), -1);
  EXPECT_EQ(RKMCompareFloatPoints::Shared().Compare(nullptr, fb), 0);

  // Every mix of signed zeros is one point, and must hash as one.
  const double zd[3] = {0, 0, 0};
  const float zf[3] = {0, 0, 0};
  for (int signs = 1; signs < 8; ++signs)
  {
    const double sd[3] = {signs & 1 ? -0.0 : 0.0, signs & 2 ? -0.0 : 0.0, signs & 4 ? -0.0 : 0.0};
    const float sf[3] = {float(sd[0]), float(sd[1]), float(sd[2])};
    EXPECT_EQ(cd.Compare(sd, zd), 0) << signs;
    EXPECT_EQ(cd.Hash(sd), RKMCompareDoublePoints::HashThreeDoubles(zd)) << signs;
    EXPECT_EQ(RKMCompareFloatPoints::Shared().Compare(sf, zf), 0) << signs;
    EXPECT_EQ(RKMCompareFloatPoints::HashThreeFloats(sf), RKMCompareFloatPoints::HashThreeFloats(zf)) << signs;
    EXPECT_EQ(RKMHashFloatPoint::Hash(sf), RKMCompareFloatPoints::HashThreeFloats(zf)) << signs;
  }
  // Doubles hash as their float roundings, so values beyond the float range hash as the infinities.
  const double big[3] = {1e300, -1e300, 0.1};
  const float rounded[3] = {std::numeric_limits<float>::infinity(), -std::numeric_limits<float>::infinity(), 0.1f};
  EXPECT_EQ(RKMCompareDoublePoints::HashThreeDoubles(big), RKMCompareFloatPoints::HashThreeFloats(rounded));
}

TEST(RKMTripleSets, CallerTriplesAreKeptByAddressAndComparedByValue)
{
  const double a[3] = {1, 2, 3}, sameAsA[3] = {1, 2, 3}, b[3] = {0, -0.0, 5}, bPositive[3] = {0, 0, 5};
  RKMSetOf3Doubles s;
  EXPECT_EQ(s.Insert(a), S_OK);
  EXPECT_EQ(s.Insert(sameAsA), S_FALSE);
  EXPECT_EQ(s.Find(sameAsA), a);
  EXPECT_EQ(s.Insert(b), S_OK);
  EXPECT_EQ(s.Insert(bPositive), S_FALSE);
  EXPECT_EQ(s.Remove(bPositive), S_OK);
  EXPECT_EQ(s.Size(), 1);
  const float f[3] = {4, 5, 6}, g[3] = {4, 5, 6};
  RKMSetOf3Floats sf;
  EXPECT_EQ(sf.Insert(f), S_OK);
  EXPECT_EQ(sf.Remove(g), S_OK);
  EXPECT_FALSE(sf.Locate(f));
}

TEST(RKMTripleSets, NaNTripleIsNotEqualToFiniteOnes)
{
  // Were NaN neither below nor above any number, (NaN, 0, 0) would equal (x, 0, 0) while hashing apart
  // from it, and a finite triple would be refused exactly when it shares the NaN triple's bucket: with 31
  // buckets, (24, 0, 0) does.
  const float nan[3] = {kNaNF, 0, 0}, x[3] = {24, 0, 0};
  ASSERT_EQ(RKMCompareFloatPoints::HashThreeFloats(nan) % 31, RKMCompareFloatPoints::HashThreeFloats(x) % 31);
  RKMSetOf3Floats s;
  EXPECT_EQ(s.Insert(nan), S_OK);
  EXPECT_EQ(s.Insert(x), S_OK);
  EXPECT_NE(RKMCompareFloatPoints::Shared().Compare(nan, x), 0);
}

TEST(RKMSetOfFloatPoints, OwnCopiesStayPutUntilRemovedAndFreedSlotsComeFirst)
{
  RKMSetOfFloatPoints s;
  float buffer[3] = {1, 2, 3};
  const float *stored = nullptr, *again = nullptr;
  ASSERT_EQ(s.Insert(buffer, &stored), S_OK);
  ASSERT_TRUE(stored && stored != buffer);
  buffer[0] = 9;
  EXPECT_EQ(stored[0], 1.0f) << "the set keeps its own copy";
  EXPECT_EQ(s.Insert(1, 2, 3, &again), S_FALSE);
  EXPECT_EQ(again, stored);
  EXPECT_EQ(s.Insert(0.0f, -0.0f, 0.0f), S_OK);
  EXPECT_EQ(s.Insert(-0.0f, 0.0f, -0.0f), S_FALSE);
  EXPECT_EQ(s.Insert(nullptr, &again), E_INVALIDARG);
  EXPECT_EQ(again, nullptr);
  s.RemoveAll();

  // Thousands of triples cross several pool blocks and table growths without moving.
  std::map<const float *, unsigned> live;
  for (unsigned v = 0; v < kValues; ++v)
  {
    ASSERT_EQ(s.Insert(&Triples<float>()[3 * v], &stored), S_OK);
    ASSERT_TRUE(live.emplace(stored, v).second) << "two triples share an address";
  }
  std::mt19937 rng(7);
  for (int round = 0; round < 2000; ++round)
  {
    const auto victim = std::next(live.begin(), static_cast<long>(rng() % live.size()));
    const unsigned v = victim->second;
    const float *freed = victim->first;
    ASSERT_EQ(s.Remove(&Triples<float>()[3 * (v + kValues)]), S_OK);
    live.erase(victim);
    if (round % 2)
      continue;
    ASSERT_EQ(s.Insert(&Triples<float>()[3 * v], &stored), S_OK);
    EXPECT_EQ(stored, freed) << "the slot just freed is reused first";
    live.emplace(stored, v);
  }
  ASSERT_EQ(s.Size(), static_cast<int>(live.size()));
  for (const auto &e : live)
    ASSERT_TRUE(ValueOf(e.first) == e.second && s.Find(&Triples<float>()[3 * e.second]) == e.first) << e.second;

  RKMSetOfFloatPoints failed(INT_MAX);
  EXPECT_FALSE(failed.IsValid());
  EXPECT_EQ(failed.Insert(1, 2, 3, &again), E_OUTOFMEMORY);
  EXPECT_EQ(again, nullptr);
}

TEST(RKMSetOfFloatPoints, CopiesAreDeepAndOutliveTheSource)
{
  auto source = std::make_unique<RKMSetOfFloatPoints>();
  for (unsigned v = 0; v < 700; ++v)
    source->Insert(&Triples<float>()[3 * v]);
  std::set<const float *> sourceAddresses;
  for (RKMSetOfFloatPoints::Iterator it(*source); !it.End(); ++it)
    sourceAddresses.insert(*it);
  RKMSetOfFloatPoints copy(*source), assigned;
  assigned.Insert(100, 100, 100);
  assigned = *source;
  RKMSetOfFloatPoints &alias = assigned;
  assigned = alias;
  source.reset();
  for (const RKMSetOfFloatPoints *s : {&copy, &assigned})
  {
    ASSERT_TRUE(s->IsValid());
    ASSERT_EQ(s->Size(), 700);
    unsigned i = 0;
    for (RKMSetOfFloatPoints::Iterator it(*s); !it.End(); ++it, ++i)
      EXPECT_TRUE(!sourceAddresses.count(it.GetFloats()) && ValueOf(*it) == i) << "entry " << i;
  }
}

TYPED_TEST(RKMInterningMaps, FollowModelThroughGrowthAndDraining)
{
  TypeParam a;
  htmodel::Run(a, {201, 30000, 2 * kValues});
}

TYPED_TEST(RKMInterningMaps, SignedZeroIsOneKeyAndNullIsRefused)
{
  using T = typename std::remove_const<typename std::remove_pointer<decltype(TypeParam::At({}))>::type>::type;
  const T zero[3] = {0, 0, 0}, negX[3] = {-T(0), 0, 0}, allNeg[3] = {-T(0), -T(0), -T(0)};
  TypeParam a;
  auto &m = a.t;
  EXPECT_EQ(m.Insert(zero, TypeParam::Val(1)), S_OK);
  EXPECT_EQ(m.Insert(negX, TypeParam::Val(2)), E_FAIL);
  EXPECT_EQ(m.Insert(allNeg, TypeParam::Val(1)), S_FALSE);
  EXPECT_EQ(m.Size(), 1);
  EXPECT_EQ(m.InsertOrUpdate(negX, TypeParam::Val(3)), S_OK);
  auto v = TypeParam::Val(0);
  EXPECT_TRUE(m.Locate(allNeg, v) && v == TypeParam::Val(3));
  EXPECT_EQ(m.Insert(nullptr, v), E_INVALIDARG);
  EXPECT_EQ(m.InsertOrUpdate(nullptr, v), E_INVALIDARG);
  EXPECT_FALSE(m.Locate(nullptr, v));
  EXPECT_EQ(m.Remove(nullptr), S_FALSE);
  EXPECT_EQ(m.Remove(negX), S_OK);
  EXPECT_EQ(m.Size(), 0);
  EXPECT_FALSE(m.Locate(zero, v));
}

TEST(RKMInterningMapsCopy, PoolMapsCopyDeeplyCallerMapsShareTheCallersTriples)
{
  auto source = std::make_unique<RKMMapOfFloatsToInt>();
  for (unsigned v = 0; v < 500; ++v)
    source->Insert(&Triples<float>()[3 * v], static_cast<int>(v));
  source->Remove(&Triples<float>()[3 * 7]);
  std::set<const float *> sourceAddresses;
  std::vector<unsigned> order;
  for (RKMMapOfFloatsToInt::Iterator it(*source); !it.End(); ++it)
    sourceAddresses.insert(it.GetFloats()), order.push_back(ValueOf(it.GetFloats()));
  RKMMapOfFloatsToInt copy(*source), assigned;
  assigned.Insert(&Triples<float>()[3 * 600], 1);
  assigned = *source;
  RKMMapOfFloatsToInt &alias = copy;
  copy = alias;
  source.reset();
  for (const RKMMapOfFloatsToInt *m : {&copy, &assigned})
  {
    ASSERT_TRUE(m->IsValid());
    std::vector<unsigned> walked;
    for (RKMMapOfFloatsToInt::Iterator it(*m); !it.End(); ++it)
    {
      EXPECT_EQ(sourceAddresses.count(it.GetFloats()), 0u);
      EXPECT_EQ(it.GetData(), static_cast<int>(ValueOf(it.GetFloats())));
      walked.push_back(ValueOf(it.GetFloats()));
    }
    EXPECT_EQ(walked, order) << "a copy keeps the entry order";
  }
  RKMMapOf3DoublesToInt byAddress;
  byAddress.Insert(&Triples<double>()[3 * 5], 5);
  EXPECT_EQ(RKMMapOf3DoublesToInt::Iterator(RKMMapOf3DoublesToInt(byAddress)).GetDoubles(), &Triples<double>()[3 * 5]);
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
    ASSERT_NE(Bits(key.front()), Bits(kNaNF));
    EXPECT_FALSE(m.Locate(key.data(), v)) << "another NaN pattern is another key";
    EXPECT_EQ(m.Insert(nullptr, 1), E_INVALIDARG);
    EXPECT_FALSE(m.Locate(nullptr, v));
    EXPECT_EQ(m.Remove(nullptr), S_FALSE);
  }
}

TEST(RKMMapOfNFloatsToInt, FollowsModelAndCopiesDeeply)
{
  // Coordinates from a few values so that keys repeat, with -0 and NaN among them.
  const float coords[] = {0.0f, -0.0f, 1.0f, 2.5f, -7.0f, kNaNF};
  RKMMapOfNFloatsToInt m(3);
  std::map<std::vector<std::uint32_t>, int> model;
  std::mt19937 rng(301);
  for (int step = 0; step < 20000; ++step)
  {
    const float key[3] = {coords[rng() % 6], coords[rng() % 6], coords[rng() % 6]};
    const std::vector<std::uint32_t> c = {Bits(key[0] + 0.0f), Bits(key[1] + 0.0f), Bits(key[2] + 0.0f)};
    const int value = static_cast<int>(rng() % 3);
    const auto found = model.find(c);
    const bool present = found != model.end();
    int v = -1;
    switch (rng() % 4)
    {
    case 0:
      ASSERT_EQ(m.Insert(key, value), !present ? S_OK : found->second == value ? S_FALSE : E_FAIL) << step;
      model.emplace(c, value);
      break;
    case 1:
      ASSERT_EQ(m.InsertOrUpdate(key, value), present && found->second == value ? S_FALSE : S_OK) << step;
      model[c] = value;
      break;
    case 2:
      ASSERT_EQ(m.Remove(key), present ? S_OK : S_FALSE) << step;
      model.erase(c);
      break;
    default:
      ASSERT_EQ(m.Locate(key, v), present) << step;
      ASSERT_EQ(v, present ? found->second : -1) << step;
    }
    ASSERT_EQ(m.Size(), static_cast<int>(model.size())) << step;
  }
  RKMMapOfNFloatsToInt wider(7);
  wider.Insert(std::vector<float>(7, 1.0f).data(), 9);
  wider = m;
  EXPECT_EQ(wider.GetN(), 3);
  const RKMMapOfNFloatsToInt copy(m);
  m.RemoveAll();
  for (const RKMMapOfNFloatsToInt *t : {static_cast<const RKMMapOfNFloatsToInt *>(&wider), &copy})
  {
    ASSERT_EQ(t->Size(), static_cast<int>(model.size()));
    for (const auto &e : model)
    {
      float key[3];
      std::memcpy(key, e.first.data(), sizeof key);
      int v = -1;
      EXPECT_TRUE(t->Locate(key, v) && v == e.second);
    }
  }
}
