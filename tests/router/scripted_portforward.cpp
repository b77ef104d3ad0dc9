// The scripted platform's interfaces, key/value files and rule file.
#include "platform/netif.h"
#include "platform/portforward.h"
#include "tests/router/scripted_hash.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>

using scripted::Call;
using scripted::DeleteHash;
using scripted::Get;
using scripted::NewHash;

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

void Copy(const std::string &text, char *to, size_t size) {
  std::snprintf(to, size, "%s", text.c_str());
}

} // namespace

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
    const scripted::Lan &lan = lans[static_cast<size_t>(i)];
    Copy(lan.name, entries[i].name, sizeof(entries[i].name));
    Copy(lan.ip, entries[i].ip, sizeof(entries[i].ip));
    Copy(lan.mask, entries[i].mask, sizeof(entries[i].mask));
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
