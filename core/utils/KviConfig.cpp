// The configuration file of key = "value" lines: reading and parsing it into a
// container's list, the queries every module reads its settings through, and
// the containers' change callbacks with the thread that watches the file.
#include "core/utils/KviConfig.h"

#include <atomic>
#include <cctype>
#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <sys/select.h>
#include <sys/time.h>
#include <type_traits>

#include "core/utils/KviTrace.h"
#include "kvi/KviTime.h"

namespace
{

// The container behind every query with a null container pointer. Static
// storage, so it is all zeros until kviCsConfigInit fills it, and finalizing
// it zeroes it again: a null list is how "not initialized" shows.
KviCsCfgContainer defaultConfigContainer;

std::atomic<KviCsCfgReadHookT> readHook{nullptr};

constexpr SaHpiUint32T LOAD_ATTEMPTS = 5;
constexpr SaHpiUint32T INITIAL_CALLBACKS = 10;
constexpr SaHpiUint32T CALLBACK_GROWTH = 11;
constexpr int WATCHER_NAPS = 10;
constexpr suseconds_t WATCHER_NAP_USEC = 100000;

struct CharSet {
    bool member[256];
};

constexpr CharSet makeCharSet(const char *chars)
{
    CharSet set{};
    for (; *chars != '\0'; ++chars)
        set.member[static_cast<unsigned char>(*chars)] = true;
    return set;
}

// Lookup tables rather than strchr: strchr finds the terminating NUL too, and
// a NUL byte in the file must never pass for a key character.
constexpr CharSet keyCharacters = makeCharSet(KV_VALID_CHARACTERS);
constexpr CharSet keyReadCharacters = makeCharSet(KV_KEY_READ_CHARACTERS);

bool isKeyCharacter(char c)
{
    return keyCharacters.member[static_cast<unsigned char>(c)];
}

KviCsCfgContainer *resolve(KviCsCfgContainer *container)
{
    return container != nullptr ? container : &defaultConfigContainer;
}

// The list pointer is read before any lock (to refuse a container that was
// never initialized) and replaced by a reload under GeneralSem, so both go
// through atomic accesses.
KviCsLinkedListT *loadList(KviCsCfgContainer *container)
{
    return std::atomic_ref<KviCsLinkedListT *>(container->KeyValueList)
        .load(std::memory_order_acquire);
}

void storeList(KviCsCfgContainer *container, KviCsLinkedListT *list)
{
    std::atomic_ref<KviCsLinkedListT *>(container->KeyValueList)
        .store(list, std::memory_order_release);
}

// The watcher polls ShuttingDown while finalization sets it.
bool isShuttingDown(KviCsCfgContainer *container)
{
    return std::atomic_ref<SaHpiBoolT>(container->ShuttingDown).load(std::memory_order_acquire) !=
           SAHPI_FALSE;
}

void setShuttingDown(KviCsCfgContainer *container)
{
    std::atomic_ref<SaHpiBoolT>(container->ShuttingDown)
        .store(SAHPI_TRUE, std::memory_order_release);
}

// Skips the rest of a line whose start was looked at already: advances to the
// next newline (counted; the walker steps over it), NUL or the end. A NUL
// stops the walk of the whole text, so the position is left just before it
// for the walker's step to land on it. The first byte is passed over unless
// it is a NUL itself, so an error found on a newline costs the next line too.
void skipRestOfLine(const char *text, SaHpiUint32T size, SaHpiUint32T *index,
                    SaHpiUint32T *lineCount)
{
    SaHpiUint32T i = *index;
    if (i >= size)
        return;
    if (text[i] == '\0') {
        if (i > 0)
            *index = i - 1;
        return;
    }
    while (++i < size) {
        if (text[i] == '\n') {
            ++*lineCount;
            break;
        }
        if (text[i] == '\0') {
            --i;
            break;
        }
    }
    *index = i;
}

// strtoul and strtol as they behave where long has 32 bits, whatever the
// platform: out-of-range magnitudes saturate, and a negative unsigned value
// wraps modulo 2^32.
SaHpiUint32T toUint32(const char *text, char **end)
{
    errno = 0;
    unsigned long long converted = strtoull(text, end, 0);
    if (errno == ERANGE)
        return UINT32_MAX;
    const char *p = text;
    while (isspace(static_cast<unsigned char>(*p)))
        ++p;
    unsigned long long magnitude = *p == '-' ? 0ULL - converted : converted;
    if (magnitude > UINT32_MAX)
        return UINT32_MAX;
    return static_cast<SaHpiUint32T>(converted);
}

SaHpiInt32T toInt32(const char *text, char **end)
{
    long long converted = strtoll(text, end, 0);
    if (converted > INT32_MAX)
        return INT32_MAX;
    if (converted < INT32_MIN)
        return INT32_MIN;
    return static_cast<SaHpiInt32T>(converted);
}

// Undoes a partly done kviCsConfigInitStructure: what was made is given back
// and the container is left zeroed.
void tearDownPartial(KviCsCfgContainer *container, int semaphoresMade)
{
    if (container->ThreadIdPtr != nullptr)
        KVI_CS_FREE(container->ThreadIdPtr);
    if (container->KeyValueList != nullptr) {
        kviCsCfgFreeKeyValueList(container->KeyValueList);
        KVI_CS_FREE(container->KeyValueList);
    }
    if (container->CallbackList != nullptr)
        KVI_CS_FREE(container->CallbackList);
    if (container->Filename != nullptr)
        KVI_CS_FREE(container->Filename);
    if (semaphoresMade > 1)
        KVI_CS_SEM_DESTROY(&container->DeleteSem);
    if (semaphoresMade > 0)
        KVI_CS_SEM_DESTROY(&container->GeneralSem);
    memset(container, 0, sizeof *container);
}

SaErrorT startWatcher(KviCsCfgContainer *container, const char *mallocMessage)
{
    container->ThreadIdPtr = static_cast<KviCsThreadId *>(KVI_CS_MALLOC(sizeof(KviCsThreadId)));
    if (container->ThreadIdPtr == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "%s", mallocMessage);
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    SaErrorT rc = kviCsCreateThread(container->ThreadIdPtr, kviCsThreadRoutine, container);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsCreateThread returned %d", rc);
        KVI_CS_FREE(container->ThreadIdPtr);
        return SA_ERR_HPI_ERROR;
    }
    container->HasThread = SAHPI_TRUE;
    return SA_OK;
}

} // namespace

