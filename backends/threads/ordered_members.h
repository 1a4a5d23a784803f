// OrderedMembers: what was added to something, in order, visited while visitors add and remove.
#pragma once

#include <algorithm>
#include <cstdint>
#include <memory>
#include <tuple>
#include <utility>
#include <vector>

namespace quazor {

// Holds each item once. Items of a lower rank stand first, equal ones as they were added.
//
// Thread: one at a time. An item that is let go is destroyed when the members are in order again, so its destructor may
// call everything here.
template <class Item>
class OrderedMembers {
 public:
  bool empty() const { return members_.empty(); }

  // Adds `item`, which must not be null. Without effect when it is there. `number` says when it was added: it is higher
  // at every call.
  void add(std::shared_ptr<Item> item, std::int64_t rank, std::uint64_t number) {
    if (find(item.get()) != members_.end()) return;
    const Place place{rank, number};
    members_.insert(firstBehind(place), Member{place, std::move(item)});
  }

  // Without effect when it is not there.
  void remove(const Item* item) {
    const auto found = find(item);
    if (found == members_.end()) return;
    const std::shared_ptr<Item> held = std::move(found->item);  // until the end of this call
    members_.erase(found);
  }

  // True when `condition` holds for one of them. It must not add or remove.
  template <class Condition>
  bool anyOf(Condition condition) const {
    return std::any_of(members_.begin(), members_.end(),
                       [&condition](const Member& member) { return condition(*member.item); });
  }

  // Calls `act(item)`, in order, for each that `wanted(item)` accepts when its turn comes. `act` may add and remove:
  // what is removed before its turn is passed over, and so is what was added with a higher number than `newest`. The
  // item lives until `act` has returned. `wanted` must not add or remove.
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
      // Only now that the item may have gone too: its destructor may have added or removed others.
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

  std::vector<Member> members_;  // sorted by their places
};

}  // namespace quazor
