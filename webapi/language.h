#ifndef WEBAPI_LANGUAGE_H
#define WEBAPI_LANGUAGE_H

#include <string>
#include <string_view>

namespace vornwebapi {

/// The user-interface language that a caller's Accept-Language field (RFC 9110, section 12.5.4) likes best.
/// @param[in] acceptLanguage  the field's value, of any content
/// @return a language code of three letters; "enu" when the field names none that is known
std::string LanguageCode(std::string_view acceptLanguage);

} // namespace vornwebapi

#endif
