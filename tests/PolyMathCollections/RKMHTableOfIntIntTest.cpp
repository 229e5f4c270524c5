#include "RKMHTableOfIntInt.h"
#include "RKMHashTable.h"
#include "RKMMapOfIntIntToFloat.h"
#include "RKMMapOfIntToFloat.h"

#include "HTableModel.h"

#include <climits>
#include <utility>

using htmodel::Keys;
using htmodel::ToW;
using htmodel::Walked;

namespace
{
typedef std::pair<int, int> Pair;

// 40 small ints, then the extremes: r < 47.
int PairValue(RKMWord r)
{
  static const int extremes[] = {INT_MIN, INT_MIN + 1, -1, 0, 1, INT_MAX - 1, INT_MAX};
  return r < 40 ? static_cast<int>(r) - 20 : extremes[r - 40];
}
std::uint64_t PairCanon(int a, int b) { return std::uint64_t(std::uint32_t(a)) << 32 | std::uint32_t(b); }

// Elements are cells compared by the int they hold, and two cells hold each value, so an equal element
// can sit at another address. The table doubles its buckets plus one when an insertion finds it as full
// as its bucket count; its walk goes bucket by bucket, rank by rank, as Retrieve gives them.
constexpr RKMWord kCellValues = 1500;
int *Cell(RKMWord r)
{
  static std::vector<int> cells = [] {
    std::vector<int> c(2 * kCellValues);
    for (std::size_t i = 0; i < c.size(); ++i)
      c[i] = static_cast<int>(i % kCellValues);
    return c;
  }();
  return &cells[r];
}
unsigned PointeeHash(const void *p) { return static_cast<unsigned>(*static_cast<const int *>(p)) % 7; }
int PointeeCompare(const void *a, const void *b) { return *static_cast<const int *>(a) == *static_cast<const int *>(b) ? 0 : 1; }
struct PointerSet : htmodel::Plain
{
  static constexpr bool kHasData = false, kOrdered = false;
  static constexpr int kWalkEvery = 50;
  RKMHashTable t{PointeeHash, PointeeCompare};
  static void *P(Keys k) { return reinterpret_cast<void *>(k.k1); }
  Keys Fresh(unsigned r) const { return {ToW(Cell(r)), 0}; }
  Keys Variant(Keys k) const { return {ToW(Cell((static_cast<int *>(P(k)) - Cell(0) + kCellValues) % (2 * kCellValues))), 0}; }
  std::uint64_t Canon(Keys k) const { return static_cast<std::uint64_t>(*static_cast<int *>(P(k))); }
  HRESULT Insert(Keys k, RKMWord)
  {
    const int n = t.Size(), b = t.GetBucketCount();
    const HRESULT hr = t.Insert(P(k));
    EXPECT_EQ(t.GetBucketCount(), hr == S_OK && n >= b ? 2 * b + 1 : b);
    return hr;
  }
  HRESULT Remove(Keys k, RKMWord &removed) { return (removed = ToW(t.Remove(P(k)))) ? S_OK : S_FALSE; }
  bool Lookup(Keys k, Keys &stored, RKMWord &data) const { return stored = k, (data = ToW(t.Locate(P(k)))) != 0; }
  std::vector<Walked> Walk() const
  {
    std::vector<Walked> walked, retrieved;
    RKMHashCodeIter it(t);
    while (void *p = it++)
      walked.push_back({{ToW(p), 0}, ToW(p)});
    for (int b = 0; b < t.GetBucketCount(); ++b)
      for (int r = 0; void *p = t.Retrieve(b, r); ++r)
        retrieved.push_back({{ToW(p), 0}, ToW(p)});
    EXPECT_TRUE(walked.size() == retrieved.size() && std::equal(walked.begin(), walked.end(), retrieved.begin(),
                                                                 [](const Walked &x, const Walked &y) { return x.data == y.data; }));
    return walked;
  }
  int Size() const { return t.Size(); }
};

// Pairs of PairValue; unordered tables take a pair and its reverse as one key, kept as first given.
struct IntPairs : htmodel::Plain
{
  static constexpr bool kHasData = false, kExactKeys = false, kOrdered = false;
  static constexpr int kWalkEvery = 20;
  RKMHTableOfIntInt t;
  static int A(Keys k) { return static_cast<int>(k.k1); }
  static int B(Keys k) { return static_cast<int>(k.k2); }
  Keys Fresh(unsigned r) const { return {ToW(PairValue(r / 47)), ToW(PairValue(r % 47))}; }
  Keys Variant(Keys k) const { return t.IsOrdered() ? k : Keys{k.k2, k.k1}; }
  std::uint64_t Canon(Keys k) const { return t.IsOrdered() ? PairCanon(A(k), B(k)) : PairCanon(std::min(A(k), B(k)), std::max(A(k), B(k))); }
  HRESULT Insert(Keys k, RKMWord) { return t.Insert(A(k), B(k)) ? S_OK : S_FALSE; }
  HRESULT Remove(Keys k, RKMWord &) { return t.Remove(A(k), B(k)) ? S_OK : S_FALSE; }
  bool Lookup(Keys k, Keys &stored, RKMWord &data) const { return stored = k, data = Canon(k), t.Locate(A(k), B(k)); }
  // The indices, which the iterator must give in their order, from the beginning again too.
  std::vector<Walked> Walk() const
  {
    RKMRawCollint firsts, seconds;
    t.GetIndices(firsts, seconds);
    EXPECT_EQ(firsts.Size(), seconds.Size());
    std::vector<Walked> w;
    RKMHTableOfIntIntIterator it(t);
    int x = 0, y = 0;
    for (int i = 1; i <= firsts.Size(); ++i)
    {
      const Keys k{ToW(firsts[i]), ToW(seconds[i])};
      w.push_back({k, Canon(k)});
      EXPECT_TRUE((i == 1 ? it.GetCurrent(x, y) : it.GetNext(x, y)) && x == firsts[i] && y == seconds[i]) << i;
    }
    EXPECT_FALSE(firsts.Size() ? it.GetNext(x, y) : it.GetCurrent(x, y));
    it.Beginning();
    EXPECT_EQ(it.GetCurrent(x, y), firsts.Size() > 0);
    EXPECT_TRUE(!firsts.Size() || (x == firsts[1] && y == seconds[1] && t.First(x, y) && x == firsts[1] && y == seconds[1]));
    return w;
  }
  int Size() const { return t.Size(); }
};

// Keys (i, j), i a PairValue and j in 12 columns; walked column by column, each in the order of i.
struct Columns : htmodel::Plain
{
  static constexpr bool kOrdered = false;
  RKMMapOfIntIntToFloat t;
  static int I(Keys k) { return static_cast<int>(k.k1); }
  static int J(Keys k) { return static_cast<int>(k.k2) - 6; }
  Keys Fresh(unsigned r) const { return {ToW(PairValue(r / 12)), r % 12}; }
  Keys Variant(Keys k) const { return k; }
  std::uint64_t Canon(Keys k) const { return PairCanon(J(k), I(k)); }
  HRESULT Insert(Keys k, RKMWord d) { return t.Insert(I(k), J(k), static_cast<float>(d)); }
  HRESULT InsertOrUpdate(Keys k, RKMWord d) { return t.InsertOrUpdate(I(k), J(k), static_cast<float>(d)); }
  HRESULT Remove(Keys k, RKMWord &) { return t.Remove(I(k), J(k)); }
  bool Lookup(Keys k, Keys &stored, RKMWord &data) const
  {
    float v = -1; // left alone when absent
    return stored = k, t.Locate(I(k), J(k), v) ? (data = static_cast<RKMWord>(v), true) : v != -1;
  }
  std::vector<Walked> Walk() const
  {
    std::vector<Walked> w;
    for (int j = -6; j < 6; ++j)
      if (const RKMMapOfIntToFloat *column = t.GetColumn(j))
      {
        EXPECT_FALSE(RKMMapOfIntToFloat::Iterator(*column).End()) << "a column exists only while it holds pairs";
        for (RKMMapOfIntToFloat::Iterator it(*column); !it.End(); ++it)
        {
          EXPECT_TRUE(w.empty() || J(w.back().keys) < j || I(w.back().keys) < it.GetKey()) << "in key order";
          w.push_back({{ToW(it.GetKey()), RKMWord(j + 6)}, static_cast<RKMWord>(it.GetData())});
        }
      }
    return w;
  }
  int Size() const { return t.Size(); }
};
}

