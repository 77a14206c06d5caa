// kvi-hpid and libKviHpiClient end to end: every call answered through the
// daemon as the library answers it in process, events to a remote
// subscriber, sessions closed with their connection, hostile peers answered
// or dropped while others are served, and a clean stop under SIGTERM.
#include <gtest/gtest.h>

#include <string.h>

#include <vector>

#include "../../plugins/simulator/SimulatorTestSupport.h"
#include "HpidTestSupport.h"
#include "coder/KviInventoryWire.h"
#include "coder/KviWireCalls.h"
#include "support/KviTestSupport.h"

namespace
{

using Bytes = std::vector<SaHpiUint8T>;

template <typename P> Bytes bytesBehind(P Arg)
{
    if constexpr (std::is_pointer_v<P> && !std::is_void_v<std::remove_pointer_t<P>>) {
        if (Arg != nullptr) {
            const auto *b = reinterpret_cast<const SaHpiUint8T *>(Arg);
            return Bytes(b, b + sizeof(*Arg));
        }
    }
    return {};
}

template <typename P> void putBack(P Arg, const Bytes &Saved)
{
    if constexpr (std::is_pointer_v<P>) {
        if (!Saved.empty())
            memcpy(const_cast<void *>(static_cast<const void *>(Arg)), Saved.data(), Saved.size());
    }
}

// A request made by hand, for the peers the client library would never be.
template <typename... T> Bytes request(KviMsgTypeT Type, T... Params)
{
    alignas(8) static SaHpiUint8T msg[KVI_WIRE_MAX_MSG];
    kviWireStart(msg, Type, 7);
    KviWireBody body(msg, sizeof msg);
    body.put(KVI_WIRE_LAYOUT_TAG);
    (body.put(Params), ...);
    kviWireSeal(msg, body.end());
    return Bytes(msg, msg + body.end());
}

struct RawPeer {
    explicit RawPeer(int Port)
    {
        kviCsOpenClientComm(Port, "127.0.0.1", &fd);
        kviCsSemInitNoLogging(&sem, 1);
    }
    ~RawPeer()
    {
        kviCsCloseComm(fd);
        kviCsSemDestroyNoLogging(&sem);
    }
    void send(const Bytes &B) { ASSERT_EQ(write(fd, B.data(), B.size()), ssize_t(B.size())); }
    // The answer's KviCommRetCode, or -1 when the daemon hung up instead.
    int answer()
    {
        if (kviCpsReadProtoMsg(fd, 10000, 1, &sem, sizeof rsp, rsp) != SA_OK)
            return -1;
        return reinterpret_cast<KviRspMsgHdr *>(rsp)->CommRetCode;
    }
    SaErrorT result() const { return reinterpret_cast<const KviRspMsgHdr *>(rsp)->SaRetCode; }
    SaHpiInt32T fd = -1;
    KviCsSemaphore sem;
    alignas(8) SaHpiUint8T rsp[KVI_WIRE_MAX_MSG];
};

class HpidTest : public testing::Test
{
  protected:
    static void SetUpTestSuite()
    {
        dir_ = new KviTempDir;
        const std::string local = kviHpidShelfConfig(simulatorPath(), dir_->file("local-nv"));
        ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, dir_->write("local.conf", local).c_str()), SA_OK);
        ASSERT_EQ(kviDsApiRedirectorInitialize(), SA_OK);
        SaHpiVersionT version = 0;
        ASSERT_EQ(saHpiInitialize(&version), SA_OK);
        ASSERT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &local_, nullptr), SA_OK);
        ASSERT_EQ(saHpiResourcesDiscover(local_), SA_OK);
        const std::string remote = kviHpidShelfConfig(simulatorPath(), dir_->file("remote-nv"));
        daemon_ = new KviHpid(dir_->write("remote.conf", remote), dir_->file("hpid.log"));
        ASSERT_NE(daemon_->port(), 0);
        client_ = kviHpiClientOpen(daemon_->port());
        ASSERT_NE(client_, nullptr) << dlerror();
        ASSERT_EQ(KVI_REMOTE(client_, saHpiInitialize)(&version), SA_OK);
        ASSERT_EQ(KVI_REMOTE(client_, saHpiSessionOpen)(0, &remote_, nullptr), SA_OK);
    }
    static void TearDownTestSuite()
    {
        EXPECT_EQ(KVI_REMOTE(client_, saHpiFinalize)(), SA_OK);
        EXPECT_EQ(daemon_->stop(SIGTERM), 0);
        delete daemon_;
        saHpiFinalize();
        kviDsMaplManagerFinalize();
        kviCsConfigFinalize();
        delete dir_;
    }

    // Fn in process and through the daemon, with the same arguments after
    // the session: the same result and the same bytes behind every pointer.
    template <typename F, typename... P>
    static SaErrorT same(const char *Name, F Local, F Remote, P... Args)
    {
        SCOPED_TRACE(Name);
        const Bytes before[] = {bytesBehind(Args)..., {}};
        const SaErrorT rc = Local(local_, Args...);
        const Bytes local[] = {bytesBehind(Args)..., {}};
        size_t i = 0;
        (putBack(Args, before[i++]), ...);
        EXPECT_EQ(Remote(remote_, Args...), rc);
        const Bytes remote[] = {bytesBehind(Args)..., {}};
        for (i = 0; i < sizeof...(Args); ++i)
            EXPECT_EQ(remote[i], local[i]) << "argument " << i + 2;
        return rc;
    }

    static void sameRecords(SaHpiResourceIdT Rid);
    static Bytes inventory(decltype(&saHpiEntityInventoryDataRead) Read, SaHpiSessionIdT Session,
                           SaHpiResourceIdT Rid);

    static KviTempDir *dir_;
    static KviHpid *daemon_;
    static void *client_;
    static SaHpiSessionIdT local_;
    static SaHpiSessionIdT remote_;
};
KviTempDir *HpidTest::dir_;
KviHpid *HpidTest::daemon_;
void *HpidTest::client_;
SaHpiSessionIdT HpidTest::local_;
SaHpiSessionIdT HpidTest::remote_;

