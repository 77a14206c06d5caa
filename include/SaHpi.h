/*
 * SaHpi.h - Hardware Platform Interface, version A.01.01.
 *
 * The types, constants, error codes and entry points of the HPI A.01.01 API
 * as our clients, daemons and plug-ins see them. Layouts are part of the
 * binary interface shared with code built elsewhere: never reorder members,
 * change a member's type or renumber a value. tests/abi checks every size,
 * alignment, offset, value and prototype against the published interface on
 * 64-bit and 32-bit x86.
 *
 * Plain C11; compiles unchanged as C++20.
 */
#ifndef SAHPI_H
#define SAHPI_H

#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/*
 * Decorations of the published prototypes. SAHPI_API stays empty: the
 * library adds its own visibility where it defines the functions, so the
 * declarations here carry no export attribute. The direction markers only
 * document which arguments are read, written or both.
 */
#ifndef SAHPI_API
#define SAHPI_API
#endif
#define SAHPI_IN
#define SAHPI_OUT
#define SAHPI_INOUT

/*
 * The library implements the entry points in C++ and marks them noexcept so
 * that no exception ever crosses into a C caller. C++ rejects a definition
 * that is noexcept after a declaration that is not, so the
 * declarations carry it too; C sees nothing. The same macro, spelled the
 * same way, is in kvi/KviExport.h: this header must also stand alone.
 */
#ifndef KVI_NOEXCEPT
#ifdef __cplusplus
#define KVI_NOEXCEPT noexcept
#else
#define KVI_NOEXCEPT
#endif
#endif

/* ------------------------------------------------------------------------ */
/* Basic data types and values                                              */
/* ------------------------------------------------------------------------ */

typedef uint8_t SaHpiUint8T;
typedef uint16_t SaHpiUint16T;
typedef uint32_t SaHpiUint32T;
typedef int8_t SaHpiInt8T;
typedef int16_t SaHpiInt16T;
typedef int32_t SaHpiInt32T;
typedef int64_t SaHpiInt64T;
typedef float SaHpiFloat32T;
typedef double SaHpiFloat64T;

typedef SaHpiUint8T SaHpiBoolT;
/* Any non-zero SaHpiBoolT means true: test for truth, never == SAHPI_TRUE. */
#define SAHPI_TRUE 1
#define SAHPI_FALSE 0

/* Manufacturer identifiers are IANA private enterprise numbers. */
typedef SaHpiUint32T SaHpiManufacturerIdT;
#define SAHPI_MANUFACTURER_ID_UNSPECIFIED ((SaHpiManufacturerIdT)0)

/* Interface version: one byte each for the letter (A = 1), major and minor. */
typedef SaHpiUint32T SaHpiVersionT;
#define SAHPI_INTERFACE_VERSION ((SaHpiVersionT)0x010101)

typedef SaHpiInt32T SaErrorT;
#define SA_OK ((SaErrorT)0x0000)

#define SA_HPI_ERR_BASE (-1000)
#define SA_ERR_HPI_ERROR ((SaErrorT)(SA_HPI_ERR_BASE - 1))
#define SA_ERR_HPI_UNSUPPORTED_API ((SaErrorT)(SA_HPI_ERR_BASE - 2))
#define SA_ERR_HPI_BUSY ((SaErrorT)(SA_HPI_ERR_BASE - 3))
#define SA_ERR_HPI_INVALID ((SaErrorT)(SA_HPI_ERR_BASE - 4))
#define SA_ERR_HPI_INVALID_CMD ((SaErrorT)(SA_HPI_ERR_BASE - 5))
#define SA_ERR_HPI_TIMEOUT ((SaErrorT)(SA_HPI_ERR_BASE - 6))
#define SA_ERR_HPI_OUT_OF_SPACE ((SaErrorT)(SA_HPI_ERR_BASE - 7))
#define SA_ERR_HPI_DATA_TRUNCATED ((SaErrorT)(SA_HPI_ERR_BASE - 8))
#define SA_ERR_HPI_DATA_LEN_INVALID ((SaErrorT)(SA_HPI_ERR_BASE - 9))
#define SA_ERR_HPI_DATA_EX_LIMITS ((SaErrorT)(SA_HPI_ERR_BASE - 10))
#define SA_ERR_HPI_INVALID_PARAMS ((SaErrorT)(SA_HPI_ERR_BASE - 11))
#define SA_ERR_HPI_INVALID_DATA ((SaErrorT)(SA_HPI_ERR_BASE - 12))
#define SA_ERR_HPI_NOT_PRESENT ((SaErrorT)(SA_HPI_ERR_BASE - 13))
#define SA_ERR_HPI_INVALID_DATA_FIELD ((SaErrorT)(SA_HPI_ERR_BASE - 14))
#define SA_ERR_HPI_INVALID_SENSOR_CMD ((SaErrorT)(SA_HPI_ERR_BASE - 15))
#define SA_ERR_HPI_NO_RESPONSE ((SaErrorT)(SA_HPI_ERR_BASE - 16))
#define SA_ERR_HPI_DUPLICATE ((SaErrorT)(SA_HPI_ERR_BASE - 17))
#define SA_ERR_HPI_UPDATING ((SaErrorT)(SA_HPI_ERR_BASE - 18))
#define SA_ERR_HPI_INITIALIZING ((SaErrorT)(SA_HPI_ERR_BASE - 19))
#define SA_ERR_HPI_UNKNOWN ((SaErrorT)(SA_HPI_ERR_BASE - 20))
#define SA_ERR_HPI_INVALID_SESSION ((SaErrorT)(SA_HPI_ERR_BASE - 21))
#define SA_ERR_HPI_INVALID_DOMAIN ((SaErrorT)(SA_HPI_ERR_BASE - 22))
#define SA_ERR_HPI_INVALID_RESOURCE ((SaErrorT)(SA_HPI_ERR_BASE - 23))
#define SA_ERR_HPI_INVALID_REQUEST ((SaErrorT)(SA_HPI_ERR_BASE - 24))
#define SA_ERR_HPI_ENTITY_NOT_PRESENT ((SaErrorT)(SA_HPI_ERR_BASE - 25))
#define SA_ERR_HPI_UNINITIALIZED ((SaErrorT)(SA_HPI_ERR_BASE - 26))

/* Domains, sessions, resources and table entries. */
typedef SaHpiUint32T SaHpiDomainIdT;
#define SAHPI_DEFAULT_DOMAIN_ID ((SaHpiDomainIdT)0x00000000)
#define SAHPI_UNSPECIFIED_DOMAIN_ID ((SaHpiDomainIdT)0xFFFFFFFF)

typedef SaHpiUint32T SaHpiSessionIdT;

typedef SaHpiUint32T SaHpiResourceIdT;
#define SAHPI_UNSPECIFIED_RESOURCE_ID ((SaHpiResourceIdT)0xFFFFFFFF)
/* Names the domain controller, e.g. to reach the domain's own event log. */
#define SAHPI_DOMAIN_CONTROLLER_ID ((SaHpiResourceIdT)0xFFFFFFFE)

/* Cursor of the RPT and RDR walks: start at FIRST, stop when LAST comes back. */
typedef SaHpiUint32T SaHpiEntryIdT;
#define SAHPI_FIRST_ENTRY ((SaHpiEntryIdT)0x00000000)
#define SAHPI_LAST_ENTRY ((SaHpiEntryIdT)0xFFFFFFFF)

/*
 * Time in nanoseconds. Values up to SAHPI_TIME_MAX_RELATIVE are relative
 * (time since some start-up); larger values are absolute, since 00:00:00
 * UTC 1 January 1970.
 */
typedef SaHpiInt64T SaHpiTimeT;
/* INT64_MIN, written so that it is a signed constant in C and C++. */
#define SAHPI_TIME_UNSPECIFIED ((SaHpiTimeT)(-0x7FFFFFFFFFFFFFFFLL - 1))
#define SAHPI_TIME_MAX_RELATIVE ((SaHpiTimeT)0x0C00000000000000LL)

/* Timeouts in nanoseconds; the two special values never wait and wait forever. */
typedef SaHpiInt64T SaHpiTimeoutT;
#define SAHPI_TIMEOUT_IMMEDIATE ((SaHpiTimeoutT)0x0000000000000000LL)
#define SAHPI_TIMEOUT_BLOCK ((SaHpiTimeoutT)-1LL)

/* ------------------------------------------------------------------------ */
/* Text buffers                                                             */
/* ------------------------------------------------------------------------ */

