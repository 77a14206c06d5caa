#include <cstddef>

#include "core/utils/Memory.h"
#include "tests/core/SaHpi/parmControl/ParmControlFixture.h"

namespace
{
using namespace pctest;

class ParmControlHelpersTest : public ParmControlTest
{
};

// The key format is part of the store's files: prefix, flag digit, domain
// and resource as 8 lower-case hex digits, record number as 2.
TEST_F(ParmControlHelpersTest, KeysCarryPrefixFlagDomainResourceAndNumber)
{
    SaHpiTextBufferT tag = text("Blade");
    SaHpiSeverityT severity = SAHPI_MAJOR;
    ASSERT_EQ(kviCsSaveResTagNV(1, 0x12, SAHPI_FALSE, &tag), SA_OK);
    ASSERT_EQ(kviCsSaveResSeverityNV(1, 0x12, SAHPI_FALSE, &severity), SA_OK);
    EXPECT_TRUE(stored("kviResTag00000000100000012"));
    EXPECT_TRUE(stored("kviResSev00000000100000012"));
    EXPECT_FALSE(stored("kviResTag10000000100000012"));

    // The daemon's own copy sits beside it under flag 1.
    ASSERT_EQ(kviCsSaveResTagNV(1, 0x12, SAHPI_TRUE, &tag), SA_OK);
    EXPECT_TRUE(stored("kviResTag10000000100000012"));

    SaHpiSensorEvtEnablesT enables{};
    ASSERT_EQ(kviCsSaveEvtEnablesNV(0xABCDEF01, 0xFEDCBA98, 0xAB, SAHPI_TRUE, &enables), SA_OK);
    EXPECT_TRUE(stored("kviEvtEnb1abcdef01fedcba98ab"));

    // The inventory key is the longest the store takes: 29 characters.
    char fru[3] = {1, 2, 3};
    ASSERT_EQ(kviCsSaveFruNV(0xFFFFFFFF, 0xFFFFFFFE, 0xFF, SAHPI_FALSE, 3, fru), SA_OK);
    EXPECT_TRUE(stored("kviSavFru 0fffffffffffffffeff"));
    EXPECT_EQ(std::string("kviSavFru 0fffffffffffffffeff").size(), 29u);

    // Any true value gives the digit 1, never a longer key.
    ASSERT_EQ(kviCsSaveEvtLogStNV(0, 7, static_cast<SaHpiBoolT>(2), SAHPI_TRUE), SA_OK);
    EXPECT_TRUE(stored("kviEvtLogSt10000000000000007"));
}

TEST_F(ParmControlHelpersTest, StoredLengthsAreTheRequiredOnes)
{
    SaHpiTextBufferT tag = text("abcde");
    SaHpiSeverityT severity = SAHPI_CRITICAL;
    SaHpiSensorThresholdsT th = thresholds(10);
    SaHpiSensorEvtEnablesT enables{};
    SaHpiCtrlStateT digital{};
    digital.Type = SAHPI_CTRL_TYPE_DIGITAL;
    SaHpiCtrlStateT textCtrl{};
    textCtrl.Type = SAHPI_CTRL_TYPE_TEXT;
    textCtrl.StateUnion.Text.Text = text("Hello World!");
    char fru[20] = {};

    ASSERT_EQ(kviCsSaveEvtLogStNV(0, 1, SAHPI_FALSE, SAHPI_TRUE), SA_OK);
    ASSERT_EQ(kviCsSaveResTagNV(0, 1, SAHPI_FALSE, &tag), SA_OK);
    ASSERT_EQ(kviCsSaveResSeverityNV(0, 1, SAHPI_FALSE, &severity), SA_OK);
    ASSERT_EQ(kviCsSaveThreshNV(0, 1, 2, SAHPI_FALSE, &th), SA_OK);
    ASSERT_EQ(kviCsSaveEvtEnablesNV(0, 1, 2, SAHPI_FALSE, &enables), SA_OK);
    ASSERT_EQ(kviCsSaveCtrlStateNV(0, 1, 3, SAHPI_FALSE, &digital), SA_OK);
    ASSERT_EQ(kviCsSaveCtrlStateNV(0, 1, 4, SAHPI_FALSE, &textCtrl), SA_OK);
    ASSERT_EQ(kviCsSaveFruNV(0, 1, 5, SAHPI_FALSE, sizeof fru, fru), SA_OK);

    EXPECT_EQ(storedLength("kviEvtLogSt00000000000000001"), 1u);
    EXPECT_EQ(storedLength("kviResTag00000000000000001"), 9u + 5u);
    EXPECT_EQ(storedLength("kviResSev00000000000000001"), 4u);
    EXPECT_EQ(storedLength("kviThresh0000000000000000102"), 384u);
    EXPECT_EQ(storedLength("kviEvtEnb0000000000000000102"), 6u);
    EXPECT_EQ(storedLength("kviCtlSte0000000000000000103"), 272u);
    EXPECT_EQ(storedLength("kviCtlSte0000000000000000104"), 12u + 10u);
    EXPECT_EQ(storedLength("kviSavFru 0000000000000000105"), sizeof fru + 7);
}

TEST_F(ParmControlHelpersTest, WhatIsSavedIsReadBack)
{
    SaHpiTextBufferT tag = text("a resource tag"), tagOut{};
    SaHpiSeverityT severity = SAHPI_CRITICAL, severityOut = SAHPI_OK;
    SaHpiSensorThresholdsT th = thresholds(100), thOut{};
    SaHpiSensorEvtEnablesT enables{SAHPI_SENSTAT_EVENTS_ENABLED, 0x0102, 0x0304}, enablesOut{};
    SaHpiCtrlStateT analog{}, analogOut{};
    analog.Type = SAHPI_CTRL_TYPE_ANALOG;
    analog.StateUnion.Analog = -42;
    SaHpiBoolT logOut = SAHPI_TRUE;

    for (SaHpiBoolT flag : {SAHPI_FALSE, SAHPI_TRUE}) {
        SCOPED_TRACE(flag);
        ASSERT_EQ(kviCsSaveEvtLogStNV(0, 9, flag, SAHPI_FALSE), SA_OK);
        ASSERT_EQ(kviCsSaveResTagNV(0, 9, flag, &tag), SA_OK);
        ASSERT_EQ(kviCsSaveResSeverityNV(0, 9, flag, &severity), SA_OK);
        ASSERT_EQ(kviCsSaveThreshNV(0, 9, 1, flag, &th), SA_OK);
        ASSERT_EQ(kviCsSaveEvtEnablesNV(0, 9, 1, flag, &enables), SA_OK);
        ASSERT_EQ(kviCsSaveCtrlStateNV(0, 9, 2, flag, &analog), SA_OK);

        EXPECT_EQ(kviCsGetEvtLogStNV(0, 9, flag, &logOut), SA_OK);
        EXPECT_EQ(logOut, SAHPI_FALSE);
        EXPECT_EQ(kviCsGetResTagNV(0, 9, flag, &tagOut), SA_OK);
        EXPECT_EQ(str(tagOut), "a resource tag");
        EXPECT_EQ(tagOut.Language, SAHPI_LANG_ENGLISH);
        EXPECT_EQ(kviCsGetResSeverityNV(0, 9, flag, &severityOut), SA_OK);
        EXPECT_EQ(severityOut, SAHPI_CRITICAL);
        EXPECT_EQ(kviCsGetThreshNV(0, 9, 1, flag, &thOut), SA_OK);
        EXPECT_TRUE(same(&thOut, &th, sizeof th));
        EXPECT_EQ(kviCsGetEvtEnablesNV(0, 9, 1, flag, &enablesOut), SA_OK);
        EXPECT_TRUE(same(&enablesOut, &enables, sizeof enables));
        EXPECT_EQ(kviCsGetCtrlStateNV(0, 9, 2, flag, &analogOut), SA_OK);
        EXPECT_EQ(analogOut.StateUnion.Analog, -42);
    }

    // A tag that fills the whole buffer is stored whole.
    SaHpiTextBufferT full = text(std::string(255, 'x').c_str());
    ASSERT_EQ(kviCsSaveResTagNV(0, 9, SAHPI_FALSE, &full), SA_OK);
    EXPECT_EQ(kviCsGetResTagNV(0, 9, SAHPI_FALSE, &tagOut), SA_OK);
    EXPECT_EQ(tagOut.DataLength, 255);
}

// A text control keeps only DataLength + 10 bytes of its state, so the last
// seven characters of its text do not come back; its length field does.
TEST_F(ParmControlHelpersTest, TextControlComesBackShortOfItsLastSevenCharacters)
{
    SaHpiCtrlStateT state{}, out{};
    state.Type = SAHPI_CTRL_TYPE_TEXT;
    state.StateUnion.Text.Line = 2;
    state.StateUnion.Text.Text = text("Hello World!");
    ASSERT_EQ(kviCsSaveCtrlStateNV(0, 3, 1, SAHPI_FALSE, &state), SA_OK);
    ASSERT_EQ(kviCsGetCtrlStateNV(0, 3, 1, SAHPI_FALSE, &out), SA_OK);
    EXPECT_EQ(out.Type, SAHPI_CTRL_TYPE_TEXT);
    EXPECT_EQ(out.StateUnion.Text.Line, 2);
    EXPECT_EQ(out.StateUnion.Text.Text.DataLength, 12);
    EXPECT_EQ(std::string(reinterpret_cast<char *>(out.StateUnion.Text.Text.Data), 12),
              std::string("Hello", 5) + std::string(7, '\0'));

    // Shorter than the length field: it reads as empty.
    state.StateUnion.Text.Text = text("Hi");
    ASSERT_EQ(kviCsSaveCtrlStateNV(0, 3, 1, SAHPI_FALSE, &state), SA_OK);
    ASSERT_EQ(kviCsGetCtrlStateNV(0, 3, 1, SAHPI_FALSE, &out), SA_OK);
    EXPECT_EQ(out.StateUnion.Text.Text.DataLength, 0);
}

TEST_F(ParmControlHelpersTest, ShortObjectsThatDisagreeWithTheirLengthFieldAreRefused)
{
    KviLogCapture log;
    // A tag whose DataLength claims more than was stored.
    SaHpiTextBufferT tag = text("abcdef"), out{};
    ASSERT_EQ(kviCsNonVolatilePut("kviResTag00000000000000005", 12, &tag), SA_OK);
    EXPECT_EQ(kviCsGetResTagNV(0, 5, SAHPI_FALSE, &out), SA_ERR_HPI_DATA_TRUNCATED);
    EXPECT_TRUE(
        loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, "bytesRead did not match TextBuffer size. 12, 15"));

