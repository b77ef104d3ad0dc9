// What libvornwebapi.so shows: everything is hidden except what is marked here. A class of the contract is marked by
// declaring it before its header is read.
#ifndef WEBAPI_EXPORT_H
#define WEBAPI_EXPORT_H

#define VORN_WEBAPI_EXPORT __attribute__((visibility("default")))

namespace VORN {
class VORN_WEBAPI_EXPORT APIRequest;
class VORN_WEBAPI_EXPORT APIResponse;
class VORN_WEBAPI_EXPORT APIPolling;
} // namespace VORN

#endif
