// The configuration unit's own helpers: the file reader, the parser and the
// watcher's body. Not exported; declared here so the unit's tests, fuzz target
// and benchmarks can drive them directly.
#pragma once

#include "kvi/KviConfig.h"

// Sizes of the parser's key and value buffers, terminating NUL included.
#define MAX_KEY_LENGTH 2056
#define MAX_VALUE_LENGTH 2056
// The characters a key is made of.
#define KV_VALID_CHARACTERS "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ_-.1234567890"
// The characters allowed while a key is being read: key characters and the
// ones that end a key.
#define KV_KEY_READ_CHARACTERS KV_VALID_CHARACTERS " \t=\n"
// A list longer than this when freed must be corrupt (a cycle).
#define KEY_VALUE_MAX_FREE 1000000
// Wait on a container's semaphores, in milliseconds.
#define KVI_CS_CFG_SEM_TIMEOUT 500

// Reads the container's file and parses it into its list.
SaErrorT kviCsConfigLoadValues(KviCsCfgContainer *ConfigContainer) noexcept;

// Walks a text of Size bytes (not NUL-terminated) and appends every
// well-formed pair to the container's list.
SaErrorT kviCsCfgDataParseData(const char *CfgFileText, SaHpiUint32T Size,
                               KviCsCfgContainer *CfgCont) noexcept;

// Parses one key = "value" pair starting at *Index (the first key character);
// on success *Index is left on the closing double quote.
SaErrorT kviCsCfgDataParseKeyValuePair(const char *CfgFileText, SaHpiUint32T Size,
                                       SaHpiUint32T LineCount, SaHpiUint32T *Index,
                                       KviCsCfgContainer *CfgCont) noexcept;

// Appends a copy of the pair at the tail of the container's list.
SaErrorT kviCsCfgDataRegisterKeyValuePair(const char *Key, const char *Value,
                                          KviCsCfgContainer *CfgCont) noexcept;

// Cuts trailing white space of a NUL-terminated string in place.
SaErrorT rmTrailingWhitespace(char *Str) noexcept;

// Runs the registered callbacks of a container (null: the default one).
SaErrorT kviCsConfigPerformCallbacks(KviCsCfgContainer *CfgContainer) noexcept;

// The watcher thread's body; its argument is the container.
void *kviCsThreadRoutine(void *CfgContainer) noexcept;

// Frees every pair and node of a key/value list, leaving the header empty.
SaErrorT kviCsCfgFreeKeyValueList(KviCsLinkedListT *List) noexcept;

// Test seam: called by the file reader after each read of the file and before
// the file's information is taken again, so a test can change the file in
// exactly that window. Null switches it off.
typedef void (*KviCsCfgReadHookT)(const char *FileName);
void kviCsConfigSetReadHook(KviCsCfgReadHookT Hook) noexcept;
