#include "RKMHTableOfIntInt.h"
#include "RKMHashTable.h"
#include "RKMMapOfIntIntToFloat.h"
#include "RKMMapOfIntToFloat.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <climits>
#include <map>
#include <memory>
#include <random>
#include <utility>
#include <vector>

namespace
{
// Elements are addresses of ints compared by the int, so an equal element can sit at another address.
unsigned PointeeHash(const void *p) { return static_cast<unsigned>(*static_cast<const int *>(p)) % 7; }
int PointeeCompare(const void *a, const void *b)
{
  return *static_cast<const int *>(a) == *static_cast<const int *>(b) ? 0 : 1;
}

std::vector<void *> Walk(const RKMHashTable &t)
{
  std::vector<void *> v;
  RKMHashCodeIter it(t);
  while (void *p = it++)
    v.push_back(p);
  return v;
}

typedef std::pair<int, int> Pair;
std::vector<Pair> Indices(const RKMHTableOfIntInt &t)
{
  RKMRawCollint firsts, seconds;
  t.GetIndices(firsts, seconds);
  std::vector<Pair> v;
  EXPECT_EQ(firsts.Size(), seconds.Size());
  for (int i = 1; i <= firsts.Size(); ++i)
    v.emplace_back(firsts[i], seconds[i]);
  return v;
}

int PairValue(std::mt19937 &rng)
{
  static const int extremes[] = {INT_MIN, INT_MIN + 1, -1, 0, 1, INT_MAX - 1, INT_MAX};
  return rng() % 4 ? static_cast<int>(rng() % 40) - 20 : extremes[rng() % 7];
}
}

TEST(RKMHashTable, FollowsModelGrowsAndWalksEveryElementOnce)
{
  EXPECT_EQ(RKMHashTable(nullptr, nullptr, -5).GetBucketCount(), 16);
  EXPECT_EQ(RKMHashTable(nullptr, nullptr, 100).GetBucketCount(), 100);
  int x = 0;
  RKMHashTable byAddress(nullptr, nullptr);
  EXPECT_EQ(byAddress.Insert(nullptr), E_INVALIDARG);
  EXPECT_EQ(byAddress.Insert(&x), S_OK);
  EXPECT_EQ(byAddress.Locate(&x), &x);
  EXPECT_EQ(byAddress.Retrieve(-1, 0), nullptr);
  EXPECT_EQ(byAddress.Retrieve(0, -1), nullptr);
  EXPECT_EQ(byAddress.Retrieve(16, 0), nullptr);

  // Two cells hold each value, so an equal element can sit at another address.
  constexpr int kValues = 1500;
  std::vector<int> cells(2 * kValues);
  for (int i = 0; i < 2 * kValues; ++i)
    cells[static_cast<std::size_t>(i)] = i % kValues;
  RKMHashTable t(PointeeHash, PointeeCompare);
  std::map<int, void *> model;
  int buckets = 16; // the table doubles plus one when an insertion finds it as full as its bucket count
  std::mt19937 rng(401);
  for (int step = 0; step < 12000; ++step)
  {
    int *e = &cells[rng() % cells.size()];
    const auto found = model.find(*e);
    const bool present = found != model.end();
    if (rng() % 10 < (step < 6000 ? 7u : 3u))
    {
      if (!present && t.Size() >= buckets)
        buckets = 2 * buckets + 1;
      ASSERT_EQ(t.Insert(e), present ? S_FALSE : S_OK) << step;
      model.emplace(*e, e);
    }
    else if (rng() % 2)
    {
      ASSERT_EQ(t.Remove(e), present ? found->second : nullptr) << step;
      model.erase(*e);
    }
    else
      ASSERT_EQ(t.Locate(e), present ? found->second : nullptr) << step;
    ASSERT_EQ(t.Size(), static_cast<int>(model.size()));
    ASSERT_EQ(t.GetBucketCount(), buckets);
    if (step % 251 != 0)
      continue;
    // The walk goes bucket by bucket, rank by rank, and meets every stored element once.
    const std::vector<void *> walked = Walk(t);
    std::vector<void *> retrieved, expected;
    for (int b = 0; b < t.GetBucketCount(); ++b)
      for (int r = 0; void *p = t.Retrieve(b, r); ++r)
        retrieved.push_back(p);
    ASSERT_EQ(walked, retrieved);
    for (const auto &m : model)
      expected.push_back(m.second);
    std::sort(retrieved.begin(), retrieved.end());
    std::sort(expected.begin(), expected.end());
    ASSERT_EQ(retrieved, expected) << step;
  }

  RKMHashTable copy(t), assigned(nullptr, nullptr);
  assigned = t;
  RKMHashTable &alias = assigned;
  assigned = alias;
  ASSERT_FALSE(model.empty());
  ASSERT_EQ(t.Remove(model.begin()->second), model.begin()->second);
  for (const RKMHashTable *c : {&copy, &assigned})
  {
    EXPECT_EQ(c->Size(), static_cast<int>(model.size()));
    for (const auto &m : model)
      EXPECT_EQ(c->Locate(m.second), m.second) << "copies keep the functions and are independent";
  }
  t.RemoveAll();
  EXPECT_TRUE(t.Size() == 0 && Walk(t).empty());
}