TEST(RKMHashTable, FollowsModelGrowsAndWalksEveryElementOnce)
{
  EXPECT_TRUE(RKMHashTable(nullptr, nullptr, -5).GetBucketCount() == 16 && RKMHashTable(nullptr, nullptr, 100).GetBucketCount() == 100);
  int x = 0;
  RKMHashTable byAddress(nullptr, nullptr);
  EXPECT_TRUE(byAddress.Insert(nullptr) == E_INVALIDARG && byAddress.Insert(&x) == S_OK && byAddress.Locate(&x) == &x);
  EXPECT_TRUE(!byAddress.Retrieve(-1, 0) && !byAddress.Retrieve(0, -1) && !byAddress.Retrieve(16, 0));

  PointerSet a;
  htmodel::Run(a, {401, 12000, 2 * kCellValues});
  a.t.RemoveAll();
  EXPECT_TRUE(a.Size() == 0 && a.Walk().empty());
}

TEST(RKMHTableOfIntInt, OrderedAndUnorderedPairs)
{
  RKMHTableOfIntInt ordered, unordered(0, 0);
  EXPECT_TRUE(ordered.IsOrdered() && !unordered.IsOrdered());
  EXPECT_TRUE(ordered.Insert(5, 3) && ordered.Insert(3, 5) && !ordered.Insert(3, 5));
  EXPECT_TRUE(unordered.Insert(5, 3) && !unordered.Insert(3, 5) && unordered.Locate(3, 5));
  RKMRawCollint firsts, seconds;
  unordered.GetIndices(firsts, seconds);
  EXPECT_TRUE(firsts.Size() == 1 && firsts[1] == 5 && seconds[1] == 3) << "the pair is kept as first given";
  EXPECT_TRUE(unordered.Remove(3, 5) && !unordered.Remove(5, 3));
  int a = 1, b = 2;
  EXPECT_TRUE(!unordered.First(a, b) && a == 1);

  // Pair sums wrap: these hash to -2, 0, -1, -1, -1 (mod 2^32) and must stay distinct, under UBSan too.
  RKMMapOfIntInt extremes;
  for (Pair p : {Pair(INT_MAX, INT_MAX), Pair(INT_MIN, INT_MIN), Pair(INT_MAX, INT_MIN), Pair(INT_MIN, INT_MAX), Pair(-1, 0)})
    EXPECT_TRUE(extremes.Insert(p.first, p.second)) << p.first << ", " << p.second;
  EXPECT_TRUE(extremes.Locate(INT_MIN, INT_MAX) && extremes.Size() == 5);
}

