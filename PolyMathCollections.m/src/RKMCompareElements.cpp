#include "RKMCompareElements.h"

RKMCompareElements::~RKMCompareElements() = default;
