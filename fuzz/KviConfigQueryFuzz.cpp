// Parses arbitrary bytes as a configuration file, then reads what it parsed
// to through every query: the text query at buffer sizes around the value's
// length, the two number conversions and the list elements of each value.
// Buffers are exactly as large as the caller says, so a write past the size
// a query was given is caught.
#include <vector>

#include "KviConfigFuzzing.h"

using namespace kviFuzz;

namespace
{
// Queries walk the list from its head; a bound on the pairs looked at keeps
// a long input from costing the square of its length.
constexpr int MAX_QUERIED_PAIRS = 8;
constexpr SaHpiUint32T MAX_ELEMENTS = 4;

// A buffer of exactly `size` bytes, never a null pointer, even for none.
std::unique_ptr<char[]> exactBuffer(SaHpiUint32T size)
{
    std::unique_ptr<char[]> buffer(new char[size]);
    memset(buffer.get(), 'x', size);
    return buffer;
}

// What a query for the key must find: the first pair that has it.
const char *firstValue(const KviCsLinkedListNodeT *head, const char *key)
{
    for (auto *node = head; node != nullptr; node = node->Next)
        if (strcmp(pairOf(node)->Key, key) == 0)
            return pairOf(node)->Value;
    return nullptr;
}

// The text query with a buffer of exactly `size` bytes: a value shorter than
// the buffer comes back whole and padded with NULs, a longer one cut to the
// buffer with no terminator.
void checkText(const char *key, const char *expected, SaHpiUint32T size, KviCsCfgContainer *cont)
{
    auto buffer = exactBuffer(size);
    SaErrorT rc = kviCsCfgDataGet(key, size, buffer.get(), cont);
    if (expected == nullptr) {
        require(rc == SA_ERR_HPI_NOT_PRESENT);
        return;
    }
    size_t length = strlen(expected);
    require(rc == (length < size ? SA_OK : SA_ERR_HPI_DATA_TRUNCATED));
    size_t copied = length < size ? length : size;
    require(memcmp(buffer.get(), expected, copied) == 0);
    for (size_t i = copied; i < size; ++i)
        require(buffer[i] == '\0');
}

// The two conversions read the same text, so they must agree: both accept
// it with the same bits, or the signed one refuses what only the unsigned
// range holds, or the unsigned one refuses -1 (its saturated value).
void checkNumbers(const char *key, const char *expected, KviCsCfgContainer *cont)
{
    SaHpiUint32T u = 0;
    SaHpiInt32T s = 0;
    SaErrorT urc = kviCsCfgDataUint32Get(key, &u, cont);
    SaErrorT src = kviCsCfgDataInt32Get(key, &s, cont);
    if (expected == nullptr) {
        require(urc == SA_ERR_HPI_NOT_PRESENT && src == SA_ERR_HPI_NOT_PRESENT);
        return;
    }
    if (strlen(expected) >= 12) {
        require(urc == SA_ERR_HPI_DATA_TRUNCATED && src == SA_ERR_HPI_DATA_TRUNCATED);
        return;
    }
    require(urc == SA_OK || urc == SA_ERR_HPI_INVALID_DATA);
    require(src == SA_OK || src == SA_ERR_HPI_INVALID_DATA);
    require(urc != SA_OK || u != UINT32_MAX);
    require(src != SA_OK || (s != INT32_MIN && s != INT32_MAX));
    if (src == SA_OK && s != -1)
        require(urc == SA_OK && u == static_cast<SaHpiUint32T>(s));
}

// The elements, each in a buffer just large enough, put back together with
// their separators, give the value again; the one after the last is not
// present. `small` is a buffer size the input chose, too small for some.
void checkElements(const char *value, SaHpiUint32T small)
{
    // Two bytes at least: a smaller buffer is refused whatever the value.
    SaHpiUint32T room = static_cast<SaHpiUint32T>(strlen(value)) + 2;
    auto result = exactBuffer(room);
    auto cramped = exactBuffer(small);
    const char *rest = value;
    for (SaHpiUint32T i = 0; i < MAX_ELEMENTS; ++i) {
        SaErrorT rc = kviGetListElement(i, value, room, result.get());
        if (rest == nullptr) {
            require(rc == SA_ERR_HPI_NOT_PRESENT);
            return;
        }
        require(rc == SA_OK);
        size_t length = strlen(result.get());
        require(strncmp(rest, result.get(), length) == 0);
        require(rest[length] == ';' || rest[length] == '\0');

        rc = kviGetListElement(i, value, small, cramped.get());
        if (small < 2)
            require(rc == SA_ERR_HPI_INVALID_PARAMS);
        else if (length < small)
            require(rc == SA_OK && strcmp(cramped.get(), result.get()) == 0);
        else
            require(rc == SA_ERR_HPI_OUT_OF_SPACE);
        rest = rest[length] == ';' ? rest + length + 1 : nullptr;
    }
}

void checkKey(const char *key, const KviCsLinkedListNodeT *head, SaHpiUint32T small,
              KviCsCfgContainer *cont)
{
    const char *expected = firstValue(head, key);
    SaHpiUint32T length = expected != nullptr ? static_cast<SaHpiUint32T>(strlen(expected)) : 0;
    for (SaHpiUint32T size : {length + 1, length, small})
        checkText(key, expected, size, cont);
    checkNumbers(key, expected, cont);
    if (expected != nullptr)
        checkElements(expected, small);
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    if (size > MAX_INPUT_BYTES)
        return 0;
    ParsedConfig parsed(data, size);
    // A size the input chooses, from none to a little more than most values.
    SaHpiUint32T small = size > 0 ? data[size - 1] % 16 : 0;
    int queried = 0;
    for (auto *node = parsed.head(); node != nullptr && queried < MAX_QUERIED_PAIRS;
         node = node->Next, ++queried) {
        const char *key = pairOf(node)->Key;
        checkKey(key, parsed.head(), small, parsed.container());
        // The key less its last character may belong to another pair or to
        // none.
        std::vector<char> shorter(key, key + strlen(key));
        shorter.back() = '\0';
        checkKey(shorter.data(), parsed.head(), small, parsed.container());
    }
    return 0;
}
