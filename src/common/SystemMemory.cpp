#include "common/SystemMemory.h"

#include <sys/mman.h>

#include <new>

namespace SystemMemory {

uint8_t* Map(size_t size_I, size_t alignment_I) {
  const size_t mapped = size_I + alignment_I;
  void* base = mmap(nullptr, mapped, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  if (base == MAP_FAILED) throw std::bad_alloc();
  if (alignment_I == 0) return static_cast<uint8_t*>(base);
  // The slack before and after the aligned range goes back at once.
  const auto address = reinterpret_cast<uintptr_t>(base);
  const uintptr_t aligned = (address + alignment_I - 1) & ~(uintptr_t{alignment_I} - 1);
  if (aligned > address) munmap(base, aligned - address);
  if (aligned + size_I < address + mapped) {
    munmap(reinterpret_cast<void*>(aligned + size_I), address + mapped - aligned - size_I);
  }
  return reinterpret_cast<uint8_t*>(aligned);
}

void Unmap(uint8_t* base_I, size_t size_I) {
  if (base_I != nullptr) munmap(base_I, size_I);
}

void PreferHugePages(uint8_t* base_I, size_t size_I) { madvise(base_I, size_I, MADV_HUGEPAGE); }

}  // namespace SystemMemory
