// The scripted platform's hashes, lists, section files, programs and scheduler. Section files and copies leave behind
// what the real ones would, so that a test can go through many calls.
#include "platform/schedule.h"
#include "tests/router/scripted_hash.h"

#include <algorithm>
#include <cstdarg>
#include <initializer_list>

using scripted::Call;
using scripted::Get;
using scripted::Pairs;
using scripted::Section;

struct QARDCSzList {
  std::vector<std::string> texts;
};

namespace {

std::string Text(const char *text) {
  return text == nullptr ? "null" : text;
}

std::string Text(const Pairs &pairs) {
  std::string text;
  for (const auto &[key, value] : pairs) {
    text.append(text.empty() ? "" : ", ").append(key).append("=").append(value);
  }
  return "{" + text + "}";
}

// "Function(argument, argument)"
std::string CallText(const std::string &function, const std::vector<std::string> &arguments) {
  std::string text;
  for (const std::string &argument : arguments) {
    text.append(text.empty() ? "" : ", ").append(argument);
  }
  return function + "(" + text + ")";
}

Pairs::iterator Find(QARDCSzHash *hash, const std::string &key) {
  return std::find_if(hash->pairs.begin(), hash->pairs.end(), [&key](const auto &pair) { return pair.first == key; });
}

void Set(QARDCSzHash *hash, const std::string &key, const std::string &value) {
  const auto found = Find(hash, key);
  if (found == hash->pairs.end()) {
    hash->pairs.emplace_back(key, value);
  } else {
    found->second = value;
  }
}

void MakeFile(const std::string &path) {
  auto &files = Get().existingFiles;
  if (std::find(files.begin(), files.end(), path) == files.end()) {
    files.push_back(path);
  }
}

} // namespace

namespace scripted {

QARDCSzHash *NewHash() {
  ++Get().liveHashes;
  return new QARDCSzHash{"hash " + std::to_string(Get().hashes++), {}, {}};
}

void DeleteHash(QARDCSzHash *hash) {
  Get().liveHashes -= hash == nullptr ? 0 : 1;
  delete hash;
}

} // namespace scripted

QARDCSzHash *QARDCSzHashAlloc(size_t size) {
  const bool fails = Call("QARDCSzHashAlloc(" + std::to_string(size) + ")") != 0;
  return fails ? nullptr : scripted::NewHash();
}

void QARDCSzHashFree(QARDCSzHash *hash) {
  Call("QARDCSzHashFree(" + (hash == nullptr ? "null" : hash->name) + ")");
  scripted::DeleteHash(hash);
}

int QARDCSzHashSetValue(QARDCSzHash *hash, const char *key, const char *value) {
  const int result = Call("QARDCSzHashSetValue(" + hash->name + ", " + Text(key) + ", " + Text(value) + ")");
  if (result >= 0) {
    Set(hash, key, value);
  }
  return result;
}

const char *QARDCSzHashGetValue(QARDCSzHash *hash, const char *key) {
  const auto found = Find(hash, key);
  return found == hash->pairs.end() ? nullptr : found->second.c_str();
}

char *QARDCSzHashRemoveKey(QARDCSzHash *hash, const char *key) {
  Call("QARDCSzHashRemoveKey(" + hash->name + ", " + key + ")");
  const auto found = Find(hash, key);
  if (found == hash->pairs.end()) {
    return nullptr;
  }
  hash->removed = found->second;
  hash->pairs.erase(found);
  return hash->removed.data();
}

QARDCSzList *QARDCSzListAlloc(size_t size) {
  if (Call("QARDCSzListAlloc(" + std::to_string(size) + ")") != 0) {
    return nullptr;
  }
  ++Get().liveLists;
  return new QARDCSzList;
}

const char *QARDCSzListGet(QARDCSzList *list, int index) {
  const auto at = static_cast<size_t>(index);
  return at < list->texts.size() ? list->texts[at].c_str() : nullptr;
}

void QARDCSzListFree(QARDCSzList *list) {
  Call("QARDCSzListFree()");
  Get().liveLists -= list == nullptr ? 0 : 1;
  delete list;
}

int QARDCFileAddSection(const char *path, const char *section, QARDCSzHash *pairs, const char *lineFormat) {
  const int result =
      Call(CallText("QARDCFileAddSection", {path, section, Text(pairs->pairs), scripted::Text(lineFormat)}));
  if (result >= 0) {
    MakeFile(path);
    Get().sectionFiles[path].push_back({section, pairs->pairs});
  }
  return result;
}

int QARDCFileEnumSection(const char *path, QARDCSzList *sections) {
  const auto &file = Get().sectionFiles[path];
  const int result = Call(CallText("QARDCFileEnumSection", {path}), static_cast<int>(file.size()));
  for (int i = 0; i < result; ++i) {
    sections->texts.push_back(file[static_cast<size_t>(i)].name);
  }
  return result;
}

int QARDCFileGetSection(const char *path, const char *section, QARDCSzHash *pairs) {
  const auto &file = Get().sectionFiles[path];
  const auto found =
      std::find_if(file.begin(), file.end(), [&section](const Section &each) { return each.name == section; });
  const int result = Call(CallText("QARDCFileGetSection", {path, Text(section)}),
                          found == file.end() ? -1 : static_cast<int>(found->pairs.size()));
  for (int i = 0; i < result; ++i) {
    Set(pairs, found->pairs[static_cast<size_t>(i)].first, found->pairs[static_cast<size_t>(i)].second);
  }
  return result;
}

int QARDCFileCheckDir(const char *path) {
  return Call(CallText("QARDCFileCheckDir", {Text(path)}), static_cast<int>(Get().folders.count(path)));
}

int QARDCSysUnlink(const char *path) {
  const int result = Call(CallText("QARDCSysUnlink", {Text(path)}));
  if (result >= 0) {
    auto &files = Get().existingFiles;
    files.erase(std::remove(files.begin(), files.end(), path), files.end());
    Get().sectionFiles.erase(path);
  }
  return result;
}

int QARDCExec(const char *program, const char *a1, const char *a2, const char *a3, const char *a4) {
  const int result = Call(CallText("QARDCExec", {Text(program), Text(a1), Text(a2), Text(a3), Text(a4)}));
  if (result >= 0 && Text(program) == "/bin/cp") {
    MakeFile(a3);
  }
  return result;
}

int QARDCExecl(const char *program, int flags, ...) {
  std::vector<std::string> words = {program, std::to_string(flags)};
  va_list list;
  va_start(list, flags);
  while (const char *argument = va_arg(list, const char *)) {
    words.emplace_back(argument);
  }
  va_end(list);
  return Call(CallText("QARDCExecl", words));
}

int QARDCErrGet(void) {
  return Get().errorCode;
}

int VORNScheduleSet(const VORNScheduleRecord *record, int flags) {
  Get().schedulerRecords.emplace_back(reinterpret_cast<const char *>(record), sizeof(*record));
  return Call(CallText("VORNScheduleSet", {record->command, std::to_string(flags)}));
}

int VORNScheduleRemove(const char *command) {
  return Call(CallText("VORNScheduleRemove", {command}));
}

int VORNSchedGetNowIndex(void) {
  return Get().slot;
}