/* Languages of SAHPI_TL_TYPE_LANGUAGE text (ISO 639 order). */
typedef enum {
    SAHPI_LANG_UNDEF = 0,
    SAHPI_LANG_AFAR,
    SAHPI_LANG_ABKHAZIAN,
    SAHPI_LANG_AFRIKAANS,
    SAHPI_LANG_AMHARIC,
    SAHPI_LANG_ARABIC,
    SAHPI_LANG_ASSAMESE,
    SAHPI_LANG_AYMARA,
    SAHPI_LANG_AZERBAIJANI,
    SAHPI_LANG_BASHKIR,
    SAHPI_LANG_BYELORUSSIAN,
    SAHPI_LANG_BULGARIAN,
    SAHPI_LANG_BIHARI,
    SAHPI_LANG_BISLAMA,
    SAHPI_LANG_BENGALI,
    SAHPI_LANG_TIBETAN,
    SAHPI_LANG_BRETON,
    SAHPI_LANG_CATALAN,
    SAHPI_LANG_CORSICAN,
    SAHPI_LANG_CZECH,
    SAHPI_LANG_WELSH,
    SAHPI_LANG_DANISH,
    SAHPI_LANG_GERMAN,
    SAHPI_LANG_BHUTANI,
    SAHPI_LANG_GREEK,
    SAHPI_LANG_ENGLISH,
    SAHPI_LANG_ESPERANTO,
    SAHPI_LANG_SPANISH,
    SAHPI_LANG_ESTONIAN,
    SAHPI_LANG_BASQUE,
    SAHPI_LANG_PERSIAN,
    SAHPI_LANG_FINNISH,
    SAHPI_LANG_FIJI,
    SAHPI_LANG_FAEROESE,
    SAHPI_LANG_FRENCH,
    SAHPI_LANG_FRISIAN,
    SAHPI_LANG_IRISH,
    SAHPI_LANG_SCOTSGAELIC,
    SAHPI_LANG_GALICIAN,
    SAHPI_LANG_GUARANI,
    SAHPI_LANG_GUJARATI,
    SAHPI_LANG_HAUSA,
    SAHPI_LANG_HINDI,
    SAHPI_LANG_CROATIAN,
    SAHPI_LANG_HUNGARIAN,
    SAHPI_LANG_ARMENIAN,
    SAHPI_LANG_INTERLINGUA,
    SAHPI_LANG_INTERLINGUE,
    SAHPI_LANG_INUPIAK,
    SAHPI_LANG_INDONESIAN,
    SAHPI_LANG_ICELANDIC,
    SAHPI_LANG_ITALIAN,
    SAHPI_LANG_HEBREW,
    SAHPI_LANG_JAPANESE,
    SAHPI_LANG_YIDDISH,
    SAHPI_LANG_JAVANESE,
    SAHPI_LANG_GEORGIAN,
    SAHPI_LANG_KAZAKH,
    SAHPI_LANG_GREENLANDIC,
    SAHPI_LANG_CAMBODIAN,
    SAHPI_LANG_KANNADA,
    SAHPI_LANG_KOREAN,
    SAHPI_LANG_KASHMIRI,
    SAHPI_LANG_KURDISH,
    SAHPI_LANG_KIRGHIZ,
    SAHPI_LANG_LATIN,
    SAHPI_LANG_LINGALA,
    SAHPI_LANG_LAOTHIAN,
    SAHPI_LANG_LITHUANIAN,
    SAHPI_LANG_LATVIANLETTISH,
    SAHPI_LANG_MALAGASY,
    SAHPI_LANG_MAORI,
    SAHPI_LANG_MACEDONIAN,
    SAHPI_LANG_MALAYALAM,
    SAHPI_LANG_MONGOLIAN,
    SAHPI_LANG_MOLDAVIAN,
    SAHPI_LANG_MARATHI,
    SAHPI_LANG_MALAY,
    SAHPI_LANG_MALTESE,
    SAHPI_LANG_BURMESE,
    SAHPI_LANG_NAURU,
    SAHPI_LANG_NEPALI,
    SAHPI_LANG_DUTCH,
    SAHPI_LANG_NORWEGIAN,
    SAHPI_LANG_OCCITAN,
    SAHPI_LANG_AFANOROMO,
    SAHPI_LANG_ORIYA,
    SAHPI_LANG_PUNJABI,
    SAHPI_LANG_POLISH,
    SAHPI_LANG_PASHTOPUSHTO,
    SAHPI_LANG_PORTUGUESE,
    SAHPI_LANG_QUECHUA,
    SAHPI_LANG_RHAETOROMANCE,
    SAHPI_LANG_KIRUNDI,
    SAHPI_LANG_ROMANIAN,
    SAHPI_LANG_RUSSIAN,
    SAHPI_LANG_KINYARWANDA,
    SAHPI_LANG_SANSKRIT,
    SAHPI_LANG_SINDHI,
    SAHPI_LANG_SANGRO,
    SAHPI_LANG_SERBOCROATIAN,
    SAHPI_LANG_SINGHALESE,
    SAHPI_LANG_SLOVAK,
    SAHPI_LANG_SLOVENIAN,
    SAHPI_LANG_SAMOAN,
    SAHPI_LANG_SHONA,
    SAHPI_LANG_SOMALI,
    SAHPI_LANG_ALBANIAN,
    SAHPI_LANG_SERBIAN,
    SAHPI_LANG_SISWATI,
    SAHPI_LANG_SESOTHO,
    SAHPI_LANG_SUDANESE,
    SAHPI_LANG_SWEDISH,
    SAHPI_LANG_SWAHILI,
    SAHPI_LANG_TAMIL,
    SAHPI_LANG_TELUGU,
    SAHPI_LANG_TAJIK,
    SAHPI_LANG_THAI,
    SAHPI_LANG_TIGRINYA,
    SAHPI_LANG_TURKMEN,
    SAHPI_LANG_TAGALOG,
    SAHPI_LANG_SETSWANA,
    SAHPI_LANG_TONGA,
    SAHPI_LANG_TURKISH,
    SAHPI_LANG_TSONGA,
    SAHPI_LANG_TATAR,
    SAHPI_LANG_TWI,
    SAHPI_LANG_UKRAINIAN,
    SAHPI_LANG_URDU,
    SAHPI_LANG_UZBEK,
    SAHPI_LANG_VIETNAMESE,
    SAHPI_LANG_VOLAPUK,
    SAHPI_LANG_WOLOF,
    SAHPI_LANG_XHOSA,
    SAHPI_LANG_YORUBA,
    SAHPI_LANG_CHINESE,
    SAHPI_LANG_ZULU
} SaHpiLanguageT;

/* How the bytes of a text buffer are to be read (IPMI type/length codes). */
typedef enum {
    SAHPI_TL_TYPE_BINARY = 0, /* any bytes; DataLength counts them */
    SAHPI_TL_TYPE_BCDPLUS,    /* 0-9, space, dash, period, colon, comma, underscore */
    SAHPI_TL_TYPE_ASCII6,     /* reduced ASCII set, 0x20-0x5F */
    SAHPI_TL_TYPE_LANGUAGE    /* text in the buffer's Language */
} SaHpiTextTypeT;

#define SAHPI_MAX_TEXT_BUFFER_LENGTH 255

typedef struct {
    SaHpiTextTypeT DataType;
    SaHpiLanguageT Language; /* meaningful for SAHPI_TL_TYPE_LANGUAGE only */
    SaHpiUint8T DataLength;  /* bytes used in Data; no terminating NUL */
    SaHpiUint8T Data[SAHPI_MAX_TEXT_BUFFER_LENGTH];
} SaHpiTextBufferT;

/* ------------------------------------------------------------------------ */
/* Entities                                                                 */
/* ------------------------------------------------------------------------ */

/*
 * Entity types below 0x10000 mirror the IPMI entity ids; the HPI adds its
 * own from SAHPI_ENT_SAFHPI_GROUP on. SAHPI_ENT_ROOT ends an entity path.
 */
#define SAHPI_ENT_IPMI_GROUP 0
#define SAHPI_ENT_SAFHPI_GROUP 0x10000
#define SAHPI_ENT_ROOT_VALUE 0xFFFF

typedef enum {
    SAHPI_ENT_UNSPECIFIED = SAHPI_ENT_IPMI_GROUP,
    SAHPI_ENT_OTHER,
    SAHPI_ENT_UNKNOWN,
    SAHPI_ENT_PROCESSOR,
    SAHPI_ENT_DISK_BAY,
    SAHPI_ENT_PERIPHERAL_BAY,
    SAHPI_ENT_SYS_MGMNT_MODULE,
    SAHPI_ENT_SYSTEM_BOARD,
    SAHPI_ENT_MEMORY_MODULE,
    SAHPI_ENT_PROCESSOR_MODULE,
    SAHPI_ENT_POWER_SUPPLY,
    SAHPI_ENT_ADD_IN_CARD,
    SAHPI_ENT_FRONT_PANEL_BOARD,
    SAHPI_ENT_BACK_PANEL_BOARD,
    SAHPI_ENT_POWER_SYSTEM_BOARD,
    SAHPI_ENT_DRIVE_BACKPLANE,
    SAHPI_ENT_SYS_EXPANSION_BOARD,
    SAHPI_ENT_OTHER_SYSTEM_BOARD,
    SAHPI_ENT_PROCESSOR_BOARD,
    SAHPI_ENT_POWER_UNIT,
    SAHPI_ENT_POWER_MODULE,
    SAHPI_ENT_POWER_MGMNT,
    SAHPI_ENT_CHASSIS_BACK_PANEL_BOARD,
    SAHPI_ENT_SYSTEM_CHASSIS,
    SAHPI_ENT_SUB_CHASSIS,
    SAHPI_ENT_OTHER_CHASSIS_BOARD,
    SAHPI_ENT_DISK_DRIVE_BAY,
    SAHPI_ENT_PERIPHERAL_BAY_2,
    SAHPI_ENT_DEVICE_BAY,
    SAHPI_ENT_COOLING_DEVICE,
    SAHPI_ENT_COOLING_UNIT,
    SAHPI_ENT_INTERCONNECT,
    SAHPI_ENT_MEMORY_DEVICE,
    SAHPI_ENT_SYS_MGMNT_SOFTWARE,
    SAHPI_ENT_BIOS,
    SAHPI_ENT_OPERATING_SYSTEM,
    SAHPI_ENT_SYSTEM_BUS,
    SAHPI_ENT_GROUP,
    SAHPI_ENT_REMOTE,
    SAHPI_ENT_EXTERNAL_ENVIRONMENT,
    SAHPI_ENT_BATTERY,
    SAHPI_ENT_CHASSIS_SPECIFIC = SAHPI_ENT_IPMI_GROUP + 0x90,
    SAHPI_ENT_BOARD_SET_SPECIFIC = SAHPI_ENT_IPMI_GROUP + 0xB0,
    SAHPI_ENT_OEM_SYSINT_SPECIFIC = SAHPI_ENT_IPMI_GROUP + 0xD0,
    SAHPI_ENT_ROOT = SAHPI_ENT_ROOT_VALUE,
    SAHPI_ENT_RACK = SAHPI_ENT_SAFHPI_GROUP,
    SAHPI_ENT_SUBRACK,
    SAHPI_ENT_COMPACTPCI_CHASSIS,
    SAHPI_ENT_ADVANCEDTCA_CHASSIS,
    SAHPI_ENT_SYSTEM_SLOT,
    SAHPI_ENT_SBC_BLADE,
    SAHPI_ENT_IO_BLADE,
    SAHPI_ENT_DISK_BLADE,
    SAHPI_ENT_DISK_DRIVE,
    SAHPI_ENT_FAN,
    SAHPI_ENT_POWER_DISTRIBUTION_UNIT,
    SAHPI_ENT_SPEC_PROC_BLADE,
    SAHPI_ENT_IO_SUBBOARD,
    SAHPI_ENT_SBC_SUBBOARD,
    SAHPI_ENT_ALARM_MANAGER,
    SAHPI_ENT_ALARM_MANAGER_BLADE,
    SAHPI_ENT_SUBBOARD_CARRIER_BLADE
} SaHpiEntityTypeT;

typedef SaHpiUint32T SaHpiEntityInstanceT;

typedef struct {
    SaHpiEntityTypeT EntityType;
    SaHpiEntityInstanceT EntityInstance;
} SaHpiEntityT;

/*
 * An entity's location, most specific element first. A path shorter than
 * SAHPI_MAX_ENTITY_PATH ends with an element of type SAHPI_ENT_ROOT.
 */
