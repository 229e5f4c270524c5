#include "RKMListValRKMPolyIntersectionPoint.h"
#include "RKMPolyIntersectionPoint.h"
#include "RKMPolyIntersectionPointBuckets.h"

#include <gtest/gtest.h>

#include <random>
#include <vector>

namespace
{
using Pt = RKMPolyIntersectionPoint;
using List = RKMListValRKMPolyIntersectionPoint;
const Pt kZero;

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

// Each slot reads back only what it holds; slots other than 0 and 1 read undefined and ignore writes.
TEST(IntersectionPoint, Slots)
{
  Pt p;
  EXPECT_EQ(p.GetEntityType(0), Pt::Undefined);
  p.SetVertexIntersection(0, 2);
  p.SetBarIntersection(1, 1);
  EXPECT_EQ(p.GetVertexIndex(0), 2);
  EXPECT_EQ(p.GetBarIndex(1), 1);
  EXPECT_EQ(p.GetBarIndex(0), -1);
  EXPECT_EQ(p.GetVertexIndex(1), -1);
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

// Random appends, inserts, removals and clears against a vector; every answer is a size.
TEST(IntersectionPointList, EditsFollowAModel)
{
  List list;
  std::vector<Pt> model;
  const unsigned seed = 61;
  std::mt19937 rng(seed);
  for (int step = 0; step < 3000; ++step)
  {
    const int op = static_cast<int>(rng() % 4), size = static_cast<int>(model.size());
    int got = size, want = size;
    if (op == 0)
    {
      got = list.Append(Make(step)), want = size + 1;
      model.push_back(Make(step));
    }
    else if (op == 1)
    {
      const int pos = 1 + static_cast<int>(rng() % (size + 1));
      got = list.InsertAt(pos, Make(step)), want = size + 1;
      model.insert(model.begin() + (pos - 1), Make(step));
    }
    else if (op == 2 && size > 0)
    {
      const int pos = 1 + static_cast<int>(rng() % size);
      got = list.RemovePosition(pos), want = size - 1;
      model.erase(model.begin() + (pos - 1));
    }
    else if (op == 3 && step % 200 == 0)
    {
      list.RemoveAll(step % 400 ? RKMCollecReleaseAllocatedMemory : RKMCollecKeepAllocatedMemory);
      model.clear();
    }
    ASSERT_EQ(got, want) << "seed " << seed << " step " << step << " op " << op;
    ASSERT_EQ(list.Size(), static_cast<int>(model.size())) << "seed " << seed << " step " << step;
  }
  for (int i = 1; i <= list.Size(); ++i)
    EXPECT_EQ(list[i], model[i - 1]) << i;
}

// Positions out of range change nothing and read as the zero point.
TEST(IntersectionPointList, BadPositions)
{
  List list(4);
  EXPECT_EQ(list.InsertAt(0, Make(1)), 0);
  EXPECT_EQ(list.InsertAt(2, Make(1)), 0);
  EXPECT_EQ(list.RemovePosition(1), -1);
  EXPECT_EQ(list[0], kZero);
  EXPECT_EQ(list[1], kZero);
  list.Append(Make(5));
  EXPECT_EQ(list.InsertAt(3, Make(1)), 0);
  EXPECT_EQ(list.RemovePosition(0), -1);
  EXPECT_EQ(list.RemovePosition(2), -1);
  EXPECT_EQ(list.Size(), 1);
  EXPECT_EQ(list[1], Make(5));
  EXPECT_EQ(list[2], kZero);
  EXPECT_EQ(list[-1], kZero);
}

// Copies and assignments are deep; equality looks at sizes and every field; a list appends to itself.
TEST(IntersectionPointList, CopyAssignAndCompare)
{
  List a;
  for (int k = 0; k < 40; ++k)
    a.Append(Make(k));
  List b(a);
  EXPECT_TRUE(a == b);
  EXPECT_FALSE(a != b);
  b.RemovePosition(1);
  EXPECT_EQ(a.Size(), 40);
  EXPECT_EQ(a[1], Make(0));
  EXPECT_TRUE(a != b);

  List c;
  c.Append(Make(100));
  c = a;
  EXPECT_TRUE(c == a);
  a.RemoveAll();
  EXPECT_EQ(c.Size(), 40);
  EXPECT_EQ(c[40], Make(39));
  const List &alias = c;
  c = alias;
  EXPECT_EQ(c.Size(), 40);

  List d(c);
  Pt changed = Make(20);
  changed.SetEntities(20, 21);
  d.RemovePosition(21);
  d.InsertAt(21, changed);
  EXPECT_EQ(d.Size(), c.Size());
  EXPECT_FALSE(d == c);

  List e;
  e.Append(Make(1));
  EXPECT_EQ(e.Append(c), 41);
  EXPECT_EQ(e[2], Make(0));
  EXPECT_EQ(e.Append(e), 82);
  EXPECT_EQ(e[42], Make(1));
  EXPECT_EQ(e[82], Make(39));
}

// Positions count from 1 across blocks of 32; references taken early stay valid and unchanged while
// thousands of points follow; out-of-range positions read as zero and forget writes.
TEST(IntersectionPointBuckets, PushBackIndexingAndStableReferences)
{
  RKMPolyIntersectionPointBuckets buckets;
  const RKMPolyIntersectionPointBuckets &cb = buckets;
  EXPECT_EQ(buckets.Size(), 0u);
  EXPECT_EQ(buckets[1], kZero);
  std::vector<const Pt *> refs;
  for (int k = 0; k < 5000; ++k)
  {
    ASSERT_EQ(buckets.PushBack(Make(k)), static_cast<unsigned>(k + 1));
    if (k % 7 == 0)
      refs.push_back(&buckets[static_cast<unsigned>(k + 1)]);
  }
  for (size_t r = 0; r < refs.size(); ++r)
  {
    const unsigned k = static_cast<unsigned>(r * 7);
    EXPECT_EQ(*refs[r], Make(static_cast<int>(k))) << k;
    EXPECT_EQ(refs[r], &cb[k + 1]) << k;
  }
  // The 33rd point opens a second block: a different allocation from the first one's points.
  EXPECT_TRUE(&cb[33] < &cb[1] || &cb[33] >= &cb[1] + 32);
  EXPECT_EQ(cb[2], Make(1));
  EXPECT_EQ(cb[0], kZero);
  EXPECT_EQ(cb[5001], kZero);
  EXPECT_EQ(buckets[0], kZero);
  buckets[5] = Make(500);
  EXPECT_EQ(cb[5], Make(500));
  buckets[6000] = Make(9);
  EXPECT_EQ(buckets[6000], kZero);
  EXPECT_EQ(cb[6000], kZero);
  EXPECT_EQ(buckets.Size(), 5000u);
}

} // namespace
