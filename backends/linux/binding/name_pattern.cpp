#include "backends/linux/binding/name_pattern.h"

#include "base/text/input_error.h"

#include <algorithm>
#include <array>
#include <utility>

namespace quazor {
namespace {

struct Placeholder {
  std::string_view name;
  std::optional<std::string> ChannelNames::*member;
};

constexpr std::array<Placeholder, 3> kPlaceholders{
    {{"group", &ChannelNames::group}, {"subgroup", &ChannelNames::subgroup}, {"name", &ChannelNames::name}}};

const Placeholder* placeholderNamed(std::string_view name) {
  const auto found = std::ranges::find(kPlaceholders, name, &Placeholder::name);
  return found == kPlaceholders.end() ? nullptr : &*found;
}

}  // namespace

NamePattern NamePattern::parse(std::string_view text) {
  NamePattern pattern;
  for (std::size_t at = 0; at < text.size();) {
    std::string& literal = pattern.wildcards_.empty() ? pattern.beginning_ : pattern.wildcards_.back().after;
    const char character = text[at];
    if (character != '*' && character != '{' && character != '}') {
      literal += character;
      ++at;
      continue;
    }
    std::size_t length = 1;
    std::string placeholder;
    if (character != '*') {
      const std::size_t end = character == '{' ? text.find('}', at) : std::string_view::npos;
      if (end == std::string_view::npos) throw InputError("contains an unmatched brace.");
      placeholder = text.substr(at + 1, end - at - 1);
      length = placeholder.size() + 2;
      if (placeholderNamed(placeholder) == nullptr) {
        throw InputError("contains the unknown placeholder \"{" + placeholder +
                         "}\"; expected one of \"{group}\", \"{subgroup}\" and \"{name}\".");
      }
      if (pattern.hasPlaceholder(placeholder)) {
        throw InputError("contains the placeholder \"{" + placeholder + "}\" twice; remove one.");
      }
    }
    if (!pattern.wildcards_.empty() && literal.empty()) {
      throw InputError("needs text between two placeholders or *, so that they can be told apart.");
    }
    pattern.wildcards_.push_back({std::move(placeholder), {}});
    at += length;
  }
  return pattern;
}

bool NamePattern::hasPlaceholder(std::string_view name) const {
  return std::ranges::find(wildcards_, name, &Wildcard::placeholder) != wildcards_.end();
}

bool NamePattern::match(std::string_view name, ChannelNames* names) const {
  if (isLiteral()) return name == beginning_;
  if (!name.starts_with(beginning_)) return false;
  std::size_t at = beginning_.size();
  ChannelNames found;
  for (std::size_t i = 0; i < wildcards_.size(); ++i) {
    const Wildcard& wildcard = wildcards_[i];
    const std::size_t least = at + (wildcard.placeholder.empty() ? 0 : 1);
    const bool isLast = i + 1 == wildcards_.size();
    std::size_t end = isLast ? name.size() - std::min(name.size(), wildcard.after.size())
                             : name.find(wildcard.after, std::min(least, name.size()));
    // The first match is never worse than a later one, because it leaves more text for the rest.
    if (end == std::string_view::npos || end < least || (isLast && !name.ends_with(wildcard.after))) return false;
    if (const Placeholder* const placeholder = placeholderNamed(wildcard.placeholder)) {
      found.*(placeholder->member) = std::string(name.substr(at, end - at));
    }
    at = end + wildcard.after.size();
  }
  if (names != nullptr) *names = std::move(found);
  return true;
}

}  // namespace quazor