#define SAHPI_MAX_ENTITY_PATH 16

typedef struct {
    SaHpiEntityT Entry[SAHPI_MAX_ENTITY_PATH];
} SaHpiEntityPathT;

/* ------------------------------------------------------------------------ */
/* Event categories and states                                              */
/* ------------------------------------------------------------------------ */

/* The category tells how to read the bits of an SaHpiEventStateT. */
typedef SaHpiUint8T SaHpiEventCategoryT;

#define SAHPI_EC_UNSPECIFIED ((SaHpiEventCategoryT)0x00)
#define SAHPI_EC_THRESHOLD ((SaHpiEventCategoryT)0x01)
#define SAHPI_EC_USAGE ((SaHpiEventCategoryT)0x02)
#define SAHPI_EC_STATE ((SaHpiEventCategoryT)0x03)
#define SAHPI_EC_PRED_FAIL ((SaHpiEventCategoryT)0x04)
#define SAHPI_EC_LIMIT ((SaHpiEventCategoryT)0x05)
#define SAHPI_EC_PERFORMANCE ((SaHpiEventCategoryT)0x06)
#define SAHPI_EC_SEVERITY ((SaHpiEventCategoryT)0x07)
#define SAHPI_EC_PRESENCE ((SaHpiEventCategoryT)0x08)
#define SAHPI_EC_ENABLE ((SaHpiEventCategoryT)0x09)
#define SAHPI_EC_AVAILABILITY ((SaHpiEventCategoryT)0x0A)
#define SAHPI_EC_REDUNDANCY ((SaHpiEventCategoryT)0x0B)
#define SAHPI_EC_USER ((SaHpiEventCategoryT)0x7E)
#define SAHPI_EC_GENERIC ((SaHpiEventCategoryT)0x7F)

/* Bit sets; the same bit means different things in different categories. */
typedef SaHpiUint16T SaHpiEventStateT;

#define SAHPI_ES_UNSPECIFIED ((SaHpiEventStateT)0x0000)

/* SAHPI_EC_THRESHOLD */
#define SAHPI_ES_LOWER_MINOR ((SaHpiEventStateT)0x0001)
#define SAHPI_ES_LOWER_MAJOR ((SaHpiEventStateT)0x0002)
#define SAHPI_ES_LOWER_CRIT ((SaHpiEventStateT)0x0004)
#define SAHPI_ES_UPPER_MINOR ((SaHpiEventStateT)0x0008)
#define SAHPI_ES_UPPER_MAJOR ((SaHpiEventStateT)0x0010)
#define SAHPI_ES_UPPER_CRIT ((SaHpiEventStateT)0x0020)

/* SAHPI_EC_USAGE */
#define SAHPI_ES_IDLE ((SaHpiEventStateT)0x0001)
#define SAHPI_ES_ACTIVE ((SaHpiEventStateT)0x0002)
#define SAHPI_ES_BUSY ((SaHpiEventStateT)0x0004)

/* SAHPI_EC_STATE */
#define SAHPI_ES_STATE_DEASSERTED ((SaHpiEventStateT)0x0001)
#define SAHPI_ES_STATE_ASSERTED ((SaHpiEventStateT)0x0002)

/* SAHPI_EC_PRED_FAIL */
#define SAHPI_ES_PRED_FAILURE_DEASSERT ((SaHpiEventStateT)0x0001)
#define SAHPI_ES_PRED_FAILURE_ASSERT ((SaHpiEventStateT)0x0002)

/* SAHPI_EC_LIMIT */
#define SAHPI_ES_LIMIT_NOT_EXCEEDED ((SaHpiEventStateT)0x0001)
#define SAHPI_ES_LIMIT_EXCEEDED ((SaHpiEventStateT)0x0002)

/* SAHPI_EC_PERFORMANCE */
#define SAHPI_ES_PERFORMANCE_MET ((SaHpiEventStateT)0x0001)
#define SAHPI_ES_PERFORMANCE_LAGS ((SaHpiEventStateT)0x0002)

/* SAHPI_EC_SEVERITY */
#define SAHPI_ES_OK ((SaHpiEventStateT)0x0001)
#define SAHPI_ES_MINOR_FROM_OK ((SaHpiEventStateT)0x0002)
#define SAHPI_ES_MAJOR_FROM_LESS ((SaHpiEventStateT)0x0004)
#define SAHPI_ES_CRITICAL_FROM_LESS ((SaHpiEventStateT)0x0008)
#define SAHPI_ES_MINOR_FROM_MORE ((SaHpiEventStateT)0x0010)
#define SAHPI_ES_MAJOR_FROM_CRITICAL ((SaHpiEventStateT)0x0020)
#define SAHPI_ES_CRITICAL ((SaHpiEventStateT)0x0040)
#define SAHPI_ES_MONITOR ((SaHpiEventStateT)0x0080)
#define SAHPI_ES_INFORMATIONAL ((SaHpiEventStateT)0x0100)

/* SAHPI_EC_PRESENCE */
#define SAHPI_ES_ABSENT ((SaHpiEventStateT)0x0001)
#define SAHPI_ES_PRESENT ((SaHpiEventStateT)0x0002)

/* SAHPI_EC_ENABLE */
#define SAHPI_ES_DISABLED ((SaHpiEventStateT)0x0001)
#define SAHPI_ES_ENABLED ((SaHpiEventStateT)0x0002)

/* SAHPI_EC_AVAILABILITY */
#define SAHPI_ES_RUNNING ((SaHpiEventStateT)0x0001)
#define SAHPI_ES_TEST ((SaHpiEventStateT)0x0002)
#define SAHPI_ES_POWER_OFF ((SaHpiEventStateT)0x0004)
#define SAHPI_ES_ON_LINE ((SaHpiEventStateT)0x0008)
#define SAHPI_ES_OFF_LINE ((SaHpiEventStateT)0x0010)
#define SAHPI_ES_OFF_DUTY ((SaHpiEventStateT)0x0020)
#define SAHPI_ES_DEGRADED ((SaHpiEventStateT)0x0040)
#define SAHPI_ES_POWER_SAVE ((SaHpiEventStateT)0x0080)
#define SAHPI_ES_INSTALL_ERROR ((SaHpiEventStateT)0x0100)

/* SAHPI_EC_REDUNDANCY */
#define SAHPI_ES_FULLY_REDUNDANT ((SaHpiEventStateT)0x0001)
#define SAHPI_ES_REDUNDANCY_LOST ((SaHpiEventStateT)0x0002)
#define SAHPI_ES_REDUNDANCY_DEGRADED ((SaHpiEventStateT)0x0004)
#define SAHPI_ES_REDUNDANCY_LOST_SUFFICIENT_RESOURCES ((SaHpiEventStateT)0x0008)
#define SAHPI_ES_NON_REDUNDANT_SUFFICIENT_RESOURCES ((SaHpiEventStateT)0x0010)
#define SAHPI_ES_NON_REDUNDANT_INSUFFICIENT_RESOURCES ((SaHpiEventStateT)0x0020)
#define SAHPI_ES_REDUNDANCY_DEGRADED_FROM_FULL ((SaHpiEventStateT)0x0040)
#define SAHPI_ES_REDUNDANCY_DEGRADED_FROM_NON ((SaHpiEventStateT)0x0080)

/* SAHPI_EC_GENERIC and SAHPI_EC_USER */
#define SAHPI_ES_STATE_00 ((SaHpiEventStateT)0x0001)
#define SAHPI_ES_STATE_01 ((SaHpiEventStateT)0x0002)
#define SAHPI_ES_STATE_02 ((SaHpiEventStateT)0x0004)
#define SAHPI_ES_STATE_03 ((SaHpiEventStateT)0x0008)
#define SAHPI_ES_STATE_04 ((SaHpiEventStateT)0x0010)
#define SAHPI_ES_STATE_05 ((SaHpiEventStateT)0x0020)
#define SAHPI_ES_STATE_06 ((SaHpiEventStateT)0x0040)
#define SAHPI_ES_STATE_07 ((SaHpiEventStateT)0x0080)
#define SAHPI_ES_STATE_08 ((SaHpiEventStateT)0x0100)
#define SAHPI_ES_STATE_09 ((SaHpiEventStateT)0x0200)
#define SAHPI_ES_STATE_10 ((SaHpiEventStateT)0x0400)
#define SAHPI_ES_STATE_11 ((SaHpiEventStateT)0x0800)
#define SAHPI_ES_STATE_12 ((SaHpiEventStateT)0x1000)
#define SAHPI_ES_STATE_13 ((SaHpiEventStateT)0x2000)
#define SAHPI_ES_STATE_14 ((SaHpiEventStateT)0x4000)

/* ------------------------------------------------------------------------ */
/* Sensors                                                                  */
/* ------------------------------------------------------------------------ */

typedef SaHpiUint8T SaHpiSensorNumT;

/* Numbers reserved for the aggregate sensors of a resource. */
#define SAHPI_DEFAGSENS_OPER ((SaHpiSensorNumT)0xFE)
#define SAHPI_DEFAGSENS_PWR ((SaHpiSensorNumT)0xFD)
#define SAHPI_DEFAGSENS_TEMP ((SaHpiSensorNumT)0xFC)

/* Sensor types follow the IPMI sensor type codes. */
typedef enum {
    SAHPI_TEMPERATURE = 0x01,
    SAHPI_VOLTAGE,
    SAHPI_CURRENT,
    SAHPI_FAN,
    SAHPI_PHYSICAL_SECURITY,
    SAHPI_PLATFORM_VIOLATION,
    SAHPI_PROCESSOR,
    SAHPI_POWER_SUPPLY,
    SAHPI_POWER_UNIT,
    SAHPI_COOLING_DEVICE,
    SAHPI_OTHER_UNITS_BASED_SENSOR,
    SAHPI_MEMORY,
    SAHPI_DRIVE_SLOT,
    SAHPI_POST_MEMORY_RESIZE,
    SAHPI_SYSTEM_FW_PROGRESS,
    SAHPI_EVENT_LOGGING_DISABLED,
    SAHPI_RESERVED1,
    SAHPI_SYSTEM_EVENT,
    SAHPI_CRITICAL_INTERRUPT,
    SAHPI_BUTTON,
    SAHPI_MODULE_BOARD,
    SAHPI_MICROCONTROLLER_COPROCESSOR,
    SAHPI_ADDIN_CARD,
    SAHPI_CHASSIS,
    SAHPI_CHIP_SET,
    SAHPI_OTHER_FRU,
    SAHPI_CABLE_INTERCONNECT,
    SAHPI_TERMINATOR,
    SAHPI_SYSTEM_BOOT_INITIATED,
    SAHPI_BOOT_ERROR,
    SAHPI_OS_BOOT,
    SAHPI_OS_CRITICAL_STOP,
    SAHPI_SLOT_CONNECTOR,
    SAHPI_SYSTEM_ACPI_POWER_STATE,
    SAHPI_RESERVED2,
    SAHPI_PLATFORM_ALERT,
    SAHPI_ENTITY_PRESENCE,
    SAHPI_MONITOR_ASIC_IC,
    SAHPI_LAN,
    SAHPI_MANAGEMENT_SUBSYSTEM_HEALTH,
    SAHPI_BATTERY,
    SAHPI_OPERATIONAL = 0xA0,
    SAHPI_OEM_SENSOR = 0xC0
} SaHpiSensorTypeT;

