// The entity schema is a configuration setting turned into four ASCII letters
// packed high byte first. It is read once and then answered from a cache for
// the life of the process: clients expect a schema that never changes under
// them, even if the configuration file is edited later.
#include "core/SaHpi/entitySchema/EntitySchema.h"

#include <atomic>
#include <cctype>
#include <cstring>

#include "core/utils/KviTrace.h"
#include "kvi/KviConfig.h"

namespace
{

// Four letters and the terminator: a longer value does not fit and fails the
// read, so only values of at most four characters are ever compared.
constexpr SaHpiUint32T SCHEMA_BUFFER_SIZE = 5;

constexpr SaHpiUint32T SCHEMA_CPCI = 0x43504349; // "CPCI"
constexpr SaHpiUint32T SCHEMA_ATCA = 0x41544341; // "ATCA"
constexpr SaHpiUint32T SCHEMA_OEM = 0x4F454D00;  // "OEM" and one character in the low byte

// Calls are not serialised: two first calls may both read the configuration
// and store the same value, which is harmless. The atomics only make that
// race well defined; the flag is published after the value.
std::atomic<SaHpiUint32T> savedValue{0};
std::atomic<SaHpiBoolT> isValueSaved{SAHPI_FALSE};

} // namespace

extern "C" SaErrorT kviCsEntitySchemaGet(SaHpiUint32T *Value) noexcept
{
    KVI_TRACE("Key: %s", "KviEntitySchemaId");
    KVI_NULL_CHECK(Value);
    *Value = 0;

    if (isValueSaved.load(std::memory_order_acquire) == SAHPI_TRUE) {
        *Value = savedValue.load(std::memory_order_relaxed);
        KVI_DLOG(KVI_LOG_DBG_L, "Saved Value: %8.8x", *Value);
        return SA_OK;
    }

    char schema[SCHEMA_BUFFER_SIZE] = {};
    SaErrorT rc = kviCsCfgDataGet("KviEntitySchemaId", SCHEMA_BUFFER_SIZE, schema, nullptr);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to retrieve Config Data rc, %d", rc);
        return SA_ERR_HPI_ERROR;
    }

    SaHpiUint32T identifier;
    if (memcmp(schema, "OEM", 3) == 0) {
        // The identifier carries the digit's character code, not its value.
        const unsigned char oemDigit = static_cast<unsigned char>(schema[3]);
        identifier = SCHEMA_OEM | oemDigit;
        if (!isxdigit(oemDigit)) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Entity Schema is out of Range %8.8x", identifier);
            return SA_ERR_HPI_ERROR;
        }
    } else if (memcmp(schema, "CPCI", 4) == 0) {
        identifier = SCHEMA_CPCI;
    } else if (memcmp(schema, "ATCA", 4) == 0) {
        identifier = SCHEMA_ATCA;
    } else {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid Entity Schema %s", schema);
        return SA_ERR_HPI_ERROR;
    }

    savedValue.store(identifier, std::memory_order_relaxed);
    isValueSaved.store(SAHPI_TRUE, std::memory_order_release);
    *Value = identifier;
    KVI_DLOG(KVI_LOG_DBG_L, "Value: %8.8x, savedValue %8.8x", *Value, identifier);
    return SA_OK;
}

void kviCsEntitySchemaForget() noexcept
{
    isValueSaved.store(SAHPI_FALSE, std::memory_order_release);
    savedValue.store(0, std::memory_order_relaxed);
}
