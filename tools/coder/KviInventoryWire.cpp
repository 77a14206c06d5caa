// Inventory trees to and from their wire form. Both directions walk the
// same shape: the head's record list, each record's general area (chassis,
// board, product) with its eight texts and custom list, or its opaque bytes.
#include "KviInventoryWire.h"

#include <stddef.h>
#include <stdint.h>
#include <string.h>

namespace
{

constexpr size_t RECORD_DATA = offsetof(SaHpiInventDataRecordT, RecordData);
constexpr size_t CHASSIS_GENERAL = offsetof(SaHpiInventChassisDataT, GeneralData);
constexpr size_t CUSTOM = offsetof(SaHpiInventGeneralDataT, CustomField);
constexpr size_t RECORDS = offsetof(SaHpiInventoryDataT, DataRecords);
constexpr size_t PTR = sizeof(void *);
constexpr size_t GENERAL_TEXTS = (CUSTOM - offsetof(SaHpiInventGeneralDataT, Manufacturer)) / PTR;

// Where a record's general area starts within the record, or 0 for a record
// whose data are DataLength opaque bytes. The type is taken as the number it
// is on the wire, which need not be one of the enumeration's.
size_t generalOffset(SaHpiUint32T Type) noexcept
{
    switch (Type) {
    case SAHPI_INVENT_RECTYPE_CHASSIS_INFO:
        return RECORD_DATA + CHASSIS_GENERAL;
    case SAHPI_INVENT_RECTYPE_BOARD_INFO:
    case SAHPI_INVENT_RECTYPE_PRODUCT_INFO:
        return RECORD_DATA;
    default:
        return 0;
    }
}

SaHpiUint32T recordType(const void *Record) noexcept
{
    static_assert(sizeof(SaHpiInventDataRecordTypeT) == sizeof(SaHpiUint32T));
    SaHpiUint32T type;
    memcpy(&type, static_cast<const char *>(Record) + offsetof(SaHpiInventDataRecordT, RecordType),
           sizeof type);
    return type;
}

// The pointer slots of a general area: the eight texts, then the custom
// list up to its NULL.
void *const *textSlot(const char *General, size_t Index) noexcept
{
    return reinterpret_cast<void *const *>(
        General + offsetof(SaHpiInventGeneralDataT, Manufacturer) + Index * PTR);
}

// ---- Tree to wire ----

class Flattener
{
  public:
    Flattener(const void *Bounds, size_t BoundsSize, char *Block, size_t Size) noexcept
        : bounds_(static_cast<const char *>(Bounds)), boundsSize_(BoundsSize), block_(Block),
          size_(Size)
    {
    }

    SaErrorT head(const SaHpiInventoryDataT *Data) noexcept
    {
        size_t count = 0;
        while (inside(slot(Data, RECORDS, count), PTR) && *slot(Data, RECORDS, count) != nullptr) {
            ++count;
        }
        if (!inside(slot(Data, RECORDS, count), PTR)) {
            return SA_ERR_HPI_INVALID_DATA;
        }
        size_t bytes = RECORDS + (count + 1) * PTR;
        size_t at = take(bytes < sizeof *Data ? sizeof *Data : bytes, alignof(SaHpiInventoryDataT));
        if (!ok_) {
            return rc_;
        }
        copy(at, Data, RECORDS);
        for (size_t i = 0; i < count; ++i) {
            link(at + RECORDS + i * PTR,
                 record(static_cast<const char *>(*slot(Data, RECORDS, i))));
        }
        link(at + RECORDS + count * PTR, 0);
        return ok_ ? SA_OK : rc_;
    }

    size_t used() const noexcept { return used_; }

  private:
    static void *const *slot(const void *Base, size_t Offset, size_t Index) noexcept
    {
        return reinterpret_cast<void *const *>(static_cast<const char *>(Base) + Offset +
                                               Index * PTR);
    }