#define SAHPI_SENSOR_BUFFER_LENGTH 32

/* Selects the member of SaHpiSensorInterpretedUnionT that holds a reading. */
typedef enum {
    SAHPI_SENSOR_INTERPRETED_TYPE_UINT8,
    SAHPI_SENSOR_INTERPRETED_TYPE_UINT16,
    SAHPI_SENSOR_INTERPRETED_TYPE_UINT32,
    SAHPI_SENSOR_INTERPRETED_TYPE_INT8,
    SAHPI_SENSOR_INTERPRETED_TYPE_INT16,
    SAHPI_SENSOR_INTERPRETED_TYPE_INT32,
    SAHPI_SENSOR_INTERPRETED_TYPE_FLOAT32,
    SAHPI_SENSOR_INTERPRETED_TYPE_BUFFER /* 32 bytes of text or data */
} SaHpiSensorInterpretedTypeT;

typedef union {
    SaHpiUint8T SensorUint8;
    SaHpiUint16T SensorUint16;
    SaHpiUint32T SensorUint32;
    SaHpiInt8T SensorInt8;
    SaHpiInt16T SensorInt16;
    SaHpiInt32T SensorInt32;
    SaHpiFloat32T SensorFloat32;
    SaHpiUint8T SensorBuffer[SAHPI_SENSOR_BUFFER_LENGTH];
} SaHpiSensorInterpretedUnionT;

typedef struct {
    SaHpiSensorInterpretedTypeT Type;
    SaHpiSensorInterpretedUnionT Value;
} SaHpiSensorInterpretedT;

/* Sensor status bits, as reported with readings and event enables. */
typedef SaHpiUint8T SaHpiSensorStatusT;
#define SAHPI_SENSTAT_EVENTS_ENABLED ((SaHpiSensorStatusT)0x80)
#define SAHPI_SENSTAT_SCAN_ENABLED ((SaHpiSensorStatusT)0x40)
#define SAHPI_SENSTAT_BUSY ((SaHpiSensorStatusT)0x20)

typedef struct {
    SaHpiSensorStatusT SensorStatus;
    SaHpiEventStateT EventStatus;
} SaHpiSensorEvtStatusT;

typedef struct {
    SaHpiSensorStatusT SensorStatus;
    SaHpiEventStateT AssertEvents;
    SaHpiEventStateT DeassertEvents;
} SaHpiSensorEvtEnablesT;

/* Which parts of a reading are valid. */
typedef SaHpiUint8T SaHpiSensorReadingFormatsT;
#define SAHPI_SRF_RAW ((SaHpiSensorReadingFormatsT)0x01)
#define SAHPI_SRF_INTERPRETED ((SaHpiSensorReadingFormatsT)0x02)
#define SAHPI_SRF_EVENT_STATE ((SaHpiSensorReadingFormatsT)0x04)

typedef struct {
    SaHpiSensorReadingFormatsT ValuesPresent;
    SaHpiUint32T Raw;
    SaHpiSensorInterpretedT Interpreted;
    SaHpiSensorEvtStatusT EventStatus;
} SaHpiSensorReadingT;

typedef struct {
    SaHpiSensorReadingT LowCritical;
    SaHpiSensorReadingT LowMajor;
    SaHpiSensorReadingT LowMinor;
    SaHpiSensorReadingT UpCritical;
    SaHpiSensorReadingT UpMajor;
    SaHpiSensorReadingT UpMinor;
    SaHpiSensorReadingT PosThdHysteresis;
    SaHpiSensorReadingT NegThdHysteresis;
} SaHpiSensorThresholdsT;

/* Raw-to-interpreted conversion: y = L[(M*x + B*10^ExpB) * 10^ExpR]. */
typedef enum {
    SAHPI_SL_LINEAR = 0, /* the formula without a function */
    SAHPI_SL_LN,
    SAHPI_SL_LOG10,
    SAHPI_SL_LOG2,
    SAHPI_SL_E,
    SAHPI_SL_EXP10,
    SAHPI_SL_EXP2,
    SAHPI_SL_1OVERX,
    SAHPI_SL_SQRX,
    SAHPI_SL_CUBEX,
    SAHPI_SL_SQRTX,
    SAHPI_SL_CUBERTX,
    SAHPI_SL_NONLINEAR = 0x70, /* factors vary with the reading */
    SAHPI_SL_OEM,
    SAHPI_SL_UNSPECIFIED = 0xFF
} SaHpiSensorLinearizationT;

typedef struct {
    SaHpiInt16T M_Factor;        /* 10-bit signed multiplier */
    SaHpiInt16T B_Factor;        /* 10-bit signed offset */
    SaHpiUint16T AccuracyFactor; /* 10-bit unsigned, in 1/100 percent */
    SaHpiUint8T ToleranceFactor; /* 6-bit, in half raw counts */
    SaHpiUint8T ExpA;            /* 4-bit unsigned accuracy exponent */
    SaHpiInt8T ExpR;             /* 4-bit signed result exponent */
    SaHpiInt8T ExpB;             /* 4-bit signed B exponent */
    SaHpiSensorLinearizationT Linearization;
} SaHpiSensorFactorsT;

/* Which members of an SaHpiSensorRangeT are valid. */
typedef SaHpiUint8T SaHpiSensorRangeFlagsT;
#define SAHPI_SRF_MIN ((SaHpiSensorRangeFlagsT)0x10)
#define SAHPI_SRF_MAX ((SaHpiSensorRangeFlagsT)0x08)
#define SAHPI_SRF_NORMAL_MIN ((SaHpiSensorRangeFlagsT)0x04)
#define SAHPI_SRF_NORMAL_MAX ((SaHpiSensorRangeFlagsT)0x02)
#define SAHPI_SRF_NOMINAL ((SaHpiSensorRangeFlagsT)0x01)

typedef struct {
    SaHpiSensorRangeFlagsT Flags;
    SaHpiSensorReadingT Max;
    SaHpiSensorReadingT Min;
    SaHpiSensorReadingT Nominal;
    SaHpiSensorReadingT NormalMax;
    SaHpiSensorReadingT NormalMin;
} SaHpiSensorRangeT;

/* Units follow the IPMI unit codes. */
typedef enum {
    SAHPI_SU_UNSPECIFIED = 0,
    SAHPI_SU_DEGREES_C,
    SAHPI_SU_DEGREES_F,
    SAHPI_SU_DEGREES_K,
    SAHPI_SU_VOLTS,
    SAHPI_SU_AMPS,
    SAHPI_SU_WATTS,
    SAHPI_SU_JOULES,
    SAHPI_SU_COULOMBS,
    SAHPI_SU_VA,
    SAHPI_SU_NITS,
    SAHPI_SU_LUMEN,
    SAHPI_SU_LUX,
    SAHPI_SU_CANDELA,
    SAHPI_SU_KPA,
    SAHPI_SU_PSI,
    SAHPI_SU_NEWTON,
    SAHPI_SU_CFM,
    SAHPI_SU_RPM,
    SAHPI_SU_HZ,
    SAHPI_SU_MICROSECOND,
    SAHPI_SU_MILLISECOND,
    SAHPI_SU_SECOND,
    SAHPI_SU_MINUTE,
    SAHPI_SU_HOUR,
    SAHPI_SU_DAY,
    SAHPI_SU_WEEK,
    SAHPI_SU_MIL,
    SAHPI_SU_INCHES,
    SAHPI_SU_FEET,
    SAHPI_SU_CU_IN,
    SAHPI_SU_CU_FEET,
    SAHPI_SU_MM,
    SAHPI_SU_CM,
    SAHPI_SU_M,
    SAHPI_SU_CU_CM,
    SAHPI_SU_CU_M,
    SAHPI_SU_LITERS,
    SAHPI_SU_FLUID_OUNCE,
    SAHPI_SU_RADIANS,
    SAHPI_SU_STERADIANS,
    SAHPI_SU_REVOLUTIONS,
    SAHPI_SU_CYCLES,
    SAHPI_SU_GRAVITIES,
    SAHPI_SU_OUNCE,
    SAHPI_SU_POUND,
    SAHPI_SU_FT_LB,
    SAHPI_SU_OZ_IN,
    SAHPI_SU_GAUSS,
    SAHPI_SU_GILBERTS,
    SAHPI_SU_HENRY,
    SAHPI_SU_MILLIHENRY,
    SAHPI_SU_FARAD,
    SAHPI_SU_MICROFARAD,
    SAHPI_SU_OHMS,
    SAHPI_SU_SIEMENS,
    SAHPI_SU_MOLE,
    SAHPI_SU_BECQUEREL,
    SAHPI_SU_PPM,
    SAHPI_SU_RESERVED,
    SAHPI_SU_DECIBELS,
    SAHPI_SU_DBA,
    SAHPI_SU_DBC,
    SAHPI_SU_GRAY,
    SAHPI_SU_SIEVERT,
    SAHPI_SU_COLOR_TEMP_DEG_K,
    SAHPI_SU_BIT,
    SAHPI_SU_KILOBIT,
    SAHPI_SU_MEGABIT,
    SAHPI_SU_GIGABIT,
    SAHPI_SU_BYTE,
    SAHPI_SU_KILOBYTE,
    SAHPI_SU_MEGABYTE,
    SAHPI_SU_GIGABYTE,
    SAHPI_SU_WORD,
    SAHPI_SU_DWORD,
    SAHPI_SU_QWORD,
    SAHPI_SU_LINE,
    SAHPI_SU_HIT,
    SAHPI_SU_MISS,
    SAHPI_SU_RETRY,
    SAHPI_SU_RESET,
    SAHPI_SU_OVERRUN,
    SAHPI_SU_UNDERRUN,
    SAHPI_SU_COLLISION,
    SAHPI_SU_PACKETS,
    SAHPI_SU_MESSAGES,
    SAHPI_SU_CHARACTERS,
    SAHPI_SU_ERRORS,
    SAHPI_SU_CORRECTABLE_ERRORS,
    SAHPI_SU_UNCORRECTABLE_ERRORS
} SaHpiSensorUnitsT;

