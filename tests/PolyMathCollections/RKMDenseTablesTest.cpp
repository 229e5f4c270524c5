#include "RKMHTableOfIntToInt.h"
#include "RKMHTableOfIntToPtr.h"
#include "RKMHTableOfPtrToInt.h"
#include "RKMHTableOfPtrToPtr.h"
#include "RKMHTable_D.h"
#include "RKMHTable_KK_D.h"
#include "RKMHTable_K_D.h"
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

#include <climits>

using htmodel::ExpectedCapacity;
using htmodel::Keys;
using htmodel::ToW;

namespace
{
// Key words look like 64-bit addresses, so the folding of the high bits into the default hash takes part.
const RKMWord kBase = static_cast<RKMWord>(0x7f5a00000000ull);
// Under the "modulo" comparisons two words are equal when they agree modulo kClasses, so an equal key can be
// another word: the table must keep and report the first one stored.
constexpr RKMWord kClasses = 5003;

RKMWord W(const void *p) { return reinterpret_cast<RKMWord>(p); }
class ModuloCompare : public RKMCompareElements
{
public:
  int Compare(const void *a, const void *b) const override { return W(a) % kClasses == W(b) % kClasses ? 0 : 1; }
  // Disagrees with the default hash (w >> 2): a set that ignored it would miss equal elements.
  unsigned int Hash(const void *e) const override { return static_cast<unsigned>(W(e) % kClasses) * 2654435761u; }
};
const ModuloCompare kModulo;
// Compares pointers by the ints they point to.
class PointeeCompare : public RKMCompareElements
{
public:
  int Compare(const void *a, const void *b) const override { return *static_cast<const int *>(a) == *static_cast<const int *>(b) ? 0 : 1; }
  unsigned int Hash(const void *e) const override { return static_cast<unsigned>(*static_cast<const int *>(e)); }
};

// Few distinct values, so chains run long and removals relink inside crowded buckets.
unsigned CrowdedHash(RKMWord w) { return static_cast<unsigned>(w % kClasses % 97); }
unsigned CrowdedHash2(RKMWord a, RKMWord b) { return static_cast<unsigned>((a % kClasses + b) % 97); }
int ModuloCompare4(RKMWord a1, RKMWord a2, RKMWord b1, RKMWord b2) { return a1 % kClasses == b1 % kClasses && a2 == b2 ? 0 : 1; }
int UnorderedPair(RKMWord a1, RKMWord a2, RKMWord b1, RKMWord b2) { return (a1 == b1 && a2 == b2) || (a1 == b2 && a2 == b1) ? 0 : 1; }

template <class T, int N = 1, class V = RKMWord>
struct Generic : htmodel::Dense<T, RKMWord, V, N>
{
  bool modulo = false;
  Keys Fresh(unsigned r) const { return N == 2 ? Keys{kBase + r / 4, r % 4} : Keys{kBase + r, 0}; }
  Keys Variant(Keys k) const { return modulo ? Keys{k.k1 + kClasses, k.k2} : k; }
  std::uint64_t Canon(Keys k) const { return ((modulo ? k.k1 % kClasses : k.k1) << 2) | k.k2; }
};
using Set = Generic<RKMHTable_D, 1, void>;
using Map = Generic<RKMHTable_K_D>;
using Map2 = Generic<RKMHTable_KK_D, 2>;

// Large enough for the tables to pass through 31, 67, 137, ... up to 4481 buckets.
template <class A>
void RunOn(decltype(A::t) table, bool modulo, unsigned seed, unsigned range, int requested = 0)
{
  A a{{std::move(table)}, modulo};
  EXPECT_GE(htmodel::Run(a, {seed, 60000, range, requested}), 4481);
}

// Typed int keys spread over the whole range with INT_MIN and INT_MAX among them, so that pair sums wrap.
template <class K>
K MakeKey(unsigned r)
{
  if constexpr (std::is_pointer<K>::value)
    return reinterpret_cast<K>(kBase + 8 * RKMWord(r));
  else
    return r == 0 ? INT_MIN : r == 1 ? INT_MAX : static_cast<int>(r * 2654435761u);
}
template <class K>
std::uint64_t Compact(RKMWord w) // injective on the keys above, to make the number of a pair
{
  return static_cast<std::uint32_t>(std::is_pointer<K>::value ? (w - kBase) / 8 : w);
}
template <class T, class K, class V, int N = 1>
struct Typed : htmodel::Dense<T, K, V, N>
{
  Keys Fresh(unsigned r) const { return N == 1 ? Keys{ToW(MakeKey<K>(r)), 0} : Keys{ToW(MakeKey<K>(r / 4)), ToW(MakeKey<K>(r % 4))}; }
  Keys Variant(Keys k) const { return k; }
  std::uint64_t Canon(Keys k) const { return N == 1 ? k.k1 : Compact<K>(k.k1) << 32 | Compact<K>(k.k2); }
};
template <class A>
class RKMTypedTables : public ::testing::Test
{
};
using Adapters = ::testing::Types<
    Typed<RKMSetOfInt, int, void>, Typed<RKMSetOfPtr, void *, void>, Typed<RKMMapOfIntToInt, int, int>,
    Typed<RKMHTableOfIntToInt, int, int>, Typed<RKMMapOfIntToPtr, int, void *>, Typed<RKMHTableOfIntToPtr, int, void *>,
    Typed<RKMMapOfPtrToInt, void *, int>, Typed<RKMHTableOfPtrToInt, void *, int>, Typed<RKMMapOfPtrToPtr, void *, void *>,
    Typed<RKMHTableOfPtrToPtr, void *, void *>, Typed<RKMMapOfIntIntToInt, int, int, 2>,
    Typed<RKMMapOfIntIntToPtr, int, void *, 2>, Typed<RKMMapOfPtrPtrToInt, void *, int, 2>,
    Typed<RKMMapOfPtrPtrToPtr, void *, void *, 2>>;
TYPED_TEST_SUITE(RKMTypedTables, Adapters);
}

