// SPDX-License-Identifier: MIT
#include "analysis/each_stretch.hpp"

#include "terminal/failure.hpp"
#include "terminal/progress.hpp"

namespace tool {

std::uint64_t each_stretch(const recording::source &source, const selection &chosen, std::size_t size,
                           const char *label, const std::function<void(const sample_block &)> &take,
                           const std::function<void(const sample_range &)> &end) {
  sample_blocks blocks(source, chosen, size);
  progress bar(label);
  sample_range now;
  std::uint64_t done = 0;
  while (const auto block = blocks.next()) {
    if (block->begins_stretch) {
      if (now.samples > 0) end(now);
      now = {block->first, 0};
    }
    take(*block);
    now.samples += block->count;
    done += block->count;
    bar.update(done, chosen.samples == recording::endless ? 0 : chosen.samples);
  }
  if (done == 0) throw failure("{}: holds no samples", source.data.string());
  end(now);
  return done;
}

}  // namespace tool
