// What the configuration fuzz targets share: the input parsed as the file
// reader would hand it to the parser, and the checks that the parse gave back
// every block it took. Parsing from memory skips the file round trip; the
// reading of the file itself is covered by the unit tests.
#pragma once

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>

#include "core/utils/KviConfig.h"

// The parser allocates four blocks a pair; the address sanitizer's record
// of where each block came from is most of what an input costs, and a
// finding reproduces from its input anyway.
extern "C" const char *__asan_default_options()
{
    return "malloc_context_size=2";
}

namespace kviFuzz
{
inline void require(bool condition)
{
    if (!condition)
        abort();
}

inline SaHpiInt32T liveBlocks()
{
    SaHpiInt32T n = 0;
    kviCsGetMemorySegmentsAllocated(&n);
    return n;
}

// One container for the whole run: the queries need its semaphores, and each
// input gets a list of its own.
inline KviCsCfgContainer &sharedContainer()
{
    static KviCsCfgContainer cont = [] {
        KviCsCfgContainer c{};
        require(kviCsSemInitNoLogging(&c.GeneralSem, 1) == SA_OK);
        require(kviCsSemInitNoLogging(&c.DeleteSem, 1) == SA_OK);
        return c;
    }();
    return cont;
}

// The input as the configuration of the shared container for the lifetime of
// the object. The text is an exact copy with no terminating NUL, as the file
// reader's buffer is, so a scan past its end is caught.
class ParsedConfig
{
  public:
    ParsedConfig(const uint8_t *data, size_t size)
        : text_(new char[size + (size == 0)]), size_(static_cast<SaHpiUint32T>(size)),
          blocksBefore_(liveBlocks())
    {
        if (size > 0)
            memcpy(text_.get(), data, size);
        kviCsLinkedListInitialize(&list_);
        container()->KeyValueList = &list_;
        kviCsCfgDataParseData(text_.get(), size_, container());
    }
    ~ParsedConfig()
    {
        require(kviCsCfgFreeKeyValueList(&list_) == SA_OK);
        container()->KeyValueList = nullptr;
        require(liveBlocks() == blocksBefore_);
    }
    ParsedConfig(const ParsedConfig &) = delete;
    ParsedConfig &operator=(const ParsedConfig &) = delete;

    KviCsCfgContainer *container() { return &sharedContainer(); }
    const char *text() const { return text_.get(); }
    SaHpiUint32T size() const { return size_; }
    const KviCsLinkedListNodeT *head() const { return list_.HeadPointer; }

  private:
    std::unique_ptr<char[]> text_;
    SaHpiUint32T size_;
    SaHpiInt32T blocksBefore_;
    KviCsLinkedListT list_{};
};

inline const KviKeyValuePairT *pairOf(const KviCsLinkedListNodeT *node)
{
    return static_cast<const KviKeyValuePairT *>(node->Data);
}

// Larger inputs only take longer to say the same.
constexpr size_t MAX_INPUT_BYTES = 1u << 20;
} // namespace kviFuzz
