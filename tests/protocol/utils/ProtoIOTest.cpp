#include "protocol/utils/ProtoIO.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <chrono>
#include <deque>
#include <string>
#include <sys/socket.h>
#include <thread>
#include <unistd.h>

#include "support/KviTestSupport.h"

namespace
{
using Clock = std::chrono::steady_clock;

long long msSince(Clock::time_point start)
{
    return std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - start).count();
}

// The 10-byte minimum header announcing Size bytes.
std::string header(SaHpiUint16T Size)
{
    KviMinMsgHdr hdr{KVI_LIB_PROTOCOL_IDENTIFIER, KVI_LIB_PROTOCOL_MAJOR_VERSION,
                     KVI_LIB_PROTOCOL_MINOR_VERSION, 7, Size};
    return std::string(reinterpret_cast<const char *>(&hdr), sizeof hdr);
}
std::string message(SaHpiUint16T Size)
{
    return header(Size) + std::string(Size - 10, 'p');
}

void send(SaHpiInt32T desc, const std::string &bytes)
{
    ASSERT_EQ(::send(desc, bytes.data(), bytes.size(), 0), static_cast<ssize_t>(bytes.size()));
}

class ProtoIO : public testing::Test
{
  protected:
    void SetUp() override { ASSERT_EQ(kviCsSemInitNoLogging(&sem, 1), SA_OK); }
    void TearDown() override { kviCpsIoOps = kviCpsDefaultIoOps; }
    SaErrorT read(SaHpiInt32T TimeOut = 1000, SaHpiUint32T NumRetries = 1)
    {
        buf.assign(80, '#');
        return kviCpsReadProtoMsg(connection.server, TimeOut, NumRetries, &sem, 64, buf.data());
    }
    SaErrorT write(SaHpiUint32T NumRetries, SaHpiUint32T TimeOut = 1000, SaHpiUint16T Size = 30)
    {
        std::string m = message(Size);
        return kviCpsWriteProtoMsg(connection.client, TimeOut, NumRetries, m.data());
    }
    KviLoopback connection;
    KviCsSemaphore sem;
    std::string buf;
};

// What the scripted seams answer, in order; the real call once it runs out.
std::deque<int> pollScript;
std::deque<SaErrorT> writeScript;
int scriptedPoll(pollfd *fds, nfds_t count, int timeoutMs)
{
    if (pollScript.empty())
        return poll(fds, count, timeoutMs);
    int status = pollScript.front();
    pollScript.pop_front();
    fds->revents = status > 0 ? fds->events : 0;
    errno = EINTR;
    return status;
}
SaErrorT scriptedWrite(SaHpiInt32T Desc, const void *Buf, SaHpiInt32T Size) noexcept
{
    if (writeScript.empty())
        return kviCsWriteMessage(Desc, Buf, Size);
    SaErrorT rc = writeScript.front();
    writeScript.pop_front();
    return rc;
}

TEST(ProtoIOTypes, EveryPairAndItsCode)
{
#define PAIR(Name, Code) Name##_REQ, Name##_RSP, Code
    // clang-format off
    const int table[] = {
        PAIR(KVI_SESSION_OPEN, 0x06), PAIR(KVI_SESSION_CLOSE, 0x08),
        PAIR(KVI_RESOURCES_DISCOVER, 0x0a), PAIR(KVI_RPT_INFO_GET, 0x0c),
        PAIR(KVI_RPT_ENTRY_GET, 0x0e), PAIR(KVI_RPT_ENTRY_GET_BY_RESOURCE_ID, 0x10),
        PAIR(KVI_RESOURCE_SEVERITY_SET, 0x12), PAIR(KVI_RESOURCE_TAG_SET, 0x14),
        PAIR(KVI_RESOURCE_ID_GET, 0x16), PAIR(KVI_ENTITY_SCHEMA_GET, 0x18),
        PAIR(KVI_EVENT_LOG_INFO_GET, 0x1a), PAIR(KVI_EVENT_LOG_ENTRY_GET, 0x1c),
        PAIR(KVI_EVENT_LOG_ENTRY_ADD, 0x1e), PAIR(KVI_EVENT_LOG_ENTRY_DELETE, 0x20),
        PAIR(KVI_EVENT_LOG_CLEAR, 0x22), PAIR(KVI_EVENT_LOG_TIME_GET, 0x24),
        PAIR(KVI_EVENT_LOG_TIME_SET, 0x26), PAIR(KVI_EVENT_LOG_STATE_GET, 0x28),
        PAIR(KVI_EVENT_LOG_STATE_SET, 0x2a), PAIR(KVI_SUBSCRIBE, 0x2c), PAIR(KVI_UNSUBSCRIBE, 0x2e),
        PAIR(KVI_EVENT_GET, 0x30), PAIR(KVI_RDR_GET, 0x32), PAIR(KVI_SENSOR_READING_GET, 0x34),
        PAIR(KVI_SENSOR_READING_CONVERT, 0x36), PAIR(KVI_SENSOR_THRESHOLDS_GET, 0x38),
        PAIR(KVI_SENSOR_THRESHOLDS_SET, 0x3a), PAIR(KVI_SENSOR_TYPE_GET, 0x3c),
        PAIR(KVI_SENSOR_EVENT_ENABLES_GET, 0x3e), PAIR(KVI_SENSOR_EVENT_ENABLES_SET, 0x40),
        PAIR(KVI_CONTROL_TYPE_GET, 0x42), PAIR(KVI_CONTROL_STATE_GET, 0x44),
        PAIR(KVI_CONTROL_STATE_SET, 0x46), PAIR(KVI_ENTITY_INVENTORY_DATA_READ, 0x48),
        PAIR(KVI_ENTITY_INVENTORY_DATA_WRITE, 0x4a), PAIR(KVI_WATCHDOG_TIMER_GET, 0x4c),
        PAIR(KVI_WATCHDOG_TIMER_SET, 0x4e), PAIR(KVI_WATCHDOG_TIMER_RESET, 0x50),
        PAIR(KVI_PARM_CONTROL, 0x6c), PAIR(KVI_RESOURCE_RESET_STATE_GET, 0x6e),
        PAIR(KVI_RESOURCE_RESET_STATE_SET, 0x70)};
    // clang-format on
#undef PAIR
    ASSERT_EQ(std::size(table), 41u * 3);
    for (size_t i = 0; i < std::size(table); i += 3) {
        EXPECT_EQ(table[i], table[i + 2]);
        EXPECT_EQ(table[i + 1], table[i + 2] + 1);
    }
    EXPECT_EQ(KVI_CPS_LAST_MSG_TYPE, 0x0071);
}

