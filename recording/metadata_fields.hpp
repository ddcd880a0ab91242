// Typed access to SigMF metadata. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <utility>

#include "recording/failure.hpp"

namespace recording {

/// The fields of one JSON object, with the file's name for messages.
class fields {
 public:
  fields(const nlohmann::json &object, std::string where) : object_(object), where_(std::move(where)) {
    if (!object.is_object()) throw failure("{} is missing or not an object", where_);
  }

  [[nodiscard]] std::optional<std::string> text(const char *key) const {
    const nlohmann::json *value = find(key);
    if (value && !value->is_string()) throw failure("{}: {} must be a text", where_, key);
    return value ? std::optional(value->get<std::string>()) : std::nullopt;
  }
  [[nodiscard]] std::optional<double> number(const char *key) const {
    const nlohmann::json *value = find(key);
    if (value && !value->is_number()) throw failure("{}: {} must be a number", where_, key);
    return value ? std::optional(value->get<double>()) : std::nullopt;
  }
  /// Counts are limited so that sums and products of a few cannot overflow.
  [[nodiscard]] std::optional<std::uint64_t> count(const char *key) const {
    const nlohmann::json *value = find(key);
    if (!value) return std::nullopt;
    const std::uint64_t largest = std::uint64_t{1} << 52;
    if (!value->is_number_unsigned() || value->get<std::uint64_t>() > largest)
      throw failure("{}: {} must be a whole number from 0 to 2^52", where_, key);
    return value->get<std::uint64_t>();
  }
  /// A field that must be there.
  template <class Value>
  Value required(std::optional<Value> value, const char *key) const {
    if (!value) throw failure("{}: {} is missing", where_, key);
    return *std::move(value);
  }
  [[nodiscard]] bool is_true(const char *key) const {
    const nlohmann::json *value = find(key);
    return value && value->is_boolean() && value->get<bool>();
  }

 private:
  [[nodiscard]] const nlohmann::json *find(const char *key) const {
    const auto found = object_.find(key);
    return found == object_.end() || found->is_null() ? nullptr : &*found;
  }

  const nlohmann::json &object_;
  std::string where_;
};

}  // namespace recording
