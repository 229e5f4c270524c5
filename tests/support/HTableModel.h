#pragma once

// The oracle for the hash tables: Run drives a table through random operations against a std::unordered_map
// of its contents, plus the keys in entry order, where an insertion appends and a removal moves the last
// entry into the hole. Dense<> adapts any dense table to it, Plain gives an adapter's defaults; CheckFailed
// and CheckCopies are the failed-table and the copy checks.

#include "RKMHTableCore.h"
#include "RKMHTableTyped.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <memory>
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
};

// Written apart from the table's arithmetic on purpose: 31 below 32, else the smallest n >= request with no
// prime factor up to 19, and 0 beyond 2^30.
inline int ExpectedCapacity(long long request)
{
  for (long long n = request; request >= 32 && n <= (1LL << 30); ++n)
    if (n % 2 && n % 3 && n % 5 && n % 7 && n % 11 && n % 13 && n % 17 && n % 19)
      return static_cast<int>(n);
  return request < 32 ? 31 : 0;
}

template <class T>
RKMWord ToW(T v) { return RKMWordCast<T>::To(v); }
inline RKMWord ToW(RKMWord v) { return v; }
template <class T>
T FromW(RKMWord w) { return RKMWordCast<T>::From(w); }
template <>
inline RKMWord FromW<RKMWord>(RKMWord w) { return w; }

// Copy-constructs and assigns (over assigned, then onto itself) a copy of t, destroys that source, then
// checks both results: copies must be deep and keep what the table was built with.
template <class T, class Check>
void CheckCopies(const T &t, T assigned, const Check &check)
{
  auto source = std::make_unique<T>(t);
  T copy(*source);
  assigned = *source;
  T &alias = assigned;
  assigned = alias;
  source.reset();
  check(copy);
  check(assigned);
}

// An adapter gives Run Fresh(r) (a key), Variant(keys) (an equal key, maybe of other words), Canon(keys) (one
// number per key), Insert, InsertOrUpdate, Update, Remove (leaving kNotGiven when it gives no data), Lookup
// (the stored keys and data), Walk, Size, Capacity, and these flags: kHasData (a map), kUpdate, kHandles
// (Lookup gives the stored keys), kExactKeys (the walk gives the words first stored, not just equal ones),
// kCapacity (which follows the growth rule), kWalk, kOrdered (walked in entry order), kWalkEvery (steps
// between walks of a small table). Plain is a map without Update or handles, walked in entry order.
constexpr RKMWord kNotGiven = ~RKMWord(0);
struct Plain
{
  static constexpr bool kHasData = true, kUpdate = false, kHandles = false, kExactKeys = true, kCapacity = false;
  static constexpr bool kWalk = true, kOrdered = true;
  static constexpr int kWalkEvery = 1;
  HRESULT InsertOrUpdate(Keys, RKMWord) { return E_NOTIMPL; }
  HRESULT Update(Keys, RKMWord) { return E_NOTIMPL; }
  int Capacity() const { return 0; }
};

