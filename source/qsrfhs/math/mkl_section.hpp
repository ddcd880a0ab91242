// Where MKL takes locks of its own: making and freeing transforms, and what it does only once for the process or for a
// thread. No handler of a fork can free those in the child, so a fork waits until nobody is in such a section, and
// nobody enters one meanwhile. Computing takes no lock and is no section. SPDX-License-Identifier: MIT
#pragma once

namespace qsrfhs {

/// May be nested. No other lock of the library is taken inside.
class mkl_section {
 public:
  mkl_section() noexcept { enter(); }
  ~mkl_section() { leave(); }
  mkl_section(const mkl_section &) = delete;
  mkl_section &operator=(const mkl_section &) = delete;

  /// For a section that begins in one function and ends in another.
  static void enter() noexcept;
  static void leave() noexcept;
};

}  // namespace qsrfhs
