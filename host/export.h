// What the platform library shows. Everything is hidden (-fvisibility=hidden) except what is marked here.
//
// A function of the contract is marked at its definition. A class is marked before its header is read, so that its
// table of virtual functions is shown too:
//   namespace vorn::network { class VORN_EXPORT EthernetInterface; }
//   #include "platform/interface.h"
#ifndef HOST_EXPORT_H
#define HOST_EXPORT_H

#define VORN_EXPORT __attribute__((visibility("default")))

#endif
