// Many writers of one file, and a reader who looks all the time.
#include "host/utility/atomic_file.h"
#include "host/utility/line_file.h"
#include "platform/utility.h"
#include "tests/host/files.h"

#include <gmock/gmock.h>

#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <map>
#include <thread>

namespace {

constexpr int kWriters = 16;
constexpr int kSets = 200;
constexpr const char *kPath = "/etc/race/file.conf";

std::string Key(int writer, int number) {
  return "w" + std::to_string(writer) + "_" + std::to_string(number);
}

std::string Value(int writer, int number) {
  return "value of " + Key(writer, number) + " end";
}

// @return how many sets were acknowledged
int WriteAll(int writer) {
  int done = 0;
  for (int number = 0; number < kSets; ++number) {
    if (QARDCFileSetKeyValue(kPath, Key(writer, number).c_str(), Value(writer, number).c_str(), "%s=%s\n") == 0) {
      ++done;
    }
  }
  return done;
}

std::map<std::string, std::string> Everything() {
  std::map<std::string, std::string> out;
  for (int writer = 0; writer < kWriters; ++writer) {
    for (int number = 0; number < kSets; ++number) {
      out[Key(writer, number)] = Value(writer, number);
    }
  }
  return out;
}

// @return the file's pairs; fails the test when a line is not whole
std::map<std::string, std::string> ReadPairs() {
  std::map<std::string, std::string> out;
  const std::string content = hosttest::ReadText(kPath);
  EXPECT_TRUE(content.empty() || content.back() == '\n');
  vornhost::LineReader reader(content);
  for (std::string_view text; reader.Next(text);) {
    const vornhost::Line line = vornhost::ParseLine(text);
    EXPECT_EQ(line.value, "value of " + std::string(line.key) + " end");
    out.emplace(line.key, line.value);
  }
  return out;
}

class ConcurrentWriters : public testing::Test {
protected:
  void SetUp() override {
    hosttest::FreshFolder("/etc/race");
    hosttest::WriteText(kPath, "");
  }
  void TearDown() override {
    EXPECT_EQ(ReadPairs(), Everything());
    EXPECT_THAT(hosttest::NamesIn("/etc/race"), testing::ElementsAre("file.conf"));
  }
};

TEST_F(ConcurrentWriters, ProcessesLoseNothing) {
  std::vector<pid_t> children;
  for (int writer = 0; writer < kWriters; ++writer) {
    children.push_back(fork());
    if (children.back() == 0) {
      _exit(WriteAll(writer) == kSets ? 0 : 1);
    }
  }
  size_t running = children.size();
  size_t before = 0;
  while (running > 0) {
    const size_t now = ReadPairs().size();
    ASSERT_GE(now, before) << "a key that was there is gone";
    before = now;
    int status = 0;
    if (waitpid(-1, &status, WNOHANG) > 0) {
      EXPECT_EQ(status, 0);
      --running;
    }
  }
}

TEST_F(ConcurrentWriters, ThreadsLoseNothing) {
  std::atomic<int> running = kWriters;
  std::vector<std::thread> threads;
  threads.reserve(kWriters);
  for (int writer = 0; writer < kWriters; ++writer) {
    threads.emplace_back([writer, &running] {
      EXPECT_EQ(WriteAll(writer), kSets);
      --running;
    });
  }
  size_t before = 0;
  while (running > 0) {
    const size_t now = ReadPairs().size();
    EXPECT_GE(now, before) << "a key that was there is gone";
    before = now;
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
}

// Every writer sets the same key: what stands at the end is what was acknowledged last.
TEST(ConcurrentSets, TheLastAcknowledgedValueStands) {
  hosttest::FreshFolder("/etc/race");
  constexpr int kThreads = 4;
  std::vector<std::thread> threads;
  threads.reserve(kThreads);
  for (int writer = 0; writer < kThreads; ++writer) {
    threads.emplace_back([writer] {
      for (int number = 0; number < kSets; ++number) {
        EXPECT_EQ(QARDCFileSetKeyValue(kPath, "same", Value(writer, number).c_str(), "%s=%s\n"), 0);
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  // One of the writers' last values, since each writes in its own order.
  const std::string content = hosttest::ReadText(kPath);
  int matches = 0;
  for (int writer = 0; writer < kThreads; ++writer) {
    matches += content == "same=" + Value(writer, kSets - 1) + "\n" ? 1 : 0;
  }
  EXPECT_EQ(matches, 1) << content;
}

} // namespace
