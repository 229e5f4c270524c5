#include "RKMHTable_D.h"
#include "RKMHTable_KK_D.h"
#include "RKMHTable_K_D.h"

#include "HTableModel.h"

#include <gtest/gtest.h>

#include <climits>
#include <cstdint>
#include <type_traits>
#include <vector>

using htmodel::ExpectedCapacity;
using htmodel::Keys;
using htmodel::Walked;

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

// Few distinct values, so chains run long and removals relink inside crowded buckets.
unsigned CrowdedHash(RKMWord w) { return static_cast<unsigned>(w % kClasses % 97); }
unsigned CrowdedHash2(RKMWord a, RKMWord b) { return static_cast<unsigned>((a % kClasses + b) % 97); }
int ModuloCompare4(RKMWord a1, RKMWord a2, RKMWord b1, RKMWord b2)
{
  return a1 % kClasses == b1 % kClasses && a2 == b2 ? 0 : 1;
}
unsigned ConstantHash(RKMWord) { return 7; }

// The three generic tables seen through one set of overloads, for the model.
HRESULT Put(RKMHTable_D &t, Keys k, RKMWord, RKMWord *&h) { return t.Insert(k.k1, h); }
HRESULT Put(RKMHTable_K_D &t, Keys k, RKMWord d, RKMWord *&h) { return t.Insert(k.k1, d, h); }
HRESULT Put(RKMHTable_KK_D &t, Keys k, RKMWord d, RKMWord *&h) { return t.Insert(k.k1, k.k2, d, h); }
HRESULT PutOrUpdate(RKMHTable_K_D &t, Keys k, RKMWord d) { return t.InsertOrUpdate(k.k1, d); }
HRESULT PutOrUpdate(RKMHTable_KK_D &t, Keys k, RKMWord d) { return t.InsertOrUpdate(k.k1, k.k2, d); }
HRESULT Replace(RKMHTable_K_D &t, Keys k, RKMWord d) { return t.Update(k.k1, d); }
HRESULT Replace(RKMHTable_KK_D &t, Keys k, RKMWord d) { return t.Update(k.k1, k.k2, d); }
HRESULT Drop(RKMHTable_D &t, Keys k, RKMWord &, bool &) { return t.Remove(k.k1); }
HRESULT Drop(RKMHTable_K_D &t, Keys k, RKMWord &d, bool &gave) { return gave = true, t.Remove(k.k1, d); }
HRESULT Drop(RKMHTable_KK_D &t, Keys k, RKMWord &d, bool &gave) { return gave = true, t.Remove(k.k1, k.k2, d); }
const RKMWord *Get(const RKMHTable_D &t, Keys k) { return t.Find(k.k1); }
const RKMWord *Get(const RKMHTable_K_D &t, Keys k)
{
  RKMWord d = 0;
  const RKMWord *h = t.Find(k.k1);
  EXPECT_TRUE(t.Locate(k.k1, d) == (h != nullptr) && (!h || d == RKMHTable_K_D::GetData(h)));
  return h;
}
const RKMWord *Get(const RKMHTable_KK_D &t, Keys k)
{
  RKMWord d = 0;
  const RKMWord *h = t.Find(k.k1, k.k2);
  EXPECT_TRUE(t.Locate(k.k1, k.k2, d) == (h != nullptr) && (!h || d == RKMHTable_KK_D::GetData(h)));
  return h;
}
Keys HandleKeys(const RKMHTable_D *, const RKMWord *h) { return {RKMHTable_D::GetData(h), 0}; }
Keys HandleKeys(const RKMHTable_K_D *, const RKMWord *h) { return {RKMHTable_K_D::GetKey(h), 0}; }
Keys HandleKeys(const RKMHTable_KK_D *, const RKMWord *h) { return {RKMHTable_KK_D::GetKey1(h), RKMHTable_KK_D::GetKey2(h)}; }
Keys KeysAt(const RKMHTable_D::Iterator &it) { return {*it, 0}; }
Keys KeysAt(const RKMHTable_K_D::Iterator &it) { return {it.GetKey(), 0}; }
Keys KeysAt(const RKMHTable_KK_D::Iterator &it) { return {it.GetKey1(), it.GetKey2()}; }

