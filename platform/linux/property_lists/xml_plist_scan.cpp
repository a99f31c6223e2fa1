#include "platform/linux/property_lists/xml_plist_scan.h"

#include <algorithm>
#include <cstdint>
#include <set>
#include <string_view>
#include <vector>

#include "platform/linux/property_lists/xml_text_repair.h"
#include "platform/property_list_store.h"

namespace platform {
namespace {

constexpr std::string_view kBlanks = " \t\r\n";
constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";
constexpr char kNoUtf8 = '\xFF';

// libplist moves the rest of a text for each entity in it.
constexpr std::uint64_t kMaxMovedBytes = std::uint64_t{1} << 33U;
constexpr std::uint64_t kMaxKeySteps = std::uint64_t{1} << 24U;

constexpr std::size_t kTableFrom = 250;  // libplist counts keys and values
constexpr std::size_t kTableSize = 4096;

std::uint32_t tableHash(std::string_view key) {
  std::uint32_t hash = 5381;
  for (const char character : key) hash = hash * 33 + static_cast<std::uint32_t>(character);
  return hash;
}

// What libplist spends on the keys of one XML dictionary: it searches all entries for each new key, from some 500 on
// through a table of fixed size, and walks to the place of a key that comes again. Keys can be made to fall into one
// place of that table, or to come again and again.
class XmlKeyCost {
 public:
  // The steps that this key takes, given those before it. A key with entities or sections in it counts as the dearest,
  // since its characters are not known here.
  std::uint64_t add(std::string_view key, bool isPlain);

 private:
  bool record(std::uint32_t hash);

  std::vector<std::uint32_t> _hashes;
  std::set<std::uint32_t> _known;      // the same, from where the library has its table on
  std::vector<std::uint32_t> _chains;  // how many keys share a place of the table
};

std::uint64_t XmlKeyCost::add(std::string_view key, bool isPlain) {
  const std::uint32_t hash = tableHash(key);
  _hashes.push_back(hash);
  if (_hashes.size() <= kTableFrom) return _hashes.size();
  if (_chains.empty()) {
    _chains.resize(kTableSize);
    for (const std::uint32_t earlier : _hashes) record(earlier);
    return _hashes.size();
  }
  const bool isNew = record(hash);
  return isNew && isPlain ? _chains[hash % kTableSize] : _hashes.size();
}

bool XmlKeyCost::record(std::uint32_t hash) {
  ++_chains[hash % kTableSize];
  return _known.insert(hash).second;
}

class Scan {
 public:
  explicit Scan(std::span<char> file) : _file{file}, _text{file.data(), file.size()} {}

  // Why it ended where it failed.
  [[nodiscard]] Cause refusal() const { return _refusal; }

  [[nodiscard]] bool run() {
    while (!_isDone) {
      skipBlanks();
      if (!startsWith("<")) return false;
      ++_position;
      if (!markup()) return false;
    }
    return true;
  }

 private:
  enum class Open : std::uint8_t { plist, dictionary, array };
  struct Container {
    bool isDictionary;
    XmlKeyCost keys = {};
  };
  struct Tag {
    std::string_view name;
    std::size_t length;  // of the name as it stands in the file
    bool isEmpty;
  };
  struct Part {
    std::size_t begin;
    std::size_t end;
    bool isVerbatim;
  };

  [[nodiscard]] bool startsWith(std::string_view text) const { return _text.substr(_position).starts_with(text); }
  [[nodiscard]] bool isAtEnd() const { return _position >= _text.size(); }
  void skipBlanks() { _position = std::min(_text.find_first_not_of(kBlanks, _position), _text.size()); }

