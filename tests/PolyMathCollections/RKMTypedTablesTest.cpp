#include "RKMHTableOfIntToInt.h"
#include "RKMHTableOfIntToPtr.h"
#include "RKMHTableOfPtrToInt.h"
#include "RKMHTableOfPtrToPtr.h"
#include "RKMMapOfIntIntToInt.h"
#include "RKMMapOfIntIntToPtr.h"
#include "RKMMapOfIntToInt.h"
#include "RKMMapOfIntToPtr.h"
#include "RKMMapOfPtrPtrToInt.h"
#include "RKMMapOfPtrPtrToPtr.h"
#include "RKMMapOfPtrToInt.h"
#include "RKMMapOfPtrToPtr.h"
#include "RKMSetOfInt.h"
#include "RKMSetOfPtr.h"

#include "HTableModel.h"

#include <gtest/gtest.h>

#include <climits>
#include <cstdint>
#include <type_traits>
#include <vector>

using htmodel::Keys;
using htmodel::Walked;

namespace
{
const RKMWord kBase = static_cast<RKMWord>(0x7f3b00000000ull);

// Int keys spread over the whole range with INT_MIN and INT_MAX among them, so that pair sums wrap.
template <class K>
K MakeKey(unsigned r);
template <>
int MakeKey<int>(unsigned r)
{
  return r == 0 ? INT_MIN : r == 1 ? INT_MAX : static_cast<int>(r * 2654435761u);
}
template <>
void *MakeKey<void *>(unsigned r)
{
  return reinterpret_cast<void *>(kBase + 8 * RKMWord(r));
}
template <class K>
std::uint64_t Compact(RKMWord w) // injective on the keys above, to build the model's key of a pair
{
  return static_cast<std::uint32_t>(std::is_pointer<K>::value ? (w - kBase) / 8 : w);
}
template <class T>
RKMWord Word(T v) { return RKMWordCast<T>::To(v); }
template <class T>
T From(RKMWord w) { return RKMWordCast<T>::From(w); }

template <class M, bool kData>
struct Common
{
  static constexpr bool kHasData = kData, kHandles = false, kExactKeys = true, kCapacity = true;
  M t;
  Keys Variant(Keys k) const { return k; }
  int Size() const { return t.Size(); }
  int Capacity() const { return t.Capacity(); }
};

template <class S, class E>
struct TypedSet : Common<S, false>
{
  Keys Fresh(unsigned r) const { return {Word(MakeKey<E>(r)), 0}; }
  std::uint64_t Canon(Keys k) const { return k.k1; }
  HRESULT Insert(Keys k, RKMWord, const RKMWord *&) { return this->t.Insert(From<E>(k.k1)); }
  HRESULT Remove(Keys k, RKMWord &, bool &) { return this->t.Remove(From<E>(k.k1)); }
  bool Lookup(Keys k, Keys &stored, RKMWord &data) const
  {
    stored = k, data = Word(this->t.Find(From<E>(k.k1)));
    return this->t.Locate(From<E>(k.k1));
  }
  std::vector<Walked> Walk() const
  {
    std::vector<Walked> w;
    for (typename S::Iterator it(this->t); !it.End(); ++it)
      w.push_back({{Word(*it), 0}, Word(it.GetData()), nullptr});
    return w;
  }
};

template <class M, class K, class V>
struct TypedMap : Common<M, true>
{
  Keys Fresh(unsigned r) const { return {Word(MakeKey<K>(r)), 0}; }
  std::uint64_t Canon(Keys k) const { return k.k1; }
  HRESULT Insert(Keys k, RKMWord d, const RKMWord *&) { return this->t.Insert(From<K>(k.k1), From<V>(d)); }
  HRESULT InsertOrUpdate(Keys k, RKMWord d) { return this->t.InsertOrUpdate(From<K>(k.k1), From<V>(d)); }
  HRESULT Update(Keys k, RKMWord d) { return this->t.Update(From<K>(k.k1), From<V>(d)); }
  HRESULT Remove(Keys k, RKMWord &removed, bool &gave)
  {
    V v{};
    const HRESULT hr = this->t.Remove(From<K>(k.k1), v);
    removed = Word(v), gave = true;
    return hr;
  }
  bool Lookup(Keys k, Keys &stored, RKMWord &data) const
  {
    V v{};
    const bool found = this->t.Locate(From<K>(k.k1), v);
    stored = k, data = Word(v);
    return found;
  }
  std::vector<Walked> Walk() const
  {
    std::vector<Walked> w;
    for (typename M::Iterator it(this->t); !it.End(); ++it)
      w.push_back({{Word(it.GetKey()), 0}, Word(it.GetData()), nullptr});
    return w;
  }
};

template <class M, class K, class V>
struct PairMap : Common<M, true>
{
  Keys Fresh(unsigned r) const { return {Word(MakeKey<K>(r / 4)), Word(MakeKey<K>(r % 4))}; }
  std::uint64_t Canon(Keys k) const { return Compact<K>(k.k1) << 32 | Compact<K>(k.k2); }
  HRESULT Insert(Keys k, RKMWord d, const RKMWord *&) { return this->t.Insert(From<K>(k.k1), From<K>(k.k2), From<V>(d)); }
  HRESULT InsertOrUpdate(Keys k, RKMWord d) { return this->t.InsertOrUpdate(From<K>(k.k1), From<K>(k.k2), From<V>(d)); }
  HRESULT Update(Keys k, RKMWord d) { return this->t.Update(From<K>(k.k1), From<K>(k.k2), From<V>(d)); }
  HRESULT Remove(Keys k, RKMWord &, bool &) { return this->t.Remove(From<K>(k.k1), From<K>(k.k2)); }
  bool Lookup(Keys k, Keys &stored, RKMWord &data) const
  {
    V v{};
    const bool found = this->t.Locate(From<K>(k.k1), From<K>(k.k2), v);
    stored = k, data = Word(v);
    return found;
  }
  std::vector<Walked> Walk() const
  {
    std::vector<Walked> w;
    for (typename M::Iterator it(this->t); !it.End(); ++it)
      w.push_back({{Word(it.GetKey1()), Word(it.GetKey2())}, Word(it.GetData()), nullptr});
    return w;
  }
};

template <class A>
class RKMTypedTables : public ::testing::Test
{
};
using Adapters = ::testing::Types<
    TypedSet<RKMSetOfInt, int>, TypedSet<RKMSetOfPtr, void *>, TypedMap<RKMMapOfIntToInt, int, int>,
    TypedMap<RKMHTableOfIntToInt, int, int>, TypedMap<RKMMapOfIntToPtr, int, void *>,
    TypedMap<RKMHTableOfIntToPtr, int, void *>, TypedMap<RKMMapOfPtrToInt, void *, int>,
    TypedMap<RKMHTableOfPtrToInt, void *, int>, TypedMap<RKMMapOfPtrToPtr, void *, void *>,
    TypedMap<RKMHTableOfPtrToPtr, void *, void *>, PairMap<RKMMapOfIntIntToInt, int, int>,
    PairMap<RKMMapOfIntIntToPtr, int, void *>, PairMap<RKMMapOfPtrPtrToInt, void *, int>,
    PairMap<RKMMapOfPtrPtrToPtr, void *, void *>>;
TYPED_TEST_SUITE(RKMTypedTables, Adapters);

// Compares pointers by the ints they point to.
class PointeeCompare : public RKMCompareElements
{
public:
  int Compare(const void *a, const void *b) const override
  {
    return *static_cast<const int *>(a) == *static_cast<const int *>(b) ? 0 : 1;
  }
  unsigned int Hash(const void *e) const override { return static_cast<unsigned>(*static_cast<const int *>(e)); }
};

int UnorderedPair(RKMWord a1, RKMWord a2, RKMWord b1, RKMWord b2)
{
  return (a1 == b1 && a2 == b2) || (a1 == b2 && a2 == b1) ? 0 : 1;
}
}

