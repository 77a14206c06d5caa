// The parameter coder: every message type's call travels from the client's
// arguments to the daemon's call and its results back, bodies that are one
// byte short or long are refused, headers are checked, and inventory trees
// survive the wire while blocks that point outside themselves are refused.
#include <gtest/gtest.h>

#include <string.h>

#include "coder/KviInventoryWire.h"
#include "coder/KviWireCalls.h"

namespace
{

constexpr SaHpiUint8T kIn = 0xA5;  // every byte of every input
constexpr SaHpiUint8T kOut = 0x3C; // every byte of every result
int badArguments = 0;

bool allBytes(const void *At, size_t Size, SaHpiUint8T Value)
{
    for (size_t i = 0; i < Size; ++i)
        if (static_cast<const SaHpiUint8T *>(At)[i] != Value)
            return false;
    return true;
}

// The daemon's side of every call, faked: inputs must arrive intact, and
// every output (which starts cleared) is answered.
template <typename A> void fakeArgument(A Arg)
{
    if constexpr (!std::is_pointer_v<A>) {
        badArguments += !allBytes(&Arg, sizeof Arg, kIn);
    } else if constexpr (!std::is_void_v<std::remove_pointer_t<A>>) {
        if (Arg != nullptr && allBytes(Arg, sizeof *Arg, 0))
            memset(Arg, kOut, sizeof *Arg);
        else if (Arg != nullptr)
            badArguments += !allBytes(Arg, sizeof *Arg, kIn);
    }
}
template <typename... A> SaErrorT fakeCall(A... Args) noexcept
{
    (fakeArgument(Args), ...);
    return SA_ERR_HPI_BUSY;
}

struct Message {
    alignas(8) SaHpiUint8T Bytes[KVI_WIRE_MAX_MSG];
};
Message request, response;

template <typename T> struct RawArgs;
template <typename... A> struct RawArgs<std::tuple<A...>> {
    using Type = std::tuple<KviWireRawT<A>...>;
};

template <KviMsgTypeT Code, auto Fn, KviWireDirs D> void roundTrip(const char *Name)
{
    SCOPED_TRACE(Name);
    // Enumerations are held as their numbers, as the coder holds them: the
    // byte pattern is no value of theirs.
    using Args = typename RawArgs<typename KviWireFn<decltype(Fn)>::Args>::Type;
    [&]<size_t... I>(std::index_sequence<I...>)
    {
        std::tuple<KviWireSlotT<std::tuple_element_t<I, Args>>...> slots;
        ((memset(&std::get<I>(slots), D.Letters[I] == 'i' ? kIn : 0, sizeof std::get<I>(slots))),
         ...);
        auto arg = [&]<size_t J>() -> std::tuple_element_t<J, Args> {
            if constexpr (std::is_pointer_v<std::tuple_element_t<J, Args>>)
                return D.Letters[J] == 'z' ? nullptr : &std::get<J>(slots);
            else
                return std::get<J>(slots);
        };
        // A body as sent, one byte short, and one byte long.
        for (int extra : {0, -1, 1}) {
            kviWireStart(request.Bytes, Code, 1);
            KviWireBody body(request.Bytes, sizeof request.Bytes);
            ASSERT_TRUE(kviWirePutCall<D>(body, arg.template operator()<I>()...));
            kviWireSeal(request.Bytes, body.end() + extra);
            ASSERT_EQ(kviWireCheck(request.Bytes), KVI_MSG_SUCCESS);
            KviWireBody in(request.Bytes, body.end() + extra);
            kviWireStart(response.Bytes, Code + 1, 1);
            KviWireBody out(response.Bytes, sizeof response.Bytes);
            SaErrorT result = SA_OK;
            badArguments = 0;
            const bool served =
                kviWireServe<fakeCall<std::tuple_element_t<I, Args>...>, D>(in, out, &result);
            ASSERT_EQ(served, extra == 0);
            if (!served)
                continue;
            EXPECT_EQ(badArguments, 0);
            EXPECT_EQ(result, SA_ERR_HPI_BUSY);
            kviWireSeal(response.Bytes, out.end());
            KviWireBody back(response.Bytes, out.end());
            ASSERT_TRUE(kviWireGetCall<D>(back, true, arg.template operator()<I>()...));
            const bool answered[] = {
                (D.Letters[I] != 'o' && D.Letters[I] != 'b') ||
                allBytes(&std::get<I>(slots), sizeof std::get<I>(slots), kOut)...};
            for (size_t i = 0; i < sizeof...(I); ++i)
                EXPECT_TRUE(answered[i]) << "result " << i;
        }
    }
    (std::make_index_sequence<KviWireFn<decltype(Fn)>::Count>{});
}

TEST(ParamCoderTest, EveryCallTravelsThereAndBackAndOddBodiesAreRefused)
{
#define KVI_ROUND_TRIP(Code, Fn, Letters) roundTrip<Code, Fn, Letters>(#Fn);
    KVI_WIRE_CALLS(KVI_ROUND_TRIP)
#undef KVI_ROUND_TRIP
}

TEST(ParamCoderTest, HeadersAreCheckedBeforeTheBody)
{
    kviWireStart(request.Bytes, KVI_RPT_INFO_GET_REQ, 3);
    KviWireBody body(request.Bytes, sizeof request.Bytes);
    body.put(SaHpiSessionIdT{1000});
    kviWireSeal(request.Bytes, body.end());
    auto *h = reinterpret_cast<KviMsgHdr *>(request.Bytes);
    const struct {
        const char *what;
        void (*spoil)(KviMsgHdr *);
        KviCommRetCode expected;
    } cases[] = {
        {"intact", [](KviMsgHdr *) {}, KVI_MSG_SUCCESS},
        {"identifier", [](KviMsgHdr *H) { H->MinHdr.Identifier = 2; }, KVI_MSG_INVALID_PROTOCOL},
        {"major", [](KviMsgHdr *H) { H->MinHdr.MajorVersion = 2; }, KVI_MSG_INVALID_PROTOCOL},
        {"minor", [](KviMsgHdr *H) { H->MinHdr.MinorVersion = 0; }, KVI_MSG_INVALID_PROTOCOL},
        {"checksum", [](KviMsgHdr *H) { H->Checksum ^= 1; }, KVI_MSG_INVALID_FORMAT},
        {"size below the header", [](KviMsgHdr *H) { H->MinHdr.Size = 12; },
         KVI_MSG_INVALID_FORMAT},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.what);
        const KviMsgHdr saved = *h;
        c.spoil(h);
        EXPECT_EQ(kviWireCheck(request.Bytes), c.expected);
        *h = saved;
    }
}