TEST(RKMHTableOfIntInt, OrderedAndUnorderedPairs)
{
  RKMHTableOfIntInt ordered, unordered(0, 0);
  EXPECT_TRUE(ordered.IsOrdered());
  EXPECT_FALSE(unordered.IsOrdered());
  EXPECT_TRUE(ordered.Insert(5, 3));
  EXPECT_TRUE(ordered.Insert(3, 5));
  EXPECT_FALSE(ordered.Insert(3, 5));
  EXPECT_TRUE(unordered.Insert(5, 3));
  EXPECT_FALSE(unordered.Insert(3, 5));
  EXPECT_TRUE(unordered.Locate(3, 5));
  EXPECT_EQ(Indices(unordered), std::vector<Pair>{Pair(5, 3)}) << "the pair is kept as first given";
  EXPECT_TRUE(unordered.Remove(3, 5));
  EXPECT_FALSE(unordered.Remove(5, 3));
  int a = 1, b = 2;
  EXPECT_FALSE(unordered.First(a, b));
  EXPECT_EQ(a, 1);

  // Pair sums wrap: these hash to -2, 0, -1, -1, -1 (mod 2^32) and must stay distinct, under UBSan too.
  RKMMapOfIntInt extremes;
  for (Pair p : {Pair(INT_MAX, INT_MAX), Pair(INT_MIN, INT_MIN), Pair(INT_MAX, INT_MIN), Pair(INT_MIN, INT_MAX), Pair(-1, 0)})
    EXPECT_TRUE(extremes.Insert(p.first, p.second)) << p.first << ", " << p.second;
  EXPECT_TRUE(extremes.Locate(INT_MIN, INT_MAX));
  EXPECT_EQ(extremes.Size(), 5);
}

TEST(RKMHTableOfIntInt, FollowsModelIteratesConsistentlyAndCopiesDeeply)
{
  for (unsigned char ordered : {1, 0})
  {
    SCOPED_TRACE(static_cast<int>(ordered));
    auto t = std::make_unique<RKMHTableOfIntInt>(0, ordered);
    std::map<Pair, Pair> model; // canonical orientation -> the pair as stored
    std::mt19937 rng(500 + ordered);
    for (int step = 0; step < 8000; ++step)
    {
      const int a = PairValue(rng), b = PairValue(rng);
      const Pair c = ordered ? Pair(a, b) : Pair(std::min(a, b), std::max(a, b));
      const bool present = model.count(c) != 0;
      const unsigned roll = rng() % 10;
      if (roll < (step < 4000 ? 6u : 3u))
      {
        ASSERT_EQ(t->Insert(a, b), !present) << step;
        model.emplace(c, Pair(a, b));
      }
      else if (roll < 8)
      {
        ASSERT_EQ(t->Remove(a, b), present) << step;
        model.erase(c);
      }
      else
        ASSERT_EQ(t->Locate(a, b), present) << step;
      ASSERT_EQ(t->Size(), static_cast<int>(model.size()));
      if (step % 97 != 0)
        continue;
      const std::vector<Pair> indices = Indices(*t);
      std::vector<Pair> stored = indices, expected, iterated;
      for (const auto &m : model)
        expected.push_back(m.second);
      std::sort(stored.begin(), stored.end());
      std::sort(expected.begin(), expected.end());
      ASSERT_EQ(stored, expected) << step;
      RKMHTableOfIntIntIterator it(*t);
      int x = 0, y = 0;
      for (bool more = it.GetCurrent(x, y); more; more = it.GetNext(x, y))
        iterated.emplace_back(x, y);
      EXPECT_FALSE(it.GetNext(x, y));
      ASSERT_EQ(iterated, indices);
      it.Beginning();
      ASSERT_EQ(it.GetCurrent(x, y), !indices.empty());
      ASSERT_TRUE(indices.empty() || (Pair(x, y) == indices.front() && t->First(x, y) && Pair(x, y) == indices.front()));
    }
    RKMHTableOfIntInt copy(*t), assigned(0, !ordered);
    assigned.Insert(1000, 1);
    assigned = *t;
    RKMHTableOfIntInt &alias = assigned;
    assigned = alias;
    t.reset();
    for (const RKMHTableOfIntInt *c : {&copy, &assigned})
    {
      EXPECT_EQ(c->IsOrdered(), ordered);
      EXPECT_EQ(c->Size(), static_cast<int>(model.size()));
      for (const auto &m : model)
        EXPECT_TRUE(c->Locate(m.second.first, m.second.second) && (ordered || c->Locate(m.second.second, m.second.first)));
    }
  }
}

