// Inventory data. The HPI form of inventory data is a tree of pointers into
// the caller's buffer, so the simulator keeps each repository serialized in
// a compact form of its own and lays the tree out afresh on every read.
//
// Serialized form (host order, never stored outside the process):
//   validity u8, record count u8, then per record its type u8 and
//   internal use:  length u16, bytes
//   OEM:           manufacturer u32, length u16, bytes
//   chassis:       chassis type u8, then a general area
//   board/product: a general area
//   general area:  manufacturing time i64, eight optional texts (present u8,
//                  then type u8, language u8, length u8, bytes), custom
//                  text count u8 and the custom texts (without present byte).
#include <cstdio>
#include <cstring>

#include "SimModel.h"

namespace
{

constexpr SaHpiUint32T MAX_RECORDS = 32;
constexpr SaHpiUint32T MAX_CUSTOM = 16;
constexpr SaHpiUint32T GENERAL_TEXTS = 8;
// 2004-01-01 00:00:00 UTC in HPI time.
constexpr SaHpiTimeT MANUFACTURED = 1072915200LL * 1000000000LL;

class BlobWriter
{
  public:
    explicit BlobWriter(SimInventoryBlobT *Blob) noexcept : blob_(Blob) { blob_->Length = 0; }
    void put(const void *Data, SaHpiUint32T Size) noexcept
    {
        if (Size > SIM_INVENTORY_CAPACITY - blob_->Length) {
            full_ = true;
            return;
        }
        memcpy(blob_->Bytes + blob_->Length, Data, Size);
        blob_->Length += Size;
    }
    void u8(SaHpiUint32T Value) noexcept
    {
        SaHpiUint8T v = static_cast<SaHpiUint8T>(Value);
        put(&v, 1);
    }
    // A run of bytes, after its length.
    void bytes(const void *Data, SaHpiUint32T Length) noexcept
    {
        SaHpiUint16T n = static_cast<SaHpiUint16T>(Length);
        put(&n, sizeof(n));
        put(Data, n);
    }
    void text(const SaHpiTextBufferT *Text) noexcept
    {
        u8(Text->DataType);
        u8(Text->Language);
        u8(Text->DataLength);
        put(Text->Data, Text->DataLength);
    }
    bool full() const noexcept { return full_; }

  private:
    SimInventoryBlobT *blob_;
    bool full_ = false;
};

class BlobReader
{
  public:
    explicit BlobReader(const SimInventoryBlobT *Blob) noexcept : blob_(Blob) {}
    bool get(void *Data, SaHpiUint32T Size) noexcept
    {
        if (Size > blob_->Length - at_) {
            return false;
        }
        memcpy(Data, blob_->Bytes + at_, Size);
        at_ += Size;
        return true;
    }
    SaHpiUint8T u8() noexcept
    {
        SaHpiUint8T v = 0;
        get(&v, 1);
        return v;
    }
    // A run of bytes into Out, which holds SIM_INVENTORY_CAPACITY; returns
    // its length.
    SaHpiUint32T bytes(SaHpiUint8T *Out) noexcept
    {
        SaHpiUint16T n = 0;
        get(&n, sizeof(n));
        if (n > SIM_INVENTORY_CAPACITY) {
            n = SIM_INVENTORY_CAPACITY;
        }
        get(Out, n);
        return n;
    }
    void text(SaHpiTextBufferT *Text) noexcept
    {
        memset(Text, 0, sizeof(*Text));
        Text->DataType = static_cast<SaHpiTextTypeT>(u8());
        Text->Language = static_cast<SaHpiLanguageT>(u8());
        Text->DataLength = u8();
        if (!get(Text->Data, Text->DataLength)) {
            Text->DataLength = 0;
        }
    }

