#include "RKMPolyBVConstVisitor.h"
#include "RKMPolyBoxf.h"
#include "RKMPolyOBB.h"

#include "RKMMathBox.h"
#include "RKMMathTransformation.h"

HRESULT RKMPolyOBB::Accept(RKMPolyBVConstVisitor &visitor) const { return visitor.VisitConcrete(*this); }

RKMPolyOBB::RKMPolyOBB(const RKMMathBox &box) : m_base(box) {}

RKMPolyOBB::RKMPolyOBB(const RKMPolyBoxf &box) : m_base(box.GetMathBox()) {}

RKMMathBox RKMPolyOBB::GetAABB() const
{
  RKMMathBox box;
  m_base.GetBox(box);
  return box;
}

HRESULT RKMPolyOBB::ConvertToBoxAndTransformation(RKMMathBox &box, RKMMathTransformation &T) const
{
  return m_base.ConvertToBoxAndTransformation(box, T);
}
