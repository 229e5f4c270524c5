#include "RKMSysAllocator.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <new>
#include <string>

struct RKMSysPool
{
  unsigned flags;
  size_t blockSize;
  std::string name;
};

namespace
{
// Every block carries a header naming its size class (0 for a block taken straight from malloc),
// so that it goes back to the right free list whatever pool the caller names on return.
constexpr size_t kHeader = 16;
constexpr size_t kGranule = 16;
constexpr size_t kClasses = 32;                   // classes of 16, 32, …, 512 bytes
constexpr size_t kChunkBytes = 64 * 1024;

struct FreeBlock
{
  FreeBlock *next;
};

struct SizeClass
{
  std::mutex lock;
  FreeBlock *free = nullptr;
};

SizeClass &Class(size_t index)
{
  static SizeClass classes[kClasses + 1];
  return classes[index];
}

#if defined(__SANITIZE_ADDRESS__)
// Under AddressSanitizer every block comes from malloc, so a use after return is caught.
constexpr bool kPooling = false;
#else
constexpr bool kPooling = true;
#endif

void *TakeFromClass(size_t index)
{
  SizeClass &c = Class(index);
  std::lock_guard<std::mutex> guard(c.lock);
  if (!c.free)
  {
    const size_t stride = kHeader + index * kGranule;
    char *chunk = static_cast<char *>(std::malloc(kChunkBytes));
    if (!chunk)
      return nullptr;
    // Chunks are never returned: the pool lives as long as the process.
    for (size_t off = 0; off + stride <= kChunkBytes; off += stride)
    {
      FreeBlock *b = reinterpret_cast<FreeBlock *>(chunk + off);
      b->next = c.free;
      c.free = b;
    }
  }
  FreeBlock *b = c.free;
  c.free = b->next;
  return b;
}

RKMSysPool *DefaultPool()
{
  static RKMSysPool *pool = RKMSysCreatePool(0, 0, "RKMSysDefaultPool");
  return pool;
}
}

RKMSysPool *RKMSysCreatePool(unsigned flags, size_t blockSize, const char *name)
{
  RKMSysPool *pool = new (std::nothrow) RKMSysPool;
  if (!pool)
    return nullptr;
  pool->flags = flags;
  pool->blockSize = blockSize;
  try
  {
    pool->name = name ? name : "";
  }
  catch (...)
  {
    delete pool;
    return nullptr;
  }
  return pool;
}

void *RKMSpecializedNew(size_t size, RKMSysPool *pool, const void *, int, unsigned)
{
  if (!pool)
    pool = DefaultPool();
  if (pool && pool->blockSize > size)
    size = pool->blockSize;
  if (size == 0)
    size = 1;
  // Beyond this the header and the rounding to a size class would wrap around.
  if (size > SIZE_MAX - kHeader - kGranule)
    return nullptr;
  const size_t index = (size + kGranule - 1) / kGranule;
  char *raw;
  if (kPooling && index <= kClasses)
  {
    raw = static_cast<char *>(TakeFromClass(index));
  }
  else
    raw = static_cast<char *>(std::malloc(kHeader + size));
  if (!raw)
    return nullptr;
  const size_t tag = (kPooling && index <= kClasses) ? index : 0;
  std::memcpy(raw, &tag, sizeof tag);
  return raw + kHeader;
}

void RKMSpecializedDelete(void *block, RKMSysPool *, unsigned)
{
  if (!block)
    return;
  char *raw = static_cast<char *>(block) - kHeader;
  size_t tag;
  std::memcpy(&tag, raw, sizeof tag);
  if (tag == 0 || tag > kClasses)
  {
    std::free(raw);
    return;
  }
  SizeClass &c = Class(tag);
  std::lock_guard<std::mutex> guard(c.lock);
  FreeBlock *b = reinterpret_cast<FreeBlock *>(raw);
  b->next = c.free;
  c.free = b;
}

const char *RKMSysGetPoolName(const RKMSysPool *pool) { return pool ? pool->name.c_str() : nullptr; }
