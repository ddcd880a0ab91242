// gnuplot reads the script from one file and writes the picture to another that is open already, so it never sees a
// name and can leave nothing behind. SPDX-License-Identifier: MIT
#include "pictures/gnuplot.hpp"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cctype>
#include <cerrno>
#include <cmath>
#include <cstdlib>
#include <iterator>

#include "recording/file.hpp"
#include "terminal/console.hpp"
#include "terminal/failure.hpp"

namespace tool {
namespace {

recording::stream make_scratch() {
  recording::stream file(std::tmpfile());
  if (!file) throw failure("no temporary file for gnuplot: {}", system_reason(errno));
  return file;
}

bool is_installed() {
  const char *path = std::getenv("PATH");
  std::string_view rest = path ? path : "/usr/bin:/bin";
  for (;;) {
    const std::size_t end = rest.find(':');
    const std::string candidate = std::string(rest.substr(0, end)) + "/gnuplot";
    if (::access(candidate.c_str(), X_OK) == 0) return true;
    if (end == std::string_view::npos) return false;
    rest.remove_prefix(end + 1);
  }
}

/// Length of the UTF-8 sequence at the front; 0 when there is none that can be shown.
std::size_t sequence_length(std::string_view text) {
  const auto byte = [&](std::size_t i) { return i < text.size() ? static_cast<unsigned char>(text[i]) : 0U; };
  const unsigned first = byte(0);
  if (first < 0x80) return first >= 0x20 && first != 0x7F ? 1 : 0;
  const std::size_t length = first >= 0xF0 ? 4 : first >= 0xE0 ? 3 : 2;
  if (first < 0xC2 || first > 0xF4) return 0;
  for (std::size_t i = 1; i < length; ++i)
    if ((byte(i) & 0xC0) != 0x80) return 0;
  // Overlong forms, surrogates and values beyond Unicode.
  const unsigned second = byte(1);
  const bool bad = (first == 0xE0 && second < 0xA0) || (first == 0xED && second > 0x9F) ||
                   (first == 0xF0 && second < 0x90) || (first == 0xF4 && second > 0x8F);
  return bad ? 0 : length;
}

/// What gnuplot says last; the lines before it repeat the command.
std::string complaint(std::FILE *errors) {
  std::rewind(errors);
  std::string last = "no reason given";
  std::array<char, 512> line{};
  while (std::fgets(line.data(), line.size(), errors)) {
    std::string text(line.data());
    text.erase(text.find_last_not_of(" \n\r\t") + 1);
    if (!text.empty()) last = text;
  }
  return last;
}

/// A full disk does not fail gnuplot: the picture's last bytes tell.
bool is_complete(int picture, picture_type type) {
  constexpr std::string_view png_end("IEND\xAE\x42\x60\x82", 8);
  constexpr std::string_view svg_end("</svg>");
  std::array<char, 32> tail{};
  const off_t size = ::lseek(picture, 0, SEEK_END);
  if (size < static_cast<off_t>(tail.size())) return size == -1;  // not seekable: a pipe or a terminal
  // The descriptor is write-only; its file is opened anew to be read.
  const recording::descriptor reader(::open(fmt::format("/proc/self/fd/{}", picture).c_str(), O_RDONLY | O_CLOEXEC));
  const ssize_t got = ::pread(reader.get(), tail.data(), tail.size(), size - static_cast<off_t>(tail.size()));
  if (got < static_cast<ssize_t>(tail.size())) return false;
  const std::string_view text(tail.data(), tail.size());
  switch (type) {
    case picture_type::png:
      return text.ends_with(png_end);
    case picture_type::svg:
      return text.find(svg_end) != std::string_view::npos;
    case picture_type::pdf:
      return text.find("%%EOF") != std::string_view::npos;
  }
  return false;
}

}  // namespace

picture_type picture_type_of(const std::filesystem::path &file) {
  const std::filesystem::path suffix = file.extension();
  const picture_type *found = nullptr;
  static constexpr std::pair<const char *, picture_type> types[] = {
      {".png", picture_type::png}, {".svg", picture_type::svg}, {".pdf", picture_type::pdf}};
  for (const auto &[name, type] : types)
    if (suffix == name) found = &type;
  if (!found)
    throw failure("{}: pictures are written as .png, .svg or .pdf; choose one of these endings", file.string());
  if (!is_installed()) throw failure("gnuplot was not found; install it (package gnuplot-nox), or leave out --plot");
  return *found;
}

std::string frame_script(const picture_frame &frame, picture_type type) {
  // Long lines become smaller: a character is so many pixels wide, roughly.
  const auto shrink = [&](const std::string &line, double pixels) {
    const auto characters = static_cast<double>(std::max<std::size_t>(width_of(line), 1));
    return std::min(1.0, frame.size.width / pixels / characters);
  };
  const bool svg = type == picture_type::svg;
  const std::string terminal =
      svg ? fmt::format("svg dynamic size {},{} font 'sans-serif,16'", frame.size.width, frame.size.height)
      : type == picture_type::png
          ? fmt::format("pngcairo size {},{} font 'DejaVu Sans,12'", frame.size.width, frame.size.height)
          : fmt::format("pdfcairo size {},{} font 'DejaVu Sans,12'", frame.size.width / 100.0,
                        frame.size.height / 100.0);
  return fmt::format(
      "set encoding utf8\n"
      "set terminal {} background rgb 'white'\n"
      "set title {} noenhanced offset 0,1.6 font '{},{:.1f}'\n"
      "set label 1 {} at graph 0.5,screen 1 center offset 0,-3.1 noenhanced tc rgb '#505050' font ',{:.1f}'\n"
      "set tmargin 5\nset rmargin 4\nset lmargin 10\nset bmargin 4.2\n"
      "set border lw 1 lc rgb '#404040'\n"
      "set xlabel {} noenhanced offset 0,-0.3\nset ylabel {} noenhanced offset -0.5,0\n"
      "set xrange [{:.15g}:{:.15g}]\nset yrange [{:.15g}:{:.15g}]\n"
      "set xtics {:.15g}\nset ytics {:.15g}\nset mytics 2\nset tics scale 0.8,0.4\n"
      "set minussign\nset format x '%.10h'\nset format y '%.10h'\n"
      "set grid xtics ytics mytics lt 1 lw 0.8 lc rgb '#d4d4d4', lt 1 lw 0.6 lc rgb '#eeeeee'\n"
      "unset key\n",
      terminal, gnuplot_text(frame.title), svg ? "sans-serif:Bold" : "DejaVu Sans:Bold",
      (svg ? 20 : 14) * shrink(frame.title, 10.5), gnuplot_text(frame.settings),
      (svg ? 16 : 12) * shrink(frame.settings, 8.4), gnuplot_text(frame.x.title), gnuplot_text(frame.y.title),
      frame.x.low, frame.x.high, frame.y.low, frame.y.high, frame.x.division, frame.y.division);
}

std::string empty_script(const picture_frame &frame, const std::string &reason, picture_type type) {
  return frame_script(frame, type) +
         fmt::format("set label 2 {} at graph 0.5,0.5 center noenhanced front tc rgb '#b02020'\nplot NaN notitle\n",
                     gnuplot_text(reason));
}

double mark_distance(double length, int marks) {
  const double decade = std::pow(10, std::floor(std::log10(length / marks)));
  for (const double step : {5.0, 2.0})
    if (length / marks >= step * decade) return step * decade;
  return decade;
}

const char *curve_colour(std::size_t curve) {
  constexpr const char *colours[] = {"#1f4e8c", "#c0501a", "#2a7f3f", "#7a3fa0", "#9a7d00", "#00818f"};
  return colours[curve % std::size(colours)];
}

std::string gnuplot_text(std::string_view text) {
  std::string result = "\"";
  while (!text.empty()) {
    const std::size_t length = sequence_length(text);
    const char first = text.front();
    if (length == 0)
      result += '?';
    else if (first == '"' || first == '\\')
      result += std::string("\\") + first;
    else if (first == '`')  // would run a command; by its number it is a character, which ends where the string does
      result += "\\140\" . \"";
    else
      result += text.substr(0, length);
    text.remove_prefix(std::max<std::size_t>(length, 1));
  }
  return result + '"';
}

std::string with_minus_signs(std::string text) {
  for (std::size_t at = 0; (at = text.find('-', at)) != std::string::npos;) text.replace(at, 1, "−");
  return text;
}

void draw(const std::string &script, picture_type type, output_file &out) {
  const recording::stream input = make_scratch();
  const recording::stream errors = make_scratch();
  if (std::fwrite(script.data(), 1, script.size(), input.get()) != script.size() || std::fflush(input.get()) != 0)
    throw failure("cannot write the plot's temporary file: {}", system_reason(errno));
  (void)::lseek(::fileno(input.get()), 0, SEEK_SET);

  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  int refused = 0;
  for (const auto &[file, stream] : {std::pair{::fileno(input.get()), STDIN_FILENO},
                                     {out.descriptor(), STDOUT_FILENO},
                                     {::fileno(errors.get()), STDERR_FILENO}})
    if (refused == 0) refused = posix_spawn_file_actions_adddup2(&actions, file, stream);
  char name[] = "gnuplot";
  char no_start_files[] = "-d";
  char *arguments[] = {name, no_start_files, nullptr};
  pid_t child = 0;
  if (refused == 0) refused = ::posix_spawnp(&child, name, &actions, nullptr, arguments, environ);
  posix_spawn_file_actions_destroy(&actions);
  if (refused != 0) throw failure("gnuplot does not start: {}", system_reason(refused));
  int status = 0;
  while (::waitpid(child, &status, 0) < 0 && errno == EINTR) {
  }
  if (status != 0) throw failure("gnuplot failed: {}", complaint(errors.get()));
  if (!is_complete(out.descriptor(), type))
    throw failure("gnuplot drew no complete picture ({}); is the disk full?", complaint(errors.get()));
}

}  // namespace tool
