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

// Moves up to n blocks of a class from the shared list (carving a new chunk when it is empty) onto a
// private list; gives the number moved, 0 when memory runs out.
int TakeBatch(size_t index, FreeBlock *&head, int n)
{
  SizeClass &c = Class(index);
  std::lock_guard<std::mutex> guard(c.lock);
  if (!c.free)
  {
    const size_t stride = kHeader + index * kGranule;
    char *chunk = static_cast<char *>(std::malloc(kChunkBytes));
    if (!chunk)
      return 0;
    // Chunks are never returned: the pool lives as long as the process.
    for (size_t off = 0; off + stride <= kChunkBytes; off += stride)
    {
      FreeBlock *b = reinterpret_cast<FreeBlock *>(chunk + off);
      b->next = c.free;
      c.free = b;
    }
  }
  int moved = 0;
  while (c.free && moved < n)
  {
    FreeBlock *b = c.free;
    c.free = b->next;
    b->next = head;
    head = b;
    ++moved;
  }
  return moved;
}

// Moves n blocks from a private list back to the shared one.
void GiveBatch(size_t index, FreeBlock *&head, int n)
{
  SizeClass &c = Class(index);
  std::lock_guard<std::mutex> guard(c.lock);
  while (head && n-- > 0)
  {
    FreeBlock *b = head;
    head = b->next;
    b->next = c.free;
    c.free = b;
  }
}

// Each thread keeps a short list per class, so most allocations and releases touch no lock. The lists
// go back to the shared ones in batches, and wholly when the thread ends, so a block freed by another
// thread than the one that took it is simply reused there.
constexpr int kBatch = 32;
struct ThreadCache
{
  FreeBlock *head[kClasses + 1] = {};
  int count[kClasses + 1] = {};
  ~ThreadCache()
  {
    for (size_t i = 1; i <= kClasses; ++i)
      GiveBatch(i, head[i], count[i]);
  }
};

thread_local ThreadCache t_cache;

void *TakeFromClass(size_t index)
{
  ThreadCache &cache = t_cache;
  if (!cache.head[index])
    cache.count[index] = TakeBatch(index, cache.head[index], kBatch);
  FreeBlock *b = cache.head[index];
  if (!b)
    return nullptr;
  cache.head[index] = b->next;
  --cache.count[index];
  return b;
}

void ReturnToClass(size_t index, FreeBlock *b)
{
  ThreadCache &cache = t_cache;
  b->next = cache.head[index];
  cache.head[index] = b;
  if (++cache.count[index] > 2 * kBatch)
  {
    GiveBatch(index, cache.head[index], kBatch);
    cache.count[index] -= kBatch;
  }
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
  ReturnToClass(tag, reinterpret_cast<FreeBlock *>(raw));
}

const char *RKMSysGetPoolName(const RKMSysPool *pool) { return pool ? pool->name.c_str() : nullptr; }
