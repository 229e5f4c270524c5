#include "RKMPolyGriddedPositions.h"

RKMPolyGriddedPositionsConst::RKMPolyGriddedPositionsConst(const RKMPolyExactArithmetic &arithmetic)
    : m_arithmetic(&arithmetic)
{
}

RKMPolyGriddedPositionsConst::RKMPolyGriddedPositionsConst(const RKMPolyGriddedPositionsConst &other) = default;

RKMPolyGriddedPositionsConst::~RKMPolyGriddedPositionsConst() = default;

RKMPolyGriddedPositions::RKMPolyGriddedPositions(const RKMPolyExactArithmetic &arithmetic)
    : RKMPolyGriddedPositionsConst(arithmetic)
{
}

RKMPolyGriddedPositions::RKMPolyGriddedPositions(const RKMPolyGriddedPositions &other) = default;

RKMPolyGriddedPositions::~RKMPolyGriddedPositions() = default;