    // Inside the plug-in's buffer, when there is one to stay inside of.
    bool inside(const void *At, size_t Bytes) noexcept
    {
        const char *p = static_cast<const char *>(At);
        bool in = bounds_ == nullptr || (p >= bounds_ && Bytes <= boundsSize_ &&
                                         p - bounds_ <= ptrdiff_t(boundsSize_ - Bytes));
        if (!in) {
            fail(SA_ERR_HPI_INVALID_DATA);
        }
        return in;
    }

    size_t take(size_t Bytes, size_t Align) noexcept
    {
        size_t at = (used_ + Align - 1) / Align * Align;
        if (!ok_ || at > size_ || size_ - at < Bytes) {
            fail(SA_ERR_HPI_OUT_OF_SPACE);
            return 0;
        }
        if (block_ != nullptr) {
            memset(block_ + at, 0, Bytes);
        }
        used_ = at + Bytes;
        return at;
    }

    void fail(SaErrorT Rc) noexcept
    {
        if (ok_) {
            ok_ = false;
            rc_ = Rc;
        }
    }

    // Without a block the walk only checks and measures.
    void copy(size_t At, const void *From, size_t Bytes) noexcept
    {
        if (ok_ && block_ != nullptr) {
            memcpy(block_ + At, From, Bytes);
        }
    }

    // Writes the wire form of a pointer: the target's offset plus one.
    void link(size_t Slot, size_t Target) noexcept
    {
        if (ok_ && block_ != nullptr) {
            uintptr_t v = Target;
            memcpy(block_ + Slot, &v, sizeof v);
        }
    }

    // Copies one record; returns its offset plus one, 0 after a failure.
    size_t record(const char *Record) noexcept
    {
        if (!inside(Record, RECORD_DATA)) {
            return 0;
        }
        SaHpiUint32T length;
        memcpy(&length, Record + offsetof(SaHpiInventDataRecordT, DataLength), sizeof length);
        const size_t general = generalOffset(recordType(Record));
        size_t customs = 0;
        if (general != 0) {
            while (inside(slot(Record, general + CUSTOM, customs), PTR) &&
                   *slot(Record, general + CUSTOM, customs) != nullptr) {
                ++customs;
            }
        }
        // A length past anything a message holds cannot be right, and must
        // not wrap the sum on a 32-bit machine.
        if (general == 0 && length > 0xffff) {
            fail(SA_ERR_HPI_INVALID_DATA);
            return 0;
        }
        const size_t bytes =
            general != 0 ? general + CUSTOM + (customs + 1) * PTR : RECORD_DATA + length;
        if (!ok_ || !inside(Record, bytes)) {
            return 0;
        }
        const size_t at =
            take(bytes < sizeof(SaHpiInventDataRecordT) ? sizeof(SaHpiInventDataRecordT) : bytes,
                 alignof(SaHpiInventDataRecordT));
        if (!ok_) {
            return 0;
        }
        copy(at, Record, bytes);
        for (size_t i = 0; general != 0 && i < GENERAL_TEXTS + customs; ++i) {
            link(at + general + offsetof(SaHpiInventGeneralDataT, Manufacturer) + i * PTR,
                 text(static_cast<const SaHpiTextBufferT *>(*textSlot(Record + general, i))));
        }
        return at + 1;
    }

    size_t text(const SaHpiTextBufferT *Text) noexcept
    {
        if (Text == nullptr || !inside(Text, sizeof *Text)) {
            return 0;
        }
        const size_t at = take(sizeof *Text, alignof(SaHpiTextBufferT));
        copy(at, Text, sizeof *Text);
        return ok_ ? at + 1 : 0;
    }

    const char *bounds_;
    size_t boundsSize_;
    char *block_;
    size_t size_;
    size_t used_ = 0;
    bool ok_ = true;
    SaErrorT rc_ = SA_OK;
};

// ---- Wire to tree ----

class Relocator
{
  public:
    Relocator(char *Block, size_t Size) noexcept : block_(Block), size_(Size) {}

