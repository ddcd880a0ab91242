// SPDX-License-Identifier: MIT
#include "qsrfhs/math/mkl_section.hpp"

#include <condition_variable>
#include <mutex>

#include "platform/fork.hpp"
#include "platform/immortal.hpp"

namespace qsrfhs {
namespace {

constinit thread_local int depth = 0;

class gate {
 public:
  static gate &instance() noexcept {
    static platform::immortal<gate> only;
    return only.get();
  }

}  // namespace

void mkl_section::enter() noexcept {
  if (depth++ == 0) gate::instance().enter();
}

void mkl_section::leave() noexcept {
  if (--depth == 0) gate::instance().leave();
}

}  // namespace qsrfhs
