#include "RKMBVHDescentOperator.h"
#include "RKMBVHNodeConst.h"
#include "RKMBVHTree.h"

RKMBVHDescentOperator::~RKMBVHDescentOperator() = default;

unsigned char RKMBVHDescentOperator::Filter(RKMBVHNodeConst &, RKMBVHNodeConst &) { return 1; }
unsigned char RKMBVHDescentOperator::Filter(RKMBVHNodeConst &) { return 1; }
HRESULT RKMBVHDescentOperator::ProcessLeafNode(RKMBVHNodeConst &) { return S_OK; }
unsigned char RKMBVHDescentOperator::IsStopped() { return 0; }
HRESULT RKMBVHDescentOperator::ProcessLeafNodes(RKMBVHNodeConst &, RKMBVHNodeConst &) { return S_OK; }
int RKMBVHDescentOperator::Choose(RKMBVHNodeConst &, RKMBVHNodeConst &) { return ChooseBoth; }
void RKMBVHDescentOperator::End(RKMBVHNodeConst &, RKMBVHNodeConst &) {}

HRESULT RKMBVHDescentOperator::Descend(RKMBVHTree &tree)
{
  depth = 0;
  RKMBVHNodeConst *root = tree.GetRoot();
  if (!root)
    return E_INVALIDARG;
  return Descend(*root);
}

HRESULT RKMBVHDescentOperator::Descend(RKMBVHTree &first, RKMBVHTree &second)
{
  depth1 = 0;
  depth2 = 0;
  RKMBVHNodeConst *a = first.GetRoot();
  RKMBVHNodeConst *b = second.GetRoot();
  if (!a || !b)
    return E_INVALIDARG;
  return Descend(*a, *b);
}

HRESULT RKMBVHDescentOperator::Descend(RKMBVHNodeConst &node)
{
  if (IsStopped() || !Filter(node))
    return S_OK;
  if (node.GetNbChildren() == 0)
    return ProcessLeafNode(node);
  RKMListPtrRKMBVHNodeConst &children = node.GetChildren();
  HRESULT result = S_OK;
  for (int i = 1; i <= children.Size(); ++i)
  {
    if (IsStopped())
      break;
    RKMBVHNodeConst *child = children[i];
    if (!child)
      continue;
    ++depth;
    result = Descend(*child);
    --depth;
    if (FAILED(result))
      break;
  }
  return result;
}

HRESULT RKMBVHDescentOperator::Descend(RKMBVHNodeConst &a, RKMBVHNodeConst &b)
{
  if (IsStopped() || !Filter(a, b))
    return S_OK;
  const int na = a.GetNbChildren(), nb = b.GetNbChildren();
  if (na == 0 && nb == 0)
  {
    const HRESULT r = ProcessLeafNodes(a, b);
    End(a, b);
    return r;
  }
  const int choice = Choose(a, b);
  HRESULT result = S_OK;
  auto openB = [&]() {
    RKMListPtrRKMBVHNodeConst &children = b.GetChildren();
    for (int j = 1; j <= children.Size(); ++j)
    {
      if (IsStopped())
        break;
      RKMBVHNodeConst *child = children[j];
      if (!child)
        continue;
      ++depth2;
      result = Descend(a, *child);
      --depth2;
    }
  };
  auto openA = [&]() {
    RKMListPtrRKMBVHNodeConst &children = a.GetChildren();
    for (int i = 1; i <= children.Size(); ++i)
    {
      if (IsStopped())
        break;
      RKMBVHNodeConst *child = children[i];
      if (!child)
        continue;
      ++depth1;
      result = Descend(*child, b);
      --depth1;
    }
  };
  if (na == 0)
    openB();
  else if (nb == 0)
    openA();
  else if (choice == ChooseSecond)
    openB();
  else if (choice == ChooseFirst)
    openA();
  else
  {
    RKMListPtrRKMBVHNodeConst &ca = a.GetChildren();
    RKMListPtrRKMBVHNodeConst &cb = b.GetChildren();
    for (int i = 1; i <= ca.Size(); ++i)
    {
      RKMBVHNodeConst *childA = ca[i];
      if (!childA)
        continue;
      for (int j = 1; j <= cb.Size(); ++j)
      {
        if (IsStopped())
          break;
        RKMBVHNodeConst *childB = cb[j];
        if (!childB)
          continue;
        ++depth1;
        ++depth2;
        result = Descend(*childA, *childB);
        --depth1;
        --depth2;
      }
    }
  }
  End(a, b);
  return result;
}
