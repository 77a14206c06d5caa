// Feeds arbitrary bytes to the configuration parser as the content of a
// configuration file. The parser must never read past the buffer (which, as
// with a file, carries no terminating NUL), everything it keeps must be a
// well-formed pair, and the pairs must be the text's own, in the text's order.
#include "KviConfigFuzzing.h"

using namespace kviFuzz;

namespace
{
// The first place in [from, end) where `length` bytes start with `first` and
// satisfy `matches`, or null. memchr rather than memmem: the sanitizer checks
// the whole rest of the text on every memmem call, which made the check of an
// input with many pairs quadratic; memchr is checked only as far as it read.
template <typename Match>
const char *findFirst(const char *from, const char *end, size_t length, char first, Match matches)
{
    for (const char *p = from; end - p >= static_cast<ptrdiff_t>(length); ++p) {
        p = static_cast<const char *>(memchr(p, first, static_cast<size_t>(end - p)));
        if (p == nullptr || end - p < static_cast<ptrdiff_t>(length))
            return nullptr;
        if (matches(p))
            return p;
    }
    return nullptr;
}

// The first `value` in [from, end), or null.
const char *find(const char *from, const char *end, const char *value, size_t length)
{
    return findFirst(from, end, length, value[0],
                     [&](const char *p) { return memcmp(p, value, length) == 0; });
}

// The first `"value"` (quotes included) in [from, end), or null.
const char *findQuoted(const char *from, const char *end, const char *value, size_t length)
{
    return findFirst(from, end, length + 2, '"', [&](const char *q) {
        return memcmp(q + 1, value, length) == 0 && q[length + 1] == '"';
    });
}

// Each pair's key and quoted value must occur after the previous pair, before
// the first NUL (where the walk stops). Taking the first occurrence each time
// never overtakes where the parser really found them, so a well-behaved
// parser always passes.
const char *checkPair(const KviKeyValuePairT *pair, const char *cursor, const char *end)
{
    size_t keyLength = strlen(pair->Key);
    size_t valueLength = strlen(pair->Value);
    require(keyLength > 0 && keyLength < MAX_KEY_LENGTH);
    require(valueLength < MAX_VALUE_LENGTH);
    require(strspn(pair->Key, KV_VALID_CHARACTERS) == keyLength);

    const char *key = find(cursor, end, pair->Key, keyLength);
    require(key != nullptr);
    const char *quoted = findQuoted(key + keyLength, end, pair->Value, valueLength);
    require(quoted != nullptr);
    return quoted + valueLength + 2;
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    if (size > MAX_INPUT_BYTES)
        return 0;
    ParsedConfig parsed(data, size);
    const char *cursor = parsed.text();
    const char *nul = static_cast<const char *>(memchr(cursor, '\0', parsed.size()));
    const char *end = nul != nullptr ? nul : cursor + parsed.size();
    for (auto *node = parsed.head(); node != nullptr; node = node->Next)
        cursor = checkPair(pairOf(node), cursor, end);
    return 0;
}
