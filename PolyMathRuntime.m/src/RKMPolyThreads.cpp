#include "RKMPolyThreads.h"

RKMPolyThreads::~RKMPolyThreads() { Join(); }
