// A grow-only pool for the small, never-released records of the keyword list.
#pragma once

constexpr int kPoolChunkSize = 64000;
constexpr int kPoolMaxChunks = 256;

// count x size bytes of pool memory, or NULL (after a "PS ERROR: VM" trace).
void* PoolAlloc(int count, int size);

// Gives every chunk back; for tests only (the program never releases).
void PoolReset();

// Number of chunks obtained so far, and bytes handed out from chunk i.
int PoolChunkCount();
int PoolChunkFill(int chunk);
