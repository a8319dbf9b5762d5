#include "framework/return_status.h"

#include <knvlibs/ksi_status_text.h>

#define TEXT(row, message) message,
const char* const returnStatusStrs[] = {KSI_STATUS_TEXTS(TEXT)};
#undef TEXT

const char* KNV_ReturnStatusToString(uint32_t status) {
  return KSI_FindStatusText(returnStatusStrs, status);
}
