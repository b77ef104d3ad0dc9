// A strict reader of Prometheus' text format 0.0.4.
#ifndef TESTS_WEBAPI_EXPOSITION_H
#define TESTS_WEBAPI_EXPOSITION_H

#include <string>

namespace vorntest {

/// @return what a scraper or its linter would object to, with the line; empty when there is nothing. Beyond the format:
/// every family has HELP, TYPE and samples, in this order and in one piece; counters end in _total and are not
/// negative; histograms have rising bounds and counts, +Inf, _sum and _count.
std::string FaultOfExposition(const std::string &text);

} // namespace vorntest

#endif