TYPED_TEST(RKMTypedTables, FollowModelThroughGrowthAndDraining)
{
  TypeParam a;
  int largest = 0;
  htmodel::Run(a, {101, 30000, 4000}, &largest);
  EXPECT_GE(largest, 1117);
}

TEST(RKMTypedTablesEdges, IntPairSumsWrapWithoutOverflow)
{
  EXPECT_EQ(RKMMapOfIntIntToInt::HashKey(INT_MAX, INT_MAX), 0xFFFFFFFEu);
  EXPECT_EQ(RKMMapOfIntIntToInt::HashKey(INT_MIN, INT_MIN), 0u);
  EXPECT_EQ(RKMMapOfIntIntToPtr::HashKey(INT_MAX, 1), 0x80000000u);
  EXPECT_EQ(RKMMapOfIntIntToInt::Compare(INT_MAX, INT_MIN, INT_MAX, INT_MIN), 0);
  EXPECT_NE(RKMMapOfIntIntToInt::Compare(INT_MAX, INT_MIN, INT_MIN, INT_MAX), 0);
  // The last three pairs all sum to -1 (mod 2^32): one bucket, three distinct keys.
  const int pairs[][2] = {{INT_MAX, INT_MAX}, {INT_MIN, INT_MIN}, {INT_MAX, 1}, {INT_MAX, INT_MIN}, {INT_MIN, INT_MAX}, {-1, 0}};
  RKMMapOfIntIntToInt m;
  for (int i = 0; i < 6; ++i)
    ASSERT_EQ(m.Insert(pairs[i][0], pairs[i][1], i), S_OK) << i;
  EXPECT_EQ(m.Remove(INT_MAX, INT_MIN), S_OK);
  for (int i = 0, v = -1; i < 6; ++i, v = -1)
    EXPECT_TRUE(i == 3 ? !m.Locate(pairs[i][0], pairs[i][1], v) : m.Locate(pairs[i][0], pairs[i][1], v) && v == i) << i;
}

