#pragma once

// The order of the point comparisons, shared by the double and the float kinds.
namespace RKMLexicographicOrder
{
/// A total order: NaN comes after every number and equals any NaN. Left to < and >, a NaN would
/// equal every number while hashing apart from it.
template <class T>
int Order(T a, T b)
{
  const bool na = a != a, nb = b != b;
  if (na || nb)
    return na == nb ? 0 : (na ? 1 : -1);
  return a < b ? -1 : (a > b ? 1 : 0);
}

/// Three coordinates by Order, x first; a null point compares as 0.
template <class T>
int Lexicographic(const T *a, const T *b)
{
  if (!a || !b)
    return 0;
  for (int i = 0; i < 3; ++i)
    if (const int o = Order(a[i], b[i]))
      return o;
  return 0;
}
}
