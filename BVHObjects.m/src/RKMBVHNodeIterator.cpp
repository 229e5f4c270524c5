#include "RKMBVHNodeIterator.h"

RKMBVHNodeIterator::~RKMBVHNodeIterator() = default;
