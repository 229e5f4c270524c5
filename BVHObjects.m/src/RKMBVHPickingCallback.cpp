#include "RKMBVHPickingCallback.h"

RKMBVHPickingCallback::~RKMBVHPickingCallback() = default;