TEST_F(ProtoIO, WholeMessagesBothWays)
{
    ASSERT_EQ(write(3), SA_OK);
    ASSERT_EQ(read(), SA_OK);
    EXPECT_EQ(buf.substr(0, 30), message(30));
    EXPECT_EQ(buf[30], '#');
    send(connection.client, header(10) + message(64));
    ASSERT_EQ(read(), SA_OK);
    EXPECT_EQ(buf.substr(0, 11), header(10) + "#");
    ASSERT_EQ(read(), SA_OK) << "a message of exactly the buffer's size";
    EXPECT_EQ(buf.substr(0, 65), message(64) + "#");
}

TEST_F(ProtoIO, WhatAPeerCanSendBeforeHangingUp)
{
    struct {
        std::string sent;
        SaErrorT rc;
        const char *line;
    } cases[] = {
        {"", SA_ERR_HPI_INVALID_REQUEST, "Socket is closed"},
        {header(20).substr(0, 6), SA_ERR_HPI_INVALID_DATA, "Message header was too short"},
        {header(100) + std::string(40, 'p'), SA_ERR_HPI_NO_RESPONSE,
         "Got the message header, but not the message payload"},
        {header(9) + std::string(40, 'p'), SA_ERR_HPI_INVALID_DATA, "Message size 9 is below"},
        {message(129), SA_ERR_HPI_INVALID_DATA, "Message size 129 exceeds the buffer size 128"},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.line);
        KviLoopback peer;
        KviLogCapture log;
        send(peer.client, c.sent);
        close(peer.client);
        peer.client = -1;
        buf.assign(144, '#');
        EXPECT_EQ(kviCpsReadProtoMsg(peer.server, 1000, 1, &sem, 128, buf.data()), c.rc);
        EXPECT_TRUE(log.contains(c.line));
        EXPECT_EQ(buf.substr(128), std::string(16, '#'));
    }
}

TEST_F(ProtoIO, WaitsEndWithinTheCallersTimeOut)
{
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_FUNC_OUT_NUM);
    auto start = Clock::now();
    EXPECT_EQ(read(0), SA_ERR_HPI_TIMEOUT);
    EXPECT_LT(msSince(start), 500);
    EXPECT_TRUE(log.contains("Timeout"));
    // A header whose body never comes: the body's wait ends with the limit.
    send(connection.client, header(40));
    start = Clock::now();
    EXPECT_EQ(read(200), SA_ERR_HPI_NO_RESPONSE);
    EXPECT_GE(msSince(start), 200);
    EXPECT_LT(msSince(start), 1000);
    std::thread late([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(200));
        send(connection.client, message(12));
    });
    EXPECT_EQ(read(-1), SA_OK);
    late.join();
}

TEST_F(ProtoIO, NoRetriesReadsTheHeaderAndDeliversNothing)
{
    send(connection.client, message(30));
    EXPECT_EQ(read(1000, 0), SA_ERR_HPI_NO_RESPONSE);
    char rest[32];
    EXPECT_EQ(recv(connection.server, rest, sizeof rest, 0), 20) << "the header was consumed";
}

