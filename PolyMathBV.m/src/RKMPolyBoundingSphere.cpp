#include "RKMPolyBVConstVisitor.h"
#include "RKMPolyBoundingSphere.h"

HRESULT RKMPolyBoundingSphere::Accept(RKMPolyBVConstVisitor &visitor) const { return visitor.VisitConcrete(*this); }
