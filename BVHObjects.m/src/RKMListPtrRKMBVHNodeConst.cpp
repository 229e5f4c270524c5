#include "RKMListPtrRKMBVHNodeConst.h"

RKMListPtrRKMBVHNodeConst::~RKMListPtrRKMBVHNodeConst() = default;
