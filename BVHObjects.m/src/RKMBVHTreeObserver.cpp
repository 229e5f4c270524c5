#include "RKMBVHTreeObserver.h"

RKMBVHTreeObserver::~RKMBVHTreeObserver() = default;
