#pragma once

/// The kind of an intersection between two segments, or a point and a segment, and the reason it is
/// not a plain crossing.
struct RKMPolyIntersection
{
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