// Plain; with a crowded hash; through the comparison object's own hash and its equal keys of other words;
// both together; from a requested size. Then failed: both requests lie beyond the largest capacity, the
// second reaches it exactly.
TEST(RKMHTableGeneric, SetsFollowModelThroughGrowthAndDraining)
{
  RunOn<Set>(RKMHTable_D(), false, 11, 6000);
  RunOn<Set>(RKMHTable_D(0, nullptr, CrowdedHash), false, 12, 6000);
  RunOn<Set>(RKMHTable_D(0, &kModulo), true, 13, 10000);
  RunOn<Set>(RKMHTable_D(100), false, 14, 6000, 100);
}

TEST(RKMHTableGeneric, MapsFollowModelThroughGrowthAndDrainingAndFailCleanly)
{
  RunOn<Map>(RKMHTable_K_D(), false, 21, 6000);
  RunOn<Map>(RKMHTable_K_D(0, &kModulo, CrowdedHash), true, 22, 10000);
  RunOn<Map>(RKMHTable_K_D(0, nullptr, CrowdedHash), false, 23, 6000);
  RunOn<Map2>(RKMHTable_KK_D(), false, 31, 6000);
  RunOn<Map2>(RKMHTable_KK_D(40, CrowdedHash2, ModuloCompare4), true, 32, 40000, 40);
  for (int request : {INT_MAX, 1 << 30})
  {
    Set d{{RKMHTable_D(request)}};
    Map k{{RKMHTable_K_D(request)}};
    Map2 kk{{RKMHTable_KK_D(request)}};
    htmodel::CheckFailed(d);
    htmodel::CheckFailed(k);
    htmodel::CheckFailed(kk);
    EXPECT_EQ(RKMHTable_D(request).FindOne(5), nullptr);
  }
}

// Up to 31 entries the table lives in the object; the 32nd moves it to the heap. Emptying keeps the
// buckets; nothing of the old entries must remain reachable.
TEST(RKMHTableGeneric, CapacityFollowsRequestAndEmptyingKeepsIt)
{
  for (int request : {INT_MIN, -7, 0, 1, 31, 32, 37, 38, 100, 1000, 4096})
    EXPECT_TRUE(RKMHTable_D(request).Capacity() == ExpectedCapacity(request) && RKMHTable_K_D(request).Capacity() == ExpectedCapacity(request) &&
                RKMHTable_KK_D(request).Capacity() == ExpectedCapacity(request))
        << request;
  RKMHTable_K_D t;
  for (RKMWord i = 0; i < 31; ++i)
    ASSERT_EQ(t.Insert(kBase + i, i), S_OK);
  EXPECT_EQ(t.SizeOf(), sizeof(RKMHTable_K_D));
  ASSERT_EQ(t.Insert(kBase + 31, 31), S_OK);
  EXPECT_GT(t.SizeOf(), sizeof(RKMHTable_K_D));
  t.RemoveAll();
  EXPECT_TRUE(t.Size() == 0 && t.Capacity() == 67 && t.Find(kBase + 4) == nullptr && RKMHTable_K_D::Iterator(t).End());
  EXPECT_EQ(t.Insert(kBase + 8, 1), S_OK);
  EXPECT_EQ(RKMHTable_K_D::Iterator(t).GetKey(), kBase + 8);
}

