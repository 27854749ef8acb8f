// Grow-only chunk pool for the keyword list's small records and strings.
#include "catalogue/pool.h"

#include <cstdint>
#include <cstdio>
#include <memory>
#include <new>

#include "base/trace.h"

namespace {

// Every request is rounded up to this, so that records holding pointers are
// aligned whatever came before them.  64000 is a multiple of it, so the
// largest request still fits a chunk exactly.
constexpr int kPoolAlignment = 8;
static_assert(kPoolChunkSize % kPoolAlignment == 0, "chunk size must stay aligned");
static_assert(alignof(void*) <= kPoolAlignment, "pool alignment too small for pointers");

std::unique_ptr<char[]> g_chunks[kPoolMaxChunks];
int g_fill[kPoolMaxChunks];
int g_chunkCount = 0;

}  // namespace

void* PoolAlloc(int count, int size) {
  // The product wraps as 32-bit arithmetic would; done unsigned to stay defined.
  const uint32_t wrapped = static_cast<uint32_t>(count) * static_cast<uint32_t>(size);
  const int32_t request = static_cast<int32_t>(wrapped);
  if (wrapped > static_cast<uint32_t>(kPoolChunkSize) || request <= 0) {
    char text[64];
    std::snprintf(text, sizeof text, "%d x %d = %d", count, size, request);
    TraceMessage("PS ERROR: VM Range check in allocation ", text);
    return nullptr;
  }
  const int rounded = (request + kPoolAlignment - 1) / kPoolAlignment * kPoolAlignment;

  // Newest chunk first: older chunks are topped up only when newer ones are full.
  int chunk = -1;
  for (int i = g_chunkCount - 1; i >= 0; --i) {
    if (kPoolChunkSize - g_fill[i] >= rounded) {
      chunk = i;
      break;
    }
  }
  if (chunk < 0) {
    if (g_chunkCount >= kPoolMaxChunks) {
      TraceMessage("PS ERROR: VM Memory allocation out VM chunk limit");
      return nullptr;
    }
    std::unique_ptr<char[]> block(new (std::nothrow) char[kPoolChunkSize]);
    if (!block) {
      TraceMessage("PS ERROR: VM Allocation request to system failed");
      return nullptr;
    }
    chunk = g_chunkCount;
    g_chunks[chunk] = std::move(block);
    g_fill[chunk] = 0;
    ++g_chunkCount;
  }

  char* result = g_chunks[chunk].get() + g_fill[chunk];
  g_fill[chunk] += rounded;
  return result;
}

void PoolReset() {
  for (int i = 0; i < g_chunkCount; ++i) {
    g_chunks[i].reset();
    g_fill[i] = 0;
  }
  g_chunkCount = 0;
}

int PoolChunkCount() { return g_chunkCount; }

int PoolChunkFill(int chunk) {
  if (chunk < 0 || chunk >= g_chunkCount) return 0;
  return g_fill[chunk];
}
