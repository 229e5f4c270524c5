#include "RKMRawColl.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <climits>
#include <random>
#include <string>
#include <vector>

namespace
{
template <class L, class T> bool Holds(const L &list, const std::vector<T> &expected)
{
  if (list.Size() != static_cast<int>(expected.size()) || (list.Data() == nullptr) != expected.empty())
    return false;
  for (int i = 1; i <= list.Size(); ++i)
    if (list[i] != expected[static_cast<size_t>(i - 1)] || list.Data()[i - 1] != list[i])
      return false;
  return true;
}
} // namespace

TEST(RKMRawColl, OutOfRangeReadsZeroAndBadPositionsChangeNothing)
{
  RKMRawColldouble l;
  l.Append(1.5);
  l.Append(2.5);
  for (int pos : {INT_MIN, -1, 0, 3, 4, INT_MAX})
  {
    EXPECT_EQ(l[pos], 0.0) << pos;
    l[pos] = 99.0;
    EXPECT_TRUE(l[pos] == 0.0 && static_cast<const RKMRawColldouble &>(l)[pos] == 0.0) << "discarded write at " << pos;
    EXPECT_EQ(l.InsertAt(pos == 3 ? 4 : pos, 7.0), 0) << pos; // 3 = Size() + 1 is a valid place
    EXPECT_EQ(l.RemovePosition(pos), -1) << pos;
    l.Swap(1, pos);
    l.Swap(pos, 2);
  }
  EXPECT_TRUE(Holds(l, std::vector<double>{1.5, 2.5}));
  EXPECT_TRUE(l.InsertAt(3, 3.5) == 3 && l.InsertAt(1, 0.5) == 4);
  EXPECT_TRUE(Holds(l, std::vector<double>{0.5, 1.5, 2.5, 3.5}));
  RKMRawCollPV pv;
  int x = 0;
  EXPECT_EQ(pv.Append(&x), 1);
  EXPECT_TRUE(pv[1] == &x && pv[0] == nullptr && pv[2] == nullptr);
}

TEST(RKMRawColl, LocateRemoveValueAndRemoveAll)
{
  RKMRawCollint l(-5); // a negative capacity hint is ignored
  EXPECT_EQ(l.Data(), nullptr);
  for (int v : {1, 2, 1, 2, 1})
    l.Append(v);
  EXPECT_EQ(l.Locate(1, 2), 3) << "the search starts at the given position";
  EXPECT_TRUE(l.Locate(1, 6) == 0 && l.Locate(2, -10) == 2);
  EXPECT_EQ(l.RemoveValue(1), 1) << "only the first occurrence goes";
  EXPECT_EQ(l.RemoveValue(7), 0);
  EXPECT_TRUE(Holds(l, std::vector<int>{2, 1, 2, 1}));
  l.RemoveAll(RKMCollecKeepAllocatedMemory);
  EXPECT_TRUE(Holds(l, std::vector<int>{}));
  EXPECT_EQ(l.Append(5), 1);
  l.RemoveAll();
  EXPECT_EQ(l, RKMRawCollint(100));
}

TEST(RKMRawColl, MatchesStdVectorUnderRandomEdits)
{
  std::mt19937 rng(1234);
  RKMRawCollint l;
  std::vector<int> ref;
  for (int n = 0; n < 3000; ++n)
  {
    SCOPED_TRACE("seed 1234, step " + std::to_string(n));
    const int size = static_cast<int>(ref.size()), v = static_cast<int>(rng() % 10) - 5;
    const int pos = std::uniform_int_distribution<int>(-1, size + 2)(rng);
    const bool valid = pos >= 1 && pos <= size;
    const auto at = [&] { return ref.begin() + (pos - 1); }; // only called for a valid position
    switch (rng() % 5)
    {
    case 0:
      ASSERT_EQ(l.InsertAt(pos, v), pos >= 1 && pos <= size + 1 ? size + 1 : 0);
      if (pos >= 1 && pos <= size + 1)
        ref.insert(at(), v);
      break;
    case 1:
      ASSERT_EQ(l.RemovePosition(pos), valid ? size - 1 : -1);
      if (valid)
        ref.erase(at());
      break;
    case 2:
      l[pos] = v;
      if (valid)
        *at() = v;
      break;
    case 3:
      l.Swap(pos, size);
      if (valid)
        std::swap(*at(), ref.back());
      break;
    default:
      ASSERT_EQ(l.Append(v), size + 1);
      ref.push_back(v);
    }
    ASSERT_TRUE(Holds(l, ref));
    const auto found = std::find(ref.begin(), ref.end(), v);
    ASSERT_EQ(l.Locate(v), found == ref.end() ? 0 : 1 + static_cast<int>(found - ref.begin()));
  }
}