  // Moves to the first of these characters, and answers whether there is one. Where it says so, what stands between
  // double quotes is skipped.
  bool moveTo(std::string_view characters) {
    _position = std::min(_text.find_first_of(characters, _position), _text.size());
    return !isAtEnd();
  }
  bool moveToOutsideQuotes(std::string_view characters) {
    while (!isAtEnd() && characters.find(_text[_position]) == std::string_view::npos) {
      if (!skipQuoted()) return false;
      ++_position;
    }
    return !isAtEnd();
  }
  bool movePast(std::string_view end) {
    const std::size_t found = _text.find(end, _position);
    if (found == std::string_view::npos) return false;
    _position = found + end.size();
    return true;
  }
  bool movePastOutsideQuotes(std::string_view end) {
    while (!isAtEnd() && !startsWith(end)) {
      if (!skipQuoted()) return false;
      ++_position;
    }
    _position += end.size();
    return _position <= _text.size();
  }
  bool skipQuoted() {
    if (_text[_position] != '"') return true;
    ++_position;
    return moveTo("\"");
  }

  [[nodiscard]] bool markup() {
    if (startsWith("?")) return movePastOutsideQuotes("?>");
    if (startsWith("!--")) {
      _position += 3;
      return movePast("-->");
    }
    if (startsWith("!DOCTYPE")) return documentType();
    if (startsWith("!")) return false;
    return element();
  }

  [[nodiscard]] bool documentType() {
    _position += std::string_view{"!DOCTYPE"}.size();
    if (!moveToOutsideQuotes("[>")) return false;
    if (startsWith("[")) return movePastOutsideQuotes("]>");
    ++_position;
    return true;
  }

  [[nodiscard]] bool element() {
    Tag tag{};
    if (!readTag(tag)) return false;
    if (tag.name == "plist") return !tag.isEmpty && push(Open::plist);
    if (tag.name == "/plist") return pop(Open::plist);
    if (tag.name == "/dict") return pop(Open::dictionary);
    if (tag.name == "/array") return pop(Open::array);
    return value(tag);
  }

  bool readTag(Tag& tag) {
    const std::size_t begin = _position;
    if (!moveTo(" \r\n\t<>")) return false;
    tag.length = _position - begin;
    tag.name = _text.substr(begin, tag.length);
    if (!startsWith(">") && !moveToOutsideQuotes("<>")) return false;
    if (!startsWith(">")) return false;
    tag.isEmpty = _text[_position - 1] == '/';
    if (tag.isEmpty) tag.name = tag.name.substr(0, _position - begin - 1);
    ++_position;
    return true;
  }

  [[nodiscard]] bool push(Open kind) {
    _open.push_back(kind);
    if (kind != Open::plist) _containers.push_back({kind == Open::dictionary});
    return _containers.size() <= kMaxNesting || giveUp(Cause::excessive);
  }

  [[nodiscard]] bool pop(Open kind) {
    if (_open.empty() || _open.back() != kind) return false;
    _open.pop_back();
    if (kind == Open::plist) return true;
    _containers.pop_back();
    _isDone = _containers.empty();
    return true;
  }

  [[nodiscard]] bool value(const Tag& tag) {
    const bool isContainer = tag.name == "dict" || tag.name == "array";
    const bool isRoot = _containers.empty();
    if (isRoot && tag.name != "dict")
      return giveUp(isContainer || isScalar(tag.name) ? Cause::unsuitable : Cause::malformed);
    if (isRoot && tag.isEmpty) return keepEmptyRoot();
    if (tag.isEmpty) return isContainer || isScalar(tag.name);
    if (isContainer) return push(tag.name == "dict" ? Open::dictionary : Open::array);
    return isScalar(tag.name) && content(tag);
  }

  // Past an empty root libplist goes on reading what belongs to nothing, so all else is blanked.
  [[nodiscard]] bool keepEmptyRoot() {
    constexpr std::string_view kRoot = "<dict/>";
    std::ranges::fill(_file, ' ');
    std::ranges::copy(kRoot, _file.begin());
    return _isDone = true;
  }

  static bool isScalar(std::string_view name) {
    return name == "key" || name == "string" || name == "integer" || name == "real" || name == "true" ||
           name == "false" || name == "data" || name == "date";
  }

