#include "RKMPolyGriddedPositionsConst.h"

RKMPolyGriddedPositionsConst::RKMPolyGriddedPositionsConst(const RKMPolyExactArithmetic &arithmetic)
    : m_arithmetic(&arithmetic)
{
}

RKMPolyGriddedPositionsConst::RKMPolyGriddedPositionsConst(const RKMPolyGriddedPositionsConst &other) = default;

RKMPolyGriddedPositionsConst::~RKMPolyGriddedPositionsConst() = default;
