#pragma once

// The reference walks for the descent operator: a Script answers every hook (by hashing the seed and
// the node ids) and logs each call; RecordingOperator asks the script from the operator's hooks, and
// RefSingle and RefPair walk plain trees the way the descent is documented to, asking a script of the
// same seed. Same calls in the same order, same answers, same result: the logs must be equal.

#include "BVHTestTrees.h"
#include "RKMBVHDescentOperator.h"

#include <cstdint>

namespace bvhtest
{
inline std::uint64_t Mix(std::uint64_t x)
{
  x += 0x9e3779b97f4a7c15ull;
  x = (x ^ (x >> 30)) * 0xbf58476d1ce4e5b9ull;
  x = (x ^ (x >> 27)) * 0x94d049bb133111ebull;
  return x ^ (x >> 31);
}

inline std::uint64_t Hash(std::uint64_t seed, int tag, int a, int b = 0)
{
  return Mix(Mix(Mix(seed ^ static_cast<std::uint64_t>(tag)) + static_cast<std::uint64_t>(a)) +
             static_cast<std::uint64_t>(b));
}

struct Script
{
  explicit Script(std::uint64_t s) : seed(s) {}
  static HRESULT Result(std::uint64_t h) { return h == 0 ? E_FAIL : (h == 1 ? S_FALSE : S_OK); }
  static std::string At(int n, int d) { return std::to_string(n) + " @" + std::to_string(d); }
  static std::string At(int a, int b, int d1, int d2)
  {
    return std::to_string(a) + "," + std::to_string(b) + " @" + std::to_string(d1) + "," + std::to_string(d2);
  }
  // Logs the call, with the answer when asked to, and hands the answer back.
  template <class R> R Log(const std::string &call, R r, bool withAnswer = false)
  {
    log.push_back(withAnswer ? call + " ->" + std::to_string(r) : call);
    return r;
  }

  // True once stopAfter calls have been logged (never when negative), or once a leaf pair stopped it.
  bool Stopped()
  {
    const bool r = stopped || (stopAfter >= 0 && static_cast<long>(log.size()) >= stopAfter);
    return Log(r ? "stop?1" : "stop?0", r);
  }
  bool Filter1(int n, int d) { return Log("filter " + At(n, d), filter1(n), true); }
  HRESULT Leaf1(int n, int d) { return Log("leaf " + At(n, d), leaf1(n)); }
  bool Filter2(int a, int b, int d1, int d2) { return Log("filter " + At(a, b, d1, d2), filter2(a, b), true); }
  int Choose(int a, int b, int d1, int d2) { return Log("choose " + At(a, b, d1, d2), choose(a, b), true); }
  HRESULT Leaf2(int a, int b, int d1, int d2)
  {
    stopped = stopped || stopInLeaves;
    return Log("leaves " + At(a, b, d1, d2), leaf2(a, b));
  }
  void End(int a, int b, int d1, int d2) { log.push_back("end " + At(a, b, d1, d2)); }

