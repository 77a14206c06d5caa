#include <gtest/gtest.h>

#include <fcntl.h>
#include <unistd.h>

#include "support/KviTestSupport.h"

namespace
{
TEST(KviSock, ClientPortCheckAndAddresses)
{
    KviLoopback served;
    KviLogCapture log;
    SaHpiInt32T desc = -1;
    EXPECT_EQ(kviCsOpenClientComm(1023, "127.0.0.1", &desc), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Invalid port number configured (1023)."));
    log.clear();
    // 1024 passes the check, whether or not anything listens there.
    if (kviCsOpenClientComm(1024, "127.0.0.1", &desc) == SA_OK)
        close(desc);
    EXPECT_FALSE(log.contains("Invalid port number"));
    ASSERT_EQ(kviCsOpenClientComm(served.port, "localhost", &desc), SA_OK) << "name look-up";
    close(desc);
    EXPECT_EQ(kviCsOpenClientComm(served.port, nullptr, &desc), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Server pointer is NULL."));
    close(served.listener);
    served.listener = -1;
    EXPECT_EQ(kviCsOpenClientComm(served.port, "127.0.0.1", &desc), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Failed call to connect to Desc ("));
}

TEST(KviSock, AcceptAndNonBlockingMode)
{
    KviLoopback connection;
    KviLogCapture log;
    SaHpiInt32T desc = -1;
    // The flags are replaced: O_APPEND does not survive.
    ASSERT_EQ(fcntl(connection.listener, F_SETFL, O_APPEND), 0);
    ASSERT_EQ(kviCsSetSockNbio(connection.listener), SA_OK);
    EXPECT_EQ(fcntl(connection.listener, F_GETFL) & ~O_ACCMODE, O_NONBLOCK);
    EXPECT_EQ(kviCsAcceptConnection(connection.listener, &desc), SA_ERR_HPI_BUSY);
    EXPECT_TRUE(log.contains("Reveived busy trying accept"));
    EXPECT_EQ(kviCsAcceptConnection(connection.server, &desc), SA_ERR_HPI_ERROR);
    EXPECT_EQ(kviCsSetSockNbio(-1), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Desc is -1, Failed to set socket nonblocking: "));
}

TEST(KviSock, ReadWriteAndCloseResults)
{
    KviLoopback connection;
    KviLogCapture log;
    char buf[16];
    SaHpiInt32T count = -1;
    ASSERT_EQ(kviCsSetSockNbio(connection.server), SA_OK);
    EXPECT_EQ(kviCsReadMessage(connection.server, buf, sizeof buf, &count), SA_ERR_HPI_TIMEOUT);
    EXPECT_TRUE(log.contains("Read would block, returning timeout"));
    ASSERT_EQ(kviCsWriteMessage(connection.client, "abcde", 5), SA_OK);
    ASSERT_EQ(kviCsReadMessage(connection.server, buf, sizeof buf, &count), SA_OK);
    EXPECT_EQ(std::string(buf, count), "abcde") << "a short read is the caller's to notice";

    EXPECT_EQ(kviCsCloseComm(connection.client), SA_OK);
    EXPECT_EQ(kviCsCloseComm(connection.client), SA_OK);
    EXPECT_TRUE(log.contains("Invalid file descriptor to close."));
    EXPECT_EQ(kviCsReadMessage(connection.server, buf, sizeof buf, &count),
              SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_EQ(count, 0);
    // A peer that is gone costs the write an error, not the process SIGPIPE;
    // the kernel may still take the first bytes.
    SaErrorT rc = SA_OK;
    for (int i = 0; i < 100 && rc == SA_OK; ++i)
        rc = kviCsWriteMessage(connection.server, "x", 1);
    EXPECT_EQ(rc, SA_ERR_HPI_ERROR);

    EXPECT_EQ(kviCsReadMessage(connection.client, buf, sizeof buf, &count),
              SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_EQ(kviCsWriteMessage(connection.client, buf, 1), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("Socket not open for write"));
    connection.client = -1;
    EXPECT_EQ(kviCsReadMessage(connection.server, buf, -1, &count), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsReadMessage(connection.server, buf, 1, nullptr), SA_ERR_HPI_INVALID_PARAMS);
}
} // namespace
