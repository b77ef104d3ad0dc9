// private_view [--keep FOLDER] [--over TARGET=FILE]... -- COMMAND [ARGUMENT...]
// Runs a command in a view of the machine that is its own: writable copies of /etc and /usr, empty /tmp, /var and /run,
// an empty network with the loopback up. What it changes is gone when it ends, and nothing of it was ever seen outside.
// Works as root, and as any user through a user namespace. FOLDER (by default the current one) stays visible where it
// lies below an emptied folder.
#include <fcntl.h>
#include <linux/if.h>
#include <sched.h>
#include <sys/ioctl.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>
#include <utility>
#include <vector>

namespace fs = std::filesystem;

namespace {

const std::string kRoot = "/mnt";

[[noreturn]] void Die(const std::string &what) {
  std::fprintf(stderr, "private_view: %s: %s\n", what.c_str(), std::strerror(errno));
  std::exit(125);
}

void WriteText(const char *path, const std::string &text) {
  const int file = open(path, O_WRONLY | O_CLOEXEC);
  if (file < 0 || write(file, text.data(), text.size()) != static_cast<ssize_t>(text.size())) {
    Die(path);
  }
  close(file);
}

void Mount(const std::string &source, const std::string &target, const char *type, unsigned long flags,
           const std::string &options = "") {
  if (mount(source.c_str(), target.c_str(), type, flags, options.empty() ? nullptr : options.c_str()) != 0) {
    Die("mount " + target);
  }
}

// User ids are mapped before anything is mounted; without CAP_SYS_ADMIN nothing else would work.
void EnterNamespaces() {
  const bool root = geteuid() == 0;
  const unsigned user = geteuid();
  const unsigned group = getegid();
  if (unshare((root ? 0 : CLONE_NEWUSER) | CLONE_NEWNS | CLONE_NEWUTS | CLONE_NEWNET) != 0) {
    Die("unshare");
  }
  if (!root) {
    WriteText("/proc/self/setgroups", "deny");
    WriteText("/proc/self/uid_map", "0 " + std::to_string(user) + " 1");
    WriteText("/proc/self/gid_map", "0 " + std::to_string(group) + " 1");
  }
  Mount("none", "/", nullptr, MS_REC | MS_PRIVATE);
}

void BringUpLoopback() {
  const int probe = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
  ifreq request{};
  std::strcpy(request.ifr_name, "lo");
  request.ifr_flags = IFF_UP;
  if (ioctl(probe, SIOCSIFFLAGS, &request) != 0) {
    Die("lo");
  }
  close(probe);
  Mount("sysfs", "/sys", "sysfs", 0); // the old one shows the old network
}

// In a user namespace, files of an overlay's lower layer that belong to an unmapped user cannot be changed: copy them.
void CopyReadable(const fs::path &from, const fs::path &to) {
  std::error_code ignored;
  const auto options = fs::directory_options::skip_permission_denied;
  for (fs::recursive_directory_iterator it(from, options, ignored), end; it != end; it.increment(ignored)) {
    const fs::path target = to / it->path().lexically_relative(from); // fs::relative would follow links
    if (it->is_symlink(ignored)) {
      fs::copy_symlink(it->path(), target, ignored);
    } else if (it->is_directory(ignored)) {
      fs::create_directory(target, ignored);
    } else {
      fs::copy_file(it->path(), target, ignored);
    }
  }
}

void MakeWritable(const std::string &folder) {
  const std::string upper = kRoot + folder;
  const std::string work = upper + ".work";
  mkdir(upper.c_str(), 0755);
  mkdir(work.c_str(), 0755);
  if (geteuid() == 0 && access("/etc/shadow", W_OK) == 0) {
    Mount("overlay", folder, "overlay", 0, "lowerdir=" + folder + ",upperdir=" + upper + ",workdir=" + work);
  } else if (folder == "/etc") {
    CopyReadable(folder, upper);
    Mount(upper, folder, nullptr, MS_BIND);
  } else {
    fs::create_directories(upper + "/vorn");
    fs::create_directories(upper + "/bin"); // a folder of its own is one in which programs can be replaced
    Mount("overlay", folder, "overlay", 0, "lowerdir=" + folder + ",upperdir=" + upper + ",workdir=" + work);
  }
}

// The build's own folder may lie below one of the folders that are emptied; it is put back at its place.
void HideFolders(const std::string &keep) {
  const int kept = open(keep.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC);
  if (kept < 0) {
    Die(keep);
  }
  bool hidden = false;
  for (const char *folder : {"/tmp", "/var", "/run"}) {
    const std::string fresh = kRoot + folder;
    mkdir(fresh.c_str(), 0755);
    Mount(fresh, folder, nullptr, MS_BIND);
    hidden = hidden || keep.rfind(std::string(folder) + "/", 0) == 0;
  }
  chmod("/tmp", 01777);
  for (const char *folder : {"/var/lib", "/var/log", "/var/cache", "/var/spool", "/run/lock", "/run/netns"}) {
    mkdir(folder, 0755);
  }
  if (symlink("/run", "/var/run") != 0) {
    Die("/var/run");
  }
  if (hidden) {
    fs::create_directories(keep);
    Mount("/proc/self/fd/" + std::to_string(kept), keep, nullptr, MS_BIND | MS_REC);
  }
  close(kept);
}

void PutOver(const std::string &target, const std::string &file) {
  std::error_code ignored;
  fs::create_directories(fs::path(target).parent_path(), ignored);
  const int made = open(target.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0755);
  if (made >= 0) {
    close(made);
  }
  Mount(file, target, nullptr, MS_BIND);
}

struct Arguments {
  std::string keep = fs::current_path().string();
  std::vector<std::pair<std::string, std::string>> over;
  char **command = nullptr;
};

bool Parse(int argc, char **argv, Arguments &out) {
  int at = 1;
  for (; at + 1 < argc && std::strcmp(argv[at], "--") != 0; at += 2) {
    const std::string value = argv[at + 1];
    const size_t equals = value.find('=');
    if (std::strcmp(argv[at], "--keep") == 0) {
      out.keep = value;
    } else if (std::strcmp(argv[at], "--over") == 0 && equals != std::string::npos) {
      out.over.emplace_back(value.substr(0, equals), fs::absolute(value.substr(equals + 1)).string());
    } else {
      return false;
    }
  }
  if (at + 1 >= argc) {
    return false;
  }
  out.command = argv + at + 1;
  return true;
}

} // namespace

int main(int argc, char **argv) {
  Arguments arguments;
  if (!Parse(argc, argv, arguments)) {
    std::fputs("usage: private_view [--keep FOLDER] [--over TARGET=FILE]... -- COMMAND [ARGUMENT...]\n", stderr);
    return 125;
  }
  const std::string here = fs::current_path().string();
  EnterNamespaces();
  Mount("tmpfs", kRoot, "tmpfs", 0, "mode=755");
  MakeWritable("/etc");
  MakeWritable("/usr");
  HideFolders(arguments.keep);
  BringUpLoopback();
  for (const auto &[target, file] : arguments.over) {
    PutOver(target, file);
  }
  if (chdir(here.c_str()) != 0) {
    Die(here);
  }
  setenv("VORN_PRIVATE_VIEW", "1", 1);
  execvp(arguments.command[0], arguments.command);
  Die(arguments.command[0]);
}
