// OrderedMap: a map from strings to values that keeps insertion order.
#pragma once

#include "contract/contract.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <initializer_list>
#include <iterator>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace QUAZOR_CONTRACT {

// A dictionary that iterates in insertion order and finds a key in constant time on average.
//
// Setting an existing key replaces its value and keeps its position. A pointer returned by a lookup is valid until the
// next set() or erase(). Looking a key up never inserts it. Copies are independent.
// Thread: one at a time; any number may read while none writes.
template <class T>
class OrderedMap {
 public:
  using Entry = std::pair<std::string, T>;
  using const_iterator = typename std::vector<Entry>::const_iterator;

  OrderedMap() = default;
  OrderedMap(std::initializer_list<Entry> entries) {
    for (const Entry& entry : entries) set(entry.first, entry.second);
  }

  void set(std::string_view key, T value) { setHashed(key, slots_.empty() ? 0 : hashOf(key), std::move(value)); }

  // Sets each element's value under its key, in the order of `elements`, which is indexed from 0. The keys, views or
  // references, must outlive the call. Faster than repeated set() for very many elements, because it prefetches the
  // slots of an index that exceeds the processor's caches.
  template <class Elements, class KeyOf, class ValueOf>
  void setAll(const Elements& elements, KeyOf keyOf, ValueOf valueOf) {
    constexpr std::size_t kAhead = 16;
    std::array<std::uint32_t, kAhead> hashes{};
    const std::size_t count = std::size(elements);
    reserve(size() + count);
    const auto fetch = [&](std::size_t i) {
      if (i >= count || slots_.empty()) return;
      hashes[i % kAhead] = hashOf(keyOf(elements[i]));
      __builtin_prefetch(&slots_[hashes[i % kAhead] & (slots_.size() - 1)]);
    };
    for (std::size_t i = 0; i < kAhead; ++i) fetch(i);
    for (std::size_t i = 0; i < count; ++i) {
      setHashed(keyOf(elements[i]), hashes[i % kAhead], valueOf(elements[i]));
      fetch(i + kAhead);
    }
  }

  // Returns the value of `key`, or null.
  const T* find(std::string_view key) const { return valueOf(const_cast<OrderedMap*>(this)->findEntry(key)); }
  T* find(std::string_view key) { return valueOf(findEntry(key)); }
  bool contains(std::string_view key) const { return find(key) != nullptr; }

  // Removes `key` and returns whether it existed. Linear in the number of entries.
  bool erase(std::string_view key) {
    Entry* entry = findEntry(key);
    if (entry == nullptr) return false;
    entries_.erase(entries_.begin() + (entry - entries_.data()));
    slots_.clear();
    if (entries_.size() > kScanLimit) rebuildIndex(entries_.size());
    return true;
  }

  // Reserves space for a total of `count` entries.
  void reserve(std::size_t count) {
    entries_.reserve(count);
    if (count > kScanLimit && slots_.size() < count * 2) rebuildIndex(count);
  }
  std::size_t size() const { return entries_.size(); }
  bool empty() const { return entries_.empty(); }
  const_iterator begin() const { return entries_.begin(); }
  const_iterator end() const { return entries_.end(); }

  // Compares keys and values, regardless of their order.
  friend bool operator==(const OrderedMap& a, const OrderedMap& b) {
    if (a.size() != b.size()) return false;
    for (const Entry& entry : a) {
      const T* other = b.find(entry.first);
      if (other == nullptr || !(*other == entry.second)) return false;
    }
    return true;
  }

 private:
  // Up to this many entries a linear scan is faster than hashing; most dictionaries are this small.
  static constexpr std::size_t kScanLimit = 8;

  // One slot of the open-addressing index: the entry's position plus one (0 marks a free slot), and enough of the hash
  // to skip most other entries without comparing keys.
  struct Slot {
    std::uint32_t place = 0;
    std::uint32_t hash = 0;
  };

  static T* valueOf(Entry* entry) { return entry == nullptr ? nullptr : &entry->second; }

  static std::uint32_t hashOf(std::string_view key) {
    const std::uint64_t hash = std::hash<std::string_view>{}(key);
    return static_cast<std::uint32_t>(hash ^ (hash >> 32));
  }

  Entry* findEntry(std::string_view key) { return findEntry(key, slots_.empty() ? 0 : hashOf(key)); }

  // `hash` is the hash of `key`; it is only used if there is an index.
  Entry* findEntry(std::string_view key, std::uint32_t hash) {
    if (slots_.empty()) {
      for (Entry& entry : entries_) {
        if (entry.first == key) return &entry;
      }
      return nullptr;
    }
    const std::size_t mask = slots_.size() - 1;
    for (std::size_t at = hash & mask; slots_[at].place != 0; at = (at + 1) & mask) {
      if (slots_[at].hash != hash) continue;
      Entry& entry = entries_[slots_[at].place - 1];
      if (entry.first == key) return &entry;
    }
    return nullptr;
  }

  // `hash` is the hash of `key`; it is only used if there is an index.
  void setHashed(std::string_view key, std::uint32_t hash, T&& value) {
    if (Entry* entry = findEntry(key, hash)) {
      entry->second = std::move(value);
      return;
    }
    entries_.emplace_back(std::string(key), std::move(value));
    if (slots_.size() >= entries_.size() * 2) {
      place(entries_.size() - 1, hash);
    } else if (entries_.size() > kScanLimit) {
      rebuildIndex(entries_.size() * 2);
    }
  }

  // Builds an index with room for `count` entries.
  void rebuildIndex(std::size_t count) {
    std::size_t size = kScanLimit * 4;
    while (size < count * 2) size *= 2;
    slots_.assign(size, Slot{});
    for (std::size_t i = 0; i < entries_.size(); ++i) place(i, hashOf(entries_[i].first));
  }

  void place(std::size_t position, std::uint32_t hash) {
    const std::size_t mask = slots_.size() - 1;
    std::size_t at = hash & mask;
    while (slots_[at].place != 0) at = (at + 1) & mask;
    slots_[at] = Slot{static_cast<std::uint32_t>(position + 1), hash};
  }

  std::vector<Entry> entries_;
  // Empty, or a power of two and at most half full. Not empty if there are more than kScanLimit entries.
  std::vector<Slot> slots_;
};

}  // namespace QUAZOR_CONTRACT