// Any dense table: N keys (1 or 2) of type K, data of type V (void: a set). The generic tables (K = RKMWord)
// also give handles, checked against Find and the iterator. A test derives it with Fresh, Variant and Canon.
template <class T, class K, class V, int N>
struct Dense
{
  static constexpr bool kHasData = !std::is_void<V>::value, kHandles = std::is_same<K, RKMWord>::value;
  static constexpr bool kExactKeys = true, kCapacity = true, kUpdate = kHasData, kWalk = true, kOrdered = true;
  static constexpr int kKeys = N, kWalkEvery = 1;
  using D = std::conditional_t<kHasData, V, K>;
  T t;
  template <class F>
  auto Call(Keys k, const F &f) const
  {
    if constexpr (N == 1)
      return f(FromW<K>(k.k1));
    else
      return f(FromW<K>(k.k1), FromW<K>(k.k2));
  }
  HRESULT Insert(Keys k, RKMWord d)
  {
    return Call(k, [&](auto... ks) {
      if constexpr (!kHandles && kHasData)
        return t.Insert(ks..., FromW<V>(d));
      else if constexpr (!kHandles)
        return t.Insert(ks...);
      else
      {
        RKMWord *h = nullptr;
        HRESULT hr;
        if constexpr (kHasData)
          hr = t.Insert(ks..., d, h);
        else
          hr = t.Insert(ks..., h);
        EXPECT_TRUE(hr == E_OUTOFMEMORY ? !h : h && h == t.Find(ks...)) << "the handle is the stored entry";
        return hr;
      }
    });
  }
  HRESULT InsertOrUpdate(Keys k, RKMWord d)
  {
    if constexpr (kHasData)
      return Call(k, [&](auto... ks) { return t.InsertOrUpdate(ks..., FromW<V>(d)); });
    return E_NOTIMPL;
  }
  HRESULT Update(Keys k, RKMWord d)
  {
    if constexpr (kHasData)
      return Call(k, [&](auto... ks) { return t.Update(ks..., FromW<V>(d)); });
    return E_NOTIMPL;
  }
  HRESULT Remove(Keys k, RKMWord &removed) // the typed pair maps have no Remove giving the data
  {
    return Call(k, [&](auto... ks) {
      if constexpr (!kHasData || (!kHandles && N == 2))
        return t.Remove(ks...);
      else
      {
        D v{};
        const HRESULT hr = t.Remove(ks..., v);
        removed = ToW(v);
        return hr;
      }
    });
  }
  bool Lookup(Keys k, Keys &stored, RKMWord &data) const
  {
    return Call(k, [&](auto... ks) {
      [[maybe_unused]] D v{};
      stored = k;
      if constexpr (kHandles)
      {
        const RKMWord *h = t.Find(ks...);
        if constexpr (kHasData)
        {
          EXPECT_TRUE(t.Locate(ks..., v) == (h != nullptr) && (!h || ToW(v) == T::GetData(h))) << "Locate is Find";
        }
        return h && (stored = KeysOf(h), data = T::GetData(h), true);
      }
      else if constexpr (kHasData)
        return t.Locate(ks..., v) && (data = ToW(v), true);
      else
        return data = ToW(t.Find(ks...)), t.Locate(ks...) != 0;
    });
  }
  static Keys KeysOf(const RKMWord *h)
  {
    if constexpr (N == 2)
      return {T::GetKey1(h), T::GetKey2(h)};
    else if constexpr (kHasData)
      return {T::GetKey(h), 0};
    else
      return {T::GetData(h), 0};
  }
  std::vector<Walked> Walk() const
  {
    std::vector<Walked> w;
    for (typename T::Iterator it(t); !it.End(); ++it)
    {
      if constexpr (N == 2)
        w.push_back({{ToW(it.GetKey1()), ToW(it.GetKey2())}, ToW(it.GetData())});
      else if constexpr (kHasData)
        w.push_back({{ToW(it.GetKey()), 0}, ToW(it.GetData())});
      else
        w.push_back({{ToW(*it), 0}, ToW(it.GetData())});
      if constexpr (kHandles)
      {
        EXPECT_TRUE(KeysOf(it.GetHandle()) == w.back().keys && T::GetData(it.GetHandle()) == w.back().data);
      }
    }
    return w;
  }
  int Size() const { return t.Size(); }
  int Capacity() const { return t.Capacity(); }
};

// A table built beyond the largest capacity is failed, without allocating: it holds nothing and refuses
// insertions, and so do its copies and the tables it is assigned to; a working table assigned to it works.
template <class A>
void CheckFailed(A &a)
{
  const Keys k = a.Fresh(5);
  RKMWord got = 0;
  Keys stored;
  EXPECT_TRUE(a.Capacity() == 0 && a.Insert(k, 100) == E_OUTOFMEMORY && a.Remove(k, got) == S_FALSE);
  EXPECT_EQ(a.InsertOrUpdate(k, 100), A::kHasData ? E_OUTOFMEMORY : E_NOTIMPL);
  EXPECT_EQ(a.Update(k, 100), A::kHasData ? S_FALSE : E_NOTIMPL);
  EXPECT_FALSE(a.Lookup(k, stored, got));
  a.t.RemoveAll();
  EXPECT_TRUE(a.Size() == 0 && a.Walk().empty());
  A copy(a), full(a);
  full.t = decltype(a.t)();
  EXPECT_EQ(full.Insert(k, 100), S_OK);
  full.t = a.t;
  EXPECT_EQ(copy.Capacity() + full.Capacity(), 0) << "copies of a failed table are failed";
  EXPECT_EQ(full.Insert(k, 100), E_OUTOFMEMORY);
  copy.t = decltype(a.t)();
  EXPECT_EQ(copy.Insert(k, 100), S_OK);
  a.t = copy.t;
  EXPECT_TRUE(a.Lookup(k, stored, got) && got == (A::kHasData ? 100 : k.k1) && a.Insert(a.Fresh(6), 100) == S_OK);
}

struct Options
{
  unsigned seed;
  int steps;
  unsigned range; // keys are a.Fresh(r) for r in [0, range)
  int requested = 0;
};