/* How ModifierUnits combine with BaseUnits. */
typedef enum {
    SAHPI_SMUU_NONE = 0,
    SAHPI_SMUU_BASIC_OVER_MODIFIER, /* base / modifier */
    SAHPI_SMUU_BASIC_TIMES_MODIFIER /* base * modifier */
} SaHpiSensorModUnitUseT;

/* Encoding of raw readings. */
typedef enum {
    SAHPI_SDF_UNSIGNED = 0,
    SAHPI_SDF_1S_COMPLEMENT,
    SAHPI_SDF_2S_COMPLEMENT
} SaHpiSensorSignFormatT;

typedef struct {
    SaHpiSensorReadingFormatsT ReadingFormats; /* formats the sensor reports */
    SaHpiBoolT IsNumeric;                      /* FALSE: the members below are unused */
    SaHpiSensorSignFormatT SignFormat;
    SaHpiSensorUnitsT BaseUnits;
    SaHpiSensorUnitsT ModifierUnits;
    SaHpiSensorModUnitUseT ModifierUse;
    SaHpiBoolT FactorsStatic; /* FALSE: Factors depend on the reading */
    SaHpiSensorFactorsT Factors;
    SaHpiBoolT Percentage; /* the value is a percentage */
    SaHpiSensorRangeT Range;
} SaHpiSensorDataFormatT;

/* Selects thresholds: readable, writable or fixed ones. */
typedef SaHpiUint8T SaHpiSensorThdMaskT;
#define SAHPI_STM_LOW_MINOR ((SaHpiSensorThdMaskT)0x01)
#define SAHPI_STM_LOW_MAJOR ((SaHpiSensorThdMaskT)0x02)
#define SAHPI_STM_LOW_CRIT ((SaHpiSensorThdMaskT)0x04)
#define SAHPI_STM_UP_MINOR ((SaHpiSensorThdMaskT)0x08)
#define SAHPI_STM_UP_MAJOR ((SaHpiSensorThdMaskT)0x10)
#define SAHPI_STM_UP_CRIT ((SaHpiSensorThdMaskT)0x20)
#define SAHPI_STM_UP_HYSTERESIS ((SaHpiSensorThdMaskT)0x40)
#define SAHPI_STM_LOW_HYSTERESIS ((SaHpiSensorThdMaskT)0x80)

/* In which forms thresholds can be read and written. */
typedef SaHpiUint8T SaHpiSensorThdCapT;
#define SAHPI_STC_RAW ((SaHpiSensorThdCapT)0x01)
#define SAHPI_STC_INTERPRETED ((SaHpiSensorThdCapT)0x02)

typedef struct {
    SaHpiBoolT IsThreshold; /* FALSE: the sensor has no thresholds */
    SaHpiSensorThdCapT TholdCapabilities;
    SaHpiSensorThdMaskT ReadThold;
    SaHpiSensorThdMaskT WriteThold;
    SaHpiSensorThdMaskT FixedThold;
} SaHpiSensorThdDefnT;

/* How far a sensor's events can be switched on and off. */
typedef enum {
    SAHPI_SEC_PER_EVENT = 0,  /* event by event */
    SAHPI_SEC_ENTIRE_SENSOR,  /* all of the sensor's events at once */
    SAHPI_SEC_GLOBAL_DISABLE, /* only through the sensor status */
    SAHPI_SEC_NO_EVENTS       /* the sensor creates no events */
} SaHpiSensorEventCtrlT;

typedef struct {
    SaHpiSensorNumT Num;
    SaHpiSensorTypeT Type;
    SaHpiEventCategoryT Category;
    SaHpiSensorEventCtrlT EventCtrl;
    SaHpiEventStateT Events; /* states this sensor can report */
    SaHpiBoolT Ignore;       /* TRUE: the sensor is to be ignored */
    SaHpiSensorDataFormatT DataFormat;
    SaHpiSensorThdDefnT ThresholdDefn;
    SaHpiUint32T Oem;
} SaHpiSensorRecT;

/* ------------------------------------------------------------------------ */
/* Controls                                                                 */
/* ------------------------------------------------------------------------ */

typedef SaHpiUint8T SaHpiCtrlNumT;

typedef enum {
    SAHPI_CTRL_TYPE_DIGITAL = 0x00,
    SAHPI_CTRL_TYPE_DISCRETE = 0x01,
    SAHPI_CTRL_TYPE_ANALOG = 0x02,
    SAHPI_CTRL_TYPE_STREAM = 0x03,
    SAHPI_CTRL_TYPE_TEXT = 0x04,
    SAHPI_CTRL_TYPE_OEM = 0xC0
} SaHpiCtrlTypeT;

typedef enum {
    SAHPI_CTRL_STATE_OFF = 0,
    SAHPI_CTRL_STATE_ON,
    SAHPI_CTRL_STATE_PULSE_OFF,
    SAHPI_CTRL_STATE_PULSE_ON,
    SAHPI_CTRL_STATE_AUTO = 0xFF /* the control manages itself */
} SaHpiCtrlStateDigitalT;

typedef SaHpiUint32T SaHpiCtrlStateDiscreteT;

typedef SaHpiInt32T SaHpiCtrlStateAnalogT;

#define SAHPI_CTRL_MAX_STREAM_LENGTH 4

typedef struct {
    SaHpiBoolT Repeat; /* repeat the stream until told otherwise */
    SaHpiUint32T StreamLength;
    SaHpiUint8T Stream[SAHPI_CTRL_MAX_STREAM_LENGTH];
} SaHpiCtrlStateStreamT;

/* Text controls are written line by line, or all lines at once. */
typedef SaHpiUint8T SaHpiTxtLineNumT;
#define SAHPI_TLN_ALL_LINES ((SaHpiTxtLineNumT)0xFF)

typedef struct {
    SaHpiTxtLineNumT Line;
    SaHpiTextBufferT Text;
} SaHpiCtrlStateTextT;

#define SAHPI_CTRL_MAX_OEM_BODY_LENGTH 255

typedef struct {
    SaHpiManufacturerIdT MId;
    SaHpiUint8T BodyLength;
    SaHpiUint8T Body[SAHPI_CTRL_MAX_OEM_BODY_LENGTH];
} SaHpiCtrlStateOemT;

typedef union {
    SaHpiCtrlStateDigitalT Digital;
    SaHpiCtrlStateDiscreteT Discrete;
    SaHpiCtrlStateAnalogT Analog;
    SaHpiCtrlStateStreamT Stream;
    SaHpiCtrlStateTextT Text;
    SaHpiCtrlStateOemT Oem;
} SaHpiCtrlStateUnionT;

typedef struct {
    SaHpiCtrlTypeT Type; /* selects the member of StateUnion */
    SaHpiCtrlStateUnionT StateUnion;
} SaHpiCtrlStateT;

/* What the control drives. */
typedef enum {
    SAHPI_CTRL_GENERIC = 0,
    SAHPI_CTRL_LED,
    SAHPI_CTRL_FAN_SPEED,
    SAHPI_CTRL_DRY_CONTACT_CLOSURE,
    SAHPI_CTRL_POWER_SUPPLY_INHIBIT,
    SAHPI_CTRL_AUDIBLE,
    SAHPI_CTRL_FRONT_PANEL_LOCKOUT,
    SAHPI_CTRL_POWER_INTERLOCK,
    SAHPI_CTRL_POWER_STATE,
    SAHPI_CTRL_LCD_DISPLAY,
    SAHPI_CTRL_OEM
} SaHpiCtrlOutputTypeT;

typedef struct {
    SaHpiCtrlStateDigitalT Default;
} SaHpiCtrlRecDigitalT;

typedef struct {
    SaHpiCtrlStateDiscreteT Default;
} SaHpiCtrlRecDiscreteT;

typedef struct {
    SaHpiCtrlStateAnalogT Min;
    SaHpiCtrlStateAnalogT Max;
    SaHpiCtrlStateAnalogT Default;
} SaHpiCtrlRecAnalogT;

typedef struct {
    SaHpiCtrlStateStreamT Default;
} SaHpiCtrlRecStreamT;

typedef struct {
    SaHpiUint8T MaxChars; /* characters per line */
    SaHpiUint8T MaxLines;
    SaHpiLanguageT Language;
    SaHpiTextTypeT DataType;
    SaHpiCtrlStateTextT Default;
} SaHpiCtrlRecTextT;

#define SAHPI_CTRL_OEM_CONFIG_LENGTH 10

typedef struct {
    SaHpiManufacturerIdT MId;
    SaHpiUint8T ConfigData[SAHPI_CTRL_OEM_CONFIG_LENGTH];
    SaHpiCtrlStateOemT Default;
} SaHpiCtrlRecOemT;

typedef union {
    SaHpiCtrlRecDigitalT Digital;
    SaHpiCtrlRecDiscreteT Discrete;
    SaHpiCtrlRecAnalogT Analog;
    SaHpiCtrlRecStreamT Stream;
    SaHpiCtrlRecTextT Text;
    SaHpiCtrlRecOemT Oem;
} SaHpiCtrlRecUnionT;

typedef struct {
    SaHpiCtrlNumT Num;
    SaHpiBoolT Ignore; /* TRUE: the control is to be ignored */
    SaHpiCtrlOutputTypeT OutputType;
    SaHpiCtrlTypeT Type; /* selects the member of TypeUnion */
    SaHpiCtrlRecUnionT TypeUnion;
    SaHpiUint32T Oem;
} SaHpiCtrlRecT;

/* ------------------------------------------------------------------------ */
/* Inventory data                                                           */
/* ------------------------------------------------------------------------ */

/* Entity inventory repository of a resource. */
typedef SaHpiUint8T SaHpiEirIdT;
#define SAHPI_DEFAULT_INVENTORY_ID ((SaHpiEirIdT)0x00)

typedef enum {
    SAHPI_INVENT_DATA_VALID,
    SAHPI_INVENT_DATA_INVALID,
    SAHPI_INVENT_DATA_OVERFLOW /* the data did not fit the caller's buffer */
} SaHpiInventDataValidityT;

