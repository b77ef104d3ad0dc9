// The module's log: every failure goes to the system log at LOG_ERR, with the unit that reports it and the line in it.
#ifndef ROUTER_LOG_H
#define ROUTER_LOG_H

#include <syslog.h>

// `format` is the whole text as it stands in the log's documentation, with its leading "%s:%d ". REQUIRES: kUnit, the
// name of the unit, is in scope.
#define ROUTER_LOG(format, ...) syslog(LOG_ERR, format, kUnit, __LINE__ __VA_OPT__(, ) __VA_ARGS__)

#endif