// A chassis area whose texts are shared, a board area with custom fields,
// and an opaque OEM record, built the way a plug-in lays one out.
struct Tree {
    alignas(8) SaHpiUint8T Bytes[4096] = {};
    SaHpiUint32T Size = 0;
    SaHpiUint32T OemAt = 0;
    Tree()
    {
        size_t used = 0;
        auto take = [&](size_t n) {
            used = (used + 7) / 8 * 8;
            void *p = Bytes + used;
            used += n;
            return p;
        };
        auto *data = static_cast<SaHpiInventoryDataT *>(
            take(sizeof(SaHpiInventoryDataT) + 3 * sizeof(void *)));
        auto *text = static_cast<SaHpiTextBufferT *>(take(sizeof(SaHpiTextBufferT)));
        text->DataLength = 5;
        memcpy(text->Data, "Acme!", 5);
        auto *chassis = static_cast<SaHpiInventDataRecordT *>(take(sizeof(SaHpiInventDataRecordT)));
        chassis->RecordType = SAHPI_INVENT_RECTYPE_CHASSIS_INFO;
        chassis->RecordData.ChassisInfo.GeneralData.Manufacturer = text;
        chassis->RecordData.ChassisInfo.GeneralData.AssetTag = text;
        auto *board = static_cast<SaHpiInventDataRecordT *>(
            take(sizeof(SaHpiInventDataRecordT) + 2 * sizeof(void *)));
        board->RecordType = SAHPI_INVENT_RECTYPE_BOARD_INFO;
        board->RecordData.BoardInfo.CustomField[0] = text;
        board->RecordData.BoardInfo.CustomField[1] = text;
        auto *oem =
            static_cast<SaHpiInventDataRecordT *>(take(sizeof(SaHpiInventDataRecordT) + 16));
        OemAt = static_cast<SaHpiUint32T>(reinterpret_cast<SaHpiUint8T *>(oem) - Bytes);
        oem->RecordType = SAHPI_INVENT_RECTYPE_OEM;
        oem->DataLength = offsetof(SaHpiInventOemDataT, Data) + 12;
        memset(oem->RecordData.OemData.Data, 0x77, 12);
        data->DataRecords[0] = chassis;
        data->DataRecords[1] = board;
        data->DataRecords[2] = oem;
        Size = static_cast<SaHpiUint32T>(used);
    }
    SaHpiInventoryDataT *data() { return reinterpret_cast<SaHpiInventoryDataT *>(Bytes); }
};

