// Feeds arbitrary bytes to the configuration parser, then reads back every
// pair it kept through the queries. The parser must never read past the
// buffer (which, as with a file, carries no terminating NUL), and everything
// it keeps must be a well-formed pair.
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>

#include "core/utils/KviConfig.h"

namespace
{
void require(bool condition)
{
    if (!condition)
        abort();
}

KviCsCfgContainer &container()
{
    static KviCsCfgContainer cont = [] {
        KviCsCfgContainer c{};
        require(kviCsSemInitNoLogging(&c.GeneralSem, 1) == SA_OK);
        require(kviCsSemInitNoLogging(&c.DeleteSem, 1) == SA_OK);
        return c;
    }();
    return cont;
}

void checkPair(const KviKeyValuePairT *pair, KviCsCfgContainer *cont)
{
    size_t keyLength = strlen(pair->Key);
    size_t valueLength = strlen(pair->Value);
    require(keyLength > 0 && keyLength < MAX_KEY_LENGTH);
    require(valueLength < MAX_VALUE_LENGTH);
    require(strspn(pair->Key, KV_VALID_CHARACTERS) == keyLength);
    require(strchr(pair->Value, '"') == nullptr);

    char small[8];
    SaErrorT rc = kviCsCfgDataGet(pair->Key, sizeof small, small, cont);
    require(rc == SA_OK || rc == SA_ERR_HPI_DATA_TRUNCATED);
    SaHpiUint32T u = 0;
    SaHpiInt32T s = 0;
    kviCsCfgDataUint32Get(pair->Key, &u, cont);
    kviCsCfgDataInt32Get(pair->Key, &s, cont);
    char element[16];
    for (SaHpiUint32T i = 0; i < 4; ++i)
        kviGetListElement(i, pair->Value, sizeof element, element);
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    if (size > 1u << 20)
        return 0;
    KviCsCfgContainer *cont = &container();
    KviCsLinkedListT list{};
    kviCsLinkedListInitialize(&list);
    cont->KeyValueList = &list;

    // An exact copy, never a null pointer, even for an empty input.
    std::unique_ptr<char[]> text(new char[size + (size == 0)]);
    if (size > 0)
        memcpy(text.get(), data, size);
    kviCsCfgDataParseData(text.get(), static_cast<SaHpiUint32T>(size), cont);

    for (auto *node = list.HeadPointer; node != nullptr; node = node->Next)
        checkPair(static_cast<const KviKeyValuePairT *>(node->Data), cont);

    require(kviCsCfgFreeKeyValueList(&list) == SA_OK);
    cont->KeyValueList = nullptr;
    return 0;
}
