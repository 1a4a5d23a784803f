// OrderedMembers: an ordered set of items that may change while it is visited.
#pragma once

#include <algorithm>
#include <cstdint>
#include <memory>
#include <tuple>
#include <utility>
#include <vector>

namespace quazor {

// Contains each item once, ordered by rank and then by insertion.
//
// Thread: one at a time. A removed item is destroyed after the order has been restored, so its destructor may call all
// of these functions.
template <class Item>
class OrderedMembers {
 public:
  bool empty() const { return members_.empty(); }

  // Adds `item`, which must not be null. Does nothing if it is already present. `number` gives the order of insertion
  // and must increase with every call.
  void add(std::shared_ptr<Item> item, std::int64_t rank, std::uint64_t number) {
    if (find(item.get()) != members_.end()) return;
    const Place place{rank, number};
    members_.insert(firstBehind(place), Member{place, std::move(item)});
  }

  // Does nothing if the item is not present.
  void remove(const Item* item) {
    const auto found = find(item);
    if (found == members_.end()) return;
    const std::shared_ptr<Item> held = std::move(found->item);  // destroyed at the end of this call
    members_.erase(found);
  }

  // True if `condition` holds for one of the items. It must not add or remove.
  template <class Condition>
  bool anyOf(Condition condition) const {
    return std::any_of(members_.begin(), members_.end(),
                       [&condition](const Member& member) { return condition(*member.item); });
  }

  // Calls `act(item)`, in order, for each item that `wanted(item)` accepts at its turn. `act` may add and remove: skips
  // items that were removed before their turn and items added with a number above `newest`. An item lives until `act`
  // has returned. `wanted` must not add or remove.
  template <class Condition, class Action>
  void visit(std::uint64_t newest, Condition wanted, Action act) {
    auto next = members_.begin();
    while (next != members_.end()) {
      const Place place = next->place;
      if (place.number > newest || !wanted(*next->item)) {
        ++next;
        continue;
      }
      {
        const std::shared_ptr<Item> item = next->item;
        act(item);
      }
      // Must follow the release of the item, whose destructor may add or remove others.
      next = firstBehind(place);
    }
  }

 private:
  struct Place {
    std::int64_t rank;
    std::uint64_t number;

    bool operator<(const Place& other) const { return std::tie(rank, number) < std::tie(other.rank, other.number); }
  };
  struct Member {
    Place place;
    std::shared_ptr<Item> item;
  };

  auto find(const Item* item) {
    return std::find_if(members_.begin(), members_.end(),
                        [item](const Member& member) { return member.item.get() == item; });
  }
  auto firstBehind(const Place& place) {
    return std::upper_bound(members_.begin(), members_.end(), place,
                            [](const Place& wanted, const Member& member) { return wanted < member.place; });
  }

  std::vector<Member> members_;  // sorted by place
};

}  // namespace quazor
