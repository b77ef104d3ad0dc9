#include "host/utility/sz_hash.h"

#include "host/export.h"
#include "host/utility/error.h"
#include "host/utility/sz_room.h"

#include <utility>

using vornhost::Guarded;
using vornhost::SetError;

QARDCSzHash::QARDCSzHash(size_t room) {
  byKey_.reserve(vornhost::RoomFor(room));
}

void QARDCSzHash::Set(std::string key, std::string value) {
  const auto found = byKey_.find(key);
  if (found != byKey_.end()) {
    found->second->value = std::move(value);
    return;
  }
  std::list<Pair> one;
  one.push_back({std::move(key), std::move(value)});
  byKey_.emplace(one.front().key, one.begin());
  pairs_.splice(pairs_.end(), one);
}

const std::string *QARDCSzHash::Find(std::string_view key) const {
  const auto found = byKey_.find(key);
  return found == byKey_.end() ? nullptr : &found->second->value;
}

std::string *QARDCSzHash::Remove(std::string_view key) {
  const auto found = byKey_.find(key);
  if (found == byKey_.end()) {
    return nullptr;
  }
  const auto pair = found->second;
  removed_ = std::move(pair->value);
  byKey_.erase(found);
  pairs_.erase(pair);
  return &removed_;
}

VORN_EXPORT QARDCSzHash *QARDCSzHashAlloc(size_t size) {
  return Guarded(static_cast<QARDCSzHash *>(nullptr), [&size] { return new QARDCSzHash(size); });
}

VORN_EXPORT void QARDCSzHashFree(QARDCSzHash *hash) {
  delete hash;
}

VORN_EXPORT int QARDCSzHashSetValue(QARDCSzHash *hash, const char *key, const char *value) {
  return Guarded(-1, [&hash, &key, &value] {
    if (hash == nullptr || key == nullptr || *key == '\0' || value == nullptr) {
      return SetError(QARDC_ERR_BAD_ARGUMENT);
    }
    hash->Set(key, value);
    return 0;
  });
}

VORN_EXPORT const char *QARDCSzHashGetValue(QARDCSzHash *hash, const char *key) {
  if (hash == nullptr || key == nullptr) {
    SetError(QARDC_ERR_BAD_ARGUMENT);
    return nullptr;
  }
  const std::string *value = hash->Find(key);
  return value == nullptr ? nullptr : value->c_str();
}

VORN_EXPORT char *QARDCSzHashRemoveKey(QARDCSzHash *hash, const char *key) {
  if (hash == nullptr || key == nullptr) {
    SetError(QARDC_ERR_BAD_ARGUMENT);
    return nullptr;
  }
  std::string *value = hash->Remove(key);
  return value == nullptr ? nullptr : value->data();
}
