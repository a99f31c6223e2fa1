#include "commandline/text.h"

#include <utf8proc.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <numeric>
#include <ranges>
#include <span>
#include <utility>

namespace commandline {
namespace {

using Code = utf8proc_int32_t;

constexpr Code kEmojiSelector = 0xFE0F;
constexpr std::size_t kEmojiColumns = 2;
constexpr std::string_view kEllipsis = "…";

// What a reader sees as one character.
struct Cluster {
  std::string_view bytes;
  std::size_t columns;
};

// Adds up the columns of a cluster's characters. Pictures that are joined take the place of one.
class Measure {
 public:
  void add(Code code) {
    if (std::exchange(_isFirst, false)) {
      const auto kind = ::utf8proc_get_property(code)->boundclass;
      _isPicture = kind == UTF8PROC_BOUNDCLASS_EXTENDED_PICTOGRAPHIC || kind == UTF8PROC_BOUNDCLASS_REGIONAL_INDICATOR;
    }
    _isEmoji = _isEmoji || code == kEmojiSelector;
    _columns += static_cast<std::size_t>(std::max(::utf8proc_charwidth(code), 0));
  }
  [[nodiscard]] std::size_t columns() const {
    if (_isEmoji) return kEmojiColumns;
    return _isPicture ? std::min(_columns, kEmojiColumns) : _columns;
  }

 private:
  bool _isFirst = true;
  bool _isPicture = false;
  bool _isEmoji = false;
  std::size_t _columns = 0;
};

std::vector<Cluster> clustersOf(std::string_view text) {
  std::vector<Cluster> clusters;
  Measure measure;
  Code before = 0;
  std::int32_t state = 0;
  std::size_t begin = 0;
  std::size_t length = 0;
  for (std::size_t place = 0; place < text.size(); place += length) {
    Code code = 0;
    const std::string_view rest = text.substr(place);
    const auto taken = ::utf8proc_iterate(reinterpret_cast<const utf8proc_uint8_t*>(rest.data()),
                                          static_cast<utf8proc_ssize_t>(rest.size()), &code);
    length = taken > 0 ? static_cast<std::size_t>(taken) : 1;  // printable text has nothing else than characters
    if (place > 0 && ::utf8proc_grapheme_break_stateful(before, code, &state)) {
      clusters.push_back({text.substr(begin, place - begin), measure.columns()});
      begin = place;
      measure = {};
    }
    measure.add(code);
    before = code;
  }
  if (begin < text.size()) clusters.push_back({text.substr(begin), measure.columns()});
  return clusters;
}

// How many clusters from the front fit.
template <typename Clusters>
std::ptrdiff_t countOfFitting(const Clusters& clusters, std::size_t columns) {
  std::ptrdiff_t count = 0;
  for (const Cluster& each : clusters) {
    if (each.columns > columns) break;
    columns -= each.columns;
    ++count;
  }
  return count;
}

std::string joined(std::span<const Cluster> clusters) {
  std::string text;
  for (const Cluster& each : clusters) text += each.bytes;
  return text;
}

}  // namespace

std::string printableLines(std::string_view text) {
  std::string lines;
  while (!text.empty()) {
    const std::string_view line = text.substr(0, text.find('\n'));
    lines += printable(line);
    text.remove_prefix(line.size());
    if (text.empty()) break;
    lines += '\n';
    text.remove_prefix(1);
  }
  return lines;
}

std::size_t columnsOf(std::string_view text) {
  const auto clusters = clustersOf(text);
  return std::accumulate(clusters.begin(), clusters.end(), std::size_t{0},
                         [](std::size_t sum, const Cluster& each) { return sum + each.columns; });
}

std::string shortened(std::string_view text, std::size_t columns) {
  if (columnsOf(text) <= columns) return std::string{text};
  const auto clusters = clustersOf(text);
  const std::size_t kept = std::max<std::size_t>(columns, 1) - 1;  // but for the ellipsis
  const auto first = countOfFitting(clusters, (kept + 1) / 2);
  const std::string head = joined({clusters.begin(), clusters.begin() + first});
  const auto last = countOfFitting(clusters | std::views::reverse, kept - columnsOf(head));
  return head + std::string{kEllipsis} + joined({clusters.end() - last, clusters.end()});
}

std::vector<std::string> wrapped(std::string_view text, std::size_t columns) {
  std::vector<std::string> lines{""};
  while (!text.empty()) {
    const std::string word{text.substr(0, text.find(' '))};
    text.remove_prefix(std::min(text.size(), word.size() + 1));
    std::string& line = lines.back();
    if (line.empty()) {
      line = word;
    } else if (columnsOf(line) + 1 + columnsOf(word) <= columns) {
      line += " " + word;
    } else {
      lines.push_back(word);
    }
  }
  return lines;
}

}  // namespace commandline