// Resolves a container argument (null: the default container) into `var`,
// refusing one that was never initialized: its semaphores are not there.
#define KVI_CFG_LIVE_CONTAINER(var, arg)                                                           \
    KviCsCfgContainer *var = resolve(arg);                                                         \
    if (loadList(var) == nullptr) {                                                                \
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "cfgContainer->KeyValueList pointer is NULL.");             \
        return SA_ERR_HPI_INVALID_PARAMS;                                                          \
    }

// Takes one of a container's semaphores into `guard` for the rest of the
// scope; a wait that fails is logged and the call ends with SA_ERR_HPI_ERROR.
#define KVI_CFG_SEM_LOCK(guard, sem)                                                               \
    KVI_SEM_GUARD(guard, sem, KVI_CS_CFG_SEM_TIMEOUT);                                             \
    if (!guard.held()) {                                                                           \
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Couldn't acquire semaphore");                              \
        trace.exitMessage("Error");                                                                \
        return SA_ERR_HPI_ERROR;                                                                   \
    }

void kviCsConfigSetReadHook(KviCsCfgReadHookT Hook) noexcept
{
    readHook.store(Hook);
}

// ---------------------------------------------------------------------------
// Reading and parsing the file

SaErrorT kviCsConfigLoadValues(KviCsCfgContainer *ConfigContainer) noexcept
{
    KVI_TRACE("Container %p", static_cast<void *>(ConfigContainer));
    KVI_NULL_CHECK(ConfigContainer);
    KVI_NULL_CHECK(ConfigContainer->Filename);
    const char *fileName = ConfigContainer->Filename;

    FILE *file = fopen(fileName, "r");
    if (file == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't open %s.  error = %s", fileName, strerror(errno));
        trace.exitMessage("Error");
        return SA_ERR_HPI_ERROR;
    }
    KVI_DLOG(KVI_LOG_DBG_L, "File opened");

    char *buffer = nullptr;
    auto fail = [&](SaErrorT rc) {
        if (buffer != nullptr)
            KVI_CS_FREE(buffer);
        fclose(file);
        trace.exitMessage("Error");
        return rc;
    };

    // The file may be rewritten while it is read; the read counts only if the
    // file looks the same before and after it.
    for (SaHpiUint32T attempts = 0;; ++attempts) {
        if (attempts >= LOAD_ATTEMPTS) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Avoiding infinite loop");
            return fail(SA_ERR_HPI_ERROR);
        }
        SaHpiInt64T timeBefore = 0;
        SaHpiInt32T sizeBefore = 0;
        if (kviCsGetFileInfo(fileName, &timeBefore, &sizeBefore) != SA_OK || sizeBefore < 0) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to get file info!");
            return fail(SA_ERR_HPI_ERROR);
        }
        // The allocator refuses empty blocks, yet an empty file is a valid
        // configuration with no settings: hold at least one byte, parse size.
        SaHpiInt32T blockSize = sizeBefore > 0 ? sizeBefore : 1;
        if (buffer == nullptr) {
            buffer = static_cast<char *>(KVI_CS_MALLOC(blockSize));
            if (buffer == nullptr) {
                KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to malloc space!");
                return fail(SA_ERR_HPI_ERROR);
            }
        } else {
            char *resized = static_cast<char *>(KVI_CS_REALLOC(buffer, blockSize));
            if (resized == nullptr) {
                KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to realloc space!");
                return fail(SA_ERR_HPI_OUT_OF_SPACE);
            }
            buffer = resized;
        }

        // Not rewound: after a change the stream is usually at its end, so a
        // retry comes up short until the attempts run out.
        size_t got = fread(buffer, 1, static_cast<size_t>(sizeBefore), file);
        bool shortRead = false;
        if (got != static_cast<size_t>(sizeBefore)) {
            if (feof(file)) {
                KVI_WLOG(KVI_LOG_WARN, "Unexpected eof found in %s", fileName);
                shortRead = true;
            } else if (ferror(file)) {
                KVI_ELOG(KVI_LOG_ERR_NONFATAL, "ferror received while reading config file %s",
                         fileName);
                return fail(SA_ERR_HPI_ERROR);
            } else {
                KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                         "Asked to read %d, but got %d from config file %s. eof and ferror not "
                         "set.",
                         static_cast<int>(sizeBefore), static_cast<int>(got), fileName);
                return fail(SA_ERR_HPI_ERROR);
            }
        }
        if (KviCsCfgReadHookT hook = readHook.load(); hook != nullptr)
            hook(fileName);

        SaHpiInt64T timeAfter = 0;
        SaHpiInt32T sizeAfter = 0;
        if (kviCsGetFileInfo(fileName, &timeAfter, &sizeAfter) != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to get file info!");
            return fail(SA_ERR_HPI_ERROR);
        }
        if (sizeBefore == sizeAfter && timeBefore == timeAfter && !shortRead) {
            ConfigContainer->UpdateTime = timeBefore;
            if (fclose(file) != 0)
                KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to close file stream");
            // A malformed file still loads whatever lines were good; the
            // parser has logged the rest.
            kviCsCfgDataParseData(buffer, static_cast<SaHpiUint32T>(sizeBefore), ConfigContainer);
            KVI_CS_FREE(buffer);
            return SA_OK;
        }
    }
}

