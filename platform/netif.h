// Network interfaces of the router, with IPv4 addresses as text. Every function may be called from several threads at
// once; none keeps a pointer.
#ifndef PLATFORM_NETIF_H
#define PLATFORM_NETIF_H

#include <stddef.h>

#ifdef __cplusplus
extern "C" {
#endif

/// One entry of the enumeration, 132 bytes. Texts are NUL-terminated; an interface without an IPv4 address has empty
/// ones.
struct QARDNetInterface {
  char name[22];
  char ip[16]; ///< dotted decimal
  char reserved[74];
  char mask[16]; ///< dotted decimal
  char reserved2[4];
};

enum {
  QARD_NETIF_ALL = 0, ///< every interface
  QARD_NETIF_LAN = 2  ///< the LAN-side interfaces that have an IPv4 address: LAN and guest bridge, or the one bridge
};

/// @param[out] entries   filled with one entry an interface, in the kernel's order; unused bytes are zero
/// @param[in]  capacity  how many entries there is room for; further interfaces are left out
/// @param[in]  kind      QARD_NETIF_ALL or QARD_NETIF_LAN
/// @return how many entries were filled; 0 when there is no such interface, negative when the kernel cannot be asked or
/// an
///         argument is wrong
int QARDNetInterfaceEnum(struct QARDNetInterface *entries, int capacity, int kind);

struct VORNNetIFInfo {
  char ip[16];   ///< IPv4 address, dotted decimal
  char mask[16]; ///< its netmask, dotted decimal
};

/// @param[in]  name   an interface's name
/// @param[in]  flags  0
/// @param[out] info   the interface's first IPv4 address and its netmask
/// @retval 1   done
/// @retval <0  no such interface, it has no IPv4 address, or the kernel cannot be asked; the cause is in QARDCErrGet
int VORNNetIFGetInfo(const char *name, int flags, struct VORNNetIFInfo *info);

/// @param[in] address           IPv4 address, dotted decimal
/// @param[in] interfaceAddress  an interface's address
/// @param[in] interfaceNetmask  its netmask
/// @retval 1   `address` lies in the interface's subnet
/// @retval 0   it does not
/// @retval <0  an argument is null, no address or no netmask
int VORNNetIsSameSubnet(const char *address, const char *interfaceAddress, const char *interfaceNetmask);

#ifdef __cplusplus
}

static_assert(sizeof(QARDNetInterface) == 132);
static_assert(offsetof(QARDNetInterface, name) == 0);
static_assert(offsetof(QARDNetInterface, ip) == 22);
static_assert(offsetof(QARDNetInterface, mask) == 112);
#endif

#endif
