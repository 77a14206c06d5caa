#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/socket.h>
#include <unistd.h>

#include "support/KviTestSupport.h"

namespace
{
TEST(KviSock, PortCheckAndAddresses)
{
    KviLogCapture log;
    SaHpiInt32T desc = -1;
    EXPECT_EQ(kviCsOpenClientComm(1023, "127.0.0.1", &desc), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Invalid port number configured (1023)."));
    // 1024 passes the check and gets as far as connecting, whether or not
    // anything listens there.
    log.clear();
    if (kviCsOpenClientComm(1024, "127.0.0.1", &desc) == SA_OK)
        close(desc);
    EXPECT_FALSE(log.contains("Invalid port number"));

    KviLoopback served;
    ASSERT_EQ(kviCsOpenClientComm(served.port, "localhost", &desc), SA_OK) << "name look-up";
    close(desc);
    EXPECT_EQ(kviCsOpenClientComm(served.port, nullptr, &desc), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsOpenClientComm(served.port, "127.0.0.1", nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Server pointer is NULL."));
    EXPECT_TRUE(log.contains("Desc pointer is NULL."));

    // Nobody listens on the port any more: the connect fails and the socket
    // is given back.
    SaHpiInt32T port = served.port;
    close(served.listener);
    served.listener = -1;
    EXPECT_EQ(kviCsOpenClientComm(port, "127.0.0.1", &desc), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Failed call to connect to Desc ("));
}

TEST(KviSock, AcceptMapsNothingPendingToBusy)
{
    KviLoopback connection;
    KviLogCapture log;
    SaHpiInt32T desc = -1;
    ASSERT_EQ(kviCsSetSockNbio(connection.listener), SA_OK);
    EXPECT_EQ(kviCsAcceptConnection(connection.listener, &desc), SA_ERR_HPI_BUSY);
    EXPECT_TRUE(log.contains("Reveived busy trying accept"));
    EXPECT_EQ(kviCsAcceptConnection(connection.server, &desc), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Error accepting connection. Error = "));
    EXPECT_EQ(kviCsAcceptConnection(connection.listener, nullptr), SA_ERR_HPI_INVALID_PARAMS);
}

TEST(KviSock, NonBlockingModeReplacesTheStatusFlags)
{
    KviLoopback connection;
    KviLogCapture log;
    ASSERT_EQ(fcntl(connection.client, F_SETFL, O_APPEND), 0);
    ASSERT_EQ(kviCsSetSockNbio(connection.client), SA_OK);
    EXPECT_EQ(fcntl(connection.client, F_GETFL) & ~O_ACCMODE, O_NONBLOCK);
    EXPECT_EQ(kviCsSetSockNbio(-1), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Desc is -1, Failed to set socket nonblocking: "));
}

TEST(KviSock, ReadAndWriteResults)
{
    KviLoopback connection;
    KviLogCapture log;
    char buf[16];
    SaHpiInt32T count = -1;
    ASSERT_EQ(kviCsSetSockNbio(connection.server), SA_OK);
    EXPECT_EQ(kviCsReadMessage(connection.server, buf, sizeof buf, &count), SA_ERR_HPI_TIMEOUT);
    EXPECT_TRUE(log.contains("Read would block, returning timeout"));

    // A short read is the caller's to notice.
    ASSERT_EQ(kviCsWriteMessage(connection.client, "abcde", 5), SA_OK);
    ASSERT_EQ(kviCsReadMessage(connection.server, buf, sizeof buf, &count), SA_OK);
    EXPECT_EQ(std::string(buf, count), "abcde");

    close(connection.client);
    connection.client = -1;
    EXPECT_EQ(kviCsReadMessage(connection.server, buf, sizeof buf, &count),
              SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_EQ(count, 0);
    // Writing to a peer that is gone is an error, not SIGPIPE; the first
    // write may still be taken by the kernel.
    SaErrorT rc = SA_OK;
    for (int i = 0; i < 100 && rc == SA_OK; ++i)
        rc = kviCsWriteMessage(connection.server, "x", 1);
    EXPECT_EQ(rc, SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Protocol communication error writing message. "));

    EXPECT_EQ(kviCsReadMessage(-1, buf, sizeof buf, &count), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_EQ(kviCsWriteMessage(-1, buf, 1), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("Socket not open for read"));
    EXPECT_TRUE(log.contains("Socket not open for write"));
    EXPECT_EQ(kviCsReadMessage(connection.server, buf, -1, &count), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsReadMessage(connection.server, buf, 1, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsWriteMessage(connection.server, nullptr, 1), SA_ERR_HPI_INVALID_PARAMS);
}

TEST(KviSock, ClosingAClosedDescriptorIsFine)
{
    KviLoopback connection;
    KviLogCapture log;
    EXPECT_EQ(kviCsCloseComm(connection.client), SA_OK);
    EXPECT_EQ(kviCsCloseComm(connection.client), SA_OK);
    connection.client = -1;
    EXPECT_TRUE(log.contains("Invalid file descriptor to close."));
    EXPECT_TRUE(log.contains("Error closing communication descriptor"));
}
} // namespace
