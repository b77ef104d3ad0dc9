// The scripted platform's hashes, programs, interfaces, key/value files and rule file.
#include "platform/netif.h"
#include "platform/portforward.h"
#include "platform/utility.h"
#include "tests/router/scripted_platform.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>

using scripted::Call;
using scripted::Get;

struct QARDCSzHash {
  std::string name;
  scripted::Pairs pairs;
};

namespace {

std::string Text(const char *text) {
  return text == nullptr ? "null" : text;
}

std::string Describe(const VORNPFRecord *head) {
  std::string out;
  for (; head != nullptr; head = head->next) {
    out += std::string(out.empty() ? "" : "; ") + head->name;
    for (const auto &[key, value] : head->values->pairs) {
      out.append(" ").append(key).append("=").append(value);
    }
  }
  return "[" + out + "]";
}

QARDCSzHash *NewHash() {
  ++Get().liveHashes;
  return new QARDCSzHash{"hash " + std::to_string(Get().hashes++), {}};
}

void DeleteHash(QARDCSzHash *hash) {
  Get().liveHashes -= hash == nullptr ? 0 : 1;
  delete hash;
}

void Copy(const std::string &text, char *to, size_t size) {
  std::snprintf(to, size, "%s", text.c_str());
}

} // namespace

QARDCSzHash *QARDCSzHashAlloc(size_t size) {
  const bool fails = Call("QARDCSzHashAlloc(" + std::to_string(size) + ")") != 0;
  return fails ? nullptr : NewHash();
}

void QARDCSzHashFree(QARDCSzHash *hash) {
  Call("QARDCSzHashFree(" + (hash == nullptr ? "null" : hash->name) + ")");
  DeleteHash(hash);
}

int QARDCSzHashSetValue(QARDCSzHash *hash, const char *key, const char *value) {
  const int result = Call("QARDCSzHashSetValue(" + hash->name + ", " + Text(key) + ", " + Text(value) + ")");
  if (result >= 0) {
    hash->pairs.emplace_back(key, value);
  }
  return result;
}

const char *QARDCSzHashGetValue(QARDCSzHash *hash, const char *key) {
  const auto found =
      std::find_if(hash->pairs.begin(), hash->pairs.end(), [&key](const auto &pair) { return pair.first == key; });
  return found == hash->pairs.end() ? nullptr : found->second.c_str();
}

int QARDCExec(const char *program, const char *a1, const char *a2, const char *a3, const char *a4) {
  return Call("QARDCExec(" + Text(program) + ", " + Text(a1) + ", " + Text(a2) + ", " + Text(a3) + ", " + Text(a4) +
              ")");
}

int QARDCFileCheckDir(const char *path) {
  return Call("QARDCFileCheckDir(" + Text(path) + ")", static_cast<int>(Get().folders.count(path)));
}

int QARDCSysUnlink(const char *path) {
  return Call("QARDCSysUnlink(" + Text(path) + ")");
}

int QARDCFileGetKeyValue(const char *path, const char *key, char *value, size_t size, int flags) {
  const std::string &text = Get().keyValues[Text(path) + " " + key];
  const int result = Call("QARDCFileGetKeyValue(" + Text(path) + ", " + key + ", " + std::to_string(size) + ", " +
                              std::to_string(flags) + ")",
                          static_cast<int>(text.size()));
  Copy(result > 0 ? text : "", value, size);
  return result;
}

int QARDCFileSetKeyValue(const char *path, const char *key, const char *value, const char *lineFormat) {
  return Call("QARDCFileSetKeyValue(" + Text(path) + ", " + key + ", " + value + ", " + lineFormat + ")",
              Get().setKeyValueResult);
}

int QARDCErrGet(void) {
  return QARDC_ERR_NOT_FOUND;
}

const char *QARDCErrorGetFile(void) {
  return "netif.cpp";
}

int QARDCErrorGetLine(void) {
  return 42;
}

int QARDNetInterfaceEnum(QARDNetInterface *entries, int capacity, int kind) {
  const auto &lans = Get().lans;
  const int count = Call("QARDNetInterfaceEnum(" + std::to_string(capacity) + ", " + std::to_string(kind) + ")",
                         std::min(capacity, static_cast<int>(lans.size())));
  for (int i = 0; i < count && i < capacity; ++i) {
    Copy(lans[static_cast<size_t>(i)].name, entries[i].name, sizeof(entries[i].name));
  }
  return count;
}

int VORNNetIFGetInfo(const char *name, int flags, VORNNetIFInfo *info) {
  const int result = Call("VORNNetIFGetInfo(" + Text(name) + ", " + std::to_string(flags) + ")", 1);
  const auto &lans = Get().lans;
  const auto found = std::find_if(lans.begin(), lans.end(), [&name](const auto &lan) { return lan.name == name; });
  if (result >= 0 && found != lans.end()) {
    Copy(found->ip, info->ip, sizeof(info->ip));
    Copy(found->mask, info->mask, sizeof(info->mask));
  }
  return result;
}

int VORNNetIsSameSubnet(const char *address, const char *interfaceAddress, const char *interfaceNetmask) {
  return Call("VORNNetIsSameSubnet(" + Text(address) + ", " + interfaceAddress + ", " + interfaceNetmask + ")",
              static_cast<int>(Get().subnets[interfaceAddress].count(address)));
}

int VORNPFConfGet(VORNPFRecord **head, const char *path, int a, int b, int c) {
  const int result = Call("VORNPFConfGet(" + Text(path) + ", " + std::to_string(a) + ", " + std::to_string(b) + ", " +
                          std::to_string(c) + ")");
  *head = nullptr;
  for (auto it = Get().ruleFile.rbegin(); result >= 0 && it != Get().ruleFile.rend(); ++it) {
    auto *record = static_cast<VORNPFRecord *>(std::calloc(1, sizeof(VORNPFRecord)));
    Copy(it->name, record->name, sizeof(record->name));
    record->values = NewHash();
    record->values->pairs = it->pairs;
    record->next = *head;
    *head = record;
  }
  return result;
}

int VORNPFConfSet(VORNPFRecord *head, const char *path) {
  return Call("VORNPFConfSet(" + Describe(head) + ", " + Text(path) + ")");
}

void VORNPFConfFree(VORNPFRecord *head) {
  Call("VORNPFConfFree(" + Describe(head) + ")");
  while (head != nullptr) {
    VORNPFRecord *next = head->next;
    DeleteHash(head->values);
    std::free(head);
    head = next;
  }
}