/* Record types follow the IPMI FRU information areas. */
typedef enum {
    SAHPI_INVENT_RECTYPE_INTERNAL_USE = 0xB0,
    SAHPI_INVENT_RECTYPE_CHASSIS_INFO = 0xB1,
    SAHPI_INVENT_RECTYPE_BOARD_INFO = 0xB2,
    SAHPI_INVENT_RECTYPE_PRODUCT_INFO = 0xB3,
    SAHPI_INVENT_RECTYPE_OEM = 0xC0
} SaHpiInventDataRecordTypeT;

/* Chassis types follow the SMBIOS chassis codes. */
typedef enum {
    SAHPI_INVENT_CTYP_OTHER = 1,
    SAHPI_INVENT_CTYP_UNKNOWN,
    SAHPI_INVENT_CTYP_DESKTOP,
    SAHPI_INVENT_CTYP_LOW_PROFILE_DESKTOP,
    SAHPI_INVENT_CTYP_PIZZA_BOX,
    SAHPI_INVENT_CTYP_MINI_TOWER,
    SAHPI_INVENT_CTYP_TOWER,
    SAHPI_INVENT_CTYP_PORTABLE,
    SAHPI_INVENT_CTYP_LAPTOP,
    SAHPI_INVENT_CTYP_NOTEBOOK,
    SAHPI_INVENT_CTYP_HANDHELD,
    SAHPI_INVENT_CTYP_DOCKING_STATION,
    SAHPI_INVENT_CTYP_ALLINONE,
    SAHPI_INVENT_CTYP_SUBNOTEBOOK,
    SAHPI_INVENT_CTYP_SPACE_SAVING,
    SAHPI_INVENT_CTYP_LUNCH_BOX,
    SAHPI_INVENT_CTYP_MAIN_SERVER,
    SAHPI_INVENT_CTYP_EXPANSION,
    SAHPI_INVENT_CTYP_SUBCHASSIS,
    SAHPI_INVENT_CTYP_BUS_EXPANSION_CHASSIS,
    SAHPI_INVENT_CTYP_PERIPHERAL_CHASSIS,
    SAHPI_INVENT_CTYP_RAID_CHASSIS,
    SAHPI_INVENT_CTYP_RACKMOUNT
} SaHpiInventChassisTypeT;

/*
 * The one-element arrays below are variable-length tails: the record's
 * DataLength, or the NULL that ends a pointer list, tells how far they
 * really reach into the caller's buffer.
 */
typedef struct {
    SaHpiUint8T Data[1];
} SaHpiInventInternalUseDataT;

/*
 * Chassis, board and product areas. The text pointers point into the same
 * buffer that the whole inventory was read into; CustomField is a
 * NULL-terminated list of pointers.
 */
typedef struct {
    SaHpiTimeT MfgDateTime; /* SAHPI_TIME_UNSPECIFIED when not known */
    SaHpiTextBufferT *Manufacturer;
    SaHpiTextBufferT *ProductName;
    SaHpiTextBufferT *ProductVersion;
    SaHpiTextBufferT *ModelNumber;
    SaHpiTextBufferT *SerialNumber;
    SaHpiTextBufferT *PartNumber;
    SaHpiTextBufferT *FileId;
    SaHpiTextBufferT *AssetTag;
    SaHpiTextBufferT *CustomField[1];
} SaHpiInventGeneralDataT;

typedef struct {
    SaHpiInventChassisTypeT Type;
    SaHpiInventGeneralDataT GeneralData;
} SaHpiInventChassisDataT;

typedef struct {
    SaHpiManufacturerIdT MId;
    SaHpiUint8T Data[1];
} SaHpiInventOemDataT;

typedef union {
    SaHpiInventInternalUseDataT InternalUse;
    SaHpiInventChassisDataT ChassisInfo;
    SaHpiInventGeneralDataT BoardInfo;
    SaHpiInventGeneralDataT ProductInfo;
    SaHpiInventOemDataT OemData;
} SaHpiInventDataUnionT;

typedef struct {
    SaHpiInventDataRecordTypeT RecordType; /* selects the member of RecordData */
    SaHpiUint32T DataLength;
    SaHpiInventDataUnionT RecordData;
} SaHpiInventDataRecordT;

/* DataRecords is a NULL-terminated list of pointers into the same buffer. */
typedef struct {
    SaHpiInventDataValidityT Validity;
    SaHpiInventDataRecordT *DataRecords[1];
} SaHpiInventoryDataT;

typedef struct {
    SaHpiEirIdT EirId;
    SaHpiUint32T Oem;
} SaHpiInventoryRecT;

/* ------------------------------------------------------------------------ */
/* Watchdog timers                                                          */
/* ------------------------------------------------------------------------ */

typedef SaHpiUint8T SaHpiWatchdogNumT;
#define SAHPI_DEFAULT_WATCHDOG_NUM ((SaHpiWatchdogNumT)0x00)

/* What the timer does when it expires. */
typedef enum {
    SAHPI_WA_NO_ACTION = 0,
    SAHPI_WA_RESET,
    SAHPI_WA_POWER_DOWN,
    SAHPI_WA_POWER_CYCLE
} SaHpiWatchdogActionT;

/* What a watchdog event reports that the timer did. */
typedef enum {
    SAHPI_WAE_NO_ACTION = 0,
    SAHPI_WAE_RESET,
    SAHPI_WAE_POWER_DOWN,
    SAHPI_WAE_POWER_CYCLE,
    SAHPI_WAE_TIMER_INT = 0x08 /* the pre-timeout interrupt fired */
} SaHpiWatchdogActionEventT;

typedef enum {
    SAHPI_WPI_NONE = 0,
    SAHPI_WPI_SMI,
    SAHPI_WPI_NMI,
    SAHPI_WPI_MESSAGE_INTERRUPT,
    SAHPI_WPI_OEM = 0x0F
} SaHpiWatchdogPretimerInterruptT;

/* Who is using the timer. */
typedef enum {
    SAHPI_WTU_NONE = 0,
    SAHPI_WTU_BIOS_FRB2,
    SAHPI_WTU_BIOS_POST,
    SAHPI_WTU_OS_LOAD,
    SAHPI_WTU_SMS_OS,
    SAHPI_WTU_OEM,
    SAHPI_WTU_UNSPECIFIED = 0x0F
} SaHpiWatchdogTimerUseT;

/* Expiration flags per timer use; written to clear them. */
typedef SaHpiUint8T SaHpiWatchdogExpFlagsT;
#define SAHPI_WATCHDOG_EXP_BIOS_FRB2 ((SaHpiWatchdogExpFlagsT)0x02)
#define SAHPI_WATCHDOG_EXP_BIOS_POST ((SaHpiWatchdogExpFlagsT)0x04)
#define SAHPI_WATCHDOG_EXP_OS_LOAD ((SaHpiWatchdogExpFlagsT)0x08)
#define SAHPI_WATCHDOG_EXP_SMS_OS ((SaHpiWatchdogExpFlagsT)0x10)
#define SAHPI_WATCHDOG_EXP_OEM ((SaHpiWatchdogExpFlagsT)0x20)

/* Intervals and counts are in milliseconds. */
typedef struct {
    SaHpiBoolT Log;
    SaHpiBoolT Running;
    SaHpiWatchdogTimerUseT TimerUse;
    SaHpiWatchdogActionT TimerAction;
    SaHpiWatchdogPretimerInterruptT PretimerInterrupt;
    SaHpiUint32T PreTimeoutInterval;
    SaHpiWatchdogExpFlagsT TimerUseExpFlags;
    SaHpiUint32T InitialCount;
    SaHpiUint32T PresentCount; /* read only */
} SaHpiWatchdogT;

typedef struct {
    SaHpiWatchdogNumT WatchdogNum;
    SaHpiUint32T Oem;
} SaHpiWatchdogRecT;

/* ------------------------------------------------------------------------ */
/* Resource data records                                                    */
/* ------------------------------------------------------------------------ */

typedef enum {
    SAHPI_NO_RECORD,
    SAHPI_CTRL_RDR,
    SAHPI_SENSOR_RDR,
    SAHPI_INVENTORY_RDR,
    SAHPI_WATCHDOG_RDR
} SaHpiRdrTypeT;

typedef union {
    SaHpiCtrlRecT CtrlRec;
    SaHpiSensorRecT SensorRec;
    SaHpiInventoryRecT InventoryRec;
    SaHpiWatchdogRecT WatchdogRec;
} SaHpiRdrTypeUnionT;

typedef struct {
    SaHpiEntryIdT RecordId;
    SaHpiRdrTypeT RdrType; /* selects the member of RdrTypeUnion */
    SaHpiEntityPathT Entity;
    SaHpiRdrTypeUnionT RdrTypeUnion;
    SaHpiTextBufferT IdString;
} SaHpiRdrT;

/* ------------------------------------------------------------------------ */
/* Hot swap                                                                 */
/* ------------------------------------------------------------------------ */

typedef enum { SAHPI_HS_POWER_OFF = 0, SAHPI_HS_POWER_ON, SAHPI_HS_POWER_CYCLE } SaHpiHsPowerStateT;

typedef enum { SAHPI_HS_INDICATOR_OFF = 0, SAHPI_HS_INDICATOR_ON } SaHpiHsIndicatorStateT;

typedef enum { SAHPI_HS_ACTION_INSERTION = 0, SAHPI_HS_ACTION_EXTRACTION } SaHpiHsActionT;

typedef enum {
    SAHPI_HS_STATE_INACTIVE = 0,
    SAHPI_HS_STATE_INSERTION_PENDING,
    SAHPI_HS_STATE_ACTIVE_HEALTHY,
    SAHPI_HS_STATE_ACTIVE_UNHEALTHY,
    SAHPI_HS_STATE_EXTRACTION_PENDING,
    SAHPI_HS_STATE_NOT_PRESENT
} SaHpiHsStateT;

/* ------------------------------------------------------------------------ */
/* Events                                                                   */
/* ------------------------------------------------------------------------ */

/* Severities of events and resources; lower values are more severe. */
typedef enum {
    SAHPI_CRITICAL = 0,
    SAHPI_MAJOR,
    SAHPI_MINOR,
    SAHPI_INFORMATIONAL,
    SAHPI_OK,
    SAHPI_DEBUG = 0xF0
} SaHpiSeverityT;

