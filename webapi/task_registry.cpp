#include "webapi/task_registry.h"

#include "webapi/log.h"
#include "webapi/random.h"
#include "webapi/task_state.h"

#include <algorithm>
#include <condition_variable>
#include <exception>
#include <list>
#include <mutex>
#include <system_error>
#include <thread>

namespace vornwebapi {

namespace {

struct Task {
  std::string id;
  TaskRegistry::Kind kind;
  VORN::APIRequest::State request;
  TaskState response;
  TaskRegistry::Function function = nullptr;
  void *context = nullptr;
  TaskRegistry::Clock::time_point asked; // guarded by the registry's mutex
};

constexpr size_t kIdBytes = 16;

using TaskPointer = std::shared_ptr<Task>;

void RunFunction(Task &task) {
  VORN::APIRequest request(task.request);
  VORN::APIResponse response(task.response);
  try {
    task.function(&request, &response, task.context);
  } catch (const std::exception &error) {
    Log(LogKind::kModuleFault, "poll task of kind %s threw: %s", Printable(task.kind.prefix).c_str(),
        Printable(error.what()).c_str());
  } catch (...) {
    Log(LogKind::kModuleFault, "poll task of kind %s threw something that is no std::exception",
        Printable(task.kind.prefix).c_str());
  }
}

} // namespace

struct TaskRegistry::Inner {
  explicit Inner(const Limits &chosen) : limits(chosen) {}

  const Limits limits;
  std::mutex mutex;
  std::condition_variable changed;
  std::list<TaskPointer> tasks; // oldest first; those that were stopped while running are not in it
  size_t running = 0;           // threads, those of stopped tasks too
  bool stopping = false;

  int Admit(const Kind &kind);
  size_t Count() const;
  bool MakeRoom();
  void PurgeLocked(Clock::time_point now);
  TaskPointer Find(const std::string &user, const std::string &id);
  void Ended(const TaskPointer &task);
};

// REQUIRES: mutex is held.
size_t TaskRegistry::Inner::Count() const {
  const auto kept =
      std::count_if(tasks.begin(), tasks.end(), [](const TaskPointer &task) { return task->response.Finished(); });
  return running + static_cast<size_t>(kept);
}

// REQUIRES: mutex is held.
bool TaskRegistry::Inner::MakeRoom() {
  const auto finished = [](const TaskPointer &task) { return task->response.Finished(); };
  if (Count() < limits.tasks) {
    return true;
  }
  auto oldest = tasks.end();
  for (auto task = tasks.begin(); task != tasks.end(); ++task) {
    if (finished(*task) && (oldest == tasks.end() || (*task)->asked < (*oldest)->asked)) {
      oldest = task;
    }
  }
  if (oldest == tasks.end()) {
    return false;
  }
  tasks.erase(oldest);
  return true;
}

// REQUIRES: mutex is held.
int TaskRegistry::Inner::Admit(const Kind &kind) {
  if (stopping) {
    return kTaskServerStopping;
  }
  PurgeLocked(Clock::now());
  const auto same = std::find_if(tasks.begin(), tasks.end(), [&kind](const TaskPointer &task) {
    return task->kind.user == kind.user && task->kind.prefix == kind.prefix;
  });
  if (same != tasks.end()) {
    if (!(*same)->response.Finished()) {
      return kTaskKindRuns;
    }
    tasks.erase(same);
  }
  return MakeRoom() ? 0 : kTaskTooMany;
}

// REQUIRES: mutex is held.
void TaskRegistry::Inner::PurgeLocked(Clock::time_point now) {
  tasks.remove_if(
      [this, now](const TaskPointer &task) { return task->response.Finished() && now - task->asked >= limits.keep; });
}

// REQUIRES: mutex is held.
TaskPointer TaskRegistry::Inner::Find(const std::string &user, const std::string &id) {
  const auto found = std::find_if(tasks.begin(), tasks.end(), [&user, &id](const TaskPointer &task) {
    return task->id == id && task->kind.user == user;
  });
  if (found == tasks.end()) {
    return nullptr;
  }
  (*found)->asked = Clock::now();
  return *found;
}

void TaskRegistry::Inner::Ended(const TaskPointer &task) {
  const std::lock_guard lock(mutex);
  --running;
  task->response.MarkFinished();
  task->asked = Clock::now(); // the time to keep it begins now
  if (task->kind.remove) {
    tasks.remove(task);
  }
  changed.notify_all();
}

TaskRegistry::TaskRegistry(const Limits &limits) : inner_(std::make_shared<Inner>(limits)) {}

TaskRegistry::~TaskRegistry() = default;

int TaskRegistry::Start(const Kind &kind, const VORN::APIRequest::State &request, Function function, void *context,
                        std::string &id) {
  auto task = std::make_shared<Task>();
  const std::string random = RandomDigits(kIdBytes);
  if (random.empty() || function == nullptr) {
    return kTaskCannotStart;
  }
  task->id = kind.prefix + '_' + random;
  task->kind = kind;
  task->request = request;
  task->request.polled = nullptr;
  task->function = function;
  task->context = context;
  const std::lock_guard lock(inner_->mutex);
  const int refused = inner_->Admit(kind);
  if (refused != 0) {
    Log(LogKind::kTaskLimit, "poll task of kind %s for user %s refused with code %d", Printable(kind.prefix).c_str(),
        Printable(kind.user).c_str(), refused);
    return refused;
  }
  try {
    std::thread([inner = inner_, task] {
      RunFunction(*task);
      task->response.RunCallbacks();
      inner->Ended(task);
    }).detach();
  } catch (const std::system_error &error) {
    Log(LogKind::kTaskLimit, "no thread for a poll task: %s", error.what());
    return kTaskCannotStart;
  }
  ++inner_->running;
  inner_->tasks.push_back(task);
  id = task->id;
  return 0;
}

std::vector<std::string> TaskRegistry::List(const std::string &user, const std::string &group,
                                            const std::string &prefix) {
  std::vector<std::string> ids;
  const std::lock_guard lock(inner_->mutex);
  inner_->PurgeLocked(Clock::now());
  for (const TaskPointer &task : inner_->tasks) {
    if (task->kind.user == user && task->kind.group == group && task->kind.prefix == prefix) {
      ids.push_back(task->id);
    }
  }
  return ids;
}

int TaskRegistry::Status(const std::string &user, const std::string &id, Json::Value &data) {
  TaskPointer task;
  {
    const std::lock_guard lock(inner_->mutex);
    inner_->PurgeLocked(Clock::now());
    task = inner_->Find(user, id);
  }
  if (task == nullptr) {
    return kTaskUnknown;
  }
  data = task->response.Read();
  return 0;
}

int TaskRegistry::Stop(const std::string &user, const std::string &id, bool force) {
  const std::lock_guard lock(inner_->mutex);
  const TaskPointer task = inner_->Find(user, id);
  if (task == nullptr) {
    return kTaskUnknown;
  }
  if (!force && !task->response.Finished()) {
    return kTaskStillRuns;
  }
  inner_->tasks.remove(task);
  return 0;
}

size_t TaskRegistry::Count() {
  const std::lock_guard lock(inner_->mutex);
  return inner_->Count();
}

void TaskRegistry::Purge() {
  const std::lock_guard lock(inner_->mutex);
  inner_->PurgeLocked(Clock::now());
}

size_t TaskRegistry::Shutdown(Clock::time_point deadline) {
  std::unique_lock lock(inner_->mutex);
  inner_->stopping = true;
  inner_->changed.wait_until(lock, deadline, [this] { return inner_->running == 0; });
  return inner_->running;
}

} // namespace vornwebapi
