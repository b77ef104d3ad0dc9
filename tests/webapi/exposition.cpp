#include "tests/webapi/exposition.h"

#include <cmath>
#include <cstdlib>
#include <limits>
#include <map>
#include <regex>
#include <set>
#include <sstream>
#include <stdexcept>

namespace vorntest {
namespace {

struct Histogram {
  double bound = -std::numeric_limits<double>::infinity();
  double count = 0;
  double total = -1; // of _count
  bool sum = false;
};

void Demand(bool good, const char *fault) {
  if (!good) {
    throw std::runtime_error(fault);
  }
}

double Number(const std::string &text) {
  if (text == "+Inf") {
    return std::numeric_limits<double>::infinity();
  }
  Demand(text.find_first_not_of("0123456789+-.e") == std::string::npos, "no number");
  char *end = nullptr;
  const double value = std::strtod(text.c_str(), &end);
  Demand(!text.empty() && *end == '\0', "no number");
  return value;
}

class Reader {
public:
  void Line(const std::string &line) {
    static const std::regex head("# (HELP|TYPE) ([a-zA-Z_:][a-zA-Z0-9_:]*) (\\S.*\\S|\\S)");
    std::smatch parts;
    Demand(!line.empty(), "an empty line");
    if (line.front() != '#') {
      Sample(line);
      return;
    }
    Demand(std::regex_match(line, parts, head), "neither HELP nor TYPE");
    parts[1] == "HELP" ? Help(parts[2]) : Type(parts[2], parts[3]);
  }
  /// A family is over.
  void Finish() {
    Demand(name_.empty() || samples_ > 0, "a family without samples");
    for (const auto &[labels, histogram] : histograms_) {
      Demand(std::isinf(histogram.bound), "a histogram without +Inf");
      Demand(histogram.sum && histogram.total == histogram.count, "_sum or _count is missing, or another than +Inf's");
    }
    histograms_.clear();
  }

private:
  void Help(const std::string &name) {
    Finish();
    Demand(families_.insert(name).second, "a family twice");
    name_ = name;
    type_.clear();
    samples_ = 0;
  }
  void Type(const std::string &name, const std::string &type) {
    Demand(name == name_ && type_.empty(), "TYPE does not follow its HELP");
    Demand(type == "counter" || type == "gauge" || type == "histogram", "no such type");
    Demand((type == "counter") == (name.size() > 6 && name.substr(name.size() - 6) == "_total"),
           "_total is for counters");
    type_ = type;
  }
  void Sample(const std::string &line) {
    static const std::regex form(R"RE(([a-zA-Z_:][a-zA-Z0-9_:]*)(?:\{(.+)\})? (\S+))RE");
    std::smatch parts;
    Demand(std::regex_match(line, parts, form), "no sample");
    Demand(!type_.empty(), "a sample without TYPE");
    Demand(series_.insert(parts[1].str() + '{' + parts[2].str()).second, "a series twice");
    std::map<std::string, std::string> labels = Labels(parts[2]);
    const double value = Number(parts[3]);
    Demand(type_ == "gauge" || (value >= 0 && std::isfinite(value)), "below 0, or not finite");
    ++samples_;
    if (type_ != "histogram") {
      Demand(parts[1] == name_, "a sample of another family");
      return;
    }
    Demand(parts[1].str().rfind(name_ + '_', 0) == 0, "a sample of another family");
    OfHistogram(parts[1].str().substr(name_.size()), labels, value);
  }
  static std::map<std::string, std::string> Labels(std::string text) {
    static const std::regex form(R"RE(([a-zA-Z_][a-zA-Z0-9_]*)="((?:[^"\\]|\\[\\"n])*)"(,(?=.)|$)([^]*))RE");
    std::map<std::string, std::string> labels;
    while (!text.empty()) {
      std::smatch parts;
      Demand(std::regex_match(text, parts, form), "no label");
      Demand(labels.emplace(parts[1], parts[2]).second, "a label twice");
      Demand(parts[1].str().rfind("__", 0) != 0, "a label of the scraper's own");
      text = parts[4].str();
    }
    return labels;
  }
  void OfHistogram(const std::string &suffix, std::map<std::string, std::string> &labels, double value) {
    const auto bound = labels.find("le");
    Demand((bound != labels.end()) == (suffix == "_bucket"), "le is for buckets");
    const double le = bound == labels.end() ? 0 : Number(bound->second);
    labels.erase("le");
    Histogram &histogram = histograms_[labels];
    if (suffix == "_bucket") {
      Demand(le > histogram.bound && value >= histogram.count, "bounds or counts that do not rise");
      histogram.bound = le;
      histogram.count = value;
    } else if (suffix == "_sum") {
      histogram.sum = true;
    } else {
      Demand(suffix == "_count", "a sample of another family");
      histogram.total = value;
    }
  }

  std::string name_;
  std::string type_;
  size_t samples_ = 0;
  std::set<std::string> families_;
  std::set<std::string> series_;
  std::map<std::map<std::string, std::string>, Histogram> histograms_;
};

} // namespace

std::string FaultOfExposition(const std::string &text) {
  if (text.empty() || text.back() != '\n') {
    return "no line end at the end";
  }
  Reader reader;
  std::istringstream lines(text);
  std::string line;
  try {
    while (std::getline(lines, line)) {
      reader.Line(line);
    }
    line = "the end";
    reader.Finish();
  } catch (const std::runtime_error &fault) {
    return line + ": " + fault.what();
  }
  return {};
}

} // namespace vorntest
