// NamePattern: a name with parts that stand for any text.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// What the placeholders of patterns stood for; nothing where there was no such placeholder.
struct ChannelNames {
  std::optional<std::string> group;
  std::optional<std::string> subgroup;
  std::optional<std::string> name;
};

// * stands for any text; the placeholders {group}, {subgroup} and {name} for any text that is not empty. Each stands
// for as little as lets the whole name match. Case counts, and there is no way to write a * or a brace itself.
//
// Thread: any; it is immutable.
class NamePattern {
 public:
  // Throws InputError when the text is not a pattern; what() is the end of a sentence: "holds the unknown placeholder
  // \"{nmae}\"; ...".
  static NamePattern parse(std::string_view text);

  // Nothing of it stands for any text.
  bool isLiteral() const { return wildcards_.empty(); }
  bool hasPlaceholder(std::string_view name) const;
  bool matches(std::string_view name) const { return match(name, nullptr); }
  // On success `names`, where given, gets what the placeholders stood for.
  bool match(std::string_view name, ChannelNames* names) const;

 private:
  // What stands for any text, and the text that follows it.
  struct Wildcard {
    std::string placeholder;  // without its braces; empty for a *
    std::string after;
  };

  std::string beginning_;
  std::vector<Wildcard> wildcards_;
};

}  // namespace quazor
