#include "RKMPolyGriddedPositions.h"

RKMPolyGriddedPositions::RKMPolyGriddedPositions(const RKMPolyExactArithmetic &arithmetic)
    : RKMPolyGriddedPositionsConst(arithmetic)
{
}

RKMPolyGriddedPositions::RKMPolyGriddedPositions(const RKMPolyGriddedPositions &other) = default;

RKMPolyGriddedPositions::~RKMPolyGriddedPositions() = default;
