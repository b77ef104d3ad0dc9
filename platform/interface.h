// Interface objects: what is known of a network interface, and where the router can be reached over it.
#ifndef PLATFORM_INTERFACE_H
#define PLATFORM_INTERFACE_H

#include <json/value.h>

#include <string>

namespace VORN {
class APIRequest;
}

namespace vorn::network {

class NetworkHandler {
public:
  /// Tells the network library on whose behalf the calling thread's next interface objects are used. The pointer is
  /// kept for the thread and read by GetRedirectNetInfo on the same thread; null clears it.
  static void SetAPIRequest(VORN::APIRequest *request);
};

/// A network interface by name. An object belongs to one thread.
/// Virtual operations in slot order: complete destructor, deleting destructor, LoadData.
class EthernetInterface {
public:
  explicit EthernetInterface(const std::string &name);
  virtual ~EthernetInterface();
  EthernetInterface(const EthernetInterface &) = delete;
  EthernetInterface &operator=(const EthernetInterface &) = delete;

  /// Reads the interface from the kernel. May be repeated; the latest reading stands.
  /// @retval 0   done
  /// @retval <0  no such interface, or the kernel cannot be asked; the object then has no addresses
  virtual int LoadData();

  /// How the router will be reached over this interface.
  /// @param[out] result  object: "redirect" (boolean: the caller should go to one of the addresses), "secure" (boolean:
  ///                     over TLS), "port" (text, decimal), "auth_key" (text), "ip_list" (array of addresses as text,
  ///                     IPv4 first, link-local ones left out)
  /// @retval 0  done
  int GetRedirectNetInfo(Json::Value &result);

protected:
  const std::string &GetName() const { return name_; }
  void DropData(); ///< forgets the last reading

private:
  std::string name_;
  Json::Value addresses_;
};

/// A bridge. LoadData fails on an interface that is none.
class BridgeInterface : public EthernetInterface {
public:
  explicit BridgeInterface(const std::string &name);
  ~BridgeInterface() override;
  int LoadData() override;
};

} // namespace vorn::network

#endif
