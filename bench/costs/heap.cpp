#include "bench/costs/heap.h"

#include <malloc.h>

#include <algorithm>

extern "C" {
void* __libc_malloc(std::size_t size);                     // NOLINT: the C library's own names
void* __libc_calloc(std::size_t count, std::size_t size);  // NOLINT
void* __libc_realloc(void* block, std::size_t size);       // NOLINT
void __libc_free(void* block);                             // NOLINT
}

namespace {

std::size_t now = 0;
std::size_t peak = 0;

void* Taken(void* block) {
  now += malloc_usable_size(block);
  peak = std::max(peak, now);
  return block;
}

}  // namespace

extern "C" {

__attribute__((visibility("default"))) void* malloc(std::size_t size) {
  return Taken(__libc_malloc(size));
}

__attribute__((visibility("default"))) void* calloc(std::size_t count, std::size_t size) {
  return Taken(__libc_calloc(count, size));
}

__attribute__((visibility("default"))) void* realloc(void* block, std::size_t size) {
  const std::size_t before = malloc_usable_size(block);
  void* const moved = __libc_realloc(block, size);
  if (moved == nullptr && size > 0) return nullptr;
  now -= before;
  return Taken(moved);
}

__attribute__((visibility("default"))) void free(void* block) {
  now -= malloc_usable_size(block);
  __libc_free(block);
}

}  // extern "C"

namespace bench {

std::size_t HeapNow() { return now; }

std::size_t HeapPeak() { return peak; }

void BeginPeak() { peak = now; }

}  // namespace bench