template <class Table>
struct Generic
{
  static constexpr bool kHasData = !std::is_same<Table, RKMHTable_D>::value, kHandles = true, kExactKeys = true,
                        kCapacity = true, kTwo = std::is_same<Table, RKMHTable_KK_D>::value;
  bool modulo;
  Table t;
  Keys Fresh(unsigned r) const { return kTwo ? Keys{kBase + r / 4, r % 4} : Keys{kBase + r, 0}; }
  Keys Variant(Keys k) const { return modulo ? Keys{k.k1 + kClasses, k.k2} : k; }
  std::uint64_t Canon(Keys k) const { return ((modulo ? k.k1 % kClasses : k.k1) << 2) | k.k2; }
  HRESULT Insert(Keys k, RKMWord d, const RKMWord *&h)
  {
    RKMWord *handle = nullptr;
    const HRESULT hr = Put(t, k, d, handle);
    h = handle;
    return hr;
  }
  HRESULT InsertOrUpdate(Keys k, RKMWord d) { return PutOrUpdate(t, k, d); }
  HRESULT Remove(Keys k, RKMWord &d, bool &gave) { return Drop(t, k, d, gave); }
  bool Lookup(Keys k, Keys &stored, RKMWord &data) const
  {
    const RKMWord *h = Get(t, k);
    if (h)
      stored = KeysOf(h), data = DataOf(h);
    return h != nullptr;
  }
  static Keys KeysOf(const RKMWord *h) { return HandleKeys(static_cast<const Table *>(nullptr), h); }
  static RKMWord DataOf(const RKMWord *h) { return Table::GetData(h); }
  std::vector<Walked> Walk() const
  {
    std::vector<Walked> w;
    for (typename Table::Iterator it(t); !it.End(); ++it)
      w.push_back({KeysAt(it), it.GetData(), it.GetHandle()});
    return w;
  }
  int Size() const { return t.Size(); }
  int Capacity() const { return t.Capacity(); }
};
template <class Table>
struct GenericMap : Generic<Table>
{
  HRESULT Update(htmodel::Keys k, RKMWord d) { return Replace(this->t, k, d); }
};

// Large enough for the tables to pass through 31, 67, 137, ... up to 4481 buckets.
constexpr int kSteps = 60000, kGrownTo = 4481;

std::vector<RKMWord> KeysOfK(const RKMHTable_K_D &t)
{
  std::vector<RKMWord> v;
  for (RKMHTable_K_D::Iterator it(t); !it.End(); ++it)
    v.push_back(it.GetKey());
  return v;
}
}

TEST(RKMHTableGeneric, TablesFollowModelThroughGrowthAndDraining)
{
  int largest = 0;
  // The set: plain, with a crowded hash, through the comparison object's own hash, and from a requested size.
  Generic<RKMHTable_D> sets[] = {{false, RKMHTable_D()},
                                 {false, RKMHTable_D(0, nullptr, CrowdedHash)},
                                 {true, RKMHTable_D(0, &kModulo)},
                                 {false, RKMHTable_D(100)}};
  for (unsigned i = 0; i < 4; ++i)
  {
    htmodel::Run(sets[i], {11 + i, kSteps, sets[i].modulo ? 10000u : 6000u, i == 3 ? 100 : 0}, &largest);
    EXPECT_GE(largest, kGrownTo);
  }
  // The key map: plain, the modulo comparison with a crowded hash that agrees with it, the crowded hash alone.
  GenericMap<RKMHTable_K_D> maps[] = {{{false, RKMHTable_K_D()}},
                                      {{true, RKMHTable_K_D(0, &kModulo, CrowdedHash)}},
                                      {{false, RKMHTable_K_D(0, nullptr, CrowdedHash)}}};
  for (unsigned i = 0; i < 3; ++i)
  {
    htmodel::Run(maps[i], {21 + i, kSteps, maps[i].modulo ? 10000u : 6000u}, &largest);
    EXPECT_GE(largest, kGrownTo);
  }
  GenericMap<RKMHTable_KK_D> pairs[] = {{{false, RKMHTable_KK_D()}},
                                        {{true, RKMHTable_KK_D(40, CrowdedHash2, ModuloCompare4)}}};
  htmodel::Run(pairs[0], {31, kSteps, 6000}, &largest);
  EXPECT_GE(largest, kGrownTo);
  htmodel::Run(pairs[1], {32, kSteps, 40000, 40}, &largest);
  EXPECT_GE(largest, kGrownTo);
}

