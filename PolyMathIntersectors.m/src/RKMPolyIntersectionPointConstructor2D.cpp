#include "RKMPolyIntersectionPointConstructor2D.h"

RKMPolyIntersectionPointConstructor2D::~RKMPolyIntersectionPointConstructor2D() = default;
