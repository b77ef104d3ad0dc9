// The rule file of the contract.
//
// A file that is not a plain one, or that somebody else owns or may write, is neither read nor replaced: who can change
// the rules opens the network.
#include "host/export.h"
#include "host/portforward/record_text.h"
#include "host/utility/atomic_file.h"
#include "host/utility/error.h"
#include "host/utility/log.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

namespace {

using vornhost::Guarded;
using vornhost::SetError;

// One that is not there can be trusted: only who may write the folder can make it.
int CheckTrusted(const char *path) {
  struct stat info {};
  if (lstat(path, &info) != 0) {
    return errno == ENOENT ? 0 : vornhost::SetErrno(errno);
  }
  const bool ours = info.st_uid == 0 || info.st_uid == geteuid();
  if (!S_ISREG(info.st_mode) || !ours || (info.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
    vornhost::LogError("%s is no plain file of root's alone", vornhost::LogText(path).c_str());
    return SetError(QARDC_ERR_ACCESS);
  }
  return 0;
}

int Read(VORNPFRecord **head, const char *path) {
  if (head == nullptr) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  *head = nullptr;
  if (path == nullptr || *path == '\0') {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  std::string content;
  vornhost::RecordList records;
  if (CheckTrusted(path) != 0 || vornhost::ReadWholeFile(path, content) != 0 ||
      vornhost::ParseRecords(content, records) != 0) {
    return -1;
  }
  *head = records.release();
  return 0;
}

int Write(const VORNPFRecord *head, const char *path) {
  if (path == nullptr || *path == '\0') {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  std::string content;
  if (vornhost::RenderRecords(head, content) != 0 || CheckTrusted(path) != 0) {
    return -1;
  }
  return vornhost::ChangeFile(path, [&content](const std::string & /*old*/, std::string &fresh) {
    fresh = content;
    return 0;
  });
}

} // namespace

VORN_EXPORT int VORNPFConfGet(VORNPFRecord **head, const char *path, int /*a*/, int /*b*/, int /*c*/) {
  return Guarded(-1, [&head, &path] { return Read(head, path); });
}

VORN_EXPORT int VORNPFConfSet(VORNPFRecord *head, const char *path) {
  return Guarded(-1, [&head, &path] { return Write(head, path); });
}

VORN_EXPORT void VORNPFConfFree(VORNPFRecord *head) {
  while (head != nullptr) {
    VORNPFRecord *next = head->next;
    QARDCSzHashFree(head->values);
    std::free(head);
    head = next;
  }
}