// Through the C signatures, so values outside an enumeration go as numbers.
#define SAME(Fn, ...)                                                                              \
    same(#Fn, kviWireRawFn(&Fn), kviWireRawFn(KVI_REMOTE(client_, Fn)), __VA_ARGS__)

// An inventory as its wire form, which holds no addresses.
Bytes HpidTest::inventory(decltype(&saHpiEntityInventoryDataRead) Read, SaHpiSessionIdT Session,
                          SaHpiResourceIdT Rid)
{
    alignas(8) static SaHpiUint8T tree[8192], flat[8192];
    SaHpiUint32T actual = 0, used = 0;
    auto *data = reinterpret_cast<SaHpiInventoryDataT *>(tree);
    EXPECT_EQ(Read(Session, Rid, SAHPI_DEFAULT_INVENTORY_ID, sizeof tree, data, &actual), SA_OK);
    EXPECT_EQ(kviWireInventoryFlatten(data, tree, actual, flat, sizeof flat, &used), SA_OK);
    return Bytes(flat, flat + used);
}

void HpidTest::sameRecords(SaHpiResourceIdT Rid)
{
    for (SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY, next; entry != SAHPI_LAST_ENTRY; entry = next) {
        SaHpiRdrT rdr{};
        if (SAME(saHpiRdrGet, Rid, entry, &next, &rdr) != SA_OK)
            return;
        SaHpiSensorReadingT reading;
        SaHpiSensorThresholdsT thresholds;
        SaHpiSensorEvtEnablesT enables;
        SaHpiSensorTypeT type;
        SaHpiEventCategoryT category;
        SaHpiCtrlTypeT ctrlType;
        SaHpiCtrlStateT state;
        SaHpiWatchdogT watchdog;
        const auto &u = rdr.RdrTypeUnion;
        switch (rdr.RdrType) {
        case SAHPI_SENSOR_RDR:
            SAME(saHpiSensorReadingGet, Rid, u.SensorRec.Num, &reading);
            SAME(saHpiSensorThresholdsGet, Rid, u.SensorRec.Num, &thresholds);
            SAME(saHpiSensorEventEnablesGet, Rid, u.SensorRec.Num, &enables);
            SAME(saHpiSensorTypeGet, Rid, u.SensorRec.Num, &type, &category);
            break;
        case SAHPI_CTRL_RDR:
            SAME(saHpiControlTypeGet, Rid, u.CtrlRec.Num, &ctrlType);
            if (SAME(saHpiControlStateGet, Rid, u.CtrlRec.Num, &state) == SA_OK)
                SAME(saHpiControlStateSet, Rid, u.CtrlRec.Num, &state);
            break;
        case SAHPI_WATCHDOG_RDR:
            SAME(saHpiWatchdogTimerGet, Rid, u.WatchdogRec.WatchdogNum, &watchdog);
            break;
        case SAHPI_INVENTORY_RDR:
            EXPECT_EQ(inventory(saHpiEntityInventoryDataRead, local_, Rid),
                      inventory(KVI_REMOTE(client_, saHpiEntityInventoryDataRead), remote_, Rid));
            break;
        default:
            break;
        }
    }
}

TEST_F(HpidTest, AnswersEveryCallAsTheLibraryDoesInProcess)
{
    SaHpiUint32T schema;
    SaHpiTimeoutT timeout;
    SAME(saHpiEntitySchemaGet, &schema);
    SAME(saHpiAutoInsertTimeoutSet, SAHPI_TIMEOUT_BLOCK);
    SAME(saHpiAutoInsertTimeoutGet, &timeout);
    int resources = 0;
    for (SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY, next; entry != SAHPI_LAST_ENTRY; entry = next) {
        SaHpiRptEntryT rpt{};
        ASSERT_EQ(SAME(saHpiRptEntryGet, entry, &next, &rpt), SA_OK);
        const SaHpiResourceIdT rid = rpt.ResourceId;
        SaHpiBoolT enabled;
        SaHpiHsPowerStateT power;
        SaHpiResetActionT reset;
        SaHpiHsStateT hs;
        SaHpiHsIndicatorStateT indicator;
        SAME(saHpiRptEntryGetByResourceId, rid, &rpt);
        SAME(saHpiEventLogStateGet, rid, &enabled);
        SAME(saHpiResourcePowerStateGet, rid, &power);
        SAME(saHpiResourceResetStateGet, rid, &reset);
        SAME(saHpiHotSwapStateGet, rid, &hs);
        SAME(saHpiHotSwapIndicatorStateGet, rid, &indicator);
        SAME(saHpiAutoExtractTimeoutGet, rid, &timeout);
        // The hot-swap state machine, driven alike on both sides; no
        // countdown runs, so each step waits for its call.
        SAME(saHpiAutoExtractTimeoutSet, rid, SAHPI_TIMEOUT_BLOCK);
        SAME(saHpiHotSwapActionRequest, rid, SAHPI_HS_ACTION_EXTRACTION);
        SAME(saHpiHotSwapStateGet, rid, &hs);
        SAME(saHpiHotSwapControlRequest, rid);
        SAME(saHpiHotSwapIndicatorStateSet, rid, SAHPI_HS_INDICATOR_ON);
        SAME(saHpiResourceActiveSet, rid);
        SAME(saHpiResourceInactiveSet, rid);
        SAME(saHpiHotSwapStateGet, rid, &hs);
        SAME(saHpiResourceSeveritySet, rid, SAHPI_MAJOR);
        SAME(saHpiResourceTagSet, rid, &rpt.ResourceTag);
        SAME(saHpiParmControl, rid, SAHPI_SAVE_PARM);
        sameRecords(rid);
        ++resources;
    }
    EXPECT_EQ(resources, 5);

    // Refusals come back the same: unknown things, NULL pointers, values
    // outside their enumeration, a session that is not open.
    SaHpiRptEntryT rpt;
    SaHpiSensorReadingT reading;
    SAME(saHpiRptEntryGetByResourceId, 999u, &rpt);
    SAME(saHpiSensorReadingGet, 2u, 200u, &reading);
    SAME(saHpiSensorReadingGet, 2u, 1u, static_cast<SaHpiSensorReadingT *>(nullptr));
    SAME(saHpiResourceSeveritySet, 2u, 0x77);
    SAME(saHpiParmControl, 2u, 9);
    EXPECT_EQ(KVI_REMOTE(client_, saHpiResourcesDiscover)(5), saHpiResourcesDiscover(5));
}

TEST_F(HpidTest, EventsReachARemoteSubscriberWithRecordAndResource)
{
    ASSERT_EQ(KVI_REMOTE(client_, saHpiSubscribe)(remote_, SAHPI_FALSE), SA_OK);
    // Board 12V of the first board reads 200: an upper minor threshold below
    // that is crossed the moment it is set.
    SaHpiSensorThresholdsT limits{}, low{};
    ASSERT_EQ(KVI_REMOTE(client_, saHpiSensorThresholdsGet)(remote_, 2, 3, &limits), SA_OK);
    low.UpMinor.ValuesPresent = SAHPI_SRF_RAW;
    low.UpMinor.Raw = 195;
    ASSERT_EQ(KVI_REMOTE(client_, saHpiSensorThresholdsSet)(remote_, 2, 3, &low), SA_OK);
    SaHpiEventT event{};
    SaHpiRdrT rdr{};
    SaHpiRptEntryT rpt{};
    ASSERT_EQ(KVI_REMOTE(client_, saHpiEventGet)(remote_, 10000000000LL, &event, &rdr, &rpt),
              SA_OK);
    EXPECT_EQ(event.EventType, SAHPI_ET_SENSOR);
    EXPECT_EQ(event.EventDataUnion.SensorEvent.EventState, SAHPI_ES_UPPER_MINOR);
    EXPECT_EQ(rpt.ResourceId, event.Source);
    EXPECT_EQ(rdr.RdrTypeUnion.SensorRec.Num, event.EventDataUnion.SensorEvent.SensorNum);
    EXPECT_EQ(KVI_REMOTE(client_, saHpiSensorThresholdsSet)(remote_, 2, 3, &limits), SA_OK);
    EXPECT_EQ(KVI_REMOTE(client_, saHpiUnsubscribe)(remote_), SA_OK);
}

TEST_F(HpidTest, ClosesTheSessionsOfAConnectionThatGoesMidWait)
{
    SaHpiSessionIdT session = 0;
    auto get = KVI_REMOTE(client_, saHpiEventGet);
    SaHpiEventT event;
    {
        RawPeer peer(daemon_->port());
        peer.send(request(KVI_SESSION_OPEN_REQ, SaHpiDomainIdT{0}));
        ASSERT_EQ(peer.answer(), KVI_MSG_SUCCESS);
        memcpy(&session, peer.rsp + sizeof(KviRspMsgHdr) + 2, sizeof session);
        peer.send(request(KVI_SUBSCRIBE_REQ, session, SaHpiBoolT{SAHPI_FALSE}));
        ASSERT_EQ(peer.answer(), KVI_MSG_SUCCESS);
        peer.send(
            request(KVI_EVENT_GET_REQ, session, SAHPI_TIMEOUT_BLOCK, SAHPI_FALSE, SAHPI_FALSE));
        ASSERT_EQ(get(session, SAHPI_TIMEOUT_IMMEDIATE, &event, nullptr, nullptr),
                  SA_ERR_HPI_TIMEOUT);
    }
    EXPECT_TRUE(kviHpidWaitFor([&] {
        return get(session, SAHPI_TIMEOUT_IMMEDIATE, &event, nullptr, nullptr) ==
               SA_ERR_HPI_INVALID_SESSION;
    }));
}

TEST_F(HpidTest, AnswersOrDropsAHostileClientAndServesTheOthers)
{
    const SaHpiSessionIdT s = remote_;
    const Bytes good =
        request(KVI_SENSOR_READING_GET_REQ, s, SaHpiResourceIdT{2}, SaHpiSensorNumT{1});
    // The good request with bytes changed, sealed again unless it is the
    // checksum that is meant to be wrong.
    auto with = [&](size_t Offset, std::initializer_list<SaHpiUint8T> Values, bool Seal = true) {
        Bytes b = good;
        memcpy(b.data() + Offset, Values.begin(), Values.size());
        if (Seal && Offset >= sizeof(KviReqMsgHdr))
            kviWireSeal(b.data(), b.size());
        return b;
    };
    const struct {
        const char *what;
        Bytes message;
        int answer; // -1: dropped
    } cases[] = {
        {"garbage", Bytes(40, 0xff), -1},
        {"size below 10", with(8, {4, 0}), -1},
        {"truncated", Bytes(good.begin(), good.begin() + 25), -1},
        {"wrong identifier", with(0, {2}), KVI_MSG_INVALID_PROTOCOL},
        {"wrong version", with(2, {9}), KVI_MSG_INVALID_PROTOCOL},
        {"other layout", with(22, {0x11}), KVI_MSG_INVALID_PROTOCOL},
        {"bad checksum", with(12, {0}, false), KVI_MSG_INVALID_FORMAT},
        {"unknown type", request(0x0100, s), KVI_MSG_UNABLE_TO_PROCESS},
        {"a response type", request(KVI_SENSOR_READING_GET_RSP, s), KVI_MSG_UNABLE_TO_PROCESS},
        {"body too short", request(KVI_SENSOR_READING_GET_REQ, s, SaHpiResourceIdT{2}),
         KVI_MSG_INVALID_FORMAT},
        {"body too long",
         request(KVI_SENSOR_READING_GET_REQ, s, SaHpiResourceIdT{2}, SaHpiSensorNumT{1}, 0),
         KVI_MSG_INVALID_FORMAT},
        {"wrong parameter size", request(KVI_SENSOR_READING_GET_REQ, s, SaHpiUint8T{2}, 1u),
         KVI_MSG_INVALID_FORMAT},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.what);
        RawPeer peer(daemon_->port());
        peer.send(c.message);
        EXPECT_EQ(peer.answer(), c.answer);
        if (c.answer != -1) {
            peer.send(good);
            EXPECT_EQ(peer.answer(), KVI_MSG_SUCCESS) << "the connection stays usable";
            EXPECT_EQ(peer.result(), SA_OK);
        }
        SaHpiSensorReadingT reading;
        EXPECT_EQ(KVI_REMOTE(client_, saHpiSensorReadingGet)(remote_, 2, 1, &reading), SA_OK);
    }
}

