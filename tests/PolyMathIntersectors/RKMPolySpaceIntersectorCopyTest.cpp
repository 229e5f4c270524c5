#include "RKMPolyGeodesicSegmentIntersector.h"
#include "RKMPolyTriangleIntersector.h"
#include "RKMPolyTriangleSegmentIntersector.h"

#include "RKMMathPoint.h"
#include "RKMPolyExactArithmetic.h"

#include <gtest/gtest.h>

#include <memory>
#include <vector>

// The space intersectors own a plane intersector for coplanar queries: copies must own theirs, and
// an intersector without arithmetic must refuse every query. The sanitizer builds run these for
// leaks, double frees and reads of freed memory.
namespace
{
using P = RKMMathPoint;
using Points = std::vector<RKMPolyIntersectionPoint>;

const RKMPolyExactArithmetic *const kNoArithmetic = nullptr;

// Two coplanar pairs with different answers in z = 0, and a crossing pair.
const P kBase[3] = {{0, 0, 0}, {6, 0, 0}, {0, 6, 0}};
const P kOverlap[3] = {{1, 1, 0}, {7, 1, 0}, {1, 7, 0}};
const P kInside[3] = {{1, 1, 0}, {2, 1, 0}, {1, 2, 0}};
const P kUpright[3] = {{1, 1, -1}, {2, 1, 1}, {0, 1, 1}};

template <class T> Points Read(const T &inter)
{
  int n = -1;
  const RKMPolyIntersectionPoint *pts = inter.GetIntersectionPoints(n);
  return pts ? Points(pts, pts + n) : Points();
}

TEST(SpaceIntersectorsWithoutArithmetic, RefuseEveryQuery)
{
  RKMPolyTriangleIntersector tri(kNoArithmetic);
  int n = -1;
  EXPECT_EQ(tri.Intersect(kBase, kOverlap), -1);
  EXPECT_EQ(tri.Intersect(kBase[0], kBase[1], kBase[2], kOverlap[0], kOverlap[1], kOverlap[2]), -1);
  EXPECT_EQ(tri.Intersect(kBase[0], kBase[1], kBase[2], kOverlap[1], kOverlap[2]), -1);
  EXPECT_EQ(tri.GetIntersectionPoints(n), nullptr);
  EXPECT_EQ(n, 0);
  EXPECT_EQ(tri.AreTrianglesCoplanar(), 0);
  EXPECT_EQ(tri.HaveSameOrientation(), 0);
  EXPECT_EQ(tri.GetPosition(kBase[0], kBase[1], kBase[2], kUpright[0]), 0);

  // Copies and assignments carry the missing arithmetic along.
  RKMPolyTriangleIntersector copy(tri);
  EXPECT_EQ(copy.Intersect(kBase, kInside), -1);
  RKMPolyExactArithmetic arith;
  RKMPolyTriangleIntersector assigned(arith);
  ASSERT_EQ(assigned.Intersect(kBase, kInside), 3);
  assigned = tri;
  EXPECT_EQ(assigned.Intersect(kBase, kInside), -1);
  EXPECT_EQ(assigned.GetIntersectionPoints(n), nullptr);
  EXPECT_EQ(n, 0);

  RKMPolyTriangleSegmentIntersector seg(kNoArithmetic);
  EXPECT_EQ(seg.Intersect(kBase[0], kBase[1], kBase[2], P(1, 1, -1), P(1, 1, 1)), -1);
  EXPECT_EQ(seg.Intersect(kBase[0], kBase[1], kBase[2], P(1, -1, 0), P(1, 5, 0)), -1);
  EXPECT_EQ(seg.GetIntersectionPoints(n), nullptr);
  EXPECT_EQ(n, 0);
  EXPECT_EQ(seg.IsCoplanar(), 0);
  RKMPolyTriangleSegmentIntersector segCopy(seg);
  EXPECT_EQ(segCopy.Intersect(kBase[0], kBase[1], kBase[2], P(1, 1, -1), P(1, 1, 1)), -1);
}

// An intersector with arithmetic takes over a missing one by assignment, and gives its own away.
TEST(SpaceIntersectorsWithoutArithmetic, AssignmentBothWays)
{
  RKMPolyExactArithmetic arith;
  RKMPolyTriangleIntersector none(kNoArithmetic);
  RKMPolyTriangleIntersector some(arith);
  none = some;
  EXPECT_EQ(none.Intersect(kBase, kInside), 3);
  EXPECT_EQ(Read(none).size(), 3u);
  RKMPolyTriangleIntersector fresh(kNoArithmetic);
  none = fresh;
  EXPECT_EQ(none.Intersect(kBase, kInside), -1);

  RKMPolyTriangleSegmentIntersector segNone(kNoArithmetic);
  RKMPolyTriangleSegmentIntersector segSome(arith);
  segNone = segSome;
  EXPECT_EQ(segNone.Intersect(kBase[0], kBase[1], kBase[2], P(1, -1, 0), P(1, 5, 0)), 2);
}

class SpaceIntersectorCopies : public testing::TestWithParam<RKMPolyExactArithmetic::Mode>
{
};

TEST_P(SpaceIntersectorCopies, TriangleCopyOutlivesOriginal)
{
  RKMPolyExactArithmetic arith(GetParam());
  Points coplanar, crossing;
  std::unique_ptr<RKMPolyTriangleIntersector> copy;
  {
    RKMPolyTriangleIntersector tri(arith);
    ASSERT_EQ(tri.Intersect(kBase, kOverlap), 3);
    coplanar = Read(tri);
    ASSERT_EQ(coplanar.size(), 3u);
    copy = std::make_unique<RKMPolyTriangleIntersector>(tri);
    int n = 0, m = 0;
    EXPECT_NE(copy->GetIntersectionPoints(n), tri.GetIntersectionPoints(m));
    // A new query on the original leaves the copy's answer alone.
    ASSERT_EQ(tri.Intersect(kBase, kInside), 3);
    EXPECT_EQ(Read(*copy), coplanar);
  }
  EXPECT_EQ(Read(*copy), coplanar);
  EXPECT_EQ(copy->AreTrianglesCoplanar(), 1);
  EXPECT_EQ(copy->HaveSameOrientation(), 1);
  EXPECT_EQ(copy->Intersect(kBase, kUpright), 2);
  crossing = Read(*copy);
  EXPECT_EQ(crossing.size(), 2u);
  EXPECT_EQ(copy->Intersect(kBase, kInside), 3);

  // A copy of a copy after a non-coplanar query holds those points in its own storage.
  ASSERT_EQ(copy->Intersect(kBase, kUpright), 2);
  RKMPolyTriangleIntersector second(*copy);
  copy.reset();
  EXPECT_EQ(Read(second), crossing);
  EXPECT_EQ(second.AreTrianglesCoplanar(), 0);
}

TEST_P(SpaceIntersectorCopies, TriangleAssignmentOverUsedIntersector)
{
  RKMPolyExactArithmetic arith(GetParam());
  Points inside;
  auto target = std::make_unique<RKMPolyTriangleIntersector>(arith);
  ASSERT_EQ(target->Intersect(kBase, kOverlap), 3);
  {
    RKMPolyTriangleIntersector source(arith);
    ASSERT_EQ(source.Intersect(kInside, kBase), 3);
    inside = Read(source);
    *target = source;
    EXPECT_EQ(Read(*target), inside);
    // Self-assignment keeps the answer.
    RKMPolyTriangleIntersector &alias = *target;
    *target = alias;
    EXPECT_EQ(Read(*target), inside);
  }
  EXPECT_EQ(Read(*target), inside);
  EXPECT_EQ(target->AreTrianglesCoplanar(), 1);
  EXPECT_EQ(target->Intersect(kBase, kOverlap), 3);
  EXPECT_EQ(target->Intersect(kBase[0], kBase[1], kBase[2], P(-1, 0, 2), P(0, -1, 2)), 1);
  target.reset();
}

TEST_P(SpaceIntersectorCopies, SegmentCopiesAreDeep)
{
  RKMPolyExactArithmetic arith(GetParam());
  const P p(1, -1, 0), q(1, 7, 0);
  Points across;
  std::unique_ptr<RKMPolyTriangleSegmentIntersector> copy;
  auto assigned = std::make_unique<RKMPolyTriangleSegmentIntersector>(arith);
  ASSERT_EQ(assigned->Intersect(kBase[0], kBase[1], kBase[2], P(0, 1, 0), P(1, 1, 0)), 2);
  {
    RKMPolyTriangleSegmentIntersector seg(arith);
    ASSERT_EQ(seg.Intersect(kBase[0], kBase[1], kBase[2], p, q), 2);
    across = Read(seg);
    copy = std::make_unique<RKMPolyTriangleSegmentIntersector>(seg);
    *assigned = seg;
    ASSERT_EQ(seg.Intersect(kBase[0], kBase[1], kBase[2], P(1, 1, 0), P(2, 1, 0)), 2);
    EXPECT_EQ(Read(*copy), across);
    EXPECT_EQ(Read(*assigned), across);
  }
  for (RKMPolyTriangleSegmentIntersector *x : {copy.get(), assigned.get()})
  {
    EXPECT_EQ(Read(*x), across);
    EXPECT_EQ(x->IsCoplanar(), 1);
    EXPECT_EQ(x->Intersect(kBase[0], kBase[1], kBase[2], P(1, 1, -1), P(1, 1, 1)), 1);
    EXPECT_EQ(x->Intersect(kBase[0], kBase[1], kBase[2], p, q), 2);
  }
  RKMPolyTriangleSegmentIntersector &alias = *assigned;
  *assigned = alias;
  EXPECT_EQ(Read(*assigned), across);
  copy.reset();
  assigned.reset();
}

TEST_P(SpaceIntersectorCopies, GeodesicCopyOutlivesOriginal)
{
  RKMPolyExactArithmetic arith(GetParam());
  const P o(0, 0, 0), a(4, 0, 0), b(0, 4, 0);
  std::unique_ptr<RKMPolyGeodesicSegmentIntersector> copy;
  {
    RKMPolyGeodesicSegmentIntersector inter(arith, o);
    ASSERT_EQ(inter.Intersect(a, b, P(4, 0, 0), P(0, -4, 0)), 1);
    copy = std::make_unique<RKMPolyGeodesicSegmentIntersector>(inter);
    ASSERT_EQ(inter.Intersect(a, b, P(1, 1, -2), P(1, 1, 2)), 1);
  }
  EXPECT_EQ(copy->AreSegmentsColinear(), 1);
  EXPECT_EQ(copy->GetEntityType(0), 1);
  EXPECT_EQ(copy->GetVertexIndex(0), 0);
  EXPECT_EQ(copy->Intersect(a, b, P(1, 3, 0), P(3, 1, 0)), 2);
  EXPECT_EQ(copy->Intersect(a, b, P(1, 1, -2), P(1, 1, 2)), 1);
  EXPECT_EQ(copy->GetEntityType(0), 2);
  RKMPolyGeodesicSegmentIntersector other(arith, o);
  ASSERT_EQ(other.Intersect(a, b, P(1, 3, 0), P(3, 1, 0)), 2);
  other = *copy;
  copy.reset();
  EXPECT_EQ(other.GetEntityType(1), 2);
  EXPECT_EQ(other.Intersect(a, b, P(-1, -1, 1), P(-1, -2, 3)), 0);
}

INSTANTIATE_TEST_SUITE_P(Modes, SpaceIntersectorCopies,
                         testing::Values(RKMPolyExactArithmetic::Gridded, RKMPolyExactArithmetic::Adaptive),
                         [](const testing::TestParamInfo<RKMPolyExactArithmetic::Mode> &i) {
                           return std::string(i.param == RKMPolyExactArithmetic::Gridded ? "Gridded" : "Adaptive");
                         });

} // namespace
