#include <cstdint>
#include <random>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "support/KviTestSupport.h"

namespace
{

// The checksum as the object files define it, one bit at a time: shift left,
// and exclusive-or the polynomial when the data bit differs from the
// register's top bit.
SaHpiUint32T bitwiseCrc(const std::vector<SaHpiUint8T> &data)
{
    SaHpiUint32T reg = 0xFFFFFFFF;
    for (SaHpiUint8T byte : data) {
        for (int bit = 7; bit >= 0; --bit) {
            bool dataBit = ((byte >> bit) & 1) != 0;
            bool topBit = (reg & 0x80000000u) != 0;
            reg = dataBit != topBit ? (reg << 1) ^ 0x04c11db7u : reg << 1;
        }
    }
    return ~reg;
}

TEST(Crc, KnownValuesAndSizesOfZeroOrLess)
{
    // The check value of CRC-32/BZIP2, and one zero byte and one 0xFF byte.
    EXPECT_EQ(kviCsCrcGen("123456789", 9), 0xFC891918u);
    const SaHpiUint8T zero = 0x00;
    const SaHpiUint8T ones = 0xFF;
    EXPECT_EQ(kviCsCrcGen(&zero, 1), 0xB1F7404Bu);
    EXPECT_EQ(kviCsCrcGen(&ones, 1), 0x000000FFu);
    for (SaHpiInt32T size : {0, -1, INT32_MIN})
        EXPECT_EQ(kviCsCrcGen("abc", size), 0u) << size;
}

TEST(Crc, AgreesWithTheBitwiseDefinitionOnRandomData)
{
    std::mt19937 random(12345);
    for (int length : {1, 2, 3, 7, 8, 31, 64, 255, 1000, 4099}) {
        SCOPED_TRACE(length);
        std::vector<SaHpiUint8T> data(static_cast<size_t>(length));
        for (auto &b : data)
            b = static_cast<SaHpiUint8T>(random());
        EXPECT_EQ(kviCsCrcGen(data.data(), length), bitwiseCrc(data));
    }
}

TEST(CrcDeathTest, NullDataEndsTheProcess)
{
    KviLogCapture log(KVI_LOG_INFO_NUM);
    EXPECT_EXIT(kviCsCrcGen(nullptr, 4), testing::ExitedWithCode(1), "");
    auto lines = log.matching("NULL pointer passed into kviCsCrcGen.");
    ASSERT_EQ(lines.size(), 1u);
    EXPECT_NE(lines[0].find(KVI_LOG_ERROR_STRING " 006"), std::string::npos) << lines[0];
    // Even a size that would give 0 does not excuse a missing buffer.
    EXPECT_EXIT(kviCsCrcGen(nullptr, 0), testing::ExitedWithCode(1), "");
}

} // namespace