TEST_F(ProtoIO, ReaderHeldOffBySemaphore)
{
    send(connection.client, message(12));
    ASSERT_EQ(kviCsSemWaitNoLogging(&sem, 0), SA_OK);
    std::thread holder([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(400));
        kviCsSemPostNoLogging(&sem);
    });
    auto start = Clock::now();
    EXPECT_EQ(read(), SA_ERR_HPI_TIMEOUT);
    EXPECT_GE(msSince(start), 100);
    holder.join();
    EXPECT_EQ(read(), SA_OK);
}

TEST_F(ProtoIO, ClosedSocketsAndBadArguments)
{
    KviLogCapture log;
    std::string m = header(10), tooShort = header(9);
    for (SaHpiInt32T desc : {-1, 999}) {
        EXPECT_EQ(kviCpsReadProtoMsg(desc, 0, 1, &sem, 64, m.data()), SA_ERR_HPI_INVALID_REQUEST);
        EXPECT_EQ(kviCpsWriteProtoMsg(desc, 0, 1, m.data()), SA_ERR_HPI_INVALID_REQUEST);
    }
    EXPECT_TRUE(log.contains("Invalid file descriptor to select"));
    SaHpiInt32T desc = connection.server;
    for (SaErrorT rc : {kviCpsReadProtoMsg(desc, 0, 1, nullptr, 64, m.data()),
                        kviCpsReadProtoMsg(desc, 0, 1, &sem, 64, nullptr),
                        kviCpsReadProtoMsg(desc, 0, 1, &sem, 9, m.data()),
                        kviCpsWriteProtoMsg(desc, 0, 1, nullptr),
                        kviCpsWriteProtoMsg(desc, 0, 1, tooShort.data())})
        EXPECT_EQ(rc, SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Sem pointer is NULL."));
}

TEST_F(ProtoIO, WriterRetriesAPeerThatStopsReading)
{
    ASSERT_EQ(kviCsSetSockNbio(connection.client), SA_OK);
    // Fixed buffers, so the kernel cannot grow them, and full once the peer's
    // window is closed too: a send after a pause still finds no room.
    int small = 16384;
    setsockopt(connection.client, SOL_SOCKET, SO_SNDBUF, &small, sizeof small);
    setsockopt(connection.server, SOL_SOCKET, SO_RCVBUF, &small, sizeof small);
    std::string filler(65536, 'f');
    for (bool sent = true; sent; std::this_thread::sleep_for(std::chrono::milliseconds(20)))
        for (sent = false; ::send(connection.client, filler.data(), filler.size(), 0) > 0;)
            sent = true;
    KviLogCapture log;
    // Every wait expires and every write would block; running out of
    // attempts is not the exhaustion the equality test reports.
    EXPECT_EQ(write(2, 10, 65535), SA_OK);
    EXPECT_EQ(log.matching("Retrying write: ").size(), 3u);
}

TEST_F(ProtoIO, RetryCountsDecideByEquality)
{
    KviLogCapture log;
    kviCpsIoOps.pollDesc = scriptedPoll;
    kviCpsIoOps.writeMessage = scriptedWrite;
    struct {
        std::deque<int> polls;
        std::deque<SaErrorT> writes;
        SaHpiUint32T retries;
        SaErrorT rc;
        bool delivered;
    } cases[] = {
        {{}, {}, 0, SA_ERR_HPI_NO_RESPONSE, false},     // no retries: nothing is ever sent
        {{0, 1}, {}, 1, SA_ERR_HPI_NO_RESPONSE, false}, // writable on the last permitted wait
        {{-1, 1}, {}, 2, SA_OK, true},                  // an interrupted wait counts as one
        {{}, {SA_ERR_HPI_TIMEOUT}, 1, SA_ERR_HPI_NO_RESPONSE, true}, // sent on the last retry
        {{}, {SA_ERR_HPI_DATA_TRUNCATED}, 2, SA_OK, true},
        {{}, {SA_ERR_HPI_ERROR}, 2, SA_ERR_HPI_ERROR, false},
    };
    for (auto &c : cases) {
        pollScript = c.polls;
        writeScript = c.writes;
        EXPECT_EQ(write(c.retries), c.rc);
        EXPECT_EQ(read(0), c.delivered ? SA_OK : SA_ERR_HPI_TIMEOUT);
    }
    EXPECT_TRUE(log.contains("Exhausted retries to select for write message"));
    EXPECT_TRUE(log.contains("Exhausted write message retries."));
    // A signal during the read's wait starts the same wait again.
    ASSERT_EQ(write(2), SA_OK);
    pollScript = {-1};
    EXPECT_EQ(read(), SA_OK);
    EXPECT_TRUE(pollScript.empty());
}
} // namespace
