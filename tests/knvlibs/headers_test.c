/* The public headers are C, and a program in C reads a host with them. */
#include <stdio.h>
#include <string.h>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include <knvlibs/ksi_status.h>
#include <knvlibs/ksi_status_text.h>

_Static_assert(sizeof(struct KSI_BuddyStats) == KSI_SIZE_BuddyStats, "a record and its size");
_Static_assert(sizeof(KSI_GroupFlags) == KSI_SIZE_GroupFlags, "a number and its size");
_Static_assert(KSI_SIZE_None == 0, "a node without a value");
_Static_assert(KSI_NO_VALUE == UINT64_MAX && KSI_NO_VALUE_OF(32) == UINT32_MAX, "all ones");

uint32_t NameOfFirstChild(const char* fileName, char* name, size_t size);
void KeepText(void* context, const char* text);

/* A diagnostic handler: `context` is an array of 64 bytes. */
void KeepText(void* context, const char* text) { (void)snprintf((char*)context, 64, "%s", text); }

/* Writes the name of the root's first child in the cache file, cut to `size`, into `name`. */
uint32_t NameOfFirstChild(const char* fileName, char* name, size_t size) {
  struct KSI_Source* source = NULL;
  struct KSI_ParamList* keys = KSI_ParamListCreate(1, 2);
  struct KSI_ParamList* children = NULL;
  struct KSI_GroupName record;
  int64_t child = 0;
  uint32_t status = KSI_OpenCache(fileName, &source);
  if (status == 0) status = KSI_ParamListAddInt(keys, 0);
  if (status == 0) {
    status = KSI_SourceGetInstanceListAlloc(source, KSI_NODE_sched_groups_members_groups, keys,
                                            &children);
  }
  if (status == 0) status = KSI_ParamListGetInt64(children, 0, &child);
  KSI_ParamListRemoveLastParam(keys);
  if (status == 0) status = KSI_ParamListAddInt(keys, (uint64_t)child);
  if (status == 0) {
    status = KSI_SourceGet(source, KSI_NODE_sched_groups_groupName, keys, &record, sizeof record);
  }
  if (status == 0) (void)snprintf(name, size, "%.*s", (int)sizeof record.text, record.text);
  KSI_ParamListDestroy(children);
  KSI_ParamListDestroy(keys);
  KSI_CloseSource(source);
  return status;
}
