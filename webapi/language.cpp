#include "webapi/language.h"

#include "webapi/text.h"

#include <algorithm>
#include <array>
#include <utility>

namespace vornwebapi {
namespace {

constexpr const char *kDefault = "enu";

// ISO 639-1, and the code that modules get: ISO 639-2/B but for English.
constexpr std::array<std::pair<std::string_view, const char *>, 18> kLanguages = {{{"en", kDefault},
                                                                                   {"de", "ger"},
                                                                                   {"fr", "fre"},
                                                                                   {"it", "ita"},
                                                                                   {"es", "spa"},
                                                                                   {"pt", "por"},
                                                                                   {"nl", "dut"},
                                                                                   {"sv", "swe"},
                                                                                   {"da", "dan"},
                                                                                   {"no", "nor"},
                                                                                   {"pl", "pol"},
                                                                                   {"cs", "cze"},
                                                                                   {"hu", "hun"},
                                                                                   {"tr", "tur"},
                                                                                   {"ru", "rus"},
                                                                                   {"ja", "jpn"},
                                                                                   {"ko", "kor"},
                                                                                   {"zh", "chi"}}};

/// "q=0.8" in thousandths; 1000 when there is none, 0 when it is none of that form.
int Weight(std::string_view parameter) {
  if (parameter.empty()) {
    return 1000;
  }
  if (parameter.size() < 3 || parameter.size() > 7 || parameter.substr(0, 2) != "q=") {
    return 0;
  }
  int weight = 0;
  int unit = 1000;
  for (const char c : parameter.substr(2)) {
    if (c == '.' && unit == 100) {
      continue;
    }
    if (c < '0' || c > '9') {
      return 0;
    }
    weight += (c - '0') * unit;
    unit /= 10;
  }
  return std::min(weight, 1000);
}

const char *Known(std::string_view range) {
  const std::string primary = Lower(range.substr(0, range.find('-')));
  const auto *const found = std::find_if(kLanguages.begin(), kLanguages.end(),
                                         [&primary](const auto &entry) { return entry.first == primary; });
  return found == kLanguages.end() ? nullptr : found->second;
}

} // namespace

std::string LanguageCode(std::string_view acceptLanguage) {
  const char *best = kDefault;
  int bestWeight = 0;
  while (!acceptLanguage.empty()) {
    const size_t comma = std::min(acceptLanguage.find(','), acceptLanguage.size());
    const std::string_view entry = acceptLanguage.substr(0, comma);
    const size_t semicolon = std::min(entry.find(';'), entry.size());
    const char *code = Known(Trim(entry.substr(0, semicolon)));
    const int weight = Weight(Trim(entry.substr(std::min(semicolon + 1, entry.size()))));
    if (code != nullptr && weight > bestWeight) {
      best = code;
      bestWeight = weight;
    }
    acceptLanguage.remove_prefix(std::min(comma + 1, acceptLanguage.size()));
  }
  return best;
}

} // namespace vornwebapi
