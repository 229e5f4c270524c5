#include "RKMListValRKMPolyIntersectionPoint.h"
#include "RKMPolyIntersectionPoint.h"
#include "RKMPolyIntersectionPointBuckets.h"

#include <gtest/gtest.h>

#include <random>
#include <vector>

namespace
{
using Pt = RKMPolyIntersectionPoint;

// A point telling its number apart in every field.
Pt Make(int k)
{
  Pt p;
  p.SetEntities(k, -k);
  p.SetVertexIntersection(0, k % 3);
  if (k % 2)
    p.SetBarIntersection(1, k % 3);
  else
    p.SetTriangleIntersection(1);
  return p;
}

bool IsZero(const Pt &p)
{
  return p == Pt();
}

TEST(IntersectionPoint, Slots)
{
  Pt p;
  EXPECT_EQ(p.GetEntityType(0), Pt::Undefined);
  p.SetVertexIntersection(0, 2);
  p.SetBarIntersection(1, 1);
  EXPECT_EQ(p.GetVertexIndex(0), 2);
  EXPECT_EQ(p.GetBarIndex(0), -1);
  EXPECT_EQ(p.GetBarIndex(1), 1);
  EXPECT_EQ(p.GetVertexIndex(1), -1);
  // Slots other than 0 and 1 read undefined and ignore writes.
  const Pt before = p;
  p.SetVertexIntersection(2, 1);
  p.SetBarIntersection(-1, 1);
  EXPECT_EQ(p, before);
  EXPECT_EQ(p.GetEntityType(2), Pt::Undefined);
  EXPECT_EQ(p.GetVertexIndex(-1), -1);
  p.SetEntities(4, 5);
  p.SetUndefinedIntersection();
  EXPECT_EQ(p.GetEntityType(0), Pt::Undefined);
  EXPECT_EQ(p.index[1], 0);
  EXPECT_EQ(p.GetEntity(0), 4);
  EXPECT_EQ(p.GetEntity(1), 5);
}

TEST(IntersectionPointList, EditsFollowAModel)
{
  RKMListValRKMPolyIntersectionPoint list;
  std::vector<Pt> model;
  const unsigned seed = 61;
  std::mt19937 rng(seed);
  for (int step = 0; step < 3000; ++step)
  {
    const int op = static_cast<int>(rng() % 4);
    const int size = static_cast<int>(model.size());
    if (op == 0)
    {
      const Pt p = Make(step);
      ASSERT_EQ(list.Append(p), size + 1) << "seed " << seed << " step " << step;
      model.push_back(p);
    }
    else if (op == 1)
    {
      const int pos = 1 + static_cast<int>(rng() % (size + 1));
      const Pt p = Make(step);
      ASSERT_EQ(list.InsertAt(pos, p), size + 1) << "seed " << seed << " step " << step;
      model.insert(model.begin() + (pos - 1), p);
    }
    else if (op == 2 && size > 0)
    {
      const int pos = 1 + static_cast<int>(rng() % size);
      ASSERT_EQ(list.RemovePosition(pos), size - 1) << "seed " << seed << " step " << step;
      model.erase(model.begin() + (pos - 1));
    }
    else if (op == 3 && step % 200 == 0)
    {
      list.RemoveAll(step % 400 ? RKMCollecReleaseAllocatedMemory : RKMCollecKeepAllocatedMemory);
      model.clear();
    }
    ASSERT_EQ(list.Size(), static_cast<int>(model.size()));
  }
  for (int i = 1; i <= list.Size(); ++i)
    EXPECT_EQ(list[i], model[i - 1]) << i;
}

TEST(IntersectionPointList, BadPositions)
{
  RKMListValRKMPolyIntersectionPoint list(4);
  EXPECT_EQ(list.InsertAt(0, Make(1)), 0);
  EXPECT_EQ(list.InsertAt(2, Make(1)), 0);
  EXPECT_EQ(list.RemovePosition(1), -1);
  EXPECT_EQ(list.Size(), 0);
  EXPECT_TRUE(IsZero(list[0]));
  EXPECT_TRUE(IsZero(list[1]));
  list.Append(Make(5));
  EXPECT_EQ(list.InsertAt(3, Make(1)), 0);
  EXPECT_EQ(list.RemovePosition(0), -1);
  EXPECT_EQ(list.RemovePosition(2), -1);
  EXPECT_EQ(list[1], Make(5));
  EXPECT_TRUE(IsZero(list[2]));
  EXPECT_TRUE(IsZero(list[-1]));
}

// The list holds its own copies: changing the source after Append changes nothing.
TEST(IntersectionPointList, StoresCopies)
{
  RKMListValRKMPolyIntersectionPoint list;
  Pt p = Make(7);
  list.Append(p);
  p.SetEntities(99, 99);
  EXPECT_EQ(list[1], Make(7));
}

TEST(IntersectionPointList, CopyAssignAndCompare)
{
  RKMListValRKMPolyIntersectionPoint a;
  for (int k = 0; k < 40; ++k)
    a.Append(Make(k));
  RKMListValRKMPolyIntersectionPoint b(a);
  EXPECT_TRUE(a == b);
  EXPECT_FALSE(a != b);
  // Deep: editing one leaves the other.
  b.RemovePosition(1);
  EXPECT_EQ(a.Size(), 40);
  EXPECT_EQ(a[1], Make(0));
  EXPECT_TRUE(a != b);

  RKMListValRKMPolyIntersectionPoint c;
  c.Append(Make(100));
  c = a;
  EXPECT_TRUE(c == a);
  a.RemoveAll();
  EXPECT_EQ(c.Size(), 40);
  EXPECT_EQ(c[40], Make(39));
  const RKMListValRKMPolyIntersectionPoint &alias = c;
  c = alias;
  EXPECT_EQ(c.Size(), 40);

  // Same size, one field differs.
  RKMListValRKMPolyIntersectionPoint d(c);
  Pt changed = Make(20);
  changed.SetEntities(20, 21);
  d.RemovePosition(21);
  d.InsertAt(21, changed);
  EXPECT_EQ(d.Size(), c.Size());
  EXPECT_FALSE(d == c);

  // Appending a list, itself included.
  RKMListValRKMPolyIntersectionPoint e;
  e.Append(Make(1));
  EXPECT_EQ(e.Append(c), 41);
  EXPECT_EQ(e[2], Make(0));
  EXPECT_EQ(e.Append(e), 82);
  EXPECT_EQ(e[42], Make(1));
  EXPECT_EQ(e[82], Make(39));
}

TEST(IntersectionPointBuckets, PushBackAndIndexing)
{
  RKMPolyIntersectionPointBuckets buckets;
  EXPECT_EQ(buckets.Size(), 0u);
  EXPECT_TRUE(IsZero(buckets[1]));
  EXPECT_EQ(buckets.PushBack(Make(0)), 1u);
  for (unsigned k = 1; k < 32; ++k)
    EXPECT_EQ(buckets.PushBack(Make(static_cast<int>(k))), k + 1);
  // The 33rd point opens a second block: a different allocation from the first one's points.
  const Pt *first = &buckets[1];
  EXPECT_EQ(buckets.PushBack(Make(32)), 33u);
  const Pt *third3 = &buckets[33];
  EXPECT_TRUE(third3 < first || third3 >= first + 32);
  EXPECT_EQ(buckets[33], Make(32));
  EXPECT_EQ(buckets[1], Make(0));
  EXPECT_TRUE(IsZero(buckets[0]));
  EXPECT_TRUE(IsZero(buckets[34]));
  const RKMPolyIntersectionPointBuckets &cb = buckets;
  EXPECT_TRUE(IsZero(cb[0]));
  EXPECT_EQ(cb[2], Make(1));

  // Writing through a position stores; writing through an out-of-range one is forgotten.
  buckets[5] = Make(500);
  EXPECT_EQ(cb[5], Make(500));
  buckets[1000] = Make(9);
  EXPECT_TRUE(IsZero(buckets[1000]));
  EXPECT_TRUE(IsZero(cb[1000]));
}

// References taken early stay valid and unchanged while thousands of points follow.
TEST(IntersectionPointBuckets, ReferencesStayValid)
{
  RKMPolyIntersectionPointBuckets buckets;
  std::vector<const Pt *> refs;
  for (int k = 0; k < 5000; ++k)
  {
    ASSERT_EQ(buckets.PushBack(Make(k)), static_cast<unsigned>(k + 1));
    if (k % 7 == 0)
      refs.push_back(&buckets[static_cast<unsigned>(k + 1)]);
  }
  for (size_t r = 0; r < refs.size(); ++r)
  {
    const int k = static_cast<int>(r * 7);
    EXPECT_EQ(*refs[r], Make(k)) << k;
    EXPECT_EQ(refs[r], &buckets[static_cast<unsigned>(k + 1)]) << k;
  }
  EXPECT_EQ(buckets.Size(), 5000u);
}

} // namespace