SaErrorT kviCsCfgDataParseData(const char *CfgFileText, SaHpiUint32T Size,
                               KviCsCfgContainer *CfgCont) noexcept
{
    KVI_TRACE("Size %u", Size);
    KVI_NULL_CHECK(CfgFileText);
    KVI_NULL_CHECK(CfgCont);
    if (Size == 0 || CfgFileText[0] == '\0') {
        trace.exitMessage("Empty");
        return SA_OK;
    }

    SaHpiUint32T lineCount = 1;
    for (SaHpiUint32T index = 0; index < Size && CfgFileText[index] != '\0'; ++index) {
        char c = CfgFileText[index];
        if (c == '\r' || c == ' ' || c == '\t')
            continue;
        if (c == '\n') {
            ++lineCount;
            continue;
        }
        if (c == '#' || c == '[') {
            // A comment, or a section header, which means nothing here.
            skipRestOfLine(CfgFileText, Size, &index, &lineCount);
            continue;
        }
        if (isKeyCharacter(c)) {
            SaHpiUint32T keyStart = index;
            if (kviCsCfgDataParseKeyValuePair(CfgFileText, Size, lineCount, &index, CfgCont) !=
                SA_OK) {
                skipRestOfLine(CfgFileText, Size, &index, &lineCount);
                if (index == keyStart) {
                    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't make progress");
                    trace.exitMessage("Error");
                    return SA_ERR_HPI_ERROR;
                }
            }
            continue;
        }
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "Invalid character asc(%d) found in config file at position %d!",
                 static_cast<unsigned char>(c), static_cast<int>(index));
        skipRestOfLine(CfgFileText, Size, &index, &lineCount);
    }
    return SA_OK;
}

SaErrorT kviCsCfgDataParseKeyValuePair(const char *CfgFileText, SaHpiUint32T Size,
                                       SaHpiUint32T LineCount, SaHpiUint32T *Index,
                                       KviCsCfgContainer *CfgCont) noexcept
{
    KVI_TRACE("Line %u", LineCount);
    KVI_NULL_CHECK(CfgFileText);
    KVI_NULL_CHECK(Index);
    KVI_NULL_CHECK(CfgCont);
    SaHpiUint32T &i = *Index;
    const int line = static_cast<int>(LineCount);
    auto fail = [&](SaErrorT rc) {
        trace.exitMessage("Error");
        return rc;
    };

    // The key. Its terminating byte (blank, tab, "=" or newline) is consumed
    // with it, which is why key="v" is refused below: the "=" is gone.
    char key[MAX_KEY_LENGTH];
    SaHpiUint32T held = 0;
    for (;;) {
        if (i >= Size) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Index is greater than Size!");
            return fail(SA_ERR_HPI_ERROR);
        }
        if (held >= MAX_KEY_LENGTH) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Key longer than %d found in key/value pair",
                     MAX_KEY_LENGTH);
            return fail(SA_ERR_HPI_DATA_EX_LIMITS);
        }
        unsigned char c = static_cast<unsigned char>(CfgFileText[i]);
        if (!keyReadCharacters.member[c]) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid characher ascii(%d) found. (line %d)", c, line);
            return fail(SA_ERR_HPI_INVALID_DATA);
        }
        ++i;
        if (!keyCharacters.member[c])
            break;
        key[held++] = static_cast<char>(c);
    }
    key[held] = '\0';
    KVI_DLOG(KVI_LOG_DBG_L, "KeyString is %s", key);

    while (i < Size && (CfgFileText[i] == ' ' || CfgFileText[i] == '\t')) {
        KVI_DLOG(KVI_LOG_DBG_L, "Character %d ('%c') line %d is whitespace", CfgFileText[i],
                 CfgFileText[i], line);
        ++i;
    }
    if (i >= Size) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Index is greater than Size! (Line %d)", line);
        return fail(SA_ERR_HPI_ERROR);
    }
    if (CfgFileText[i] != '=') {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "Unexpected token asc(%d) '%c' found when expecting equal sign, line %d",
                 static_cast<unsigned char>(CfgFileText[i]), CfgFileText[i], line);
        return fail(SA_ERR_HPI_ERROR);
    }
    ++i;
    while (i < Size && (CfgFileText[i] == ' ' || CfgFileText[i] == '\t'))
        ++i;
    if (i >= Size) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Index is greater than Size! (Line %d)", line);
        return fail(SA_ERR_HPI_ERROR);
    }
    if (CfgFileText[i] != '"') {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Value doesn't start with double quotes! line=%d", line);
        return fail(SA_ERR_HPI_ERROR);
    }
    ++i;
    if (i >= Size) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Index is greater than Size! (Line %d)", line);
        return fail(SA_ERR_HPI_ERROR);
    }

    // The value: everything up to the next double quote, newlines included;
    // there is no escape, so a value cannot hold a double quote.
    char value[MAX_VALUE_LENGTH];
    held = 0;
    for (; i < Size; ++i) {
        if (held >= MAX_VALUE_LENGTH) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Val longer than %d found in key/value pair",
                     MAX_VALUE_LENGTH);
            return fail(SA_ERR_HPI_DATA_EX_LIMITS);
        }
        char c = CfgFileText[i];
        if (c == '\0') {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "End of file encountered in val string");
            return fail(SA_ERR_HPI_ERROR);
        }
        if (c == '"')
            break;
        value[held++] = c;
    }
    if (i >= Size) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Index is greater than Size!");
        return fail(SA_ERR_HPI_ERROR);
    }
    value[held] = '\0';

    KVI_DLOG(KVI_LOG_DBG_L, "Key Value pair found: *%s* *%s*", key, value);
    SaErrorT rc = kviCsCfgDataRegisterKeyValuePair(key, value, CfgCont);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsCfgDataRegisterKeyValuePair failed rc=%d", rc);
        return fail(SA_ERR_HPI_ERROR);
    }
    return SA_OK;
}

