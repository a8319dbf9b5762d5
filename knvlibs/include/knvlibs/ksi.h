/* The operations of libknvlibs.so, the kernel information library.
 *
 * The kernel's information tree (KSI) is a tree of named nodes. A node's value is a record of fixed
 * size (ksi_records.h); some levels of the tree are instances, which a parameter list of integer
 * and string keys selects in path order. Every operation that can fail returns a status, 0 for
 * success (ksi_status.h); one that fails leaves its outputs as they were, but for KSI_CheckSig and
 * KSI_SourceCheckSig, which fill theirs whatever the status.
 *
 * Any thread may call the library; what the calls of different threads may share is said with each
 * group of operations.
 */
#ifndef KNVLIBS_KSI_H_
#define KNVLIBS_KSI_H_

#include <stddef.h>
#include <stdint.h>

/* A status that is not looked at is an error that is not seen. */
#if (defined(__cplusplus) && __cplusplus >= 201703L) || \
    (defined(__STDC_VERSION__) && __STDC_VERSION__ >= 202311L)
#define KSI_NODISCARD [[nodiscard]]
#elif defined(__GNUC__)
#define KSI_NODISCARD __attribute__((warn_unused_result))
#else
#define KSI_NODISCARD
#endif

#ifdef __cplusplus
extern "C" {
#endif

/* A list of keys, or of instances. Opaque: the library's own. */
struct KSI_ParamList;

/* Reads.
 *
 * They answer from the current source, which all threads share: the host that the library runs on,
 * until KSI_UseCache names a cache file. Reads of different threads wait for each other. */

/* Answers every later read from the cache file `fileName`, which may be "FILE@WHEN", a moment of a
 * recording: see ksicache(8). `flags` is 0. */
KSI_NODISCARD uint32_t KSI_UseCache(const char* fileName, int flags);

/* The bytes of a build date and its end. */
#define KSI_BUILD_DATE_SIZE 21

/* Compares the library's definitions with those of the kernel (or of the cache file) it reads.
 * `buildBuffer` of `size` (KSI_BUILD_DATE_SIZE) bytes receives the date the kernel's definitions
 * were built,
 * `*appBuild` the date of the library's own, both as "Nov 21 2026 10:00:00"; both are filled
 * whatever the status. */
KSI_NODISCARD uint32_t KSI_CheckSig(char* buildBuffer, size_t size, const char** appBuild);

/* Reads the value of `node` for `keys` (NULL: no keys) into `buffer`. `size` is the exact size of
 * the record; another size fails with KSI_STATUS_LENGTH_MISMATCH. */
KSI_NODISCARD uint32_t KSI_Get(uint16_t node, struct KSI_ParamList* keys, void* buffer,
                               size_t size);

/* Lists the instances of `node` for `keys` (NULL: no keys) into `list`, which was made with room
 * for them; more instances than room fail with KSI_STATUS_TOO_MANY_ELEMENTS. */
KSI_NODISCARD uint32_t KSI_GetInstanceList(uint16_t node, struct KSI_ParamList* keys,
                                           struct KSI_ParamList* list);

/* The same into a list made to fit. On success `*list` is the caller's to destroy. */
KSI_NODISCARD uint32_t KSI_GetInstanceListAlloc(uint16_t node, struct KSI_ParamList* keys,
                                                struct KSI_ParamList** list);

/* The same; `hint` is the number of instances to expect and never limits the result. */
KSI_NODISCARD uint32_t KSI_GetInstanceListAllocHint(uint16_t node, struct KSI_ParamList* keys,
                                                    uint32_t hint, struct KSI_ParamList** list);

/* Parameter lists.
 *
 * A list belongs to one thread at a time, also while a read fills it or takes its keys from it. */

/* Makes an empty list of at most `capacity` entries; NULL on failure. `version` is 1. */
struct KSI_ParamList* KSI_ParamListCreate(int version, int capacity);

/* The same with `bytes` of room for the text of string entries. */
struct KSI_ParamList* KSI_ParamListCreateAndAllocateParams(int version, int capacity, size_t bytes);

/* Append an entry; a string is copied. A full list fails with KSI_STATUS_TOO_MANY_ELEMENTS. */
KSI_NODISCARD uint32_t KSI_ParamListAddInt(struct KSI_ParamList* list, uint64_t value);
KSI_NODISCARD uint32_t KSI_ParamListAddString(struct KSI_ParamList* list, const char* text);

/* Removes the last entry; an empty list stays as it is. */
void KSI_ParamListRemoveLastParam(struct KSI_ParamList* list);

/* The number of entries. */
uint32_t KSI_ParamListUsedCount(struct KSI_ParamList* list);

/* Read the entry at `index`: past the end is KSI_STATUS_NOT_FOUND, an entry of the other kind
 * KSI_STATUS_BAD_PARAM_TYPE. GetUInt32 gives the low 32 bits; the string of GetString belongs to
 * the list and lives as long. */
KSI_NODISCARD uint32_t KSI_ParamListGetInt64(struct KSI_ParamList* list, uint32_t index,
                                             int64_t* out);
KSI_NODISCARD uint32_t KSI_ParamListGetUInt32(struct KSI_ParamList* list, uint32_t index,
                                              uint32_t* out);
KSI_NODISCARD uint32_t KSI_ParamListGetString(struct KSI_ParamList* list, uint32_t index,
                                              const char** out);

/* Frees a list: once per list. */
void KSI_ParamListDestroy(struct KSI_ParamList* list);

/* Sources of a program's own, beside the current one.
 *
 * A program that reads several hosts, or one again, opens each as a handle. What differs from the
 * reads above is that a handle says whom to ask; NULL for the handle is the current source.
 * Different sources are read by different threads at the same time; reads of one source wait for
 * each other. KSI_CloseSource is called once, when no other call on the handle is under way. */

/* A host or a cache file. Opaque: the library's own. */
struct KSI_Source;

/* Opens the Linux host whose files lie below the directory `root` (NULL: "/", the host that the
 * library runs on). On success `*source` is the caller's to close. */
KSI_NODISCARD uint32_t KSI_OpenHost(const char* root, struct KSI_Source** source);

/* The same of the cache file `fileName`. It fails with the statuses of KSI_UseCache. */
KSI_NODISCARD uint32_t KSI_OpenCache(const char* fileName, struct KSI_Source** source);

/* Closes what was opened; lists that were read from it stay. NULL: no effect. */
void KSI_CloseSource(struct KSI_Source* source);

/* Begins a new reading: no read after it is answered from what was read before. A source by itself
 * keeps for a moment what many reads have in common. */
void KSI_RefreshSource(struct KSI_Source* source);

/* KSI_CheckSig, KSI_Get and KSI_GetInstanceListAlloc of `source`. */
KSI_NODISCARD uint32_t KSI_SourceCheckSig(struct KSI_Source* source, char* buildBuffer, size_t size,
                                          const char** appBuild);
KSI_NODISCARD uint32_t KSI_SourceGet(struct KSI_Source* source, uint16_t node,
                                     struct KSI_ParamList* keys, void* buffer, size_t size);
KSI_NODISCARD uint32_t KSI_SourceGetInstanceListAlloc(struct KSI_Source* source, uint16_t node,
                                                      struct KSI_ParamList* keys,
                                                      struct KSI_ParamList** list);

/* Whose answers the reads of `source` give, and of when, if it is a cache file: `*taken` receives
 * the microseconds since 1970 and `host`, if not NULL, of `size` bytes the name of the host.
 * KSI_STATUS_NOT_FOUND for a host that is read as it runs. */
KSI_NODISCARD uint32_t KSI_SourceOrigin(struct KSI_Source* source, int64_t* taken, char* host,
                                        size_t size);

/* Goes on to the next moment of a recording, which all later reads of `source` answer from; what
 * they have in common is not read again. KSI_STATUS_NOT_FOUND after the last moment, and of all
 * that is no recording: nothing changes then. After another failure, which was said to people, a
 * further call goes on behind what is damaged. */
KSI_NODISCARD uint32_t KSI_SourceNextMoment(struct KSI_Source* source);

/* Whether the groups that were walked over are a tree. A damaged cache file may have groups that
 * contain each other, and to walk over them has no end: when a walk has asked for more lists of
 * groups and been given more entries than a file of its size can hold, this is
 * KSI_STATUS_METADATA_READ_ERROR, and lists of groups fail with it. It is so until
 * KSI_RefreshSource, or until the walk's first group is asked again, unless others list it. No walk
 * ends with time: a program that walks over groups again and again calls KSI_RefreshSource before
 * each walk. */
KSI_NODISCARD uint32_t KSI_SourceWalkStatus(struct KSI_Source* source);

/* Whether something was left out of an answer of `source` since it was opened, or has no value in
 * it, for another reason than that it has gone or may not be read: the status of the first such
 * reason, which was said to people, too. */
KSI_NODISCARD uint32_t KSI_SourceLossStatus(struct KSI_Source* source);

/* What is said to people. Any thread may call these at any time. */

/* The message of a status: constant text, never NULL. */
const char* KSI_StatusText(uint32_t status);

/* Writes the formatted text to standard error: no prefix, no newline of its own. With a handler it
 * goes to that instead. The library says so what it leaves out of an answer, and why a read failed
 * where the status alone would not tell. */
#ifdef __GNUC__
__attribute__((format(printf, 1, 2)))
#endif
void Warning(const char* format, ...);

/* Receives the whole text of a diagnostic, whatever its length; it lives until the handler returns.
 * The handler runs in the thread that says it, in the midst of a read maybe: it calls no operation
 * of the library and returns. */
typedef void (*KSI_DiagnosticHandler)(void* context, const char* text); /* NOLINT: C */

/* Gives all later diagnostics of the process to `handler`, with `context`. NULL: to standard error
 * again. A diagnostic that another thread is saying may still go to the handler before. */
void KSI_SetDiagnosticHandler(KSI_DiagnosticHandler handler, void* context);

/* Copies at most `size` - 1 bytes of `source` and terminates; returns `destination`. */
char* Str_Strcpy(char* destination, const char* source, size_t size);

#ifdef __cplusplus
}
#endif

#endif /* KNVLIBS_KSI_H_ */