TEST(RKMTypedTablesEdges, FailedTablesAndUntouchedOutputs)
{
  RKMMapOfIntToInt m(INT_MAX);
  RKMSetOfInt s(INT_MAX);
  RKMMapOfIntIntToPtr mm(1 << 30);
  EXPECT_EQ(m.Capacity() + s.Capacity() + mm.Capacity(), 0);
  EXPECT_EQ(m.Insert(1, 2), E_OUTOFMEMORY);
  EXPECT_EQ(m.InsertOrUpdate(1, 2), E_OUTOFMEMORY);
  EXPECT_EQ(m.Update(1, 2), S_FALSE);
  EXPECT_EQ(s.Insert(1), E_OUTOFMEMORY);
  EXPECT_EQ(mm.Insert(1, 2, nullptr), E_OUTOFMEMORY);
  EXPECT_EQ(RKMMapOfIntToInt(m).Capacity(), 0) << "a copy of a failed table is failed";

  // Absent keys leave the output alone; keys differing only above bit 32 are different keys.
  RKMMapOfPtrToPtr p;
  int x = 0, y = 0;
  void *low = reinterpret_cast<void *>(static_cast<RKMWord>(0x100000000ull)), *high = reinterpret_cast<void *>(static_cast<RKMWord>(0x200000000ull));
  EXPECT_EQ(p.Insert(low, &x), S_OK);
  EXPECT_EQ(p.Insert(high, &y), S_OK);
  void *v = &p;
  EXPECT_FALSE(p.Locate(&x, v));
  EXPECT_EQ(p.Remove(&x, v), S_FALSE);
  EXPECT_EQ(v, &p);
  EXPECT_EQ(p.Remove(low, v), S_OK);
  EXPECT_EQ(v, &x);
  RKMMapOfPtrToPtr &alias = p;
  p = alias;
  EXPECT_TRUE(p.Locate(high, v) && v == &y) << "self-assignment keeps the data";
}

TEST(RKMTypedTablesEdges, CallerComparisonsForPointerSetsAndPairs)
{
  const PointeeCompare cmp;
  int a = 7, b = 7, c = 8;
  RKMSetOfPtr s(0, &cmp);
  EXPECT_EQ(s.Insert(&a), S_OK);
  EXPECT_EQ(s.Insert(&b), S_FALSE);
  EXPECT_EQ(s.Find(&b), &a) << "the first equal element stays stored";
  EXPECT_EQ(s.Insert(&c), S_OK);
  EXPECT_EQ(s.Remove(&b), S_OK);
  EXPECT_EQ(s.Find(&a), nullptr);

  // The default pair hash is symmetric, so an unordered comparison works with it.
  RKMMapOfPtrPtrToInt m(0, UnorderedPair);
  EXPECT_EQ(m.Insert(&a, &b, 1), S_OK);
  EXPECT_EQ(m.Insert(&b, &a, 1), S_FALSE);
  EXPECT_EQ(m.Insert(&b, &a, 2), E_FAIL);
  EXPECT_EQ(m.InsertOrUpdate(&b, &a, 3), S_OK);
  int v = 0;
  EXPECT_TRUE(m.Locate(&a, &b, v) && v == 3);
  EXPECT_EQ(m.Remove(&b, &a), S_OK);
  RKMMapOfPtrPtrToPtr ordered;
  EXPECT_EQ(ordered.Insert(&a, &b, &v), S_OK);
  EXPECT_EQ(ordered.Insert(&b, &a, &v), S_OK);
}