SaErrorT kviCsCfgDataRegisterKeyValuePair(const char *Key, const char *Value,
                                          KviCsCfgContainer *CfgCont) noexcept
{
    KVI_TRACE("Container %p", static_cast<void *>(CfgCont));
    KVI_NULL_CHECK(Key);
    KVI_NULL_CHECK(Value);
    KVI_NULL_CHECK(CfgCont);

    size_t keySize = strlen(Key) + 1;
    size_t valueSize = strlen(Value) + 1;
    auto *pair = static_cast<KviKeyValuePairT *>(KVI_CS_MALLOC(sizeof(KviKeyValuePairT)));
    KviCsLinkedListNodeT *node = nullptr;
    char *keyCopy = nullptr;
    char *valueCopy = nullptr;
    auto freeAll = [&] {
        if (valueCopy != nullptr)
            KVI_CS_FREE(valueCopy);
        if (keyCopy != nullptr)
            KVI_CS_FREE(keyCopy);
        if (node != nullptr)
            kviCsLinkedListNodeFree(node);
        if (pair != nullptr)
            KVI_CS_FREE(pair);
        trace.exitMessage("Error");
    };
    if (pair == nullptr || kviCsLinkedListNodeMalloc(&node) != SA_OK ||
        (keyCopy = static_cast<char *>(KVI_CS_MALLOC(keySize))) == nullptr ||
        (valueCopy = static_cast<char *>(KVI_CS_MALLOC(valueSize))) == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "malloc failed");
        freeAll();
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    memcpy(keyCopy, Key, keySize);
    memcpy(valueCopy, Value, valueSize);
    pair->Key = keyCopy;
    pair->Value = valueCopy;
    node->Data = pair;
    KVI_DLOG(KVI_LOG_DBG_H, "%s = \"%s\"", Key, Value);

    SaErrorT rc = kviCsLinkedListAddToTail(CfgCont->KeyValueList, node);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsLinkedListAddToTail failed with %d", rc);
        freeAll();
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

SaErrorT kviCsCfgFreeKeyValueList(KviCsLinkedListT *List) noexcept
{
    KVI_TRACE("List %p", static_cast<void *>(List));
    KVI_NULL_CHECK(List);
    for (SaHpiUint32T freed = 0; List->HeadPointer != nullptr; ++freed) {
        if (freed >= KEY_VALUE_MAX_FREE) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Infinite loop detected");
            trace.exitMessage("Error");
            return SA_ERR_HPI_ERROR;
        }
        KviCsLinkedListNodeT *node = List->HeadPointer;
        auto *pair = static_cast<KviKeyValuePairT *>(node->Data);
        if (pair == nullptr) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Null kvPair pointer found, can't finish");
            trace.exitMessage("Error");
            return SA_ERR_HPI_ERROR;
        }
        SaErrorT rc = kviCsLinkedListRemoveNode(node);
        if (rc != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "FkviCsLinkedListRemoveNode returned %d", rc);
            trace.exitMessage("Error");
            return SA_ERR_HPI_ERROR;
        }
        if (pair->Key != nullptr)
            KVI_CS_FREE(pair->Key);
        if (pair->Value != nullptr)
            KVI_CS_FREE(pair->Value);
        KVI_CS_FREE(pair);
        kviCsLinkedListNodeFree(node);
    }
    return SA_OK;
}

SaErrorT rmTrailingWhitespace(char *Str) noexcept
{
    KVI_NULL_CHECK(Str);
    size_t length = strlen(Str);
    while (length > 0 && isspace(static_cast<unsigned char>(Str[length - 1])))
        Str[--length] = '\0';
    return SA_OK;
}

// ---------------------------------------------------------------------------
// Queries

