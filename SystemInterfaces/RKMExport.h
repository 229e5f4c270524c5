#pragma once

/// Marks a class or function as part of the library's exported interface; everything else stays hidden.
#define RKM_EXPORT __attribute__((visibility("default")))