TEST(ParamCoderTest, InventoryTreesSurviveTheWireAndStrayOffsetsAreRefused)
{
    Tree tree;
    alignas(8) SaHpiUint8T wire[4096], again[4096];
    SaHpiUint32T used = 0, usedAgain = 0;
    ASSERT_EQ(kviWireInventoryFlatten(tree.data(), tree.Bytes, tree.Size, wire, sizeof wire, &used),
              SA_OK);
    EXPECT_EQ(
        kviWireInventoryFlatten(tree.data(), tree.Bytes, tree.Size, again, used - 1, &usedAgain),
        SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_EQ(kviWireInventoryFlatten(tree.data(), tree.Bytes, tree.OemAt + 12, again, sizeof again,
                                      &usedAgain),
              SA_ERR_HPI_INVALID_DATA)
        << "a tree that leaves its plug-in's buffer";
    memcpy(again, wire, used);
    ASSERT_EQ(kviWireInventoryRelocate(again, used), SA_OK);
    auto *copy = reinterpret_cast<SaHpiInventoryDataT *>(again);
    ASSERT_NE(copy->DataRecords[2], nullptr);
    EXPECT_EQ(copy->DataRecords[3], nullptr);
    const SaHpiTextBufferT *text = copy->DataRecords[1]->RecordData.BoardInfo.CustomField[1];
    EXPECT_EQ(std::string(reinterpret_cast<const char *>(text->Data), text->DataLength), "Acme!");
    EXPECT_EQ(copy->DataRecords[2]->RecordData.OemData.Data[11], 0x77);
    // The rebuilt tree goes on the wire as the same bytes.
    ASSERT_EQ(
        kviWireInventoryFlatten(copy, again, used, again + used, sizeof again - used, &usedAgain),
        SA_OK);
    EXPECT_EQ(memcmp(wire, again + used, used), 0);

    const size_t slot = offsetof(SaHpiInventoryDataT, DataRecords);
    const struct {
        const char *what;
        size_t at;
        uintptr_t value;
    } stray[] = {
        {"past the end", slot, used + 1},
        {"misaligned", slot, 3},
        {"an address outside", slot, reinterpret_cast<uintptr_t>(&tree)},
    };
    for (const auto &s : stray) {
        SCOPED_TRACE(s.what);
        memcpy(again, wire, used);
        memcpy(again + s.at, &s.value, sizeof s.value);
        EXPECT_EQ(kviWireInventoryRelocate(again, used), SA_ERR_HPI_INVALID_DATA);
    }
    uintptr_t oemAt = 0;
    memcpy(&oemAt, wire + slot + 2 * sizeof(void *), sizeof oemAt);
    EXPECT_EQ(kviWireInventoryRelocate(wire, static_cast<SaHpiUint32T>(oemAt - 1 + 12)),
              SA_ERR_HPI_INVALID_DATA)
        << "a block cut inside a record";
}

} // namespace