/* Which optional members of a sensor event carry data. */
typedef SaHpiUint8T SaHpiSensorOptionalDataT;
#define SAHPI_SOD_TRIGGER_READING ((SaHpiSensorOptionalDataT)0x01)
#define SAHPI_SOD_TRIGGER_THRESHOLD ((SaHpiSensorOptionalDataT)0x02)
#define SAHPI_SOD_OEM ((SaHpiSensorOptionalDataT)0x04)
#define SAHPI_SOD_PREVIOUS_STATE ((SaHpiSensorOptionalDataT)0x08)
#define SAHPI_SOD_SENSOR_SPECIFIC ((SaHpiSensorOptionalDataT)0x10)

typedef struct {
    SaHpiSensorNumT SensorNum;
    SaHpiSensorTypeT SensorType;
    SaHpiEventCategoryT EventCategory;
    SaHpiBoolT Assertion; /* TRUE: EventState was asserted; FALSE: deasserted */
    SaHpiEventStateT EventState;
    SaHpiSensorOptionalDataT OptionalDataPresent;
    SaHpiSensorReadingT TriggerReading;
    SaHpiSensorReadingT TriggerThreshold;
    SaHpiEventStateT PreviousState;
    SaHpiUint32T Oem;
    SaHpiUint32T SensorSpecific;
} SaHpiSensorEventT;

typedef struct {
    SaHpiHsStateT HotSwapState;
    SaHpiHsStateT PreviousHotSwapState;
} SaHpiHotSwapEventT;

typedef struct {
    SaHpiWatchdogNumT WatchdogNum;
    SaHpiWatchdogActionEventT WatchdogAction;
    SaHpiWatchdogPretimerInterruptT WatchdogPreTimerAction;
    SaHpiWatchdogTimerUseT WatchdogUse;
} SaHpiWatchdogEventT;

#define SAHPI_OEM_EVENT_DATA_SIZE 32

typedef struct {
    SaHpiManufacturerIdT MId;
    SaHpiUint8T OemEventData[SAHPI_OEM_EVENT_DATA_SIZE];
} SaHpiOemEventT;

#define SAHPI_USER_EVENT_DATA_SIZE 32

/* Events that clients add to an event log themselves. */
typedef struct {
    SaHpiUint8T UserEventData[SAHPI_USER_EVENT_DATA_SIZE];
} SaHpiUserEventT;

typedef enum {
    SAHPI_ET_SENSOR,
    SAHPI_ET_HOTSWAP,
    SAHPI_ET_WATCHDOG,
    SAHPI_ET_OEM,
    SAHPI_ET_USER
} SaHpiEventTypeT;

typedef union {
    SaHpiSensorEventT SensorEvent;
    SaHpiHotSwapEventT HotSwapEvent;
    SaHpiWatchdogEventT WatchdogEvent;
    SaHpiOemEventT OemEvent;
    SaHpiUserEventT UserEvent;
} SaHpiEventUnionT;

typedef struct {
    SaHpiResourceIdT Source;
    SaHpiEventTypeT EventType; /* selects the member of EventDataUnion */
    SaHpiTimeT Timestamp;
    SaHpiSeverityT Severity;
    SaHpiEventUnionT EventDataUnion;
} SaHpiEventT;

/* ------------------------------------------------------------------------ */
/* Parameter control and reset                                              */
/* ------------------------------------------------------------------------ */

typedef enum {
    SAHPI_DEFAULT_PARM = 0, /* back to the manufacturer's defaults */
    SAHPI_SAVE_PARM,        /* keep the current settings across restarts */
    SAHPI_RESTORE_PARM      /* go back to the last saved settings */
} SaHpiParmActionT;

typedef enum {
    SAHPI_COLD_RESET = 0,
    SAHPI_WARM_RESET,
    SAHPI_RESET_ASSERT,  /* hold the resource in reset */
    SAHPI_RESET_DEASSERT /* let it run again */
} SaHpiResetActionT;

/* ------------------------------------------------------------------------ */
/* Resource presence table                                                  */
/* ------------------------------------------------------------------------ */

/* UpdateCount changes whenever the table does, so a walk can tell it raced. */
typedef struct {
    SaHpiUint32T UpdateCount;
    SaHpiTimeT UpdateTimestamp;
} SaHpiRptInfoT;

/* Mirrors the IPMI Get Device ID answer. */
typedef struct {
    SaHpiUint8T ResourceRev;
    SaHpiUint8T SpecificVer;
    SaHpiUint8T DeviceSupport;
    SaHpiManufacturerIdT ManufacturerId;
    SaHpiUint16T ProductId;
    SaHpiUint8T FirmwareMajorRev;
    SaHpiUint8T FirmwareMinorRev;
    SaHpiUint8T AuxFirmwareRev;
} SaHpiResourceInfoT;

typedef SaHpiUint32T SaHpiCapabilitiesT;
#define SAHPI_CAPABILITY_DOMAIN ((SaHpiCapabilitiesT)0x80000000)
#define SAHPI_CAPABILITY_RESOURCE ((SaHpiCapabilitiesT)0x40000000)
#define SAHPI_CAPABILITY_EVT_DEASSERTS ((SaHpiCapabilitiesT)0x00008000)
#define SAHPI_CAPABILITY_AGGREGATE_STATUS ((SaHpiCapabilitiesT)0x00002000)
#define SAHPI_CAPABILITY_CONFIGURATION ((SaHpiCapabilitiesT)0x00001000)
#define SAHPI_CAPABILITY_MANAGED_HOTSWAP ((SaHpiCapabilitiesT)0x00000800)
#define SAHPI_CAPABILITY_WATCHDOG ((SaHpiCapabilitiesT)0x00000400)
#define SAHPI_CAPABILITY_CONTROL ((SaHpiCapabilitiesT)0x00000200)
#define SAHPI_CAPABILITY_FRU ((SaHpiCapabilitiesT)0x00000100)
#define SAHPI_CAPABILITY_INVENTORY_DATA ((SaHpiCapabilitiesT)0x00000008)
#define SAHPI_CAPABILITY_SEL ((SaHpiCapabilitiesT)0x00000004)
#define SAHPI_CAPABILITY_RDR ((SaHpiCapabilitiesT)0x00000002)
#define SAHPI_CAPABILITY_SENSOR ((SaHpiCapabilitiesT)0x00000001)

typedef struct {
    SaHpiEntryIdT EntryId;
    SaHpiResourceIdT ResourceId;
    SaHpiResourceInfoT ResourceInfo;
    SaHpiEntityPathT ResourceEntity;
    SaHpiCapabilitiesT ResourceCapabilities;
    SaHpiSeverityT ResourceSeverity;
    SaHpiDomainIdT DomainId; /* the domain this resource belongs to */
    SaHpiTextBufferT ResourceTag;
} SaHpiRptEntryT;

/* ------------------------------------------------------------------------ */
/* System event log                                                         */
/* ------------------------------------------------------------------------ */

/* What a full event log does with a new entry. */
typedef enum {
    SAHPI_SEL_OVERFLOW_DROP,     /* drop the new entry */
    SAHPI_SEL_OVERFLOW_WRAP,     /* overwrite the oldest entry */
    SAHPI_SEL_OVERFLOW_WRITELAST /* overwrite the newest entry */
} SaHpiSelOverflowActionT;

typedef struct {
    SaHpiUint32T Entries;
    SaHpiUint32T Size; /* capacity in entries */
    SaHpiTimeT UpdateTimestamp;
    SaHpiTimeT CurrentTime;
    SaHpiBoolT Enabled;
    SaHpiBoolT OverflowFlag;
    SaHpiSelOverflowActionT OverflowAction;
    SaHpiBoolT DeleteEntrySupported;
} SaHpiSelInfoT;

/* Cursor of the event-log walk, oldest to newest or back. */
typedef SaHpiUint32T SaHpiSelEntryIdT;
#define SAHPI_OLDEST_ENTRY ((SaHpiSelEntryIdT)0x00000000)
#define SAHPI_NEWEST_ENTRY ((SaHpiSelEntryIdT)0xFFFFFFFF)
#define SAHPI_NO_MORE_ENTRIES ((SaHpiSelEntryIdT)0xFFFFFFFE)

typedef struct {
    SaHpiSelEntryIdT EntryId;
    SaHpiTimeT Timestamp;
    SaHpiEventT Event;
} SaHpiSelEntryT;

/* ------------------------------------------------------------------------ */
/* Entry points                                                             */
/* ------------------------------------------------------------------------ */

/* One parameter a line, as the published interface lists them. */
/* clang-format off */

/* Library and sessions */

SaErrorT SAHPI_API saHpiInitialize(SAHPI_OUT SaHpiVersionT *HpiImplVersion) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiFinalize(void) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiSessionOpen(SAHPI_IN SaHpiDomainIdT DomainId,
                                    SAHPI_OUT SaHpiSessionIdT *SessionId,
                                    SAHPI_IN void *SecurityParams) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiSessionClose(SAHPI_IN SaHpiSessionIdT SessionId) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiResourcesDiscover(SAHPI_IN SaHpiSessionIdT SessionId) KVI_NOEXCEPT;

/* Resource presence table */

SaErrorT SAHPI_API saHpiRptInfoGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                   SAHPI_OUT SaHpiRptInfoT *RptInfo) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiRptEntryGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                    SAHPI_IN SaHpiEntryIdT EntryId,
                                    SAHPI_OUT SaHpiEntryIdT *NextEntryId,
                                    SAHPI_OUT SaHpiRptEntryT *RptEntry) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiRptEntryGetByResourceId(SAHPI_IN SaHpiSessionIdT SessionId,
                                                SAHPI_IN SaHpiResourceIdT ResourceId,
                                                SAHPI_OUT SaHpiRptEntryT *RptEntry)
    KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiResourceSeveritySet(SAHPI_IN SaHpiSessionIdT SessionId,
                                            SAHPI_IN SaHpiResourceIdT ResourceId,
                                            SAHPI_IN SaHpiSeverityT Severity) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiResourceTagSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                       SAHPI_IN SaHpiResourceIdT ResourceId,
                                       SAHPI_IN SaHpiTextBufferT *ResourceTag) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiResourceIdGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                      SAHPI_OUT SaHpiResourceIdT *ResourceId) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiEntitySchemaGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                        SAHPI_OUT SaHpiUint32T *SchemaId) KVI_NOEXCEPT;

/* System event log */

