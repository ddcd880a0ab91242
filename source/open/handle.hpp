// Handles of the open interface's objects. A handle is never unmapped, only used again, so that one that was freed is
// told from a live one instead of being followed into freed memory. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <string_view>

#include "open/door.hpp"

namespace doors {

/// What a handle of any kind points to.
struct cell {
  const void *kind;  // which class the object is of; null while the cell is free
  void *object;      // the next free cell while the cell is free
};

/// A cell for an object; throws std::bad_alloc.
cell *take_cell(const void *kind, void *object);
/// The object of a live cell of that kind, and the cell is free; null for any other address.
void *release_cell(const void *address, const void *kind) noexcept;
/// The object of a live cell of that kind; null for any other address.
void *find_object(const void *address, const void *kind) noexcept;

/// The public, incomplete type `Handle` of objects of class `Object`.
template <class Handle, class Object>
class handles {
 public:
  static void give(Handle **out, std::unique_ptr<Object> object) {
    *out = reinterpret_cast<Handle *>(take_cell(&kind_, object.get()));
    (void)object.release();
  }
  /// Null where there is no such object.
  static Object *find(const Handle *handle) noexcept { return static_cast<Object *>(find_object(handle, &kind_)); }
  static Object &get(const Handle *handle, std::string_view name) {
    require_present(handle, name);
    Object *const object = find(handle);
    require(object != nullptr, LUMRA_WRONG_OBJECT, name, " was freed, or is another kind of object; make one first");
    return *object;
  }
  static void free(Handle *handle) noexcept { delete static_cast<Object *>(release_cell(handle, &kind_)); }

 private:
  static constexpr char kind_ = 0;
};

}  // namespace doors