SaErrorT kviCsCfgDataGet(const char *Key, SaHpiUint32T Size, char *Value,
                         KviCsCfgContainer *CfgContainer) noexcept
{
    KVI_TRACE("Key %s", Key != nullptr ? Key : "(null)");
    KVI_NULL_CHECK(Key);
    KVI_NULL_CHECK(Value);
    KVI_CFG_LIVE_CONTAINER(cfgContainer, CfgContainer);

    // Held while the list is walked and the value copied, so a reload can
    // neither swap nor free the list under the reader.
    KVI_CFG_SEM_LOCK(general, &(cfgContainer->GeneralSem));
    for (KviCsLinkedListNodeT *node = cfgContainer->KeyValueList->HeadPointer; node != nullptr;
         node = node->Next) {
        auto *pair = static_cast<const KviKeyValuePairT *>(node->Data);
        if (pair == nullptr || pair->Key == nullptr || strcmp(pair->Key, Key) != 0)
            continue;
        size_t length = strlen(pair->Value);
        KVI_DLOG(KVI_LOG_DBG_L, "Size is %d+1 of %d", static_cast<int>(length),
                 static_cast<int>(Size));
        size_t copied = length < Size ? length : Size;
        memcpy(Value, pair->Value, copied);
        memset(Value + copied, 0, Size - copied);
        if (length < Size)
            return SA_OK;
        KVI_DLOG(KVI_LOG_DBG_L, "Truncated");
        trace.exitMessage("Truncated");
        return SA_ERR_HPI_DATA_TRUNCATED;
    }
    trace.exitMessage("Not present");
    return SA_ERR_HPI_NOT_PRESENT;
}

namespace
{

// The numeric queries read the value into a small buffer: a longer value is
// not a 32-bit number and comes back as truncated.
constexpr SaHpiUint32T NUMBER_TEXT_SIZE = 12;

// The shape both numeric queries share: fetch the text, convert it, and refuse
// a saturated value or trailing garbage. The warning carries the name of the
// query that was called.
template <typename T>
SaErrorT readNumber(const char *Key, T *Value, KviCsCfgContainer *CfgContainer,
                    T (*convert)(const char *, char **), const char *query)
{
    char text[NUMBER_TEXT_SIZE];
    SaErrorT rc = kviCsCfgDataGet(Key, NUMBER_TEXT_SIZE, text, CfgContainer);
    if (rc != SA_OK)
        return rc;
    rmTrailingWhitespace(text);
    char *end = nullptr;
    *Value = convert(text, &end);
    const bool saturated = *Value == std::numeric_limits<T>::max() ||
                           (std::is_signed_v<T> && *Value == std::numeric_limits<T>::min());
    if (!saturated && *end == '\0')
        return SA_OK;
    kviCsLogger(__FILE__, __LINE__, query, KVI_LOG_WARN_NUM, "Value %s: %s",
                saturated ? "out of range" : "has invalid data", text);
    return SA_ERR_HPI_INVALID_DATA;
}

} // namespace

SaErrorT kviCsCfgDataUint32Get(const char *Key, SaHpiUint32T *Value,
                               KviCsCfgContainer *CfgContainer) noexcept
{
    KVI_TRACE("Key %s", Key != nullptr ? Key : "(null)");
    KVI_NULL_CHECK(Key);
    KVI_NULL_CHECK(Value);
    SaErrorT rc = readNumber(Key, Value, CfgContainer, toUint32, __func__);
    if (rc != SA_OK)
        trace.exitMessage("Error");
    return rc;
}

SaErrorT kviCsCfgDataInt32Get(const char *Key, SaHpiInt32T *Value,
                              KviCsCfgContainer *CfgContainer) noexcept
{
    KVI_TRACE("Key %s", Key != nullptr ? Key : "(null)");
    KVI_NULL_CHECK(Key);
    KVI_NULL_CHECK(Value);
    SaErrorT rc = readNumber(Key, Value, CfgContainer, toInt32, __func__);
    if (rc != SA_OK)
        trace.exitMessage("Error");
    return rc;
}

SaErrorT kviGetListElement(SaHpiUint32T ElementToGet, const char *StringToParse,
                           SaHpiUint32T ResultMaxSize, char *Result) noexcept
{
    KVI_TRACE("Element %u", ElementToGet);
    KVI_NULL_CHECK(StringToParse);
    KVI_NULL_CHECK(Result);
    if (ResultMaxSize < 2) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "ResultMaxSize is %d.  How can anyone put a module name in that!?",
                 static_cast<int>(ResultMaxSize));
        trace.exitMessage("Error");
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    const char *p = StringToParse;
    for (SaHpiUint32T separators = 0; separators < ElementToGet; ++p) {
        if (*p == '\0') {
            trace.exitMessage("Not present");
            return SA_ERR_HPI_NOT_PRESENT;
        }
        if (*p == ';')
            ++separators;
    }
    // Room for ResultMaxSize - 1 characters and the terminator.
    for (SaHpiUint32T copied = 0; copied < ResultMaxSize; ++copied, ++p) {
        if (*p == ';' || *p == '\0') {
            Result[copied] = '\0';
            KVI_DLOG(KVI_LOG_DBG_L, "Result String is %s", Result);
            return SA_OK;
        }
        Result[copied] = *p;
    }
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Parameter ResultMaxSize=%d is too small",
             static_cast<int>(ResultMaxSize));
    trace.exitMessage("Error");
    return SA_ERR_HPI_OUT_OF_SPACE;
}

// ---------------------------------------------------------------------------
// Containers