  [[nodiscard]] bool content(const Tag& tag) {
    const bool isText = tag.name == "key" || tag.name == "string";
    if (!isText) skipBlanks();
    const std::size_t begin = _position;
    _parts.clear();
    if (!readParts()) return false;
    const std::size_t end = _parts.back().end;
    if (_text.substr(_position, tag.length) != tag.name) return false;
    _position += tag.length;
    skipBlanks();
    if (!startsWith(">")) return false;
    ++_position;
    if (isText) return repairText() && countKey(tag);
    blankComments();
    const bool isPlain = std::ranges::none_of(_parts, &Part::isVerbatim);
    if (isPlain && tag.name == "integer") repairXmlInteger(_file.subspan(begin, end - begin));
    return true;
  }

  // Text, comments and verbatim sections up to the closing tag's name.
  [[nodiscard]] bool readParts() {
    while (true) {
      const std::size_t begin = _position;
      if (!moveTo("<")) return false;
      _parts.push_back({begin, _position, false});
      ++_position;
      if (startsWith("/")) {
        ++_position;
        return true;
      }
      if (startsWith("!--")) {
        _position += 3;
        if (!movePast("-->")) return false;
      } else if (startsWith("![CDATA[")) {
        _position += std::string_view{"![CDATA["}.size();
        const std::size_t section = _position;
        if (!movePast("]]>")) return false;
        _parts.push_back({section, _position - 3, true});
      } else {
        return false;
      }
    }
  }

  [[nodiscard]] bool repairText() {
    for (const Part& part : _parts) {
      const std::span<char> text = _file.subspan(part.begin, part.end - part.begin);
      if (!part.isVerbatim) _movedBytes += repairXmlText(text) * text.size();
    }
    return _movedBytes <= kMaxMovedBytes || giveUp(Cause::excessive);
  }

  [[nodiscard]] bool countKey(const Tag& tag) {
    if (tag.name != "key" || _containers.empty() || !_containers.back().isDictionary) return true;
    const std::string_view key = _text.substr(_parts.front().begin, _parts.front().end - _parts.front().begin);
    const bool isPlain = _parts.size() == 1 && key.find('&') == std::string_view::npos;
    _keySteps += _containers.back().keys.add(key, isPlain);
    return _keySteps <= kMaxKeySteps || giveUp(Cause::excessive);
  }

  // libplist takes of data no more than stands before the first comment.
  void blankComments() {
    for (std::size_t next = 1; next < _parts.size(); ++next) {
      const std::span<char> between = _file.subspan(_parts[next - 1].end, _parts[next].begin - _parts[next - 1].end);
      if (std::string_view{between.data(), between.size()}.starts_with("<!--")) std::ranges::fill(between, ' ');
    }
  }

  [[nodiscard]] bool giveUp(Cause cause) {
    _refusal = cause;
    return false;
  }

  std::span<char> _file;
  std::string_view _text;  // the same characters
  std::size_t _position = 0;
  std::vector<Open> _open;             // the tags from the root to here
  std::vector<Container> _containers;  // the dictionaries and arrays among them
  std::vector<Part> _parts;            // of the element that is being read
  std::uint64_t _keySteps = 0;
  std::uint64_t _movedBytes = 0;
  bool _isDone = false;
  Cause _refusal = Cause::malformed;
};

}  // namespace

Cause repairXmlPlist(Bytes& file) {
  const std::span<char> characters{reinterpret_cast<char*>(file.data()), file.size()};
  std::ranges::replace(characters, '\0', kNoUtf8);
  if (std::string_view{characters.data(), characters.size()}.starts_with(kByteOrderMark)) {
    std::ranges::fill(characters.first(kByteOrderMark.size()), ' ');
  }
  Scan scan{characters};
  return scan.run() ? Cause::none : scan.refusal();
}

}  // namespace platform
