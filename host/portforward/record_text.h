// The rule file's text: a section for each record, in order, its name in brackets, its pairs as key="value".
#ifndef HOST_PORTFORWARD_RECORD_TEXT_H
#define HOST_PORTFORWARD_RECORD_TEXT_H

#include "platform/portforward.h"

#include <memory>
#include <string>
#include <string_view>

namespace vornhost {

struct RecordListDeleter {
  void operator()(VORNPFRecord *head) const { VORNPFConfFree(head); }
};
/// Null is a list without a record.
using RecordList = std::unique_ptr<VORNPFRecord, RecordListDeleter>;

/// Reads as far as the text goes. Of a text that was cut, the record at the cut lacks its last pairs, or has a value
/// with an opening quote only, which is no port and no address.
/// @retval 0   done
/// @retval <0  with the error set
int ParseRecords(std::string_view content, RecordList &head);

/// @param[out] content  the text; parsing it gives back the same list
/// @retval 0   done
/// @retval <0  with the error set: a record without a name or pairs, a text that cannot be kept whole, or too much
int RenderRecords(const VORNPFRecord *head, std::string &content);

} // namespace vornhost

#endif
