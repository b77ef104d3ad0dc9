// The contract's headers, all of them together, and the layouts that static_assert cannot see.
#include "platform/interface.h"
#include "platform/netclient.h"
#include "platform/netif.h"
#include "platform/network.h"
#include "platform/packageserver.h"
#include "platform/portforward.h"
#include "platform/schedule.h"
#include "platform/utility.h"
#include "platform/webapi.h"
#include "platform/wifi.h"

#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <new>
#include <string>

using vorn::network::BridgeInterface;
using vorn::network::EthernetInterface;

static_assert(std::is_base_of_v<EthernetInterface, BridgeInterface>);
static_assert(!std::has_virtual_destructor_v<vornwireless::dbus::WifiClient>);

namespace {

std::string called;

} // namespace

namespace vorn::network {

EthernetInterface::EthernetInterface(const std::string &name) : name_(name) {}

EthernetInterface::~EthernetInterface() {
  called += "destroy ";
}

int EthernetInterface::LoadData() {
  called += "load ";
  return 42;
}

BridgeInterface::BridgeInterface(const std::string &name) : EthernetInterface(name) {}

BridgeInterface::~BridgeInterface() {
  called += "bridge-destroy ";
}

int BridgeInterface::LoadData() {
  called += "bridge-load ";
  return 43;
}

} // namespace vorn::network

namespace {

// The Itanium C++ ABI: an object with virtual operations begins with a pointer to the table of them.
using Slot = void (*)();
Slot SlotOf(const void *object, size_t index) {
  const Slot *table = nullptr;
  std::memcpy(static_cast<void *>(&table), object, sizeof(table));
  return table[index];
}

int CallLoad(void *object) {
  return reinterpret_cast<int (*)(void *)>(SlotOf(object, 2))(object);
}

TEST(InterfaceObjects, VirtualOperationsAreInTheirSlots) {
  alignas(EthernetInterface) unsigned char room[sizeof(EthernetInterface)];
  auto *inPlace = new (room) EthernetInterface("eth0");
  called.clear();
  EXPECT_EQ(CallLoad(inPlace), 42);
  EXPECT_EQ(called, "load ");
  reinterpret_cast<void (*)(void *)>(SlotOf(inPlace, 0))(inPlace); // complete: the room stays
  EXPECT_EQ(called, "load destroy ");

  auto *onHeap = new BridgeInterface("br0");
  called.clear();
  EXPECT_EQ(CallLoad(onHeap), 43);
  reinterpret_cast<void (*)(void *)>(SlotOf(onHeap, 1))(onHeap); // deleting: a leak checker sees what it leaves
  EXPECT_EQ(called, "bridge-load bridge-destroy destroy ");
}

TEST(Layouts, RecordsAreWhereOthersExpectThem) {
  // Written at the documented offsets, read by name: what a platform built by another compiler would do.
  unsigned char bytes[132] = {};
  std::memcpy(bytes, "abcdefghijklmnopqrstu", 22);
  std::memcpy(bytes + 22, "192.168.100.200", 16);
  std::memcpy(bytes + 112, "255.255.255.252", 16);
  QARDNetInterface entry;
  std::memcpy(&entry, bytes, sizeof(entry));
  EXPECT_STREQ(entry.name, "abcdefghijklmnopqrstu");
  EXPECT_STREQ(entry.ip, "192.168.100.200");
  EXPECT_STREQ(entry.mask, "255.255.255.252");
}

} // namespace
