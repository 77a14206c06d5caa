// Feeds arbitrary bytes to the daemon's side of the wire: as a request that
// arrived whole (its size and checksum made right, so the body is what gets
// taken apart), and, when the first byte is odd, also as inventory data in
// wire form. Whatever the bytes, the daemon must answer within its response
// buffer, and a block that relocates must be a tree whose every pointer
// stays inside it.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "coder/KviInventoryWire.h"
#include "coder/KviWireCalls.h"
#include "hpid/KviHpid.h"

namespace
{
struct Message {
    alignas(8) SaHpiUint8T Bytes[KVI_WIRE_MAX_MSG];
};
Message request, response, copy;

void require(bool Condition, int Line = __builtin_LINE())
{
    if (!Condition) {
        fprintf(stderr, "requirement at line %d failed\n", Line);
        abort();
    }
}

// The calls refuse everything until the library is initialized, which is
// what a fuzzed request should meet: only the decoding runs.
bool libraryReady = [] { return kviDsApiRedirectorInitialize() == SA_OK; }();

void asRequest(const uint8_t *Data, size_t Size)
{
    memcpy(request.Bytes, Data, Size);
    kviWireSeal(request.Bytes, static_cast<SaHpiUint32T>(Size));
    kviHpidServeMessage(-1, request.Bytes, response.Bytes);
    const auto *rsp = reinterpret_cast<const KviRspMsgHdr *>(response.Bytes);
    require(rsp->MsgHdr.MinHdr.Size >= sizeof(KviRspMsgHdr));
    require(kviWireCheck(response.Bytes) == KVI_MSG_SUCCESS);
}

void asInventory(const uint8_t *Data, size_t Size)
{
    memcpy(request.Bytes, Data, Size);
    const auto size = static_cast<SaHpiUint32T>(Size);
    if (kviWireInventoryRelocate(request.Bytes, size) != SA_OK)
        return;
    SaHpiUint32T used = 0;
    const auto *tree = reinterpret_cast<const SaHpiInventoryDataT *>(request.Bytes);
    // Records that share their objects are copied once per use, so the copy
    // may not fit; it must never leave the block.
    require(kviWireInventoryFlatten(tree, request.Bytes, size, copy.Bytes, sizeof copy.Bytes,
                                    &used) != SA_ERR_HPI_INVALID_DATA);
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *Data, size_t Size)
{
    require(libraryReady);
    if (Size < sizeof(KviMsgHdr) || Size > KVI_WIRE_MAX_MSG)
        return 0;
    asRequest(Data, Size);
    if (Data[0] & 1)
        asInventory(Data + 1, Size - 1);
    return 0;
}
