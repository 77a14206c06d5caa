// Feeds arbitrary bytes to the object file checker as the content of an
// object file. Whatever the bytes, the checker must not crash, must not leak,
// and may only accept a file whose header describes exactly the bytes read.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <unistd.h>

#include "core/utils/NonVolatileStorage.h"
#include "kvi/KviMemory.h"

namespace
{
std::string scratchDir;
std::string scratchFile;

void removeScratch()
{
    unlink(scratchFile.c_str());
    rmdir(scratchDir.c_str());
}

// The checker deletes damaged files, so each input gets a fresh file under
// an object file name in a directory of its own.
const std::string &scratchPath()
{
    if (scratchFile.empty()) {
        char pattern[] = "/tmp/kvi-nvfuzz-XXXXXX";
        if (mkdtemp(pattern) == nullptr)
            abort();
        scratchDir = pattern;
        scratchFile = scratchDir + "/0000000000";
        atexit(removeScratch);
    }
    return scratchFile;
}

SaHpiInt32T liveBlocks()
{
    SaHpiInt32T n = 0;
    kviCsGetMemorySegmentsAllocated(&n);
    return n;
}

void checkAccepted(const NvObjectT *object, const uint8_t *data, size_t size)
{
    const NvObjHdrT &hdr = object->Hdr;
    bool sound = hdr.Size == size && size >= sizeof(NvObjHdrT) && hdr.NvVersion == NV_VERSION &&
                 hdr.KeyLen >= 1 && hdr.KeyLen <= NV_MAX_KEY_CHARS &&
                 sizeof(NvObjHdrT) + hdr.KeyLen <= size &&
                 memchr(object->KeyAndData, 0, hdr.KeyLen) == nullptr &&
                 memcmp(object, data, size) == 0 &&
                 hdr.Crc == kviCsCrcGen(data + 8, static_cast<SaHpiInt32T>(size - 8));
    if (!sound)
        abort();
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    const std::string &path = scratchPath();
    FILE *file = fopen(path.c_str(), "wb");
    if (file == nullptr)
        abort();
    if (size > 0 && fwrite(data, 1, size, file) != size)
        abort();
    fclose(file);

    SaHpiInt32T before = liveBlocks();
    NvObjectT *object = nullptr;
    if (nvObjectIsValid(path.c_str(), &object)) {
        checkAccepted(object, data, size);
        KVI_CS_FREE(object);
    } else if (object != nullptr) {
        abort();
    }
    if (liveBlocks() != before)
        abort();
    unlink(path.c_str());
    return 0;
}
