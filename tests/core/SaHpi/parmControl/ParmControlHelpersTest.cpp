#include <filesystem>
#include <fstream>
#include <iterator>

#include "core/utils/Memory.h"
#include "tests/core/SaHpi/parmControl/ParmControlFixture.h"

namespace
{
using namespace pctest;

class ParmControlHelpersTest : public ParmControlTest
{
};

// The key format and the stored lengths are part of the store's files: the
// prefix, the flag digit (1 for any true value, never a longer key), domain
// and resource as 8 lower-case hex digits, a record's number as 2. A tag
// keeps only its used part, a text control DataLength + 10 bytes, an
// inventory object a length word, the data and three bytes more.
TEST_F(ParmControlHelpersTest, KeysAndStoredLengthsAreTheRequiredOnes)
{
    SaHpiTextBufferT tag = text("abcde");
    SaHpiSeverityT severity = SAHPI_CRITICAL;
    SaHpiSensorThresholdsT th = thresholds(10);
    SaHpiSensorEvtEnablesT enables{};
    SaHpiCtrlStateT digital{SAHPI_CTRL_TYPE_DIGITAL, {}}, textCtrl{SAHPI_CTRL_TYPE_TEXT, {}};
    textCtrl.StateUnion.Text.Text = text("Hello World!");
    char fru[20] = {};
    ASSERT_EQ(kviCsSaveEvtLogStNV(0, 7, static_cast<SaHpiBoolT>(2), SAHPI_TRUE), SA_OK);
    ASSERT_EQ(kviCsSaveResTagNV(1, 0x12, SAHPI_FALSE, &tag), SA_OK);
    ASSERT_EQ(kviCsSaveResSeverityNV(1, 0x12, SAHPI_TRUE, &severity), SA_OK);
    ASSERT_EQ(kviCsSaveThreshNV(0xABCDEF01, 0xFEDCBA98, 0xAB, SAHPI_TRUE, &th), SA_OK);
    ASSERT_EQ(kviCsSaveEvtEnablesNV(0, 1, 2, SAHPI_FALSE, &enables), SA_OK);
    ASSERT_EQ(kviCsSaveCtrlStateNV(0, 1, 3, SAHPI_FALSE, &digital), SA_OK);
    ASSERT_EQ(kviCsSaveCtrlStateNV(0, 1, 4, SAHPI_FALSE, &textCtrl), SA_OK);
    // The inventory key is the longest the store takes: 29 characters.
    ASSERT_EQ(kviCsSaveFruNV(0xFFFFFFFF, 0xFFFFFFFE, 0xFF, SAHPI_FALSE, sizeof fru, fru), SA_OK);
    const std::pair<const char *, SaHpiUint32T> objects[] = {
        {"kviEvtLogSt10000000000000007", 1u},        {"kviResTag00000000100000012", 9u + 5u},
        {"kviResSev10000000100000012", 4u},          {"kviThresh1abcdef01fedcba98ab", 384u},
        {"kviEvtEnb0000000000000000102", 6u},        {"kviCtlSte0000000000000000103", 272u},
        {"kviCtlSte0000000000000000104", 12u + 10u}, {"kviSavFru 0fffffffffffffffeff", 20u + 7u},
    };
    for (auto [key, length] : objects)
        EXPECT_EQ(storedLength(key), length) << key;
    EXPECT_EQ(storedLength("kviResTag10000000100000012"), 0u) << "the copies stand apart";

    // A tag that fills the whole buffer is stored and read back whole.
    SaHpiTextBufferT full = text(std::string(255, 'x').c_str()), out{};
    ASSERT_EQ(kviCsSaveResTagNV(0, 9, SAHPI_TRUE, &full), SA_OK);
    EXPECT_EQ(kviCsGetResTagNV(0, 9, SAHPI_TRUE, &out), SA_OK);
    EXPECT_TRUE(same(&out, &full, sizeof full));
}

std::string fileBytes(const std::filesystem::path &Path)
{
    std::ifstream in(Path, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

void setText(SaHpiTextBufferT *Buffer, const char *Text)
{
    Buffer->DataType = SAHPI_TL_TYPE_LANGUAGE;
    Buffer->Language = SAHPI_LANG_ENGLISH;
    Buffer->DataLength = static_cast<SaHpiUint8T>(strlen(Text));
    memcpy(Buffer->Data, Text, Buffer->DataLength);
}

// One setting of each kind, in this order (so in files 0000000000 on), built
// field by field over zeros so that padding is zero too: what
// tests/data/nv-store holds.
struct SavedSettings {
    SaHpiTextBufferT Tag;
    SaHpiSeverityT Severity;
    SaHpiSensorThresholdsT Thresholds;
    SaHpiSensorEvtEnablesT Enables;
    SaHpiCtrlStateT Analog, Text;
    SaHpiUint8T Fru[10];

    SavedSettings()
    {
        memset(static_cast<void *>(this), 0, sizeof *this);
        setText(&Tag, "chassis 1");
        Severity = SAHPI_MINOR;
        SaHpiSensorReadingT *readings = &Thresholds.LowCritical;
        for (SaHpiUint32T i = 0; i < sizeof Thresholds / sizeof *readings; ++i) {
            readings[i].ValuesPresent = SAHPI_SRF_RAW | SAHPI_SRF_INTERPRETED;
            readings[i].Raw = 0x01020304u * (i + 1);
            readings[i].Interpreted.Type = SAHPI_SENSOR_INTERPRETED_TYPE_FLOAT32;
            readings[i].Interpreted.Value.SensorFloat32 = -1.5f * static_cast<float>(i);
        }
        Enables.SensorStatus = SAHPI_SENSTAT_EVENTS_ENABLED;
        Enables.AssertEvents = 0x8001;
        Enables.DeassertEvents = 0x0240;
        Analog.Type = SAHPI_CTRL_TYPE_ANALOG;
        Analog.StateUnion.Analog = -123456;
        Text.Type = SAHPI_CTRL_TYPE_TEXT;
        Text.StateUnion.Text.Line = 3;
        setText(&Text.StateUnion.Text.Text, "0123456789abcdefghij");
        memcpy(Fru,
               "\xff\x00\x01\x02\x80\x7f"
               "fru!",
               sizeof Fru);
    }

    void save() const
    {
        ASSERT_EQ(kviCsSaveResTagNV(0, 0x1234, SAHPI_TRUE, &Tag), SA_OK);
        ASSERT_EQ(kviCsSaveResSeverityNV(0, 0x1234, SAHPI_FALSE, &Severity), SA_OK);
        ASSERT_EQ(kviCsSaveEvtLogStNV(0, 0x1234, SAHPI_TRUE, SAHPI_TRUE), SA_OK);
        ASSERT_EQ(kviCsSaveThreshNV(0, 0x1234, 0x56, SAHPI_TRUE, &Thresholds), SA_OK);
        ASSERT_EQ(kviCsSaveEvtEnablesNV(0, 0x1234, 0x56, SAHPI_FALSE, &Enables), SA_OK);
        ASSERT_EQ(kviCsSaveCtrlStateNV(0, 0x1234, 7, SAHPI_TRUE, &Analog), SA_OK);
        ASSERT_EQ(kviCsSaveCtrlStateNV(0, 0x1234, 8, SAHPI_FALSE, &Text), SA_OK);
        ASSERT_EQ(kviCsSaveFruNV(0, 0x1234, 9, SAHPI_TRUE, sizeof Fru, Fru), SA_OK);
    }
};

// Object files and stored lengths are the same on 64-bit and 32-bit x86:
// each build writes the checked-in store byte for byte and reads it back, so
// a store written by one build is read by the other.
TEST_F(ParmControlHelpersTest, StoreFilesAreTheSameOnEveryWordSize)
{
    const char *data = getenv("KVI_TEST_DATA_DIR");
    std::filesystem::path expected =
        std::filesystem::path(data != nullptr ? data
                                              : std::filesystem::path(__FILE__).parent_path() /
                                                    "../../../data") /
        "nv-store";
    SavedSettings saved;
    saved.save();
    std::filesystem::path written = tmp_.file("nv");
    size_t files = 0;
    for (const auto &entry : std::filesystem::directory_iterator(expected)) {
        SCOPED_TRACE(entry.path().filename().string());
        ++files;
        EXPECT_EQ(fileBytes(written / entry.path().filename()), fileBytes(entry.path()));
    }
    EXPECT_EQ(files, 8u);
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(written), {}), 8);

    SavedSettings read;
    memset(static_cast<void *>(&read), 0, sizeof read);
    SaHpiBoolT log = SAHPI_FALSE;
    SaHpiUint32T fruSize = 0;
    ASSERT_EQ(kviCsGetResTagNV(0, 0x1234, SAHPI_TRUE, &read.Tag), SA_OK);
    ASSERT_EQ(kviCsGetResSeverityNV(0, 0x1234, SAHPI_FALSE, &read.Severity), SA_OK);
    ASSERT_EQ(kviCsGetEvtLogStNV(0, 0x1234, SAHPI_TRUE, &log), SA_OK);
    ASSERT_EQ(kviCsGetThreshNV(0, 0x1234, 0x56, SAHPI_TRUE, &read.Thresholds), SA_OK);
    ASSERT_EQ(kviCsGetEvtEnablesNV(0, 0x1234, 0x56, SAHPI_FALSE, &read.Enables), SA_OK);
    ASSERT_EQ(kviCsGetCtrlStateNV(0, 0x1234, 7, SAHPI_TRUE, &read.Analog), SA_OK);
    ASSERT_EQ(kviCsGetFruSizeNV(0, 0x1234, 9, SAHPI_TRUE, &fruSize), SA_OK);
    ASSERT_EQ(kviCsGetFruNV(0, 0x1234, 9, SAHPI_TRUE, sizeof read.Fru, read.Fru), SA_OK);
    ASSERT_EQ(kviCsGetCtrlStateNV(0, 0x1234, 8, SAHPI_FALSE, &read.Text), SA_OK);
    EXPECT_EQ(log, SAHPI_TRUE);
    EXPECT_EQ(fruSize, sizeof saved.Fru);
    // A text control comes back short of the last seven bytes of its text.
    memset(saved.Text.StateUnion.Text.Text.Data + 13, 0, 7);
    EXPECT_TRUE(same(&read, &saved, sizeof saved));
}

// A text control keeps only DataLength + 10 bytes of its state, so the last
// seven characters of its text do not come back; its length field does,
// unless the state is too short to hold it.
TEST_F(ParmControlHelpersTest, TextControlComesBackShortOfItsLastSevenCharacters)
{
    SaHpiCtrlStateT state{SAHPI_CTRL_TYPE_TEXT, {}}, out{};
    state.StateUnion.Text.Line = 2;
    state.StateUnion.Text.Text = text("Hello World!");
    ASSERT_EQ(kviCsSaveCtrlStateNV(0, 3, 1, SAHPI_FALSE, &state), SA_OK);
    ASSERT_EQ(kviCsGetCtrlStateNV(0, 3, 1, SAHPI_FALSE, &out), SA_OK);
    EXPECT_EQ(out.Type, SAHPI_CTRL_TYPE_TEXT);
    EXPECT_EQ(out.StateUnion.Text.Line, 2);
    EXPECT_EQ(out.StateUnion.Text.Text.DataLength, 12);
    EXPECT_EQ(std::string(reinterpret_cast<char *>(out.StateUnion.Text.Text.Data), 12),
              std::string("Hello", 5) + std::string(7, '\0'));
    state.StateUnion.Text.Text = text("Hi");
    ASSERT_EQ(kviCsSaveCtrlStateNV(0, 3, 1, SAHPI_FALSE, &state), SA_OK);
    ASSERT_EQ(kviCsGetCtrlStateNV(0, 3, 1, SAHPI_FALSE, &out), SA_OK);
    EXPECT_EQ(out.StateUnion.Text.Text.DataLength, 0);
}

// Objects that disagree with their length field, fixed-length items shorter
// than their type, a closed store; the daemon's copy is often missing, so
// only the explicit copy's absence is logged.
TEST_F(ParmControlHelpersTest, DamagedMissingAndUnreachableObjects)
{
    KviLogCapture log;
    SaHpiTextBufferT tag = text("abcdef"), tagOut{};
    ASSERT_EQ(kviCsNonVolatilePut("kviResTag00000000000000005", 12, &tag), SA_OK);
    EXPECT_EQ(kviCsGetResTagNV(0, 5, SAHPI_FALSE, &tagOut), SA_ERR_HPI_DATA_TRUNCATED);
    EXPECT_TRUE(
        loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, "bytesRead did not match TextBuffer size. 12, 15"));
    SaHpiCtrlStateT state{SAHPI_CTRL_TYPE_DIGITAL, {}}, stateOut{};
    ASSERT_EQ(kviCsNonVolatilePut("kviCtlSte0000000000000000501", 20, &state), SA_OK);
    EXPECT_EQ(kviCsGetCtrlStateNV(0, 5, 1, SAHPI_FALSE, &stateOut), SA_ERR_HPI_DATA_TRUNCATED);
    state.Type = SAHPI_CTRL_TYPE_TEXT;
    state.StateUnion.Text.Text.DataLength = 30;
    ASSERT_EQ(kviCsNonVolatilePut("kviCtlSte0000000000000000501", 20, &state), SA_OK);
    EXPECT_EQ(kviCsGetCtrlStateNV(0, 5, 1, SAHPI_FALSE, &stateOut), SA_ERR_HPI_DATA_TRUNCATED);
    EXPECT_TRUE(log.contains("bytesRead did not match control state size. 20, 40"));
    SaHpiSeverityT severity = SAHPI_OK;
    ASSERT_EQ(kviCsNonVolatilePut("kviResSev00000000000000005", 2, "ab"), SA_OK);
    EXPECT_EQ(kviCsGetResSeverityNV(0, 5, SAHPI_FALSE, &severity), SA_ERR_HPI_ERROR);

