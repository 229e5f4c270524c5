#include "RKMPolyBVConstVisitor.h"
#include "RKMPolyBoundingVolume.h"

RKMPolyBVConstVisitor::~RKMPolyBVConstVisitor() = default;

HRESULT RKMPolyBVConstVisitor::Visit(const RKMPolyBoundingVolume &bv) { return bv.Accept(*this); }