// FindOne wants an element whose own hash is the given one, not merely one in the same bucket.
TEST(RKMHTableGeneric, DataUpdatedThroughHandlesAndExactHashLookup)
{
  RKMHTable_K_D t;
  RKMWord *h = nullptr, data = 0;
  ASSERT_EQ(t.Insert(8, 1, h), S_OK);
  RKMHTable_K_D::Update(h, 9);
  EXPECT_TRUE(t.Locate(8, data) && data == 9);
  RKMHTable_KK_D kk;
  ASSERT_EQ(kk.Insert(1, 2, 3, h), S_OK);
  RKMHTable_KK_D::Update(h, 4);
  EXPECT_EQ(kk.InsertOrUpdate(1, 2, 4), S_FALSE);
  RKMHTable_D d(0, nullptr, CrowdedHash);
  ASSERT_TRUE(d.Insert(3) == S_OK && d.Insert(3 + 97) == S_OK && d.FindOne(3) != nullptr);
  EXPECT_EQ(CrowdedHash(RKMHTable_D::GetData(d.FindOne(3))), 3u);
  EXPECT_EQ(d.FindOne(3 + 31), nullptr);
}

TYPED_TEST(RKMTypedTables, FollowModelThroughGrowthAndDrainingAndFailCleanly)
{
  TypeParam a;
  EXPECT_GE(htmodel::Run(a, {101, 30000, 4000}), 1117);
  TypeParam failed{{decltype(a.t)(TypeParam::kKeys == 2 ? 1 << 30 : INT_MAX)}};
  htmodel::CheckFailed(failed);
}

// The pair hash is the sum modulo 2^32, without overflow; pairs summing alike come up in the run above.
TEST(RKMTypedTablesEdges, IntPairSumsWrapWithoutOverflow)
{
  EXPECT_TRUE(RKMMapOfIntIntToInt::HashKey(INT_MAX, INT_MAX) == 0xFFFFFFFEu && RKMMapOfIntIntToInt::HashKey(INT_MIN, INT_MIN) == 0u);
  EXPECT_EQ(RKMMapOfIntIntToPtr::HashKey(INT_MAX, 1), 0x80000000u);
  EXPECT_EQ(RKMMapOfIntIntToInt::Compare(INT_MAX, INT_MIN, INT_MAX, INT_MIN), 0);
  EXPECT_NE(RKMMapOfIntIntToInt::Compare(INT_MAX, INT_MIN, INT_MIN, INT_MAX), 0);
}

// Absent keys leave outputs alone; keys differing only above bit 32 are different keys; caller comparisons
// decide equality, and the default pair hash is symmetric, so an unordered comparison works with it.
TEST(RKMTypedTablesEdges, AbsentKeysLeaveOutputsAloneAndCallerComparisonsCount)
{
  RKMMapOfPtrToPtr p;
  int x = 0, y = 0, a = 7, b = 7, c = 8, d = 0;
  void *low = reinterpret_cast<void *>(static_cast<RKMWord>(0x100000000ull)), *high = reinterpret_cast<void *>(static_cast<RKMWord>(0x200000000ull));
  void *v = &p;
  EXPECT_TRUE(p.Insert(low, &x) == S_OK && p.Insert(high, &y) == S_OK);
  EXPECT_TRUE(!p.Locate(&x, v) && p.Remove(&x, v) == S_FALSE && v == &p);
  EXPECT_TRUE(p.Remove(low, v) == S_OK && v == &x && p.Locate(high, v) && v == &y);
  const PointeeCompare cmp;
  RKMSetOfPtr s(0, &cmp);
  EXPECT_TRUE(s.Insert(&a) == S_OK && s.Insert(&b) == S_FALSE);
  EXPECT_EQ(s.Find(&b), &a) << "the first equal element stays stored";
  EXPECT_TRUE(s.Insert(&c) == S_OK && s.Remove(&b) == S_OK && s.Find(&a) == nullptr);
  RKMMapOfPtrPtrToInt m(0, UnorderedPair);
  EXPECT_TRUE(m.Insert(&a, &b, 1) == S_OK && m.Insert(&b, &a, 1) == S_FALSE && m.Insert(&b, &a, 2) == E_FAIL);
  EXPECT_TRUE(m.InsertOrUpdate(&b, &a, 3) == S_OK && m.Locate(&a, &b, d) && d == 3 && m.Remove(&b, &a) == S_OK);
  RKMMapOfPtrPtrToPtr ordered;
  EXPECT_TRUE(ordered.Insert(&a, &b, &d) == S_OK && ordered.Insert(&b, &a, &d) == S_OK);
}