TEST(HpidStopTest, StopsCleanlyWithClientsConnectedAndClientsReconnect)
{
    KviTempDir dir;
    const std::string config =
        dir.write("hpid.conf", kviHpidShelfConfig(simulatorPath(), dir.file("nv")));
    auto daemon = std::make_unique<KviHpid>(config, dir.file("hpid.log"));
    const int port = daemon->port();
    ASSERT_NE(port, 0);
    void *client = kviHpiClientOpen(port);
    SaHpiVersionT version;
    SaHpiSessionIdT session;
    ASSERT_EQ(KVI_REMOTE(client, saHpiInitialize)(&version), SA_OK);
    ASSERT_EQ(KVI_REMOTE(client, saHpiSessionOpen)(0, &session, nullptr), SA_OK);
    RawPeer waiting(port);
    waiting.send(request(KVI_SESSION_OPEN_REQ, SaHpiDomainIdT{0}));
    ASSERT_EQ(waiting.answer(), KVI_MSG_SUCCESS);
    SaHpiSessionIdT other;
    memcpy(&other, waiting.rsp + sizeof(KviRspMsgHdr) + 2, sizeof other);
    waiting.send(request(KVI_SUBSCRIBE_REQ, other, SaHpiBoolT{SAHPI_FALSE}));
    ASSERT_EQ(waiting.answer(), KVI_MSG_SUCCESS);
    waiting.send(request(KVI_EVENT_GET_REQ, other, SAHPI_TIMEOUT_BLOCK, SAHPI_FALSE, SAHPI_FALSE));

    // Under the sanitizers a leak would make the exit status non-zero.
    EXPECT_EQ(daemon->stop(SIGTERM), 0);
    std::string log;
    FILE *f = fopen(dir.file("hpid.log").c_str(), "r");
    ASSERT_NE(f, nullptr);
    for (char line[512]; fgets(line, sizeof line, f) != nullptr;)
        log += line;
    fclose(f);
    EXPECT_NE(log.find("kvi-hpid stopped (0)"), std::string::npos);

    SaHpiRptInfoT info;
    EXPECT_EQ(KVI_REMOTE(client, saHpiRptInfoGet)(session, &info), SA_ERR_HPI_NO_RESPONSE);
    daemon = std::make_unique<KviHpid>(config, dir.file("hpid2.log"), port);
    ASSERT_EQ(daemon->port(), port);
    ASSERT_EQ(KVI_REMOTE(client, saHpiSessionOpen)(0, &session, nullptr), SA_OK);
    EXPECT_EQ(KVI_REMOTE(client, saHpiRptInfoGet)(session, &info), SA_OK);
    EXPECT_EQ(KVI_REMOTE(client, saHpiFinalize)(), SA_OK);
    EXPECT_EQ(daemon->stop(SIGTERM), 0);
}

} // namespace
