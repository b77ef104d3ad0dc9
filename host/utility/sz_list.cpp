#include "host/utility/sz_list.h"

#include "host/export.h"
#include "host/utility/error.h"
#include "host/utility/sz_room.h"

QARDCSzList::QARDCSzList(size_t room) {
  texts_.reserve(vornhost::RoomFor(room));
}

VORN_EXPORT QARDCSzList *QARDCSzListAlloc(size_t size) {
  return vornhost::Guarded(static_cast<QARDCSzList *>(nullptr), [&size] { return new QARDCSzList(size); });
}

VORN_EXPORT const char *QARDCSzListGet(QARDCSzList *list, int index) {
  if (list == nullptr || index < 0) {
    vornhost::SetError(QARDC_ERR_BAD_ARGUMENT);
    return nullptr;
  }
  const auto at = static_cast<size_t>(index);
  return at < list->Texts().size() ? list->Texts()[at].c_str() : nullptr;
}

VORN_EXPORT void QARDCSzListFree(QARDCSzList *list) {
  delete list;
}