SaErrorT SAHPI_API saHpiEventLogInfoGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                        SAHPI_IN SaHpiResourceIdT ResourceId,
                                        SAHPI_OUT SaHpiSelInfoT *Info) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiEventLogEntryGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                         SAHPI_IN SaHpiResourceIdT ResourceId,
                                         SAHPI_IN SaHpiSelEntryIdT EntryId,
                                         SAHPI_OUT SaHpiSelEntryIdT *PrevEntryId,
                                         SAHPI_OUT SaHpiSelEntryIdT *NextEntryId,
                                         SAHPI_OUT SaHpiSelEntryT *EventLogEntry,
                                         SAHPI_INOUT SaHpiRdrT *Rdr,
                                         SAHPI_INOUT SaHpiRptEntryT *RptEntry) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiEventLogEntryAdd(SAHPI_IN SaHpiSessionIdT SessionId,
                                         SAHPI_IN SaHpiResourceIdT ResourceId,
                                         SAHPI_IN SaHpiSelEntryT *EvtEntry) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiEventLogEntryDelete(SAHPI_IN SaHpiSessionIdT SessionId,
                                            SAHPI_IN SaHpiResourceIdT ResourceId,
                                            SAHPI_IN SaHpiSelEntryIdT EntryId) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiEventLogClear(SAHPI_IN SaHpiSessionIdT SessionId,
                                      SAHPI_IN SaHpiResourceIdT ResourceId) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiEventLogTimeGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                        SAHPI_IN SaHpiResourceIdT ResourceId,
                                        SAHPI_OUT SaHpiTimeT *Time) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiEventLogTimeSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                        SAHPI_IN SaHpiResourceIdT ResourceId,
                                        SAHPI_IN SaHpiTimeT Time) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiEventLogStateGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                         SAHPI_IN SaHpiResourceIdT ResourceId,
                                         SAHPI_OUT SaHpiBoolT *Enable) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiEventLogStateSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                         SAHPI_IN SaHpiResourceIdT ResourceId,
                                         SAHPI_IN SaHpiBoolT Enable) KVI_NOEXCEPT;

/* Events */

SaErrorT SAHPI_API saHpiSubscribe(SAHPI_IN SaHpiSessionIdT SessionId,
                                  SAHPI_IN SaHpiBoolT ProvideActiveAlarms) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiUnsubscribe(SAHPI_IN SaHpiSessionIdT SessionId) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiEventGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                 SAHPI_IN SaHpiTimeoutT Timeout,
                                 SAHPI_OUT SaHpiEventT *Event,
                                 SAHPI_INOUT SaHpiRdrT *Rdr,
                                 SAHPI_INOUT SaHpiRptEntryT *RptEntry) KVI_NOEXCEPT;

/* Resource data records */

SaErrorT SAHPI_API saHpiRdrGet(SAHPI_IN SaHpiSessionIdT SessionId,
                               SAHPI_IN SaHpiResourceIdT ResourceId,
                               SAHPI_IN SaHpiEntryIdT EntryId,
                               SAHPI_OUT SaHpiEntryIdT *NextEntryId,
                               SAHPI_OUT SaHpiRdrT *Rdr) KVI_NOEXCEPT;

/* Sensors */

SaErrorT SAHPI_API saHpiSensorReadingGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                         SAHPI_IN SaHpiResourceIdT ResourceId,
                                         SAHPI_IN SaHpiSensorNumT SensorNum,
                                         SAHPI_OUT SaHpiSensorReadingT *Reading) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiSensorReadingConvert(SAHPI_IN SaHpiSessionIdT SessionId,
                                             SAHPI_IN SaHpiResourceIdT ResourceId,
                                             SAHPI_IN SaHpiSensorNumT SensorNum,
                                             SAHPI_IN SaHpiSensorReadingT *ReadingInput,
                                             SAHPI_OUT SaHpiSensorReadingT *ConvertedReading)
    KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiSensorThresholdsGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                            SAHPI_IN SaHpiResourceIdT ResourceId,
                                            SAHPI_IN SaHpiSensorNumT SensorNum,
                                            SAHPI_OUT SaHpiSensorThresholdsT *SensorThresholds)
    KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiSensorThresholdsSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                            SAHPI_IN SaHpiResourceIdT ResourceId,
                                            SAHPI_IN SaHpiSensorNumT SensorNum,
                                            SAHPI_IN SaHpiSensorThresholdsT *SensorThresholds)
    KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiSensorTypeGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                      SAHPI_IN SaHpiResourceIdT ResourceId,
                                      SAHPI_IN SaHpiSensorNumT SensorNum,
                                      SAHPI_OUT SaHpiSensorTypeT *Type,
                                      SAHPI_OUT SaHpiEventCategoryT *Category) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiSensorEventEnablesGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                              SAHPI_IN SaHpiResourceIdT ResourceId,
                                              SAHPI_IN SaHpiSensorNumT SensorNum,
                                              SAHPI_OUT SaHpiSensorEvtEnablesT *Enables)
    KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiSensorEventEnablesSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                              SAHPI_IN SaHpiResourceIdT ResourceId,
                                              SAHPI_IN SaHpiSensorNumT SensorNum,
                                              SAHPI_IN SaHpiSensorEvtEnablesT *Enables)
    KVI_NOEXCEPT;

/* Controls */

SaErrorT SAHPI_API saHpiControlTypeGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                       SAHPI_IN SaHpiResourceIdT ResourceId,
                                       SAHPI_IN SaHpiCtrlNumT CtrlNum,
                                       SAHPI_OUT SaHpiCtrlTypeT *Type) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiControlStateGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                        SAHPI_IN SaHpiResourceIdT ResourceId,
                                        SAHPI_IN SaHpiCtrlNumT CtrlNum,
                                        SAHPI_INOUT SaHpiCtrlStateT *CtrlState) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiControlStateSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                        SAHPI_IN SaHpiResourceIdT ResourceId,
                                        SAHPI_IN SaHpiCtrlNumT CtrlNum,
                                        SAHPI_IN SaHpiCtrlStateT *CtrlState) KVI_NOEXCEPT;

/* Inventory data */

SaErrorT SAHPI_API saHpiEntityInventoryDataRead(SAHPI_IN SaHpiSessionIdT SessionId,
                                                SAHPI_IN SaHpiResourceIdT ResourceId,
                                                SAHPI_IN SaHpiEirIdT EirId,
                                                SAHPI_IN SaHpiUint32T BufferSize,
                                                SAHPI_OUT SaHpiInventoryDataT *InventData,
                                                SAHPI_OUT SaHpiUint32T *ActualSize)
    KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiEntityInventoryDataWrite(SAHPI_IN SaHpiSessionIdT SessionId,
                                                 SAHPI_IN SaHpiResourceIdT ResourceId,
                                                 SAHPI_IN SaHpiEirIdT EirId,
                                                 SAHPI_IN SaHpiInventoryDataT *InventData)
    KVI_NOEXCEPT;

/* Watchdog timers */

SaErrorT SAHPI_API saHpiWatchdogTimerGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                         SAHPI_IN SaHpiResourceIdT ResourceId,
                                         SAHPI_IN SaHpiWatchdogNumT WatchdogNum,
                                         SAHPI_OUT SaHpiWatchdogT *Watchdog) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiWatchdogTimerSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                         SAHPI_IN SaHpiResourceIdT ResourceId,
                                         SAHPI_IN SaHpiWatchdogNumT WatchdogNum,
                                         SAHPI_IN SaHpiWatchdogT *Watchdog) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiWatchdogTimerReset(SAHPI_IN SaHpiSessionIdT SessionId,
                                           SAHPI_IN SaHpiResourceIdT ResourceId,
                                           SAHPI_IN SaHpiWatchdogNumT WatchdogNum)
    KVI_NOEXCEPT;

/* Hot swap */

SaErrorT SAHPI_API saHpiHotSwapControlRequest(SAHPI_IN SaHpiSessionIdT SessionId,
                                              SAHPI_IN SaHpiResourceIdT ResourceId)
    KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiResourceActiveSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                          SAHPI_IN SaHpiResourceIdT ResourceId) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiResourceInactiveSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                            SAHPI_IN SaHpiResourceIdT ResourceId)
    KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiAutoInsertTimeoutGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                             SAHPI_OUT SaHpiTimeoutT *Timeout) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiAutoInsertTimeoutSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                             SAHPI_IN SaHpiTimeoutT Timeout) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiAutoExtractTimeoutGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                              SAHPI_IN SaHpiResourceIdT ResourceId,
                                              SAHPI_OUT SaHpiTimeoutT *Timeout) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiAutoExtractTimeoutSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                              SAHPI_IN SaHpiResourceIdT ResourceId,
                                              SAHPI_IN SaHpiTimeoutT Timeout) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiHotSwapStateGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                        SAHPI_IN SaHpiResourceIdT ResourceId,
                                        SAHPI_OUT SaHpiHsStateT *State) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiHotSwapActionRequest(SAHPI_IN SaHpiSessionIdT SessionId,
                                             SAHPI_IN SaHpiResourceIdT ResourceId,
                                             SAHPI_IN SaHpiHsActionT Action) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiResourcePowerStateGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                              SAHPI_IN SaHpiResourceIdT ResourceId,
                                              SAHPI_OUT SaHpiHsPowerStateT *State)
    KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiResourcePowerStateSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                              SAHPI_IN SaHpiResourceIdT ResourceId,
                                              SAHPI_IN SaHpiHsPowerStateT State) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiHotSwapIndicatorStateGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                                 SAHPI_IN SaHpiResourceIdT ResourceId,
                                                 SAHPI_OUT SaHpiHsIndicatorStateT *State)
    KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiHotSwapIndicatorStateSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                                 SAHPI_IN SaHpiResourceIdT ResourceId,
                                                 SAHPI_IN SaHpiHsIndicatorStateT State)
    KVI_NOEXCEPT;

/* Configuration and reset */

SaErrorT SAHPI_API saHpiParmControl(SAHPI_IN SaHpiSessionIdT SessionId,
                                    SAHPI_IN SaHpiResourceIdT ResourceId,
                                    SAHPI_IN SaHpiParmActionT Action) KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiResourceResetStateGet(SAHPI_IN SaHpiSessionIdT SessionId,
                                              SAHPI_IN SaHpiResourceIdT ResourceId,
                                              SAHPI_OUT SaHpiResetActionT *ResetAction)
    KVI_NOEXCEPT;

SaErrorT SAHPI_API saHpiResourceResetStateSet(SAHPI_IN SaHpiSessionIdT SessionId,
                                              SAHPI_IN SaHpiResourceIdT ResourceId,
                                              SAHPI_IN SaHpiResetActionT ResetAction)
    KVI_NOEXCEPT;

/* clang-format on */

#ifdef __cplusplus
}
#endif

#endif /* SAHPI_H */
