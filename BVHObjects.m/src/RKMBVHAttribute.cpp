#include "RKMBVHAttribute.h"
#include "RKMPolyAtomicOperations.h"

#include "RKMInterlocked.h"

RKMBVHAttribute::RKMBVHAttribute(const RKMBVHAttribute &other) : m_flags(RKMInterlockedRead(&other.m_flags)) {}

RKMBVHAttribute &RKMBVHAttribute::operator=(const RKMBVHAttribute &other)
{
  __atomic_store_n(&m_flags, RKMInterlockedRead(&other.m_flags), __ATOMIC_SEQ_CST);
  return *this;
}

RKMBVHAttribute::~RKMBVHAttribute() = default;

RKMGeomBVHAttribute *RKMBVHAttribute::CastAsGeomAttribute() { return nullptr; }
const RKMGeomBVHAttribute *RKMBVHAttribute::CastAsGeomAttribute() const { return nullptr; }
RKMBVHVisuAttribute *RKMBVHAttribute::CastAsVisuAttribute() { return nullptr; }
const RKMBVHVisuAttribute *RKMBVHAttribute::CastAsVisuAttribute() const { return nullptr; }
RKMBodyBVHAttribute *RKMBVHAttribute::CastAsBodyAttribute() { return nullptr; }
const RKMBodyBVHAttribute *RKMBVHAttribute::CastAsBodyAttribute() const { return nullptr; }
RKMPolyBVHAttribute *RKMBVHAttribute::CastAsPolyAttribute() { return nullptr; }
const RKMPolyBVHAttribute *RKMBVHAttribute::CastAsPolyAttribute() const { return nullptr; }
RKMTessBVHAttribute *RKMBVHAttribute::CastAsTessAttribute() { return nullptr; }
const RKMTessBVHAttribute *RKMBVHAttribute::CastAsTessAttribute() const { return nullptr; }
void RKMBVHAttribute::FlushComputedData() {}

void RKMBVHAttribute::EnableFlag(FlagType bits) { RKMPolyAtomicOperations::BitWiseOr(&m_flags, bits); }

void RKMBVHAttribute::DisableFlag(FlagType bits) { RKMPolyAtomicOperations::BitWiseTestAndReset(&m_flags, bits); }

unsigned char RKMBVHAttribute::TestFlag(FlagType bits) const
{
  // Any tested bit set reads as true, whichever byte of the word it is in.
  return (RKMInterlockedCompareExchange(&m_flags, 0, 0) & bits) != 0;
}
