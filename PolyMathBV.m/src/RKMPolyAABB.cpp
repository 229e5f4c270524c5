#include "RKMPolyAABB.h"
#include "RKMPolyBVConstVisitor.h"

#include "RKMMathBox.h"

HRESULT RKMPolyAABB::Accept(RKMPolyBVConstVisitor &visitor) const { return visitor.VisitConcrete(*this); }

RKMPolyAABB::RKMPolyAABB(const RKMPolyAABB &other) : RKMPolyBoundingVolume(other), m_box(other.m_box) {}

RKMPolyAABB::RKMPolyAABB(const RKMPolyBoxf &box) : m_box(box) {}

RKMPolyAABB::RKMPolyAABB(const RKMMathBox &box) { m_box.SetBox(box); }

void RKMPolyAABB::SetMathBox(const RKMMathBox &box) { m_box.SetBox(box); }

unsigned char RKMPolyAABB::operator==(const RKMPolyAABB &other) const
{
  const bool e1 = m_box.IsEmpty(), e2 = other.m_box.IsEmpty();
  if (e1 || e2)
    return e1 && e2;
  return m_box.GetXMin() == other.m_box.GetXMin() && m_box.GetYMin() == other.m_box.GetYMin() &&
         m_box.GetZMin() == other.m_box.GetZMin() && m_box.GetXMax() == other.m_box.GetXMax() &&
         m_box.GetYMax() == other.m_box.GetYMax() && m_box.GetZMax() == other.m_box.GetZMax();
}