  private:
    const SimInventoryBlobT *blob_;
    SaHpiUint32T at_ = 0;
};

// Places the pieces of the HPI tree in the caller's buffer. A first pass
// without a buffer only measures.
class Layout
{
  public:
    Layout(void *Base, SaHpiUint32T Size) noexcept : base_(static_cast<char *>(Base)), size_(Size)
    {
    }
    void *take(size_t Size, size_t Align = 8) noexcept
    {
        used_ = (used_ + Align - 1) / Align * Align;
        size_t at = used_;
        used_ += Size;
        return base_ != nullptr && used_ <= size_ ? base_ + at : nullptr;
    }
    size_t used() const noexcept { return used_; }

  private:
    char *base_;
    size_t size_;
    size_t used_ = 0;
};

// The one-element tail arrays of the HPI types are variable length: reach
// their elements through the byte address of the tail.
template <typename T> T *tail(void *Object, size_t Offset) noexcept
{
    return reinterpret_cast<T *>(static_cast<char *>(Object) + Offset);
}

// ---- Default inventories ----

struct GeneralTextsT {
    const char *Text[GENERAL_TEXTS]; // Manufacturer ... AssetTag; NULL: absent
    const char *Custom;              // NULL: none
};

void putTextString(BlobWriter &W, const char *Text) noexcept
{
    SaHpiTextBufferT buffer;
    simText(&buffer, Text);
    W.text(&buffer);
}

void putGeneral(BlobWriter &W, const GeneralTextsT &G, SaHpiUint32T Instance) noexcept
{
    W.put(&MANUFACTURED, sizeof(MANUFACTURED));
    for (SaHpiUint32T i = 0; i < GENERAL_TEXTS; i++) {
        W.u8(G.Text[i] != nullptr);
        if (G.Text[i] != nullptr) {
            char text[64];
            snprintf(text, sizeof(text), G.Text[i], Instance);
            putTextString(W, text);
        }
    }
    W.u8(G.Custom != nullptr ? 1 : 0);
    if (G.Custom != nullptr) {
        putTextString(W, G.Custom);
    }
}

const GeneralTextsT ChassisTexts = {{"Kvi Simulated Systems", "Simulated shelf", "1.0", "SIM-SHELF",
                                     "SIM-CH-%04u", "100-0001", "shelf.fru", nullptr},
                                    "Simulated hardware"};
const GeneralTextsT BoardTexts = {{"Kvi Simulated Systems", "Processor board", "2.1", "SIM-CPU",
                                   "SIM-PB-%04u", "200-0001", "cpu.fru", nullptr},
                                  nullptr};
const GeneralTextsT FanTexts = {{"Kvi Simulated Systems", "Fan tray", "1.2", "SIM-FAN",
                                 "SIM-FT-%04u", "300-0001", "fan.fru", nullptr},
                                nullptr};
const GeneralTextsT SupplyTexts = {{"Kvi Simulated Systems", "Power supply", "1.0", "SIM-PSU",
                                    "SIM-PS-%04u", "400-0001", "psu.fru", nullptr},
                                   nullptr};

void buildDefault(const SimRecordT *Record, SimInventoryBlobT *Blob) noexcept
{
    BlobWriter w(Blob);
    SaHpiUint32T instance = Record->Resource->Instance;
    w.u8(SAHPI_INVENT_DATA_VALID);
    switch (Record->Resource->Shape->Kind) {
    case SIM_CHASSIS:
        w.u8(2);
        w.u8(SAHPI_INVENT_RECTYPE_CHASSIS_INFO);
        w.u8(SAHPI_INVENT_CTYP_RACKMOUNT);
        putGeneral(w, ChassisTexts, instance);
        w.u8(SAHPI_INVENT_RECTYPE_PRODUCT_INFO);
        putGeneral(w, ChassisTexts, instance);
        break;
    case SIM_PROCESSOR_BOARD: {
        w.u8(3);
        w.u8(SAHPI_INVENT_RECTYPE_BOARD_INFO);
        putGeneral(w, BoardTexts, instance);
        w.u8(SAHPI_INVENT_RECTYPE_PRODUCT_INFO);
        putGeneral(w, BoardTexts, instance);
        w.u8(SAHPI_INVENT_RECTYPE_INTERNAL_USE);
        const SaHpiUint8T internal[4] = {0x01, 0x02, 0x03, 0x04};
        w.bytes(internal, sizeof(internal));
        break;
    }
    case SIM_FAN_TRAY:
        w.u8(1);
        w.u8(SAHPI_INVENT_RECTYPE_BOARD_INFO);
        putGeneral(w, FanTexts, instance);
        break;
    default: {
        w.u8(2);
        w.u8(SAHPI_INVENT_RECTYPE_PRODUCT_INFO);
        putGeneral(w, SupplyTexts, instance);
        w.u8(SAHPI_INVENT_RECTYPE_OEM);
        SaHpiManufacturerIdT mid = SIM_MANUFACTURER_ID;
        w.put(&mid, sizeof(mid));
        const SaHpiUint8T oem[2] = {0xA5, 0x5A};
        w.bytes(oem, sizeof(oem));
        break;
    }
    }
}

// ---- Serialized form to the HPI tree ----

constexpr size_t RECORD_DATA = offsetof(SaHpiInventDataRecordT, RecordData);
constexpr size_t CUSTOM = offsetof(SaHpiInventGeneralDataT, CustomField);
constexpr size_t CHASSIS_GENERAL = offsetof(SaHpiInventChassisDataT, GeneralData);
constexpr size_t INTERNAL_DATA = offsetof(SaHpiInventInternalUseDataT, Data);
constexpr size_t OEM_DATA = offsetof(SaHpiInventOemDataT, Data);

SaHpiTextBufferT *placeText(Layout &L, BlobReader &R) noexcept
{
    SaHpiTextBufferT text;
    R.text(&text);
    auto *at = static_cast<SaHpiTextBufferT *>(L.take(sizeof(SaHpiTextBufferT), 4));
    if (at != nullptr) {
        *at = text;
    }
    return at;
}

// A general area whose structure begins Offset bytes into the record's data.
// Returns the record's data length.
size_t placeGeneral(Layout &L, BlobReader &R, SaHpiInventDataRecordT *Record,
                    size_t Offset) noexcept
{
    SaHpiTimeT manufactured = SAHPI_TIME_UNSPECIFIED;
    R.get(&manufactured, sizeof(manufactured));
    SaHpiTextBufferT *texts[GENERAL_TEXTS] = {};
    // The texts follow the record, whose size depends on the custom count
    // read after them; they are placed after the record once it is known.
    SaHpiTextBufferT parsed[GENERAL_TEXTS];
    SaHpiBoolT present[GENERAL_TEXTS];
    for (SaHpiUint32T i = 0; i < GENERAL_TEXTS; i++) {
        present[i] = R.u8();
        if (present[i]) {
            R.text(&parsed[i]);
        }
    }
    SaHpiUint32T customs = R.u8();
    if (customs > MAX_CUSTOM) {
        customs = MAX_CUSTOM;
    }
    // The record itself was taken by the caller; now the texts.
    for (SaHpiUint32T i = 0; i < GENERAL_TEXTS; i++) {
        if (present[i]) {
            texts[i] = static_cast<SaHpiTextBufferT *>(L.take(sizeof(SaHpiTextBufferT), 4));
            if (texts[i] != nullptr) {
                *texts[i] = parsed[i];
            }
        }
    }
    SaHpiTextBufferT *custom[MAX_CUSTOM + 1] = {};
    for (SaHpiUint32T i = 0; i < customs; i++) {
        custom[i] = placeText(L, R);
    }
    if (Record != nullptr) {
        auto *g = tail<SaHpiInventGeneralDataT>(&Record->RecordData, Offset);
        g->MfgDateTime = manufactured;
        g->Manufacturer = texts[0];
        g->ProductName = texts[1];
        g->ProductVersion = texts[2];
        g->ModelNumber = texts[3];
        g->SerialNumber = texts[4];
        g->PartNumber = texts[5];
        g->FileId = texts[6];
        g->AssetTag = texts[7];
        auto **list = tail<SaHpiTextBufferT *>(g, CUSTOM);
        for (SaHpiUint32T i = 0; i <= customs; i++) {
            list[i] = custom[i];
        }
    }
    return Offset + CUSTOM + (customs + 1) * sizeof(SaHpiTextBufferT *);
}

// Peeks the custom count of a general area without consuming the reader, so
// the record can be sized before its texts are placed.
SaHpiUint32T customCount(BlobReader R) noexcept
{
    SaHpiTimeT manufactured;
    R.get(&manufactured, sizeof(manufactured));
    for (SaHpiUint32T i = 0; i < GENERAL_TEXTS; i++) {
        if (R.u8()) {
            SaHpiTextBufferT text;
            R.text(&text);
        }
    }
    SaHpiUint32T customs = R.u8();
    return customs > MAX_CUSTOM ? MAX_CUSTOM : customs;
}

SaHpiInventDataRecordT *takeRecord(Layout &L, size_t Size) noexcept
{
    if (Size < sizeof(SaHpiInventDataRecordT)) {
        Size = sizeof(SaHpiInventDataRecordT);
    }
    auto *record = static_cast<SaHpiInventDataRecordT *>(L.take(Size));
    if (record != nullptr) {
        memset(record, 0, Size);
    }
    return record;
}

// A record whose data ends in a run of bytes Offset bytes into it; Length
// is the record's data length.
SaHpiInventDataRecordT *placeBytes(Layout &L, BlobReader &R, size_t Offset, size_t *Length) noexcept
{
    SaHpiUint8T bytes[SIM_INVENTORY_CAPACITY];
    SaHpiUint32T n = R.bytes(bytes);
    SaHpiInventDataRecordT *record = takeRecord(L, RECORD_DATA + Offset + n);
    if (record != nullptr) {
        memcpy(tail<SaHpiUint8T>(&record->RecordData, Offset), bytes, n);
    }
    *Length = Offset + n;
    return record;
}

// Lays the whole tree out; returns the bytes it needs. With a NULL base it
// only measures.
size_t layOut(const SimInventoryBlobT *Blob, void *Base, SaHpiUint32T Size) noexcept
{
    Layout l(Base, Size);
    BlobReader r(Blob);
    SaHpiInventDataValidityT validity = static_cast<SaHpiInventDataValidityT>(r.u8());
    SaHpiUint32T count = r.u8();
    if (count > MAX_RECORDS) {
        count = MAX_RECORDS;
    }
    size_t head =
        offsetof(SaHpiInventoryDataT, DataRecords) + (count + 1) * sizeof(SaHpiInventDataRecordT *);
    auto *data = static_cast<SaHpiInventoryDataT *>(
        l.take(head < sizeof(SaHpiInventoryDataT) ? sizeof(SaHpiInventoryDataT) : head));
    SaHpiInventDataRecordT **records =
        data != nullptr
            ? tail<SaHpiInventDataRecordT *>(data, offsetof(SaHpiInventoryDataT, DataRecords))
            : nullptr;
    if (data != nullptr) {
        data->Validity = validity;
    }
    for (SaHpiUint32T i = 0; i < count; i++) {
        SaHpiInventDataRecordTypeT type = static_cast<SaHpiInventDataRecordTypeT>(r.u8());
        SaHpiInventDataRecordT *record = nullptr;
        size_t length = 0;
        switch (type) {
        case SAHPI_INVENT_RECTYPE_INTERNAL_USE:
            record = placeBytes(l, r, INTERNAL_DATA, &length);
            break;
        case SAHPI_INVENT_RECTYPE_OEM: {
            SaHpiManufacturerIdT mid = 0;
            r.get(&mid, sizeof(mid));
            record = placeBytes(l, r, OEM_DATA, &length);
            if (record != nullptr) {
                record->RecordData.OemData.MId = mid;
            }
            break;
        }
        case SAHPI_INVENT_RECTYPE_CHASSIS_INFO: {
            SaHpiInventChassisTypeT chassis = static_cast<SaHpiInventChassisTypeT>(r.u8());
            SaHpiUint32T customs = customCount(r);
            record = takeRecord(l, RECORD_DATA + CHASSIS_GENERAL + CUSTOM +
                                       (customs + 1) * sizeof(SaHpiTextBufferT *));
            if (record != nullptr) {
                record->RecordData.ChassisInfo.Type = chassis;
            }
            length = placeGeneral(l, r, record, CHASSIS_GENERAL);
            break;
        }
        default: { // board and product areas
            SaHpiUint32T customs = customCount(r);
            record =
                takeRecord(l, RECORD_DATA + CUSTOM + (customs + 1) * sizeof(SaHpiTextBufferT *));
            length = placeGeneral(l, r, record, 0);
            break;
        }
        }
        if (record != nullptr) {
            record->RecordType = type;
            record->DataLength = static_cast<SaHpiUint32T>(length);
        }
        if (records != nullptr) {
            records[i] = record;
        }
    }
    if (records != nullptr) {
        records[count] = nullptr;
    }
    return l.used();
}

// ---- HPI tree to the serialized form ----

SaErrorT checkText(const SaHpiTextBufferT *Text) noexcept
{
    return simRaw(Text->DataType) > SAHPI_TL_TYPE_LANGUAGE ||
                   simRaw(Text->Language) > SAHPI_LANG_ZULU
               ? SA_ERR_HPI_INVALID_PARAMS
               : SA_OK;
}

SaErrorT putClientGeneral(BlobWriter &W, SaHpiInventGeneralDataT *G) noexcept
{
    W.put(&G->MfgDateTime, sizeof(G->MfgDateTime));
    SaHpiTextBufferT *texts[GENERAL_TEXTS] = {G->Manufacturer, G->ProductName,  G->ProductVersion,
                                              G->ModelNumber,  G->SerialNumber, G->PartNumber,
                                              G->FileId,       G->AssetTag};
    for (SaHpiTextBufferT *text : texts) {
        W.u8(text != nullptr);
        if (text != nullptr) {
            if (checkText(text) != SA_OK) {
                return SA_ERR_HPI_INVALID_PARAMS;
            }
            W.text(text);
        }
    }
    SaHpiTextBufferT **custom = tail<SaHpiTextBufferT *>(G, CUSTOM);
    SaHpiUint32T customs = 0;
    while (custom[customs] != nullptr) {
        if (++customs > MAX_CUSTOM) {
            return SA_ERR_HPI_INVALID_PARAMS;
        }
    }
    W.u8(customs);
    for (SaHpiUint32T i = 0; i < customs; i++) {
        if (checkText(custom[i]) != SA_OK) {
            return SA_ERR_HPI_INVALID_PARAMS;
        }
        W.text(custom[i]);
    }
    return SA_OK;
}

SaErrorT serialize(SaHpiInventoryDataT *Data, SimInventoryBlobT *Blob) noexcept
{
    BlobWriter w(Blob);
    SaHpiInventDataRecordT **records =
        tail<SaHpiInventDataRecordT *>(Data, offsetof(SaHpiInventoryDataT, DataRecords));
    SaHpiUint32T count = 0;
    while (records[count] != nullptr) {
        if (++count > MAX_RECORDS) {
            return SA_ERR_HPI_INVALID_PARAMS;
        }
    }
    w.u8(SAHPI_INVENT_DATA_VALID);
    w.u8(count);
    for (SaHpiUint32T i = 0; i < count; i++) {
        SaHpiInventDataRecordT *record = records[i];
        SaErrorT rc = SA_OK;
        SaHpiUint32T type = simRaw(record->RecordType);
        w.u8(type);
        switch (type) {
        case SAHPI_INVENT_RECTYPE_INTERNAL_USE:
            if (record->DataLength > SIM_INVENTORY_CAPACITY) {
                return SA_ERR_HPI_OUT_OF_SPACE;
            }
            w.bytes(record->RecordData.InternalUse.Data, record->DataLength);
            break;
        case SAHPI_INVENT_RECTYPE_OEM:
            if (record->DataLength < OEM_DATA) {
                return SA_ERR_HPI_INVALID_PARAMS;
            }
            if (record->DataLength - OEM_DATA > SIM_INVENTORY_CAPACITY) {
                return SA_ERR_HPI_OUT_OF_SPACE;
            }
            w.put(&record->RecordData.OemData.MId, sizeof(SaHpiManufacturerIdT));
            w.bytes(tail<SaHpiUint8T>(&record->RecordData.OemData, OEM_DATA),
                    static_cast<SaHpiUint32T>(record->DataLength - OEM_DATA));
            break;
        case SAHPI_INVENT_RECTYPE_CHASSIS_INFO:
            if (simRaw(record->RecordData.ChassisInfo.Type) < SAHPI_INVENT_CTYP_OTHER ||
                simRaw(record->RecordData.ChassisInfo.Type) > SAHPI_INVENT_CTYP_RACKMOUNT) {
                return SA_ERR_HPI_INVALID_PARAMS;
            }
            w.u8(record->RecordData.ChassisInfo.Type);
            rc = putClientGeneral(w, &record->RecordData.ChassisInfo.GeneralData);
            break;
        case SAHPI_INVENT_RECTYPE_BOARD_INFO:
        case SAHPI_INVENT_RECTYPE_PRODUCT_INFO:
            rc = putClientGeneral(w, &record->RecordData.BoardInfo);
            break;
        default:
            return SA_ERR_HPI_INVALID_PARAMS;
        }
        if (rc != SA_OK) {
            return rc;
        }
    }
    return w.full() ? SA_ERR_HPI_OUT_OF_SPACE : SA_OK;
}

} // namespace