    bool head() noexcept
    {
        if (size_ < sizeof(SaHpiInventoryDataT) ||
            reinterpret_cast<uintptr_t>(block_) % KVI_WIRE_INVENTORY_ALIGN != 0) {
            return false;
        }
        for (size_t i = 0;; ++i) {
            char *record = nullptr;
            if (!resolve(RECORDS + i * PTR, RECORD_DATA, alignof(SaHpiInventDataRecordT),
                         &record)) {
                return false;
            }
            if (record == nullptr) {
                return true;
            }
            if (!body(record)) {
                return false;
            }
        }
    }

  private:
    bool fits(size_t At, size_t Bytes) const noexcept { return At <= size_ && size_ - At >= Bytes; }

    // Makes the pointer slot at Slot point into the block, checking that Bytes
    // from its target lie inside. A slot already turned into a pointer (two
    // slots naming one object) is checked the same way and left as it is.
    bool resolve(size_t Slot, size_t Bytes, size_t Align, char **Target) noexcept
    {
        if (!fits(Slot, PTR)) {
            return false;
        }
        uintptr_t v;
        memcpy(&v, block_ + Slot, sizeof v);
        const uintptr_t base = reinterpret_cast<uintptr_t>(block_);
        size_t at;
        if (v == 0) {
            *Target = nullptr;
            return true;
        } else if (v <= size_) {
            at = v - 1;
        } else if (v >= base && v - base < size_) {
            at = v - base;
        } else {
            return false;
        }
        if (at % Align != 0 || !fits(at, Bytes)) {
            return false;
        }
        *Target = block_ + at;
        memcpy(block_ + Slot, Target, sizeof v);
        return true;
    }

    bool body(char *Record) noexcept
    {
        const size_t at = static_cast<size_t>(Record - block_);
        const size_t general = generalOffset(recordType(Record));
        if (general == 0) {
            SaHpiUint32T length;
            memcpy(&length, Record + offsetof(SaHpiInventDataRecordT, DataLength), sizeof length);
            return length <= size_ && fits(at, RECORD_DATA + size_t(length));
        }
        if (!fits(at, general + CUSTOM)) {
            return false;
        }
        for (size_t i = 0;; ++i) {
            char *text = nullptr;
            const size_t slot =
                at + general + offsetof(SaHpiInventGeneralDataT, Manufacturer) + i * PTR;
            if (!resolve(slot, sizeof(SaHpiTextBufferT), alignof(SaHpiTextBufferT), &text)) {
                return false;
            }
            if (text == nullptr && i >= GENERAL_TEXTS) {
                return true;
            }
        }
    }

    char *block_;
    size_t size_;
};

} // namespace

SaErrorT kviWireInventoryFlatten(const SaHpiInventoryDataT *Data, const void *Bounds,
                                 SaHpiUint32T BoundsSize, void *Block, SaHpiUint32T Size,
                                 SaHpiUint32T *Used) noexcept
{
    Flattener f(Bounds, BoundsSize, static_cast<char *>(Block), Size);
    const SaErrorT rc = f.head(Data);
    *Used = static_cast<SaHpiUint32T>(f.used());
    return rc;
}

SaErrorT kviWireInventoryRelocate(void *Block, SaHpiUint32T Size) noexcept
{
    if (!Relocator(static_cast<char *>(Block), Size).head()) {
        return SA_ERR_HPI_INVALID_DATA;
    }
    // Objects may overlap the pointers turned before them, so what was
    // checked on the way may have changed: the finished tree is walked again,
    // reading only, and must keep to the block.
    Flattener check(Block, Size, nullptr, SIZE_MAX);
    return check.head(static_cast<const SaHpiInventoryDataT *>(Block)) == SA_OK
               ? SA_OK
               : SA_ERR_HPI_INVALID_DATA;
}
