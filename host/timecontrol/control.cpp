#include "host/timecontrol/control.h"

#include "host/schedule/local_time.h"
#include "host/timecontrol/firewall.h"
#include "host/timecontrol/restore.h"
#include "host/timecontrol/rules.h"
#include "host/utility/log.h"
#include "host/utility/unique_fd.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <ostream>

namespace vornhost {

namespace {

// Locked by whoever changes something, which nobody but root may hold up; not empty while enforcement is on. /run is
// empty after a restart.
constexpr char kStateFile[] = "/run/vorntimecontrol.state";

class State {
public:
  State() : file_(open(kStateFile, O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600)) {
    int locked = -1;
    do {
      locked = file_.IsOpen() ? flock(file_.Get(), LOCK_EX) : 0;
    } while (locked != 0 && errno == EINTR);
    if (!file_.IsOpen() || locked != 0) {
      LogError("time control: %s: %s", kStateFile, std::strerror(errno));
      file_.Reset();
    }
  }

  bool IsLocked() const { return file_.IsOpen(); }
  bool IsOn() const {
    char byte = 0;
    return pread(file_.Get(), &byte, 1, 0) == 1;
  }
  int Set(bool on) {
    const bool done = on ? pwrite(file_.Get(), "on\n", 3, 0) == 3 : ftruncate(file_.Get(), 0) == 0;
    if (!done) {
      LogError("time control: %s: %s", kStateFile, std::strerror(errno));
    }
    return done ? 0 : -1;
  }

private:
  UniqueFd file_;
};

int PresentSlot() {
  const int slot = SlotOf(std::time(nullptr));
  if (slot < 0) {
    LogError("time control: the clock was never set: nothing is cut until it is");
  }
  return slot;
}

int ReadCut(MacSet &cut) {
  std::vector<TimeRule> rules;
  if (ReadRules(rules) != 0) {
    return -1;
  }
  cut = CutIn(PresentSlot(), rules);
  return 0;
}

int Load(const MacSet &cut) {
  if (LoadTable(cut) != 0) {
    return -1;
  }
  LogInfo("time control: %zu devices are cut", cut.size());
  return 0;
}

// Where a change of the rules writes once the old ones have been ended.
constexpr std::array kFolders = {"/etc/parental", "/etc/cron.d"};
constexpr off_t kRoom = off_t{256} * 1024; // bytes: the rules of more devices than a home has

bool TakesFiles(const char *folder) {
  const UniqueFd file(open(folder, O_TMPFILE | O_WRONLY | O_CLOEXEC, 0600)); // never has a name
  const bool taken = file.IsOpen() && fallocate(file.Get(), 0, 0, kRoom) == 0;
  if (taken || errno == EOPNOTSUPP || errno == EISDIR || errno == ENOENT) {
    return true; // or nobody can tell before: the file system knows neither of the two, or the folder is still to be
                 // made
  }
  LogError("time control: stays on, %s takes no files: %s", folder, std::strerror(errno));
  return false;
}

int TurnOff(State &state) {
  return state.Set(false) == 0 && RemoveTable() == 0 ? 0 : -1;
}

std::string SlotText(int slot) {
  constexpr std::array kDays = {"Sunday", "Monday", "Tuesday", "Wednesday", "Thursday", "Friday", "Saturday"};
  char text[32];
  std::snprintf(text, sizeof(text), "%s %02d:00", kDays[static_cast<size_t>(slot / 24)], slot % 24);
  return text;
}

// "cut until Monday 07:00"
std::string Describe(const TimeRule &rule, int slot) {
  const bool cut = IsMarked(rule.schedule, slot);
  std::string state = cut ? "cut" : "free";
  for (int ahead = 1; slot >= 0 && ahead < kSlots; ++ahead) {
    const int later = (slot + ahead) % kSlots;
    if (IsMarked(rule.schedule, later) != cut) {
      return state.append(" until ").append(SlotText(later));
    }
  }
  return state;
}

} // namespace

int ApplyTimeControl() {
  State state;
  MacSet cut;
  if (!state.IsLocked() || ReadCut(cut) != 0) {
    return -1;
  }
  // First, so that no table can stand that the hourly runs would leave as it is.
  return state.Set(true) == 0 && Load(cut) == 0 ? 0 : -1;
}

int ScheduleTimeControl() {
  const State state;
  MacSet cut;
  if (!state.IsLocked()) {
    return -1;
  }
  if (!state.IsOn()) {
    return 0;
  }
  if (ReadCut(cut) != 0) {
    return -1;
  }
  return ReadTable() == cut ? 0 : Load(cut);
}

// A change of the rules begins here. On a disk that takes nothing the change would end here too, and nobody would be
// cut any more, whatever the stored rules say: then they stay as they are.
int DisableTimeControl() {
  State state;
  if (!state.IsLocked() || (state.IsOn() && !std::all_of(kFolders.begin(), kFolders.end(), TakesFiles))) {
    return -1;
  }
  return TurnOff(state);
}

int RestoreTimeControl() {
  bool enforce = false;
  if (RestoreFiles(enforce) != 0) {
    return -1;
  }
  if (enforce) {
    return ApplyTimeControl();
  }
  State state;
  return state.IsLocked() ? TurnOff(state) : -1;
}

int ShowTimeControl(std::ostream &out) {
  const State state;
  if (!state.IsLocked()) {
    return -1;
  }
  if (!state.IsOn()) {
    out << "Time control is off.\n";
    return 0;
  }
  std::vector<TimeRule> rules;
  if (ReadRules(rules) != 0) {
    return -1;
  }
  const int slot = PresentSlot();
  out << "Time control is on. " << (slot < 0 ? "The clock was never set: nothing is cut." : "It is " + SlotText(slot))
      << "\n";
  for (const TimeRule &rule : JoinRules(rules)) {
    out << rule.mac << "  " << Describe(rule, slot) << "  " << LogText(rule.name) << "\n";
  }
  if (ReadTable() != CutIn(slot, rules)) {
    out << "The packet filter says otherwise; --schedule puts it right.\n";
  }
  return 0;
}

} // namespace vornhost
