#include "core/SaHpi/entitySchema/EntitySchema.h"

#include <cstdio>
#include <string>

#include <gtest/gtest.h>

#include "support/KviTestSupport.h"

namespace
{

class EntitySchemaTest : public testing::Test
{
  protected:
    void SetUp() override
    {
        kviCsEntitySchemaForget();
        log.clear();
    }
    void TearDown() override
    {
        unload();
        kviCsEntitySchemaForget();
    }

    // Makes `contents` the process's configuration.
    void load(const std::string &contents)
    {
        unload();
        ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, dir_.write("kvi.conf", contents).c_str()), SA_OK);
        loaded_ = true;
    }
    void unload()
    {
        if (loaded_)
            kviCsConfigFinalize();
        loaded_ = false;
    }
    static std::string schemaLine(const std::string &value)
    {
        return "KviEntitySchemaId = \"" + value + "\"\n";
    }

    KviLogCapture log{KVI_LOG_DBG_L_NUM};

  private:
    KviTempDir dir_;
    bool loaded_ = false;
};

TEST_F(EntitySchemaTest, ValuesAndTheirIdentifiers)
{
    struct Case {
        const char *value;
        SaErrorT rc;
        SaHpiUint32T identifier;
        const char *message;
    };
    const Case cases[] = {
        {"CPCI", SA_OK, 0x43504349, "Value: 43504349, savedValue 43504349"},
        {"ATCA", SA_OK, 0x41544341, "Value: 41544341, savedValue 41544341"},
        {"OEM7", SA_OK, 0x4F454D37, nullptr},
        {"OEMA", SA_OK, 0x4F454D41, nullptr},
        {"OEMf", SA_OK, 0x4F454D66, nullptr},
        // The character's code, never its value: "OEM0" is not 0x4F454D00.
        {"OEM0", SA_OK, 0x4F454D30, nullptr},
        {"OEMg", SA_ERR_HPI_ERROR, 0, "Entity Schema is out of Range 4f454d67"},
        {"OEM", SA_ERR_HPI_ERROR, 0, "Entity Schema is out of Range 4f454d00"},
        {"OEM ", SA_ERR_HPI_ERROR, 0, "Entity Schema is out of Range 4f454d20"},
        {"atca", SA_ERR_HPI_ERROR, 0, "Invalid Entity Schema atca"},
        {"CPC", SA_ERR_HPI_ERROR, 0, "Invalid Entity Schema CPC"},
        {"", SA_ERR_HPI_ERROR, 0, "Invalid Entity Schema "},
        // Five characters do not fit the four-letter buffer.
        {"CPCIX", SA_ERR_HPI_ERROR, 0, "Unable to retrieve Config Data rc, -1008"},
        {"OEM7 ", SA_ERR_HPI_ERROR, 0, "Unable to retrieve Config Data rc, -1008"},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(std::string("value \"") + c.value + "\"");
        kviCsEntitySchemaForget();
        load(schemaLine(c.value));
        log.clear();
        SaHpiUint32T value = 0xDEADBEEF;
        EXPECT_EQ(kviCsEntitySchemaGet(&value), c.rc);
        EXPECT_EQ(value, c.identifier);
        if (c.message != nullptr) {
            EXPECT_TRUE(log.contains(c.message));
        }
    }
}

TEST_F(EntitySchemaTest, FirstSuccessIsKeptForTheLifeOfTheProcess)
{
    load(schemaLine("ATCA"));
    SaHpiUint32T value = 0;
    ASSERT_EQ(kviCsEntitySchemaGet(&value), SA_OK);

    load(schemaLine("CPCI"));
    log.clear();
    value = 0;
    EXPECT_EQ(kviCsEntitySchemaGet(&value), SA_OK);
    EXPECT_EQ(value, 0x41544341u);
    EXPECT_TRUE(log.contains("Saved Value: 41544341"));

    // Even a configuration without the key no longer matters.
    load("other = \"1\"\n");
    EXPECT_EQ(kviCsEntitySchemaGet(&value), SA_OK);
    EXPECT_EQ(value, 0x41544341u);
}

TEST_F(EntitySchemaTest, FailuresAreNotCachedAndTheNextCallReadsAgain)
{
    load(schemaLine("ATCa"));
    SaHpiUint32T value = 1;
    EXPECT_EQ(kviCsEntitySchemaGet(&value), SA_ERR_HPI_ERROR);
    EXPECT_EQ(kviCsEntitySchemaGet(&value), SA_ERR_HPI_ERROR);
    EXPECT_EQ(log.matching("Invalid Entity Schema ATCa").size(), 2u);

    load(schemaLine("OEMb"));
    EXPECT_EQ(kviCsEntitySchemaGet(&value), SA_OK);
    EXPECT_EQ(value, 0x4F454D62u);
}

TEST_F(EntitySchemaTest, MissingKeyFailsEveryCall)
{
    load("KviEntitySchemaIdent = \"CPCI\"\nkvientityschemaid = \"CPCI\"\n");
    for (int call = 0; call < 3; call++) {
        SaHpiUint32T value = 5;
        EXPECT_EQ(kviCsEntitySchemaGet(&value), SA_ERR_HPI_ERROR);
        EXPECT_EQ(value, 0u);
    }
    EXPECT_EQ(log.matching("Unable to retrieve Config Data rc, -1013").size(), 3u);
}

TEST_F(EntitySchemaTest, WithoutAConfigurationTheCallFails)
{
    SaHpiUint32T value = 5;
    EXPECT_EQ(kviCsEntitySchemaGet(&value), SA_ERR_HPI_ERROR);
    EXPECT_EQ(value, 0u);
    EXPECT_TRUE(log.contains("Unable to retrieve Config Data rc, "));
}

TEST_F(EntitySchemaTest, NullValueIsRefusedAndNothingIsRead)
{
    load(schemaLine("CPCI"));
    EXPECT_EQ(kviCsEntitySchemaGet(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Value pointer is NULL."));
    // The refused call cached nothing: a changed setting is still seen.
    load(schemaLine("ATCA"));
    SaHpiUint32T value = 0;
    EXPECT_EQ(kviCsEntitySchemaGet(&value), SA_OK);
    EXPECT_EQ(value, 0x41544341u);
}

} // namespace
