// Large arrays: allocation with transparent huge pages where the kernel offers them.
//
// On virtual machines a page fault on first touch is expensive, and the mesh and solver
// arrays are touched page by page: 1,000,000 elements fault some 100,000 small pages. Asking
// for huge pages (2 MiB) before the array is first written cuts the faults by a factor of 512.
// The advice is only a hint: where huge pages are off it changes nothing.
#pragma once

#include <cstddef>
#include <vector>

// Advises huge pages for the whole 2 MiB extents inside [data, data + bytes).
void AdviseHugePages(void* data, std::size_t bytes);

// Sizes `v` to `n` copies of `value`, with huge pages advised before the first touch when the
// array is large. Throws std::bad_alloc like std::vector.
template <typename T>
void AllocateArray(std::vector<T>& v, std::size_t n, const T& value = T{}) {
  constexpr std::size_t kLarge = std::size_t{4} << 20;
  if (n * sizeof(T) < kLarge) {
    v.assign(n, value);
    return;
  }
  std::vector<T>().swap(v);
  v.reserve(n);
  AdviseHugePages(v.data(), n * sizeof(T));
  v.assign(n, value);
}