TEST(RKMHTableOfIntInt, FollowsModelIteratesConsistentlyAndCopiesDeeply)
{
  for (unsigned char ordered : {1, 0})
  {
    IntPairs a;
    a.t = RKMHTableOfIntInt(0, ordered);
    htmodel::Run(a, {500u + ordered, 8000, 47 * 47});
    htmodel::CheckCopies(a.t, RKMHTableOfIntInt(0, !ordered), [&](const RKMHTableOfIntInt &c) {
      EXPECT_TRUE(c.IsOrdered() == ordered && c.Size() == a.Size());
      for (const Walked &w : a.Walk())
        EXPECT_TRUE(c.Locate(IntPairs::A(w.keys), IntPairs::B(w.keys)) && (ordered || c.Locate(IntPairs::B(w.keys), IntPairs::A(w.keys))));
    });
  }
}

TEST(RKMMapOfIntIntToFloat, FollowsModelWithColumnsCreatedAndFreedAndColumnsUpdate)
{
  Columns a;
  htmodel::Run(a, {601, 10000, 47 * 12});
  RKMMapOfIntToFloat column; // its other operations are those of the columns
  float v = 0;
  EXPECT_TRUE(column.Update(6, 1.0f) == S_FALSE && column.Insert(6, 0.0f) == S_OK && column.Update(6, 7.0f) == S_OK);
  EXPECT_TRUE(column.Locate(6, v) && v == 7.0f && column.Size() == 1);
  RKMMapOfIntIntToFloat assigned;
  assigned.Insert(1, 100, 1.0f);
  htmodel::CheckCopies(a.t, assigned, [&](const RKMMapOfIntIntToFloat &c) {
    ASSERT_TRUE(c.IsValid() && c.Size() == a.Size() && !c.GetColumn(100));
    for (const Walked &w : a.Walk())
      EXPECT_TRUE(c.Locate(Columns::I(w.keys), Columns::J(w.keys), v) && v == static_cast<float>(w.data));
    for (int j = -6; j < 6; ++j)
      EXPECT_TRUE(!a.t.GetColumn(j) || c.GetColumn(j) != a.t.GetColumn(j)) << "columns are copied, not shared";
  });
}
