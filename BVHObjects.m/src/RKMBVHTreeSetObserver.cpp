#include "RKMBVHTreeSetObserver.h"

RKMBVHTreeSetObserver::~RKMBVHTreeSetObserver() = default;