SaErrorT kviCsConfigInitStructure(KviCsCfgContainer *ConfigContainer,
                                  SaHpiBoolT SupportWaitingThread, const char *FileName) noexcept
{
    KVI_TRACE("File %s", FileName != nullptr ? FileName : "(null)");
    KVI_NULL_CHECK(ConfigContainer);
    KVI_NULL_CHECK(FileName);
    KviCsCfgContainer *cfgContainer = ConfigContainer;
    memset(cfgContainer, 0, sizeof *cfgContainer);
    auto fail = [&](int semaphoresMade, SaErrorT rc) {
        tearDownPartial(cfgContainer, semaphoresMade);
        trace.exitMessage("Error");
        return rc;
    };

    if (KVI_CS_SEM_INIT(&cfgContainer->GeneralSem, 1) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to init GeneralSem");
        return fail(0, SA_ERR_HPI_ERROR);
    }
    if (KVI_CS_SEM_INIT(&cfgContainer->DeleteSem, 1) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to init DeleteSem");
        return fail(1, SA_ERR_HPI_ERROR);
    }

    size_t nameSize = strlen(FileName) + 1;
    cfgContainer->Filename = static_cast<char *>(KVI_CS_MALLOC(nameSize));
    if (cfgContainer->Filename == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Malloc failed");
        return fail(2, SA_ERR_HPI_OUT_OF_SPACE);
    }
    memcpy(cfgContainer->Filename, FileName, nameSize);

    cfgContainer->CallbackList = static_cast<KviCsCfgCallbackList *>(
        KVI_CS_MALLOC(sizeof(KviCsCfgCallbackList) + INITIAL_CALLBACKS * sizeof(KviCsCfgCallback)));
    if (cfgContainer->CallbackList == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Malloc failed");
        return fail(2, SA_ERR_HPI_OUT_OF_SPACE);
    }
    cfgContainer->CallbackList->CountAllocated = INITIAL_CALLBACKS;
    cfgContainer->CallbackCount = 0;

    cfgContainer->KeyValueList =
        static_cast<KviCsLinkedListT *>(KVI_CS_MALLOC(sizeof(KviCsLinkedListT)));
    if (cfgContainer->KeyValueList == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to load config file %s", FileName);
        return fail(2, SA_ERR_HPI_OUT_OF_SPACE);
    }
    cfgContainer->KeyValueList->Data = nullptr;
    SaErrorT rc = kviCsLinkedListInitialize(cfgContainer->KeyValueList);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsLinkedListInitialize returned %d", rc);
        return fail(2, SA_ERR_HPI_ERROR);
    }
    rc = kviCsConfigLoadValues(cfgContainer);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsConfigLoadValues failed for file %s", FileName);
        return fail(2, SA_ERR_HPI_ERROR);
    }

    cfgContainer->HasThread = SAHPI_FALSE;
    cfgContainer->ThreadIdPtr = nullptr;
    if (SupportWaitingThread) {
        rc = startWatcher(cfgContainer, "Malloc failed");
        if (rc != SA_OK)
            return fail(2, rc);
    }
    return SA_OK;
}

SaErrorT kviCsConfigFinalizeStrucure(KviCsCfgContainer *CfgContainer) noexcept
{
    KVI_TRACE("Container %p", static_cast<void *>(CfgContainer));
    KVI_NULL_CHECK(CfgContainer);
    KVI_NULL_CHECK(CfgContainer->Filename);
    KVI_NULL_CHECK(CfgContainer->KeyValueList);
    KviCsCfgContainer *cfgContainer = CfgContainer;

    // Anyone still holding a semaphore is using the container: refuse rather
    // than pull it away from under them.
    if (KVI_CS_SEM_TRYWAIT(&cfgContainer->DeleteSem) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "DeleteSem is locked.  No other thread should be using it");
        trace.exitMessage("Error");
        return SA_ERR_HPI_INVALID_REQUEST;
    }

    setShuttingDown(cfgContainer);
    if (cfgContainer->HasThread) {
        SaErrorT rc = kviCsJoinThread(cfgContainer->ThreadIdPtr, nullptr);
        if (rc != SA_OK)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "JoinThread failed with %d, continuing", rc);
        KVI_CS_FREE(cfgContainer->ThreadIdPtr);
        cfgContainer->HasThread = SAHPI_FALSE;
    }

    if (KVI_CS_SEM_TRYWAIT(&cfgContainer->GeneralSem) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "GeneralSem is locked.  No other thread should be using it");
        KVI_CS_DOA_SEM_POST(&(cfgContainer->DeleteSem));
        trace.exitMessage("Error");
        return SA_ERR_HPI_INVALID_REQUEST;
    }

    if (cfgContainer->CallbackCount != 0)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "Callback count isn't zero! Callbacks should have all been unregistered! "
                 "Count = %d",
                 static_cast<int>(cfgContainer->CallbackCount));
    if (cfgContainer->CallbackList != nullptr) {
        KVI_CS_FREE(cfgContainer->CallbackList);
        KVI_DLOG(KVI_LOG_DBG_L, "CallbackList freed");
    }
    cfgContainer->CallbackCount = 0;

    if (kviCsCfgFreeKeyValueList(cfgContainer->KeyValueList) != SA_OK) {
        KVI_CS_DOA_SEM_POST(&(cfgContainer->GeneralSem));
        KVI_CS_DOA_SEM_POST(&(cfgContainer->DeleteSem));
        trace.exitMessage("Error");
        return SA_ERR_HPI_ERROR;
    }
    KVI_CS_FREE(cfgContainer->KeyValueList);
    KVI_CS_FREE(cfgContainer->Filename);

    KVI_CS_DOA_SEM_POST(&(cfgContainer->GeneralSem));
    KVI_CS_DOA_SEM_POST(&(cfgContainer->DeleteSem));
    SaErrorT rc = KVI_CS_SEM_DESTROY(&cfgContainer->DeleteSem);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "SEM_DESTROY failed on DeleteSem.  rc=%d", rc);
    rc = KVI_CS_SEM_DESTROY(&cfgContainer->GeneralSem);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "SEM_DESTROY failed on GeneralSem.  rc=%d", rc);
    memset(cfgContainer, 0, sizeof *cfgContainer);
    return SA_OK;
}