    log.clear();
    SaHpiSensorThresholdsT th{};
    SaHpiUint32T size = 0;
    EXPECT_EQ(kviCsGetThreshNV(0, 4, 2, SAHPI_TRUE, &th), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviCsGetResTagNV(0, 4, SAHPI_TRUE, &tagOut), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_FALSE(log.contains("kviCsNonVolatileGet failed"));
    EXPECT_EQ(kviCsGetFruSizeNV(0, 4, 1, SAHPI_FALSE, &size), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("kviCsNonVolatileGet failed. rc=-1013"));

    ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    EXPECT_EQ(kviCsSaveResTagNV(0, 1, SAHPI_FALSE, &tag), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, "kviCsNonVolatilePut failed. rc=-1026"));
    EXPECT_EQ(kviCsGetResSeverityNV(0, 1, SAHPI_TRUE, &severity), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsNonVolatileGet failed. rc=-1026"));
    EXPECT_EQ(kviCsNonVolatileInitialize(), SA_OK);
}

TEST_F(ParmControlHelpersTest, NullItemsAreRefusedByName)
{
    KviLogCapture log;
    const std::pair<SaErrorT, const char *> cases[] = {
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
    for (auto [rc, line] : cases) {
        EXPECT_EQ(rc, SA_ERR_HPI_INVALID_PARAMS) << line;
        EXPECT_TRUE(log.contains(line)) << line;
    }
}

// An inventory object's length word is masked to 16 bits; a buffer that
// cannot be had is out of space, without a leak.
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

    SaHpiInt32T before = kviTestLiveBlocks();
    KviLogCapture log;
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsSaveFruNV(0, 2, 3, SAHPI_FALSE, 4, out), SA_ERR_HPI_OUT_OF_SPACE);
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsGetFruNV(0, 2, 1, SAHPI_FALSE, 4, out), SA_ERR_HPI_OUT_OF_SPACE);
    kviCsMemoryFailNthAllocation(0);
    EXPECT_EQ(log.matching("Malloc failed").size(), 2u);
    EXPECT_EQ(kviTestLiveBlocks(), before);
}

} // namespace
