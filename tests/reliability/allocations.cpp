#include "tests/reliability/allocations.h"

#include <cstdlib>
#include <new>

namespace test {
namespace {

struct State {
  bool counts = false;
  long seen = 0;
  long fails_at = 0;
  bool for_good = false;
  long held = 0;
};

thread_local State t_state;

void* Allocate(std::size_t size) noexcept {
  State& state = t_state;
  if (state.counts) {
    ++state.seen;
    const bool due = state.fails_at != 0 && state.seen >= state.fails_at;
    if (due && (state.for_good || state.seen == state.fails_at)) return nullptr;
  }
  void* const block = std::malloc(size == 0 ? 1 : size);
  if (block != nullptr) ++state.held;
  return block;
}

void* AllocateOrThrow(std::size_t size) {
  void* const block = Allocate(size);
  if (block == nullptr) throw std::bad_alloc();
  return block;
}

void Release(void* block) noexcept {
  if (block == nullptr) return;
  --t_state.held;
  std::free(block);
}

}  // namespace

void BeginShortage(long n, Shortage shortage) {
  t_state.seen = 0;
  t_state.fails_at = n;
  t_state.for_good = shortage == Shortage::kForGood;
  t_state.counts = true;
}

long EndShortage() {
  t_state.counts = false;
  return t_state.seen;
}

long BlocksHeld() { return t_state.held; }

}  // namespace test

#define VISIBLE __attribute__((visibility("default")))

VISIBLE void* operator new(std::size_t size) { return test::AllocateOrThrow(size); }
VISIBLE void* operator new[](std::size_t size) { return test::AllocateOrThrow(size); }
VISIBLE void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
  return test::Allocate(size);
}
VISIBLE void* operator new[](std::size_t size, const std::nothrow_t&) noexcept {
  return test::Allocate(size);
}
VISIBLE void operator delete(void* block) noexcept { test::Release(block); }
VISIBLE void operator delete[](void* block) noexcept { test::Release(block); }
VISIBLE void operator delete(void* block, std::size_t) noexcept { test::Release(block); }
VISIBLE void operator delete[](void* block, std::size_t) noexcept { test::Release(block); }
VISIBLE void operator delete(void* block, const std::nothrow_t&) noexcept { test::Release(block); }
VISIBLE void operator delete[](void* block, const std::nothrow_t&) noexcept {
  test::Release(block);
}