SaErrorT kviCsConfigInit(SaHpiBoolT SupportWaitingThread, const char *FileName) noexcept
{
    KVI_TRACE("File %s", FileName != nullptr ? FileName : "(null)");
    KVI_NULL_CHECK(FileName);
    // Initializing over a live default container would lose its list, its
    // callbacks and perhaps a running watcher.
    if (loadList(&defaultConfigContainer) != nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Default config container is already initialized");
        trace.exitMessage("Error");
        return SA_ERR_HPI_DUPLICATE;
    }
    SaErrorT rc = kviCsConfigInitStructure(&defaultConfigContainer, SupportWaitingThread, FileName);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsConfigInitStructure failed %d", rc);
        trace.exitMessage("Error");
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

SaErrorT kviCsConfigFinalize(void) noexcept
{
    KVI_TRACE("Default container %p", static_cast<void *>(&defaultConfigContainer));
    SaErrorT rc = kviCsConfigFinalizeStrucure(&defaultConfigContainer);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "kviCsConfigFinalizeStrucure for default container failed %d", rc);
    return SA_OK;
}

// ---------------------------------------------------------------------------
// Change callbacks and the watcher

SaErrorT kviCsConfigRegister(KviCsCfgCallback FnPtr, KviCsCfgContainer *CfgContainer) noexcept
{
    KVI_TRACE("Callback %p", reinterpret_cast<void *>(FnPtr));
    KVI_NULL_CHECK(FnPtr);
    KVI_CFG_LIVE_CONTAINER(cfgContainer, CfgContainer);

    KVI_CFG_SEM_LOCK(general, &(cfgContainer->GeneralSem));
    KviCsCfgCallbackList *list = cfgContainer->CallbackList;
    for (SaHpiUint32T i = 0; i < cfgContainer->CallbackCount; ++i) {
        if (list->Entry[i] == FnPtr) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Callback already registered");
            trace.exitMessage("Error");
            return SA_ERR_HPI_DUPLICATE;
        }
    }
    if (cfgContainer->CallbackCount >= list->CountAllocated) {
        SaHpiUint32T wanted = cfgContainer->CallbackCount + CALLBACK_GROWTH;
        auto *grown = static_cast<KviCsCfgCallbackList *>(
            KVI_CS_REALLOC(list, sizeof(KviCsCfgCallbackList) + wanted * sizeof(KviCsCfgCallback)));
        if (grown == nullptr) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Realloc failed");
            trace.exitMessage("Error");
            return SA_ERR_HPI_OUT_OF_SPACE;
        }
        grown->CountAllocated = wanted;
        cfgContainer->CallbackList = list = grown;
    }
    list->Entry[cfgContainer->CallbackCount++] = FnPtr;
    return SA_OK;
}

SaErrorT kviCsConfigUnregister(KviCsCfgCallback FnPtr, KviCsCfgContainer *CfgContainer) noexcept
{
    KVI_TRACE("Callback %p", reinterpret_cast<void *>(FnPtr));
    KVI_NULL_CHECK(FnPtr);
    KVI_CFG_LIVE_CONTAINER(cfgContainer, CfgContainer);

    // DeleteSem first: a callback is never removed while the callbacks run.
    KVI_CFG_SEM_LOCK(deleting, &(cfgContainer->DeleteSem));
    KVI_CFG_SEM_LOCK(general, &(cfgContainer->GeneralSem));
    SaHpiUint32T count = cfgContainer->CallbackCount;
    if (count == 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Attempt to unregister FnPtr when 0 registered");
        trace.exitMessage("Error");
        return SA_ERR_HPI_NOT_PRESENT;
    }
    KviCsCfgCallback *entries = cfgContainer->CallbackList->Entry;
    for (SaHpiUint32T i = 0; i < count; ++i) {
        if (entries[i] == FnPtr) {
            // The last entry fills the gap: order is not kept.
            entries[i] = entries[count - 1];
            cfgContainer->CallbackCount = count - 1;
            return SA_OK;
        }
    }
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "FnPtr not present in the list");
    trace.exitMessage("Error");
    return SA_ERR_HPI_NOT_PRESENT;
}

