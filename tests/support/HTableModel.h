#pragma once

// The oracle for the dense tables: a std::unordered_map for contents and statuses, plus the keys in entry
// order, where an insertion appends and a removal moves the last entry into the hole.

#include "RKMHTableCore.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <ostream>
#include <random>
#include <type_traits>
#include <unordered_map>
#include <vector>

namespace htmodel
{
struct Keys
{
  RKMWord k1 = 0, k2 = 0;
};
inline bool operator==(const Keys &a, const Keys &b) { return a.k1 == b.k1 && a.k2 == b.k2; }
inline std::ostream &operator<<(std::ostream &o, const Keys &k) { return o << '(' << k.k1 << ", " << k.k2 << ')'; }

struct Walked
{
  Keys keys;
  RKMWord data;
  const RKMWord *handle;
};

// Written apart from the table's arithmetic on purpose: 31 below 32, else the smallest n >= request with no
// prime factor up to 19, and 0 beyond 2^30.
inline int ExpectedCapacity(long long request)
{
  if (request < 32)
    return 31;
  for (long long n = request; n <= (1LL << 30); ++n)
  {
    bool ok = true;
    for (int p : {2, 3, 5, 7, 11, 13, 17, 19})
      ok = ok && n % p != 0;
    if (ok)
      return static_cast<int>(n);
  }
  return 0;
}

template <class A, class = void>
struct HasUpdate : std::false_type
{
};
template <class A>
struct HasUpdate<A, std::void_t<decltype(&A::Update)>> : std::true_type
{
};

struct Options
{
  unsigned seed;
  int steps;
  unsigned range; // keys are a.Fresh(r) for r in [0, range)
  int requested = 0;
};

// Runs a random sequence of operations through the adapter a and checks every status, every value read back
// and the entry order. The first half favours insertions, so the table grows through several capacities; the
// second favours removals, so it drains to a handful of entries in a large table. Adapter flags: kHasData (a
// map, not a set), kHandles (Insert and Lookup expose the stored entry), kExactKeys (the walk gives the very
// words first stored, not just equal ones), kCapacity (Capacity() follows the growth rule).
template <class A>
void Run(A &a, const Options &o, int *largestCapacity = nullptr)
{
  SCOPED_TRACE(::testing::Message() << "seed " << o.seed);
  std::mt19937 rng(o.seed);
  struct Item
  {
    Keys keys;
    RKMWord data;
  };
  std::unordered_map<std::uint64_t, Item> items;
  std::unordered_map<std::uint64_t, std::size_t> pos;
  std::vector<std::uint64_t> order;
  int capacity = ExpectedCapacity(o.requested), largest = capacity;

  auto add = [&](std::uint64_t c, Keys k, RKMWord d) {
    if (static_cast<int>(order.size()) == capacity)
      largest = std::max(largest, capacity = ExpectedCapacity(std::max(2LL * capacity, 21LL)));
    items[c] = {k, d};
    pos[c] = order.size();
    order.push_back(c);
  };
  auto erase = [&](std::uint64_t c) {
    const std::size_t i = pos.at(c);
    pos.erase(c);
    items.erase(c);
    order[i] = order.back();
    order.pop_back();
    if (i < order.size())
      pos[order[i]] = i;
  };
  auto compare = [&](bool walk) {
    ASSERT_EQ(a.Size(), static_cast<int>(order.size()));
    ASSERT_TRUE(!A::kCapacity || a.Capacity() == capacity) << a.Capacity() << " instead of " << capacity;
    if (!walk)
      return;
    const std::vector<Walked> walked = a.Walk();
    ASSERT_EQ(walked.size(), order.size());
    for (std::size_t i = 0; i < walked.size(); ++i)
    {
      const Item &e = items.at(order.at(i));
      ASSERT_EQ(a.Canon(walked[i].keys), order[i]) << "entry " << i;
      ASSERT_TRUE(!A::kExactKeys || walked[i].keys == e.keys) << "entry " << i << ": " << walked[i].keys;
      ASSERT_EQ(walked[i].data, e.data) << "entry " << i;
      if constexpr (A::kHandles)
      {
        ASSERT_EQ(A::KeysOf(walked[i].handle), e.keys) << "entry " << i;
        ASSERT_EQ(A::DataOf(walked[i].handle), e.data) << "entry " << i;
      }
    }
  };

  auto step = [&](bool growing) {
    Keys k = a.Fresh(static_cast<unsigned>(rng() % o.range));
    if (!order.empty() && rng() % 2)
    {
      const Keys stored = items.at(order[rng() % order.size()]).keys;
      k = rng() % 2 ? a.Variant(stored) : stored;
    }
    const std::uint64_t c = a.Canon(k);
    const auto found = items.find(c);
    const bool present = found != items.end();
    const RKMWord data = A::kHasData ? 100 + rng() % 3 : k.k1;
    const unsigned roll = rng() % 100, inserts = growing ? 70 : 25, removes = growing ? 10 : 60;
    if constexpr (A::kHasData)
    {
      if (roll < inserts && rng() % 2)
      {
        ASSERT_EQ(a.InsertOrUpdate(k, data), present && found->second.data == data ? S_FALSE : S_OK) << k;
        if (present)
          found->second.data = data;
        else
          add(c, k, data);
        return;
      }
    }
    if constexpr (HasUpdate<A>::value)
    {
      if (roll >= inserts + removes && roll < inserts + removes + 10)
      {
        ASSERT_EQ(a.Update(k, data), present ? S_OK : S_FALSE) << k;
        if (present)
          found->second.data = data;
        return;
      }
    }
    if (roll < inserts)
    {
      const RKMWord *h = nullptr;
      const HRESULT expected = !present ? S_OK : (!A::kHasData || found->second.data == data) ? S_FALSE : E_FAIL;
      ASSERT_EQ(a.Insert(k, data, h), expected) << k;
      if (!present)
        add(c, k, data);
      if constexpr (A::kHandles)
      {
        ASSERT_TRUE(h && A::KeysOf(h) == items.at(c).keys && A::DataOf(h) == items.at(c).data)
            << "the handle must show the stored entry of " << k;
      }
    }
    else if (roll < inserts + removes)
    {
      RKMWord removed = 0;
      bool gave = false;
      ASSERT_EQ(a.Remove(k, removed, gave), present ? S_OK : S_FALSE) << k;
      ASSERT_TRUE(!present || !gave || removed == found->second.data) << k;
      if (present)
        erase(c);
    }
    else
    {
      Keys stored;
      RKMWord got = 0;
      ASSERT_EQ(a.Lookup(k, stored, got), present) << k;
      ASSERT_TRUE(!present || !A::kHandles || stored == found->second.keys) << k;
      ASSERT_TRUE(!present || got == found->second.data) << k;
    }
  };

  for (int s = 0; s < o.steps; ++s)
  {
    step(s < o.steps / 2);
    compare(order.size() < 64 || s % 499 == 0);
    if (::testing::Test::HasFatalFailure())
    {
      ADD_FAILURE() << "first failure at step " << s;
      return;
    }
  }
  compare(true);
  if (largestCapacity)
    *largestCapacity = largest;
}
}
