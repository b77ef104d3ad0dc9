// A device store that is damaged: its devices, what makes it damaged, and what is to be seen then.
#ifndef TESTS_HOST_DEVICES_DAMAGED_STORE_SCENE_H
#define TESTS_HOST_DEVICES_DAMAGED_STORE_SCENE_H

#include "host/devices/device.h"

#include <gmock/gmock.h>
#include <json/value.h>

#include <string>

namespace hosttest {

constexpr char kAside[] = "/var/lib/vorn/devices.db.damaged";
constexpr char kMac[] = "d4:3d:7e:11:22:33";
constexpr size_t kPageSize = 4096;

std::string MacOf(int number);
vornhost::Device DeviceOf(const std::string &mac);

/// The owner names a device. @return what the interface returns
int Name(const std::string &mac, const std::string &name);
Json::Value List();

/// As after an orderly end: everything is in one file.
void Settle();
std::string Overwritten(std::string content, size_t from, size_t count, char byte);
/// A store of many devices, each of which the owner has named. @return its path
std::string FullStore(int count = 400);
/// The root page of a table, from 0.
size_t RootOf(const std::string &table);

size_t Lines(const std::string &text);
/// The log's lines since the last call: those that were sent before it, however late they are read.
std::string LogSoFar();

class DamagedStore : public testing::Test {
protected:
  static void SetUpTestSuite();
  DamagedStore();

  /// The store works, what was in its place is kept as it was, and the log says so once.
  static void ExpectPutAside(const std::string &content);
  static void ExpectKept(const std::string &content);
  /// Neither read nor moved.
  static void ExpectRefused();
};

} // namespace hosttest

#endif
