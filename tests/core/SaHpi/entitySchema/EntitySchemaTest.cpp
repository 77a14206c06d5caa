#include "core/SaHpi/entitySchema/EntitySchema.h"

#include <string>
#include <tuple>

#include <gtest/gtest.h>

#include "support/KviTestSupport.h"

namespace
{

class EntitySchemaTest : public testing::Test
{
  protected:
    void SetUp() override { kviCsEntitySchemaForget(); }
    void TearDown() override
    {
        configure(nullptr);
        kviCsEntitySchemaForget();
    }
    // Makes `contents` the process's configuration; nullptr leaves none.
    void configure(const char *contents)
    {
        if (loaded_)
            kviCsConfigFinalize();
        loaded_ = contents != nullptr;
        if (loaded_) {
            ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, dir_.write("kvi.conf", contents).c_str()),
                      SA_OK);
        }
    }
    void configureSchema(const std::string &value)
    {
        configure(("KviEntitySchemaId = \"" + value + "\"\n").c_str());
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
        configureSchema(c.value);
        log.clear();
        SaHpiUint32T value = 0xDEADBEEF;
        EXPECT_EQ(kviCsEntitySchemaGet(&value), c.rc);
        EXPECT_EQ(value, c.identifier);
        EXPECT_TRUE(c.message == nullptr || log.contains(c.message));
    }
}

TEST_F(EntitySchemaTest, FailuresAreReadAgainAndTheFirstSuccessIsKeptForGood)
{
    SaHpiUint32T value = 5;
    EXPECT_EQ(kviCsEntitySchemaGet(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Value pointer is NULL."));
    // One configuration after another: none, a bad value, the key missing
    // (names are exact), then good values, of which only the first counts.
    const std::tuple<const char *, SaErrorT, SaHpiUint32T, const char *> steps[] = {
        {nullptr, SA_ERR_HPI_ERROR, 0, "Unable to retrieve Config Data rc, "},
        {"KviEntitySchemaId = \"ATCa\"\n", SA_ERR_HPI_ERROR, 0, "Invalid Entity Schema ATCa"},
        {"KviEntitySchemaId = \"ATCa\"\n", SA_ERR_HPI_ERROR, 0, "Invalid Entity Schema ATCa"},
        {"KviEntitySchemaIdent = \"CPCI\"\nkvientityschemaid = \"CPCI\"\n", SA_ERR_HPI_ERROR, 0,
         "Unable to retrieve Config Data rc, -1013"},
        {"KviEntitySchemaId = \"OEMb\"\n", SA_OK, 0x4F454D62, "Value: 4f454d62"},
        {"KviEntitySchemaId = \"CPCI\"\n", SA_OK, 0x4F454D62, "Saved Value: 4f454d62"},
        {"other = \"1\"\n", SA_OK, 0x4F454D62, "Saved Value: 4f454d62"},
    };
    for (const auto &[contents, rc, identifier, message] : steps) {
        SCOPED_TRACE(contents != nullptr ? contents : "no configuration");
        configure(contents);
        log.clear();
        value = 5;
        EXPECT_EQ(kviCsEntitySchemaGet(&value), rc);
        EXPECT_EQ(value, identifier);
        EXPECT_TRUE(log.contains(message));
    }
}

} // namespace