    // A control state cut short that is not a text state, and a text state
    // whose length field disagrees with what was stored.
    SaHpiCtrlStateT state{}, stateOut{};
    state.Type = SAHPI_CTRL_TYPE_DIGITAL;
    ASSERT_EQ(kviCsNonVolatilePut("kviCtlSte0000000000000000501", 20, &state), SA_OK);
    EXPECT_EQ(kviCsGetCtrlStateNV(0, 5, 1, SAHPI_FALSE, &stateOut), SA_ERR_HPI_DATA_TRUNCATED);
    state.Type = SAHPI_CTRL_TYPE_TEXT;
    state.StateUnion.Text.Text.DataLength = 30;
    ASSERT_EQ(kviCsNonVolatilePut("kviCtlSte0000000000000000501", 20, &state), SA_OK);
    EXPECT_EQ(kviCsGetCtrlStateNV(0, 5, 1, SAHPI_FALSE, &stateOut), SA_ERR_HPI_DATA_TRUNCATED);
    EXPECT_TRUE(log.contains("bytesRead did not match control state size. 20, 40"));

    // Fixed-length items shorter than their type are a store failure.
    SaHpiSeverityT severity = SAHPI_OK;
    ASSERT_EQ(kviCsNonVolatilePut("kviResSev00000000000000005", 2, "ab"), SA_OK);
    EXPECT_EQ(kviCsGetResSeverityNV(0, 5, SAHPI_FALSE, &severity), SA_ERR_HPI_ERROR);
}

