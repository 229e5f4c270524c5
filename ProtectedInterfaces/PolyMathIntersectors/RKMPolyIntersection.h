#pragma once

/// The kind of an intersection between two segments, or a point and a segment, the reason it is not
/// a plain crossing, and the answers of the intersectors' Intersect members.
struct RKMPolyIntersection
{
  /// What Intersect answers: a count of points when not negative, why there is no answer when
  /// negative. Each intersector's header says which of them it gives.
  enum Result : int
  {
    ResultDisjoint = 0,
    ResultOnePoint = 1,
    /// Two points: the ends of an intersection segment or of a collinear overlap.
    ResultTwoPoints = 2,
    /// Two triangles in one plane overlapping in a polygon of three or more corners.
    ResultPolygon = 3,
    /// No arithmetic, or a relation that could not be decided.
    ResultUndetermined = -1,
    /// A sign combination the classification does not admit (the geodesic test: apart).
    ResultInadmissible = -2,
    /// A segment that is a single point (the geodesic test: a segment collinear with the apex, on
    /// one side of it).
    ResultPointSegment = -5,
    /// A triangle whose vertices are collinear.
    ResultDegenerateTriangle = -6,
    /// The geodesic test: the apex lies between a segment's ends.
    ResultApexBetween = -8
  };

  enum Type : int
  {
    /// Degenerate input or undecided.
    TypeUndefined = -1,
    TypeNone = 0,
    TypePoint = 1,
    TypeOverlap = 2
  };
  enum Error : int
  {
    ErrorNone = 0,
    ErrorUndetermined = -2,
    ErrorColinear = -3,
    ErrorDegenerate = -5
  };
};
