#include "tests/reliability/scarce_memory.h"

#include <atomic>
#include <cstdlib>
#include <new>

namespace {

std::atomic<bool> isCounting{false};
std::atomic<std::size_t> allocations{0};
std::atomic<std::size_t> failing{0};

bool isToFail() { return isCounting && ++allocations == failing; }

void* allocatedOrNull(std::size_t size) { return isToFail() ? nullptr : std::malloc(size == 0 ? 1 : size); }

void* allocated(std::size_t size) {
  void* const memory = allocatedOrNull(size);
  if (memory == nullptr) throw std::bad_alloc{};
  return memory;
}

}  // namespace

void* operator new(std::size_t size) { return allocated(size); }
void* operator new[](std::size_t size) { return allocated(size); }
void* operator new(std::size_t size, const std::nothrow_t&) noexcept { return allocatedOrNull(size); }
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept { return allocatedOrNull(size); }
void operator delete(void* memory) noexcept { std::free(memory); }
void operator delete[](void* memory) noexcept { std::free(memory); }
void operator delete(void* memory, std::size_t) noexcept { std::free(memory); }
void operator delete[](void* memory, std::size_t) noexcept { std::free(memory); }
void operator delete(void* memory, const std::nothrow_t&) noexcept { std::free(memory); }
void operator delete[](void* memory, const std::nothrow_t&) noexcept { std::free(memory); }

namespace tests {

void beginScarcity(std::size_t failingAllocation) {
  allocations = 0;
  failing = failingAllocation;
  isCounting = true;
}

std::size_t endScarcity() {
  isCounting = false;
  return allocations;
}

}  // namespace tests
