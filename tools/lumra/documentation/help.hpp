// What --help shows. SPDX-License-Identifier: MIT
#pragma once

#include <CLI/CLI.hpp>
#include <string>

namespace tool {

/// As wide as the terminal, at most 80 columns.
class help_formatter final : public CLI::FormatterBase {
 public:
  std::string make_help(const CLI::App *app, std::string name, CLI::AppFormatMode mode) const override;
};

}  // namespace tool
