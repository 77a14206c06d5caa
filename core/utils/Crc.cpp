// The checksum of the non-volatile object files: CRC-32 over the polynomial
// 0x04c11db7, most significant bit first, register preset to all ones and
// complemented at the end. Files written by earlier releases carry this CRC,
// so its parameters can never change.
#include <array>
#include <cstdlib>

#include "core/utils/KviTrace.h"
#include "kvi/KviNonVolatile.h"

namespace
{
constexpr SaHpiUint32T KVI_CRC_QUOTIENT = 0x04c11db7;
constexpr SaHpiUint32T CRC_INITIAL_VALUE = 0xFFFFFFFF;

// One byte at a time through a table gives the same register as feeding the
// byte bit by bit (shift left, and exclusive-or the polynomial when the data
// bit differs from the register's top bit), eight times faster.
constexpr std::array<SaHpiUint32T, 256> makeCrcTable()
{
    std::array<SaHpiUint32T, 256> table{};
    for (SaHpiUint32T byte = 0; byte < 256; ++byte) {
        SaHpiUint32T reg = byte << 24;
        for (int bit = 0; bit < 8; ++bit)
            reg = (reg & 0x80000000u) != 0 ? (reg << 1) ^ KVI_CRC_QUOTIENT : reg << 1;
        table[byte] = reg;
    }
    return table;
}

constexpr std::array<SaHpiUint32T, 256> crcTable = makeCrcTable();
} // namespace

extern "C" {

KVI_EXPORT SaHpiUint32T kviCsCrcGen(const void *Data, SaHpiInt32T Size) noexcept
{
    KVI_TRACE("Size=%d", Size);
    if (Data == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "NULL pointer passed into kviCsCrcGen.");
        exit(1);
    }
    if (Size <= 0)
        return 0;
    const auto *bytes = static_cast<const SaHpiUint8T *>(Data);
    SaHpiUint32T reg = CRC_INITIAL_VALUE;
    for (SaHpiInt32T i = 0; i < Size; ++i)
        reg = (reg << 8) ^ crcTable[((reg >> 24) ^ bytes[i]) & 0xFF];
    return ~reg;
}

} // extern "C"