// The daemon's copy is often missing, so only the explicit copy's absence is
// logged; the two copies never stand in for each other.
TEST_F(ParmControlHelpersTest, MissingKeysAreNotPresentAndLoggedOnlyForTheExplicitCopy)
{
    SaHpiSensorThresholdsT th = thresholds(1), out{};
    ASSERT_EQ(kviCsSaveThreshNV(0, 4, 1, SAHPI_TRUE, &th), SA_OK);
    KviLogCapture log;
    EXPECT_EQ(kviCsGetThreshNV(0, 4, 2, SAHPI_TRUE, &out), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_FALSE(log.contains("kviCsNonVolatileGet failed"));
    EXPECT_EQ(kviCsGetThreshNV(0, 4, 1, SAHPI_FALSE, &out), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("kviCsNonVolatileGet failed. rc=-1013"));

    SaHpiTextBufferT tag{};
    EXPECT_EQ(kviCsGetResTagNV(0, 4, SAHPI_TRUE, &tag), SA_ERR_HPI_NOT_PRESENT);
    SaHpiUint32T size = 0;
    EXPECT_EQ(kviCsGetFruSizeNV(0, 4, 1, SAHPI_FALSE, &size), SA_ERR_HPI_NOT_PRESENT);
}

TEST_F(ParmControlHelpersTest, StoreFailuresBecomeErrors)
{
    SaHpiTextBufferT tag = text("t");
    SaHpiSeverityT severity = SAHPI_OK;
    ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    KviLogCapture log;
    EXPECT_EQ(kviCsSaveResTagNV(0, 1, SAHPI_FALSE, &tag), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, "kviCsNonVolatilePut failed. rc=-1026"));
    EXPECT_EQ(kviCsGetResSeverityNV(0, 1, SAHPI_TRUE, &severity), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsNonVolatileGet failed. rc=-1026"));
    EXPECT_EQ(kviCsNonVolatileInitialize(), SA_OK);
}

TEST_F(ParmControlHelpersTest, NullItemsAreRefusedByName)
{
    KviLogCapture log;
    struct {
        SaErrorT rc;
        const char *line;
    } cases[] = {
        {kviCsSaveResTagNV(0, 1, 0, nullptr), "ResourceTag pointer is NULL."},
        {kviCsGetResTagNV(0, 1, 0, nullptr), "ResourceTag pointer is NULL."},
        {kviCsSaveResSeverityNV(0, 1, 0, nullptr), "Severity pointer is NULL."},
        {kviCsGetResSeverityNV(0, 1, 0, nullptr), "Severity pointer is NULL."},
        {kviCsGetEvtLogStNV(0, 1, 0, nullptr), "Enable pointer is NULL."},
        {kviCsSaveThreshNV(0, 1, 1, 0, nullptr), "SensorThresholds pointer is NULL."},
        {kviCsGetThreshNV(0, 1, 1, 0, nullptr), "SensorThresholds pointer is NULL."},
        {kviCsSaveEvtEnablesNV(0, 1, 1, 0, nullptr), "Enables pointer is NULL."},
        {kviCsGetEvtEnablesNV(0, 1, 1, 0, nullptr), "Enables pointer is NULL."},
        {kviCsSaveCtrlStateNV(0, 1, 1, 0, nullptr), "CtrlState pointer is NULL."},
        {kviCsGetCtrlStateNV(0, 1, 1, 0, nullptr), "CtrlState pointer is NULL."},
        {kviCsSaveFruNV(0, 1, 1, 0, 4, nullptr), "FruBuffer pointer is NULL."},
        {kviCsGetFruNV(0, 1, 1, 0, 4, nullptr), "FruBuffer pointer is NULL."},
        {kviCsGetFruSizeNV(0, 1, 1, 0, nullptr), "FruSize pointer is NULL."},
    };
    for (const auto &c : cases) {
        EXPECT_EQ(c.rc, SA_ERR_HPI_INVALID_PARAMS) << c.line;
        EXPECT_TRUE(log.contains(c.line)) << c.line;
    }
}

// An inventory object is a length word masked to 16 bits, the data, and
// three bytes more.
TEST_F(ParmControlHelpersTest, InventoryDataKeepsASixteenBitLength)
{
    std::vector<SaHpiUint8T> data(0x10005);
    for (size_t i = 0; i < data.size(); i++)
        data[i] = static_cast<SaHpiUint8T>(i * 7);
    ASSERT_EQ(kviCsSaveFruNV(0, 2, 1, SAHPI_FALSE, 0x10005, data.data()), SA_OK);
    EXPECT_EQ(storedLength("kviSavFru 0000000000000000201"), 5u + 7u);
    SaHpiUint32T size = 0;
    ASSERT_EQ(kviCsGetFruSizeNV(0, 2, 1, SAHPI_FALSE, &size), SA_OK);
    EXPECT_EQ(size, 5u);

    SaHpiUint8T out[8] = {};
    EXPECT_EQ(kviCsGetFruNV(0, 2, 1, SAHPI_FALSE, sizeof out, out), SA_OK);
    EXPECT_TRUE(same(out, data.data(), 5));
    EXPECT_EQ(out[5], 0);
    EXPECT_EQ(kviCsGetFruNV(0, 2, 1, SAHPI_FALSE, 3, out), SA_ERR_HPI_DATA_TRUNCATED);

    // An object shorter than its length word claims.
    SaHpiUint32T lie[2] = {100, 0};
    ASSERT_EQ(kviCsNonVolatilePut("kviSavFru 0000000000000000202", sizeof lie, lie), SA_OK);
    EXPECT_EQ(kviCsGetFruNV(0, 2, 2, SAHPI_FALSE, 200, out), SA_ERR_HPI_ERROR);
}

TEST_F(ParmControlHelpersTest, InventoryBuffersThatCannotBeHadAreOutOfSpace)
{
    SaHpiUint8T data[4] = {1, 2, 3, 4};
    ASSERT_EQ(kviCsSaveFruNV(0, 2, 3, SAHPI_FALSE, 4, data), SA_OK);
    SaHpiInt32T before = kviTestLiveBlocks();
    KviLogCapture log;
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsSaveFruNV(0, 2, 3, SAHPI_FALSE, 4, data), SA_ERR_HPI_OUT_OF_SPACE);
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsGetFruNV(0, 2, 3, SAHPI_FALSE, 4, data), SA_ERR_HPI_OUT_OF_SPACE);
    kviCsMemoryFailNthAllocation(0);
    EXPECT_EQ(log.matching("Malloc failed").size(), 2u);
    EXPECT_EQ(kviTestLiveBlocks(), before);
}

} // namespace
