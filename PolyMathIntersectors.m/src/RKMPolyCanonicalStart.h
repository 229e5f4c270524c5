#pragma once

// The start vertex s of a triangle from the signs (σ0, σ1, σ2) of its vertices against a line or a
// plane, each in -1, 0, 1: vertex s is alone on its side (or the one to start from when vertices lie
// on the line), and the canonical order is s, s + 1, s + 2. All three zero has no start: 0 is given.
inline int RKMPolyCanonicalStartVertex(int s0, int s1, int s2)
{
  static const signed char kStart[3][9] = {
      {2, 2, 2, 1, 0, 2, 1, 1, 0},
      {0, 1, 2, 2, 0, 2, 1, 1, 0},
      {0, 0, 1, 0, 0, 1, 2, 2, 2},
  };
  return kStart[s0 + 1][(s1 + 1) * 3 + (s2 + 1)];
}