  // The hooks' answers, hashed from the seed, the hook and the node ids unless a test sets its own.
  std::uint64_t seed;
  std::function<bool(int)> filter1 = [this](int n) { return Hash(seed, 1, n) % 10 != 0; };
  std::function<HRESULT(int)> leaf1 = [this](int n) { return Result(Hash(seed, 2, n) % 5); };
  std::function<bool(int, int)> filter2 = [this](int a, int b) { return Hash(seed, 3, a, b) % 12 != 0; };
  std::function<int(int, int)> choose = [this](int a, int b) { return static_cast<int>(Hash(seed, 4, a, b) % 4); };
  std::function<HRESULT(int, int)> leaf2 = [this](int a, int b) { return Result(Hash(seed, 5, a, b) % 4); };
  long stopAfter = -1;
  bool stopInLeaves = false, stopped = false;
  std::vector<std::string> log;
};

class RecordingOperator : public RKMBVHDescentOperator
{
public:
  explicit RecordingOperator(Script &s) : m_s(s) {}
  void Scramble() { depth = 77, depth1 = 88, depth2 = 99; } // the public entry points must reset them

protected:
  unsigned char Filter(RKMBVHNodeConst &n) override { return m_s.Filter1(IdOf(n), depth); }
  HRESULT ProcessLeafNode(RKMBVHNodeConst &n) override { return m_s.Leaf1(IdOf(n), depth); }
  unsigned char IsStopped() override { return m_s.Stopped(); }
  unsigned char Filter(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    return m_s.Filter2(IdOf(a), IdOf(b), depth1, depth2);
  }
  int Choose(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override { return m_s.Choose(IdOf(a), IdOf(b), depth1, depth2); }
  HRESULT ProcessLeafNodes(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    return m_s.Leaf2(IdOf(a), IdOf(b), depth1, depth2);
  }
  void End(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override { m_s.End(IdOf(a), IdOf(b), depth1, depth2); }

private:
  Script &m_s;
};

// For each child in order: a stop ends the loop, a null child is skipped, visit's false ends the loop.
inline void EachChild(const std::vector<int> &kids, Script &s, const std::function<bool(int)> &visit)
{
  for (int c : kids)
  {
    if (s.Stopped())
      break;
    if (c >= 0 && !visit(c))
      break;
  }
}

inline HRESULT RefSingle(const Plain &t, int n, Script &s, int &depth)
{
  if (s.Stopped() || !s.Filter1(n, depth))
    return S_OK;
  if (t[n].empty())
    return s.Leaf1(n, depth);
  HRESULT r = S_OK;
  EachChild(t[n], s,
            [&](int c)
            {
              ++depth;
              r = RefSingle(t, c, s, depth);
              --depth;
              return !FAILED(r);
            });
  return r;
}

// Both open (every pair, A's children outermost) unless one side is a leaf or Choose picks one side.
inline HRESULT RefPair(const Plain &A, int a, const Plain &B, int b, Script &s, int &d1, int &d2)
{
  if (s.Stopped() || !s.Filter2(a, b, d1, d2))
    return S_OK;
  const bool leafA = A[a].empty(), leafB = B[b].empty();
  HRESULT r = S_OK;
  if (leafA && leafB)
    r = s.Leaf2(a, b, d1, d2);
  else
  {
    const int choice = s.Choose(a, b, d1, d2);
    const auto pair = [&](int ca, int cb, int down1, int down2)
    {
      d1 += down1, d2 += down2;
      r = RefPair(A, ca, B, cb, s, d1, d2);
      d1 -= down1, d2 -= down2;
      return true;
    };
    if (!leafA && (leafB || choice == 1))
      EachChild(A[a], s, [&](int ca) { return pair(ca, b, 1, 0); });
    else if (!leafB && (leafA || choice == 2))
      EachChild(B[b], s, [&](int cb) { return pair(a, cb, 0, 1); });
    else
      for (int ca : A[a])
        if (ca >= 0)
          EachChild(B[b], s, [&](int cb) { return pair(ca, cb, 1, 1); });
  }
  s.End(a, b, d1, d2);
  return r;
}

// The first difference, with three calls of context on either side.
inline ::testing::AssertionResult SameLog(const std::vector<std::string> &want, const std::vector<std::string> &got)
{
  size_t i = 0;
  while (i < want.size() && i < got.size() && want[i] == got[i])
    ++i;
  if (want == got)
    return ::testing::AssertionSuccess();
  auto r = ::testing::AssertionFailure() << "logs differ at call " << i << " (" << want.size() << " calls expected, "
                                         << got.size() << " made)";
  for (size_t k = i > 3 ? i - 3 : 0; k < i + 3 && k < std::max(want.size(), got.size()); ++k)
    r << "\n  " << k << ": expected [" << (k < want.size() ? want[k] : "-") << "] got ["
      << (k < got.size() ? got[k] : "-") << "]";
  return r;
}
} // namespace bvhtest
