/* The operations of libknvlibs.so, the kernel information library.
 *
 * The kernel's information tree (KSI) is a tree of named nodes. A node's value is a record of fixed
 * size (ksi_records.h); some levels of the tree are instances, which a parameter list of integer
 * and string keys selects in path order. Every operation that can fail returns a status, 0 for
 * success (ksi_status.h); one that fails leaves its outputs as they were.
 *
 * The library is called from one thread at a time.
 */
#ifndef KNVLIBS_KSI_H_
#define KNVLIBS_KSI_H_

#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* A list of keys, or of instances. Opaque: the library's own. */
struct KSI_ParamList;

/* Answers every later read from the cache file `fileName`. `flags` is 0. */
uint32_t KSI_UseCache(const char* fileName, int flags);

/* Compares the library's definitions with those of the kernel (or of the cache file) it reads.
 * `buildBuffer` of `size` (21) bytes receives the date the kernel's definitions were built,
 * `*appBuild` the date of the library's own, both as "Nov 21 2026 10:00:00"; both are filled
 * whatever the status. */
uint32_t KSI_CheckSig(char* buildBuffer, size_t size, const char** appBuild);

/* Reads the value of `node` for `keys` (NULL: no keys) into `buffer`. `size` is the exact size of
 * the record; another size fails with KSI_STATUS_LENGTH_MISMATCH. */
uint32_t KSI_Get(uint16_t node, struct KSI_ParamList* keys, void* buffer, size_t size);

/* Lists the instances of `node` for `keys` (NULL: no keys) into `list`, which was made with room
 * for them; more instances than room fail with KSI_STATUS_TOO_MANY_ELEMENTS. */
uint32_t KSI_GetInstanceList(uint16_t node, struct KSI_ParamList* keys, struct KSI_ParamList* list);

/* The same into a list made to fit. On success `*list` is the caller's to destroy. */
uint32_t KSI_GetInstanceListAlloc(uint16_t node, struct KSI_ParamList* keys,
                                  struct KSI_ParamList** list);

/* The same; `hint` is the number of instances to expect and never limits the result. */
uint32_t KSI_GetInstanceListAllocHint(uint16_t node, struct KSI_ParamList* keys, uint32_t hint,
                                      struct KSI_ParamList** list);

/* Makes an empty list of at most `capacity` entries; NULL on failure. `version` is 1. */
struct KSI_ParamList* KSI_ParamListCreate(int version, int capacity);

/* The same with `bytes` of room for the text of string entries. */
struct KSI_ParamList* KSI_ParamListCreateAndAllocateParams(int version, int capacity, size_t bytes);

/* Append an entry; a string is copied. A full list fails with KSI_STATUS_TOO_MANY_ELEMENTS. */
uint32_t KSI_ParamListAddInt(struct KSI_ParamList* list, uint64_t value);
uint32_t KSI_ParamListAddString(struct KSI_ParamList* list, const char* text);

/* Removes the last entry; an empty list stays as it is. */
void KSI_ParamListRemoveLastParam(struct KSI_ParamList* list);

/* The number of entries. */
uint32_t KSI_ParamListUsedCount(struct KSI_ParamList* list);

/* Read the entry at `index`: past the end is KSI_STATUS_NOT_FOUND, an entry of the other kind
 * KSI_STATUS_BAD_PARAM_TYPE. GetUInt32 gives the low 32 bits; the string of GetString belongs to
 * the list and lives as long. */
uint32_t KSI_ParamListGetInt64(struct KSI_ParamList* list, uint32_t index, int64_t* out);
uint32_t KSI_ParamListGetUInt32(struct KSI_ParamList* list, uint32_t index, uint32_t* out);
uint32_t KSI_ParamListGetString(struct KSI_ParamList* list, uint32_t index, const char** out);

/* Frees a list: once per list. */
void KSI_ParamListDestroy(struct KSI_ParamList* list);

/* Writes the formatted text to standard error: no prefix, no newline of its own. */
#ifdef __GNUC__
__attribute__((format(printf, 1, 2)))
#endif
void Warning(const char *format, ...);

/* Copies at most `size` - 1 bytes of `source` and terminates; returns `destination`. */
char* Str_Strcpy(char* destination, const char* source, size_t size);

#ifdef __cplusplus
}
#endif

#endif /* KNVLIBS_KSI_H_ */
