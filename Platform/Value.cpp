#include "Platform/Value.h"

namespace palisade {

Dictionary::Dictionary() = default;
Dictionary::Dictionary(const Dictionary&) = default;
Dictionary::Dictionary(Dictionary&&) noexcept = default;
Dictionary& Dictionary::operator=(const Dictionary&) = default;
Dictionary& Dictionary::operator=(Dictionary&&) noexcept = default;
Dictionary::~Dictionary() = default;

Dictionary::Dictionary(std::initializer_list<Entry> entries) {
  for (const Entry& entry : entries) set(entry.first, entry.second);
}

void Dictionary::set(std::string key, Value value) {
  const auto [position, isNew] = _positions.try_emplace(key, _entries.size());
  if (isNew) {
    _entries.emplace_back(std::move(key), std::move(value));
  } else {
    _entries[position->second].second = std::move(value);
  }
}

const Value* Dictionary::find(std::string_view key) const {
  const auto position = _positions.find(key);
  return position == _positions.end() ? nullptr : &_entries[position->second].second;
}

std::size_t Dictionary::size() const { return _entries.size(); }
bool Dictionary::empty() const { return _entries.empty(); }
std::vector<Dictionary::Entry>::const_iterator Dictionary::begin() const { return _entries.begin(); }
std::vector<Dictionary::Entry>::const_iterator Dictionary::end() const { return _entries.end(); }

bool operator==(const Dictionary& left, const Dictionary& right) {
  if (left.size() != right.size()) return false;
  for (const auto& [key, value] : left) {
    const Value* other = right.find(key);
    if (other == nullptr || !(*other == value)) return false;
  }
  return true;
}

Value::Value(std::uint64_t value) {
  if (value <= static_cast<std::uint64_t>(INT64_MAX)) {
    _content = static_cast<std::int64_t>(value);
  } else {
    _content = value;
  }
}

}  // namespace palisade
