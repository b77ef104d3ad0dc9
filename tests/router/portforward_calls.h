// What the tests of the PortForward, DMZ and LocalLan rows share: calls as they are recorded.
#ifndef TESTS_ROUTER_PORTFORWARD_CALLS_H
#define TESTS_ROUTER_PORTFORWARD_CALLS_H

#include "tests/router/scripted_platform.h"

#include <string>

namespace scripted {

inline const std::string kFolder = "/etc/portforward/routerpf";
inline const std::string kCheckFolder = "QARDCFileCheckDir(" + kFolder + ")";
inline const std::string kMkdir = "QARDCExec(/bin/mkdir, -p, " + kFolder + ", null, null)";
inline const std::string kRestart = "QARDCExec(/etc/rc.network, start-dnat, null, null, null)";

} // namespace scripted

#endif