TEST(RKMHTableGeneric, CapacityFollowsRequestAndGrowthRule)
{
  for (int request : {INT_MIN, -7, 0, 1, 31, 32, 37, 38, 100, 1000, 4096})
  {
    EXPECT_EQ(RKMHTable_D(request).Capacity(), ExpectedCapacity(request)) << request;
    EXPECT_EQ(RKMHTable_KK_D(request).Capacity(), ExpectedCapacity(request)) << request;
  }
  EXPECT_EQ(RKMHTable_K_D(32).Capacity(), 37);
  EXPECT_EQ(RKMHTable_K_D(100).Capacity(), 101);

  // Up to 31 entries the table lives in the object; the 32nd moves it to the heap with 67 buckets.
  RKMHTable_K_D t;
  for (RKMWord i = 0; i < 31; ++i)
    ASSERT_EQ(t.Insert(kBase + i, i), S_OK);
  EXPECT_EQ(t.Capacity(), 31);
  EXPECT_EQ(t.SizeOf(), sizeof(RKMHTable_K_D));
  ASSERT_EQ(t.Insert(kBase + 31, 31), S_OK);
  EXPECT_EQ(t.Capacity(), 67);
  EXPECT_GT(t.SizeOf(), sizeof(RKMHTable_K_D));
  RKMHTable_D s(32);
  for (RKMWord i = 0; i < 38; ++i)
    ASSERT_EQ(s.Insert(kBase + 4 * i), S_OK);
  EXPECT_EQ(s.Capacity(), 79) << "37 grows to 79";

  // Emptying keeps the buckets; nothing of the old entries must remain reachable.
  s.RemoveAll();
  EXPECT_EQ(s.Size(), 0);
  EXPECT_EQ(s.Capacity(), 79);
  EXPECT_EQ(s.Find(kBase + 4), nullptr);
  EXPECT_TRUE(RKMHTable_D::Iterator(s).End());
  EXPECT_EQ(s.Insert(kBase + 8), S_OK);
  EXPECT_EQ(*RKMHTable_D::Iterator(s), kBase + 8);
}

TEST(RKMHTableGeneric, FailedTableHoldsNothingAndRefusesInsertion)
{
  // Both requests lie beyond the largest capacity: the failed state, reached without allocating.
  for (int request : {INT_MAX, 1 << 30})
  {
    RKMHTable_D d(request);
    RKMHTable_K_D k(request);
    RKMHTable_KK_D kk(request);
    EXPECT_EQ(d.Capacity() + k.Capacity() + kk.Capacity(), 0);
    RKMWord *h = reinterpret_cast<RKMWord *>(&request);
    EXPECT_EQ(d.Insert(5, h), E_OUTOFMEMORY);
    EXPECT_EQ(h, nullptr);
    EXPECT_EQ(k.Insert(5, 6), E_OUTOFMEMORY);
    EXPECT_EQ(k.InsertOrUpdate(5, 6), E_OUTOFMEMORY);
    EXPECT_EQ(kk.InsertOrUpdate(5, 6, 7), E_OUTOFMEMORY);
    EXPECT_EQ(k.Update(5, 6), S_FALSE);
    EXPECT_EQ(d.Remove(5), S_FALSE);
    EXPECT_EQ(kk.Remove(5, 6), S_FALSE);
    EXPECT_EQ(kk.Find(5, 6), nullptr);
    EXPECT_EQ(d.FindOne(5), nullptr);
    k.RemoveAll();
    EXPECT_TRUE(RKMHTable_K_D::Iterator(k).End());
    EXPECT_EQ(k.Size(), 0);

    // A copy of a failed table is failed; assigning a working table over one makes it work again.
    EXPECT_EQ(RKMHTable_K_D(k).Capacity(), 0);
    RKMHTable_K_D full;
    full.Insert(1, 2);
    full = k;
    EXPECT_EQ(full.Capacity(), 0);
    EXPECT_EQ(full.Insert(1, 2), E_OUTOFMEMORY);
    RKMHTable_KK_D good;
    good.Insert(1, 2, 3);
    kk = good;
    RKMWord data = 0;
    EXPECT_TRUE(kk.Locate(1, 2, data) && data == 3);
    EXPECT_EQ(kk.Insert(4, 5, 6), S_OK);
  }
}

