// A program outside the library's tree, linked against an installed copy through find_package.
#include "RKMBVHNode.h"
#include "RKMBVHTree.h"
#include "RKMMathBox.h"
#include "RKMMathPoint.h"
#include "RKMPolyAABB.h"
#include "RKMPolyBoxf.h"
#include "RKMRef.h"

#include <cstdio>
#include <cstdlib>

int main()
{
  RKMPolyBoxf box(RKMMathBox(RKMMathPoint(0.1, 0.2, 0.3), RKMMathPoint(1.1, 1.2, 1.3)));
  RKMPolyBoxf probe(1.0, 2.0, 1.0, 2.0, 1.0, 2.0);
  // The headers of every layer are installed side by side and included by class name.
  const RKMRef<RKMBVHTree> tree = RKMRef<RKMBVHTree>::Adopt(
      new RKMBVHTree(new RKMBVHNode(new RKMPolyAABB(RKMMathBox(0, 1, 0, 1, 0, 1)))));
  const bool ok = box.IsContaining(RKMMathPoint(0.1, 0.2, 0.3)) && box.IsIntersecting(probe, 0.0f) &&
                  tree->GetRoot() != nullptr;
  std::printf("installed library linked: %s\n", ok ? "ok" : "wrong answer");
  return ok ? EXIT_SUCCESS : EXIT_FAILURE;
}
