#include "RKMBVHPickingOperator.h"

HRESULT RKMBVHPickingOperator::Run(const RKMBVHTree &, const RKMMathPoint &, const RKMMathVector &) { return E_FAIL; }
