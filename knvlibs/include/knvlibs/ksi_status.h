/* The return statuses that the library gives and its callers test. 0 is success. */
#ifndef KNVLIBS_KSI_STATUS_H_
#define KNVLIBS_KSI_STATUS_H_

#define KSI_STATUS_SUCCESS 0u
#define KSI_STATUS_FAILURE 0xbad0001u
#define KSI_STATUS_NOT_FOUND 0xbad0003u
#define KSI_STATUS_LIMIT_EXCEEDED 0xbad0006u
#define KSI_STATUS_BAD_PARAM 0xbad0007u
#define KSI_STATUS_METADATA_READ_ERROR 0xbad0008u /* a damaged cache file */
#define KSI_STATUS_IO_ERROR 0xbad000au
#define KSI_STATUS_READ_ERROR 0xbad000bu
#define KSI_STATUS_NO_MEMORY 0xbad0014u
#define KSI_STATUS_TIMEOUT 0xbad0021u
#define KSI_STATUS_MAJOR_VERSION_MISMATCH 0xbad002cu /* a cache file of a newer schema */
#define KSI_STATUS_CHECKSUM_MISMATCH 0xbad003au      /* definitions that differ */
#define KSI_STATUS_IS_A_DIRECTORY 0xbad0055u
#define KSI_STATUS_PERMISSION_DENIED 0xbad005au
#define KSI_STATUS_BAD_PARAM_COUNT 0xbad0083u
#define KSI_STATUS_BAD_PARAM_TYPE 0xbad0084u
/* Not a cache file; a kernel file that is not understood. */
#define KSI_STATUS_INVALID_METADATA 0xbad0099u
#define KSI_STATUS_TOO_MANY_ELEMENTS 0xbad00b4u
#define KSI_STATUS_NO_HANDLER 0xbad00c3u
#define KSI_STATUS_INVALID_NODE 0xbad00d8u
#define KSI_STATUS_LENGTH_MISMATCH 0xbad0122u

#endif /* KNVLIBS_KSI_STATUS_H_ */
