// The snapshot as text: what is read back is what was written, to the byte.
#include "host/network/topology_snapshot.h"

#include <gtest/gtest.h>

namespace {

using vornhost::LinkState;
using vornhost::ParseSnapshot;
using vornhost::Snapshot;
using vornhost::SnapshotText;

Snapshot WithPort(const std::string &name) {
  Snapshot out;
  out.from = "router";
  out.to = "bridge";
  LinkState port;
  port.link.name = name;
  port.link.mac = "02:00:5e:10:00:01";
  out.links.push_back(port);
  return out;
}

TEST(SnapshotText, FileWithBytesThatAreNoUtf8ComesBackAsItWas) {
  Snapshot snapshot = WithPort("eth0");
  snapshot.wanFile = "# Anschlu\xdf\nSLAVE=no\n# \xc3\xa4 \"\\ \t end\r\n";
  const auto back = ParseSnapshot(SnapshotText(snapshot));
  ASSERT_TRUE(back);
  EXPECT_EQ(back->wanFile, snapshot.wanFile);
  EXPECT_EQ(SnapshotText(*back), SnapshotText(snapshot));
}

TEST(SnapshotText, MissingFileIsNotAnEmptyOne) {
  Snapshot snapshot = WithPort("eth0");
  EXPECT_EQ(ParseSnapshot(SnapshotText(snapshot))->wanFile, std::nullopt);
  snapshot.wanFile = "";
  EXPECT_EQ(ParseSnapshot(SnapshotText(snapshot))->wanFile, "");
}

TEST(SnapshotText, WhatIsNoSnapshotIsNotRead) {
  for (const char *text : {"", "{}", "[]", "{\"from\":1}", "{\"links\":[]}", "{\"links\":[{}]}"}) {
    EXPECT_FALSE(ParseSnapshot(text)) << text;
  }
}

} // namespace