// ---- Model ----

SaErrorT simInventoryInitialize(SimRecordT *Record) noexcept
{
    Record->Inventory.Data =
        static_cast<SimInventoryBlobT *>(KVI_CS_MALLOC(sizeof(SimInventoryBlobT)));
    if (Record->Inventory.Data == nullptr) {
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    buildDefault(Record, Record->Inventory.Data);
    return SA_OK;
}

void simInventoryRelease(SimRecordT *Record) noexcept
{
    if (Record->Inventory.Data != nullptr) {
        KVI_CS_FREE(Record->Inventory.Data);
    }
}

void simInventoryDefaults(SimRecordT *Record) noexcept
{
    buildDefault(Record, Record->Inventory.Data);
}

// ---- Slots ----

SaErrorT simEntityInventoryDataRead(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiEirIdT,
                                    SaHpiUint32T BufferSize, void *UserData,
                                    SaHpiInventoryDataT *InventData,
                                    SaHpiUint32T *ActualSize) noexcept
{
    if (InventData == nullptr || ActualSize == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return simWithRecord(UserData, SAHPI_INVENTORY_RDR, [&](SimRecordT &R) {
        size_t needed = layOut(R.Inventory.Data, nullptr, 0);
        *ActualSize = static_cast<SaHpiUint32T>(needed);
        if (needed > BufferSize) {
            // The caller learns the size it needs; what fits says the data overflowed.
            if (BufferSize >= sizeof(SaHpiInventoryDataT)) {
                memset(InventData, 0, sizeof(SaHpiInventoryDataT));
                InventData->Validity = SAHPI_INVENT_DATA_OVERFLOW;
            }
            return SA_ERR_HPI_DATA_LEN_INVALID;
        }
        layOut(R.Inventory.Data, InventData, BufferSize);
        return SA_OK;
    });
}

SaErrorT simEntityInventoryDataWrite(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiEirIdT,
                                     SaHpiInventoryDataT *InventData, void *UserData) noexcept
{
    if (simRecordOf(UserData, SAHPI_INVENTORY_RDR) == nullptr || InventData == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    auto *blob = static_cast<SimInventoryBlobT *>(KVI_CS_MALLOC(sizeof(SimInventoryBlobT)));
    if (blob == nullptr) {
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    SaErrorT rc = serialize(InventData, blob);
    if (rc == SA_OK) {
        rc = simWithRecord(UserData, SAHPI_INVENTORY_RDR, [&](SimRecordT &R) {
            memcpy(R.Inventory.Data, blob, sizeof(SimInventoryBlobT));
            return SA_OK;
        });
    }
    KVI_CS_FREE(blob);
    return rc;
}
