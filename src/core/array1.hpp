#pragma once
// Numbering convention of the whole engine.
//
// Nodes, elements, faces, items, outputs and numbered sections count from 1,
// and the number 0 means "none" (a boundary face has element2 = 0). Every
// per-entity array is therefore an Array1: a std::vector with one spare slot
// in front, so that a[1] .. a[n] hold entities 1 .. n and a[0] is the slot of
// "none". Kernels may read a[0] (for example the element on the far side of a
// boundary face) and find a harmless value there; they never write it.
//
// Owned entities come first (1 .. n_owned), halo entities after them
// (n_owned+1 .. n); loops that write results run over owned entities.

#include <cstddef>
#include <vector>

namespace vhd {

template <class T>
class Array1 {
public:
  Array1() = default;
  explicit Array1(int n, const T& init = T()) : v_(static_cast<std::size_t>(n) + 1, init) {}

  // Sets the array to n entries (plus the spare slot), all equal to init.
  void assign(int n, const T& init = T()) { v_.assign(static_cast<std::size_t>(n) + 1, init); }
  // Number of entries (not counting the spare slot).
  int size() const { return v_.empty() ? 0 : static_cast<int>(v_.size()) - 1; }
  bool empty() const { return size() == 0; }
  void clear() { v_.clear(); v_.shrink_to_fit(); }

  T& operator[](int i) { return v_[static_cast<std::size_t>(i)]; }
  const T& operator[](int i) const { return v_[static_cast<std::size_t>(i)]; }

  // Pointer to the spare slot: p[i] is entry i.
  T* data() { return v_.data(); }
  const T* data() const { return v_.data(); }

  // Iteration over entries 1 .. n (the spare slot is skipped).
  T* begin() { return v_.empty() ? nullptr : v_.data() + 1; }
  T* end() { return v_.empty() ? nullptr : v_.data() + v_.size(); }
  const T* begin() const { return v_.empty() ? nullptr : v_.data() + 1; }
  const T* end() const { return v_.empty() ? nullptr : v_.data() + v_.size(); }

  std::vector<T>& raw() { return v_; }
  const std::vector<T>& raw() const { return v_; }

private:
  std::vector<T> v_;
};

}  // namespace vhd