TEST(RKMHTableGeneric, RemovalMovesLastEntryIntoTheHoleEvenWithinOneChain)
{
  for (RKMHashFunction hash : {RKMHashFunction(nullptr), RKMHashFunction(ConstantHash)})
  {
    RKMHTable_K_D t(0, nullptr, hash);
    for (RKMWord k : {10, 20, 30, 40, 50})
      t.Insert(k, k + 1);
    RKMWord removed = 0;
    ASSERT_EQ(t.Remove(20, removed), S_OK);
    EXPECT_EQ(removed, 21u);
    EXPECT_EQ(KeysOfK(t), (std::vector<RKMWord>{10, 50, 30, 40}));
    ASSERT_EQ(t.Remove(40), S_OK);
    ASSERT_EQ(t.Remove(10), S_OK);
    EXPECT_EQ(KeysOfK(t), (std::vector<RKMWord>{30, 50}));
    EXPECT_EQ(t.Remove(10, removed), S_FALSE);
    for (RKMWord k : {30, 50})
    {
      const RKMWord *h = t.Find(k);
      ASSERT_NE(h, nullptr) << "the moved entry must stay reachable through its chain";
      EXPECT_EQ(RKMHTable_K_D::GetData(h), k + 1);
    }
    ASSERT_EQ(t.Insert(60, 61), S_OK);
    EXPECT_EQ(KeysOfK(t), (std::vector<RKMWord>{30, 50, 60}));
  }
}

TEST(RKMHTableGeneric, HandlesAndExactHashLookup)
{
  RKMHTable_K_D t;
  RKMWord *h = nullptr, *again = nullptr;
  ASSERT_EQ(t.Insert(8, 1, h), S_OK);
  EXPECT_EQ(t.Insert(8, 2, again), E_FAIL);
  EXPECT_EQ(again, h);
  EXPECT_EQ(RKMHTable_K_D::GetData(h), 1u) << "a refused insertion keeps the stored data";
  RKMHTable_K_D::Update(h, 9);
  RKMWord data = 0;
  EXPECT_TRUE(t.Locate(8, data) && data == 9);
  RKMHTable_KK_D kk;
  ASSERT_EQ(kk.Insert(1, 2, 3, h), S_OK);
  RKMHTable_KK_D::Update(h, 4);
  EXPECT_EQ(kk.InsertOrUpdate(1, 2, 4), S_FALSE);

  // FindOne wants an element whose own hash is the given one, not merely one in the same bucket.
  RKMHTable_D d(0, nullptr, CrowdedHash);
  ASSERT_EQ(d.Insert(3), S_OK);
  ASSERT_EQ(d.Insert(3 + 97), S_OK);
  ASSERT_NE(d.FindOne(3), nullptr);
  EXPECT_EQ(CrowdedHash(RKMHTable_D::GetData(d.FindOne(3))), 3u);
  EXPECT_EQ(d.FindOne(3 + 31), nullptr);
}

TEST(RKMHTableGeneric, CopiesAndAssignmentKeepEntriesInOrder)
{
  for (int n : {10, 700})
  {
    SCOPED_TRACE(n);
    RKMHTable_K_D src(0, &kModulo, CrowdedHash);
    for (int i = 0; i < n; ++i)
      src.Insert(kBase + 3 * i, i);
    for (int i = 0; i < n; i += 3)
      src.Remove(kBase + 3 * i);
    const std::vector<RKMWord> keys = KeysOfK(src);
    RKMHTable_K_D copy(src), assigned(5000);
    assigned.Insert(1, 1);
    assigned = src;
    RKMHTable_K_D &alias = assigned;
    assigned = alias;
    EXPECT_EQ(KeysOfK(copy), keys);
    EXPECT_EQ(KeysOfK(assigned), keys) << "self-assignment keeps the entries";

    // The copy keeps the comparison object and is independent of the source.
    RKMWord data = 0;
    EXPECT_TRUE(copy.Locate(kBase + 3 + kClasses, data) && data == 1);
    EXPECT_EQ(copy.Remove(kBase + 3), S_OK);
    for (int i = 0; i < 2 * n; ++i)
      copy.InsertOrUpdate(kBase + 1 + 3 * i, 7);
    EXPECT_EQ(KeysOfK(src), keys);
    EXPECT_TRUE(src.Locate(kBase + 3, data));
  }
}
