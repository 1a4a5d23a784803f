// NamePattern: a name with wildcards and placeholders.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// The texts that the placeholders matched; nothing for a placeholder that is not in the pattern.
struct ChannelNames {
  std::optional<std::string> group;
  std::optional<std::string> subgroup;
  std::optional<std::string> name;
};

// * matches any text; the placeholders {group}, {subgroup} and {name} match any non-empty text. Each matches as little
// as possible. Matching is case-sensitive, and * and braces cannot be escaped.
//
// Thread: any; it is immutable.
class NamePattern {
 public:
  // Throws InputError if the text is not a pattern. what() is the end of a sentence: contains the unknown placeholder
  // "{nmae}"; ...
  static NamePattern parse(std::string_view text);

  // True if the pattern has no wildcards or placeholders.
  bool isLiteral() const { return wildcards_.empty(); }
  bool hasPlaceholder(std::string_view name) const;
  bool matches(std::string_view name) const { return match(name, nullptr); }
  // On success stores the texts that the placeholders matched in `names`, unless it is null.
  bool match(std::string_view name, ChannelNames* names) const;

 private:
  // A wildcard or placeholder, and the literal text after it.
  struct Wildcard {
    std::string placeholder;  // without braces; empty for *
    std::string after;
  };

  std::string beginning_;
  std::vector<Wildcard> wildcards_;
};

}  // namespace quazor