TEST(RKMMapOfIntToFloat, StatusesAndKeyOrder)
{
  RKMMapOfIntToFloat m;
  EXPECT_EQ(m.Insert(5, 1.5f), S_OK);
  EXPECT_EQ(m.Insert(5, 1.5f), S_FALSE);
  EXPECT_EQ(m.Insert(5, 2.5f), E_FAIL);
  EXPECT_EQ(m.InsertOrUpdate(5, 1.5f), S_FALSE);
  EXPECT_EQ(m.InsertOrUpdate(5, 3.5f), S_OK);
  EXPECT_EQ(m.Update(6, 1.0f), S_FALSE);
  EXPECT_EQ(m.Insert(INT_MIN, -1.0f), S_OK);
  EXPECT_EQ(m.InsertOrUpdate(INT_MAX, 0.0f), S_OK);
  EXPECT_EQ(m.Update(INT_MAX, 7.0f), S_OK);
  float v = 42.0f;
  EXPECT_FALSE(m.Locate(6, v));
  EXPECT_EQ(v, 42.0f);
  std::vector<std::pair<int, float>> walked;
  for (RKMMapOfIntToFloat::Iterator it(m); !it.End(); ++it)
    walked.emplace_back(it.GetKey(), it.GetData());
  EXPECT_EQ(walked, (std::vector<std::pair<int, float>>{{INT_MIN, -1.0f}, {5, 3.5f}, {INT_MAX, 7.0f}}));
  EXPECT_EQ(m.Remove(5), S_OK);
  EXPECT_EQ(m.Remove(5), S_FALSE);
}

TEST(RKMMapOfIntIntToFloat, FollowsModelWithColumnsCreatedAndFreed)
{
  RKMMapOfIntIntToFloat m;
  std::map<Pair, float> model; // (j, i) -> value, so a column is a contiguous range
  std::mt19937 rng(601);
  for (int step = 0; step < 10000; ++step)
  {
    const int i = PairValue(rng), j = static_cast<int>(rng() % 12) - 6;
    const float value = static_cast<float>(rng() % 3);
    const auto found = model.find(Pair(j, i));
    const bool present = found != model.end();
    const unsigned roll = rng() % 10;
    if (roll < (step < 5000 ? 4u : 2u))
    {
      ASSERT_EQ(m.Insert(i, j, value), !present ? S_OK : found->second == value ? S_FALSE : E_FAIL) << step;
      model.emplace(Pair(j, i), value);
    }
    else if (roll < 6)
    {
      ASSERT_EQ(m.InsertOrUpdate(i, j, value), present && found->second == value ? S_FALSE : S_OK) << step;
      model[Pair(j, i)] = value;
    }
    else if (roll < 9)
    {
      ASSERT_EQ(m.Remove(i, j), present ? S_OK : S_FALSE) << step;
      model.erase(Pair(j, i));
    }
    else
    {
      float v = -1;
      ASSERT_EQ(m.Locate(i, j, v), present) << step;
      ASSERT_EQ(v, present ? found->second : -1.0f) << step;
    }
    ASSERT_EQ(m.Size(), static_cast<int>(model.size())) << step;
    if (step % 53 != 0)
      continue;
    for (int col = -6; col < 6; ++col)
    {
      const auto lo = model.lower_bound(Pair(col, INT_MIN)), hi = model.lower_bound(Pair(col + 1, INT_MIN));
      const RKMMapOfIntToFloat *column = m.GetColumn(col);
      ASSERT_EQ(column != nullptr, lo != hi) << "a column exists exactly while it holds pairs: " << col;
      if (!column)
        continue;
      std::vector<std::pair<int, float>> got, expected;
      for (RKMMapOfIntToFloat::Iterator it(*column); !it.End(); ++it)
        got.emplace_back(it.GetKey(), it.GetData());
      for (auto e = lo; e != hi; ++e)
        expected.emplace_back(e->first.second, e->second);
      ASSERT_EQ(got, expected) << col;
    }
  }

  auto source = std::make_unique<RKMMapOfIntIntToFloat>(m);
  RKMMapOfIntIntToFloat copy(*source), assigned;
  assigned.Insert(1, 100, 1.0f);
  assigned = *source;
  RKMMapOfIntIntToFloat &alias = assigned;
  assigned = alias;
  for (int col = -6; col < 6; ++col)
  {
    const RKMMapOfIntToFloat *c = source->GetColumn(col);
    EXPECT_TRUE(c == nullptr || copy.GetColumn(col) != c) << "columns are copied, not shared";
  }
  source.reset();
  for (const RKMMapOfIntIntToFloat *c : {&copy, &assigned})
  {
    ASSERT_TRUE(c->IsValid());
    ASSERT_EQ(c->Size(), static_cast<int>(model.size()));
    EXPECT_EQ(c->GetColumn(100), nullptr);
    for (const auto &e : model)
    {
      float v = -1;
      EXPECT_TRUE(c->Locate(e.first.second, e.first.first, v));
      EXPECT_EQ(v, e.second);
    }
  }
}