// The first half of the run favours insertions, so the table grows through several capacities; the second
// favours removals, so it drains to a handful of entries in a large table. Small, at its largest and drained,
// the table is copied and assigned back (onto itself too), and must go on as before. Gives the largest
// capacity reached.
template <class A>
int Run(A &a, const Options &o)
{
  SCOPED_TRACE(::testing::Message() << "seed " << o.seed);
  std::mt19937 rng(o.seed);
  struct Item
  {
    Keys keys;
    RKMWord data;
    std::size_t pos;
  };
  std::unordered_map<std::uint64_t, Item> items;
  std::vector<std::uint64_t> order; // Canon of the keys, in entry order
  int capacity = ExpectedCapacity(o.requested), largest = capacity;

  auto compare = [&](bool walk) {
    ASSERT_EQ(a.Size(), static_cast<int>(order.size()));
    ASSERT_TRUE(!A::kCapacity || a.Capacity() == capacity) << a.Capacity() << " instead of " << capacity;
    std::vector<Walked> walked = walk && A::kWalk ? a.Walk() : std::vector<Walked>();
    std::vector<std::uint64_t> canon = walk && A::kWalk ? order : std::vector<std::uint64_t>();
    if (!A::kOrdered) // then compared in the order of Canon
    {
      std::sort(canon.begin(), canon.end());
      std::sort(walked.begin(), walked.end(), [&](const Walked &x, const Walked &y) { return a.Canon(x.keys) < a.Canon(y.keys); });
    }
    ASSERT_EQ(walked.size(), canon.size());
    for (std::size_t i = 0; i < walked.size(); ++i)
    {
      const Item &e = items.at(canon[i]);
      ASSERT_TRUE(a.Canon(walked[i].keys) == canon[i] && (!A::kExactKeys || walked[i].keys == e.keys) && walked[i].data == e.data)
          << "entry " << i << ": " << walked[i].keys << " -> " << walked[i].data << " instead of " << e.keys << " -> " << e.data;
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
    Item *e = found != items.end() ? &found->second : nullptr;
    const RKMWord data = A::kHasData ? 100 + rng() % 3 : A::kExactKeys ? k.k1 : c; // a set's data: its key
    const unsigned roll = rng() % 100, inserts = growing ? 70 : 25, removes = growing ? 10 : 60;
    const bool upsert = A::kHasData && roll < inserts && rng() % 2;
    const bool update = A::kUpdate && roll >= inserts + removes && roll < inserts + removes + 10;
    if (roll < inserts || update)
    {
      HRESULT expected = !e ? S_OK : (!A::kHasData || e->data == data) ? S_FALSE : E_FAIL;
      if (upsert || update)
        expected = upsert ? (e && e->data == data ? S_FALSE : S_OK) : e ? S_OK : S_FALSE;
      ASSERT_EQ(upsert ? a.InsertOrUpdate(k, data) : update ? a.Update(k, data) : a.Insert(k, data), expected) << k;
      if (e && (upsert || update))
        e->data = data;
      if (e || update)
        return;
      if (static_cast<int>(order.size()) == capacity)
        largest = std::max(largest, capacity = ExpectedCapacity(std::max(2LL * capacity, 21LL)));
      items[c] = {k, data, order.size()};
      order.push_back(c);
    }
    else if (roll < inserts + removes)
    {
      RKMWord removed = kNotGiven;
      ASSERT_EQ(a.Remove(k, removed), e ? S_OK : S_FALSE) << k;
      ASSERT_TRUE(!e || removed == kNotGiven || removed == e->data) << k;
      if (!e)
        return;
      const std::size_t i = e->pos; // the last entry moves into the hole
      items.erase(found);
      order[i] = order.back();
      order.pop_back();
      if (i < order.size())
        items.at(order[i]).pos = i;
    }
    else
    {
      Keys stored;
      RKMWord got = 0;
      ASSERT_EQ(a.Lookup(k, stored, got), e != nullptr) << k;
      ASSERT_TRUE(!e || ((!A::kHandles || stored == e->keys) && got == e->data)) << k;
    }
  };

  for (int s = 0; s < o.steps && !::testing::Test::HasFatalFailure(); ++s)
  {
    step(s < o.steps / 2);
    const bool copied = s == 20 || s == o.steps / 2 || s == o.steps - 1;
    if (copied)
    {
      A copy(a);
      A &alias = copy;
      copy.t = alias.t;
      a.t = copy.t;
    }
    compare(copied || (order.size() < 64 && s % A::kWalkEvery == 0) || s % 499 == 0);
    if (::testing::Test::HasFatalFailure())
      ADD_FAILURE() << "first failure at step " << s << (copied ? ", after copying" : "");
  }
  return largest;
}
}
