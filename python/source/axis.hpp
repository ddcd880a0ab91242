// Arrays of several dimensions as rows along one of them. SPDX-License-Identifier: MIT
#pragma once

#include <vector>

#include "arrays.hpp"

namespace binding {

/// The axis, from 0 on. Throws TypeError and ValueError, also for arrays without dimensions.
std::size_t axis_of(const numbers &x, py::handle axis);

/// Whether elements lie whole elements apart.
bool has_whole_strides(const py::array &array);

py::tuple shape_tuple(const std::vector<py::ssize_t> &shape);

/// Two arrays that differ in the length of one axis alone. Distances are in elements of each.
class axis_rows {
 public:
  /// Sets of as many rows as can be, in any order, or else of single rows in the order of their indices.
  axis_rows(const py::array &in, const py::array &out, std::size_t axis, bool single = false);

  std::ptrdiff_t in_step, out_step;                  // from an element of a row to the next
  std::uint64_t rows = 1;                            // of a set
  std::ptrdiff_t in_distance = 0, out_distance = 0;  // from a row of a set to the next

  /// Calls work(in, out) with where each set of rows begins.
  template <class Work>
  void each(Work work) const {
    if (empty_) return;
    std::vector<py::ssize_t> at(outer_.size());
    std::ptrdiff_t in = 0, out = 0;
    for (;;) {
      work(in, out);
      std::size_t k = outer_.size();
      for (; k-- > 0;) {
        in += outer_[k].in, out += outer_[k].out;
        if (++at[k] < outer_[k].length) break;
        in -= at[k] * outer_[k].in, out -= at[k] * outer_[k].out;
        at[k] = 0;
      }
      if (k == static_cast<std::size_t>(-1)) return;
    }
  }

 private:
  struct dimension {
    py::ssize_t length;
    std::ptrdiff_t in, out;
  };
  std::vector<dimension> outer_;
  bool empty_;
};

}  // namespace binding