SaErrorT kviCsConfigPerformCallbacks(KviCsCfgContainer *CfgContainer) noexcept
{
    KVI_TRACE("Container %p", static_cast<void *>(CfgContainer));
    KVI_CFG_LIVE_CONTAINER(cfgContainer, CfgContainer);

    KVI_CFG_SEM_LOCK(deleting, &(cfgContainer->DeleteSem));
    // The callbacks run on a copy, outside GeneralSem, so they may register
    // further callbacks and read the configuration.
    KviCsCfgCallback *callbacks = nullptr;
    SaHpiUint32T count = 0;
    {
        KVI_CFG_SEM_LOCK(general, &(cfgContainer->GeneralSem));
        count = cfgContainer->CallbackCount;
        if (count > 0) {
            callbacks =
                static_cast<KviCsCfgCallback *>(KVI_CS_MALLOC(count * sizeof(KviCsCfgCallback)));
            if (callbacks == nullptr) {
                KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Malloc failed");
                trace.exitMessage("Error");
                return SA_ERR_HPI_OUT_OF_SPACE;
            }
            memcpy(callbacks, cfgContainer->CallbackList->Entry, count * sizeof(KviCsCfgCallback));
        }
    }
    for (SaHpiUint32T i = 0; i < count; ++i)
        callbacks[i]();
    if (callbacks != nullptr)
        KVI_CS_FREE(callbacks);
    return SA_OK;
}

SaErrorT kviCsConfigProcessChanges(KviCsCfgContainer *CfgContainer) noexcept
{
    KVI_TRACE("Container %p", static_cast<void *>(CfgContainer));
    KVI_NULL_CHECK(CfgContainer);
    KVI_NULL_CHECK(CfgContainer->Filename);

    // The new settings are built completely aside; a file that fails to load
    // leaves the old ones in place.
    KviCsCfgContainer fresh;
    SaErrorT rc = kviCsConfigInitStructure(&fresh, SAHPI_FALSE, CfgContainer->Filename);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsConfigInitStructure returned %d", rc);
        trace.exitMessage("Error");
        return SA_ERR_HPI_ERROR;
    }
    {
        KVI_SEM_GUARD(general, &(CfgContainer->GeneralSem), KVI_CS_CFG_SEM_TIMEOUT);
        if (!general.held()) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "KVI_CS_SEM_WAIT returned %d", general.result());
            rc = kviCsConfigFinalizeStrucure(&fresh);
            if (rc != SA_OK)
                KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                         "double fault: kviCsConfigFinalizeStrucure returned %d", rc);
            trace.exitMessage("Error");
            return SA_ERR_HPI_ERROR;
        }
        // Readers hold GeneralSem too: they see the whole old list or the
        // whole new one, and the old one is freed only after this.
        KviCsLinkedListT *old = CfgContainer->KeyValueList;
        storeList(CfgContainer, fresh.KeyValueList);
        fresh.KeyValueList = old;
    }
    rc = kviCsConfigFinalizeStrucure(&fresh);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsConfigFinalizeStrucure returned %d", rc);

    rc = kviCsConfigPerformCallbacks(CfgContainer);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsConfigPerformCallbacks returned %d", rc);
        trace.exitMessage("Error");
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

SaErrorT kviCsConfigAddWaitingThread(KviCsCfgContainer *CfgContainer) noexcept
{
    KVI_TRACE("Container %p", static_cast<void *>(CfgContainer));
    KVI_CFG_LIVE_CONTAINER(cfgContainer, CfgContainer);

    KVI_CFG_SEM_LOCK(general, &(cfgContainer->GeneralSem));
    if (cfgContainer->HasThread) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "kviCsConfigAddWaitingThread called on config container with thread");
        trace.exitMessage("Error");
        return SA_ERR_HPI_DUPLICATE;
    }
    SaErrorT rc = startWatcher(cfgContainer, "Unable to malloc space");
    if (rc != SA_OK)
        trace.exitMessage("Error");
    return rc;
}

void *kviCsThreadRoutine(void *Arg) noexcept
{
    KVI_TRACE("Container %p", Arg);
    if (Arg == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "CfgContainer is NULL");
        return nullptr;
    }
    auto *CfgContainer = static_cast<KviCsCfgContainer *>(Arg);

    while (!isShuttingDown(CfgContainer)) {
        SaHpiInt64T modified = 0;
        {
            KVI_SEM_GUARD(general, &(CfgContainer->GeneralSem), KVI_CS_CFG_SEM_TIMEOUT);
            if (!general.held()) {
                KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Couldn't acquire semaphore");
                return nullptr;
            }
            if (kviCsGetFileInfo(CfgContainer->Filename, &modified, nullptr) != SA_OK) {
                KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to load config file %s",
                         CfgContainer->Filename);
                return nullptr;
            }
        }
        // Only the list is swapped by a reload, never UpdateTime: once the
        // file has changed, every later poll reloads it again.
        if (modified != CfgContainer->UpdateTime) {
            SaErrorT rc = kviCsConfigProcessChanges(CfgContainer);
            if (rc != SA_OK) {
                KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsConfigProcessChanges returned %d", rc);
                return nullptr;
            }
        }
        // Short naps, so a finalization waits at most one of them.
        for (int nap = 0; nap < WATCHER_NAPS; ++nap) {
            KVI_DLOG(KVI_LOG_DBG_L, "Falling asleep");
            struct timeval napTime = {0, WATCHER_NAP_USEC};
            select(0, nullptr, nullptr, nullptr, &napTime);
            KVI_DLOG(KVI_LOG_DBG_L, "Wakee Wakee! (%d of %d)", nap, WATCHER_NAPS);
            if (isShuttingDown(CfgContainer))
                return nullptr;
        }
    }
    return nullptr;
}
