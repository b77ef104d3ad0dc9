// Client devices as the network shows them now: the wireless daemon's stations and the kernel's neighbours, with names
// asked for by NetBIOS. That takes seconds a device, so the listing is a poll task.
#ifndef ROUTER_CONNECTIONLIST_H
#define ROUTER_CONNECTIONLIST_H

#include "platform/webapi.h"
#include "router/export.h"

#include <string>

/// Has no state: what a listing leaves behind is the file of its names, "/tmp/connectionlist.txt". The members that
/// return a truth value give true on success.
class ROUTER_EXPORT ConnectionList {
public:
  ConnectionList();
  ~ConnectionList();

  /// Answers with the state of the user's listing, or starts one when there is none. The finished list is given once:
  /// the answer that says so ends the task.
  void GetList(VORN::APIRequest *request, VORN::APIResponse *response);

  /// @param[out] id  the first task of this module that the framework lists for the request's user
  /// @retval 0   found
  /// @retval -1  there is none, or the framework cannot list: then that is answered
  int GetPollId(VORN::APIRequest *request, VORN::APIResponse *response, std::string &id);
  void PollStart(VORN::APIRequest *request, VORN::APIResponse *response);
  void PollStatus(VORN::APIRequest *request, VORN::APIResponse *response, const std::string &id);

  /// The task's function.
  /// @param[in] context  the object that started the task; it has nothing to tell and may be gone
  static void WrapperFunc(VORN::APIRequest *request, VORN::APIResponse *response, void *context);
  /// The listing. Gives the task's response the list again and again, as it grows.
  void DoPollingTask(VORN::APIRequest *request, VORN::APIResponse *response);

  /// @param[in,out] stations  array: the stations of every main and guest network that is on are appended
  /// @return false when the daemon is ready but cannot list its adapters
  bool LoadWirelessConnData(Json::Value &stations);
  /// Gives every station the members that the daemon does not know.
  bool AssignDetailInfo(Json::Value &stations);

  /// @param[in,out] stations  array: a record for each neighbour on a bridge and in that bridge's subnet is appended
  /// @return false when the kernel's table cannot be opened
  bool LoadArpConnData(Json::Value &stations);
  /// @return whether the record's address lies in the subnet of the interface that it was seen on
  bool CheckArpObject(const Json::Value &record);
  /// Has the kernel forget and learn again every neighbour on a bridge, so that who has gone is not in the next list.
  /// Takes up to a second a neighbour.
  /// @return false when it did not start: no table, or a topology without a LAN bridge
  bool UpdateArpTable();
  /// @param[in] pattern  POSIX extended regular expression; one that does not compile matches nothing
  bool RegMatch(const char *text, const char *pattern);

  /// Merges the wired records into the stations, by MAC address.
  /// @param[in,out] arpStations  array; the records that are appended are moved out of it
  /// @return false when one of them is no array
  bool CombineJsonData(Json::Value &stations, Json::Value &arpStations);
  /// Gives stations without a name the one that the last listing had for their address.
  /// @param[in,out] result  object: "stations"
  void ApplyOldHostName(Json::Value &result);
  /// Asks every station for its NetBIOS name, answers after each, and keeps the list for the next time.
  void UpdateHostName(Json::Value &result, VORN::APIResponse *response);
  /// Asks one host, which takes as long as nmblookup waits for it.
  /// @param[in]     ip    an address: it becomes part of a command line, and whoever reports stations has checked it
  /// @param[in,out] name  left as it is when the host has none to tell
  /// @retval 0   asked
  /// @retval -1  the command could not be started, or the address holds a NUL
  int GetNetBIOSNameByIP(const std::string &ip, std::string &name);

  void WriteDataToFile(const Json::Value &result);
  /// @param[in,out] result  what could be read of the file; left as it is when there is none, or one that is not read
  ///                        (see router/namecache.h)
  void ReadDataFromFile(Json::Value &result);
};

#endif
