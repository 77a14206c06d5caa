// The configuration file's grammar, its quirks and the reader's retry loop.
// Texts are handed to the parser in heap buffers of exactly their size, with
// no terminating NUL, so that AddressSanitizer reports any read past the end.
#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "core/utils/KviConfig.h"
#include "core/utils/Memory.h"
#include "support/KviTestSupport.h"

namespace
{
using namespace std::string_literals;
using Pairs = std::vector<std::pair<std::string, std::string>>;

// A bare list in a container shell: all the parser and the reader need.
class Shell
{
  public:
    explicit Shell(std::string fileName = "") : name_(std::move(fileName))
    {
        kviCsLinkedListInitialize(&list_);
        container_.KeyValueList = &list_;
        container_.Filename = name_.empty() ? nullptr : name_.data();
    }
    ~Shell() { EXPECT_EQ(kviCsCfgFreeKeyValueList(&list_), SA_OK); }
    Shell(const Shell &) = delete;
    Shell &operator=(const Shell &) = delete;

    SaErrorT parse(std::string_view text)
    {
        std::unique_ptr<char[]> exact(new char[text.size()]);
        memcpy(exact.get(), text.data(), text.size());
        return kviCsCfgDataParseData(exact.get(), static_cast<SaHpiUint32T>(text.size()),
                                     &container_);
    }
    Pairs pairs() const
    {
        Pairs out;
        for (auto *node = list_.HeadPointer; node != nullptr; node = node->Next) {
            auto *pair = static_cast<KviKeyValuePairT *>(node->Data);
            out.emplace_back(pair->Key, pair->Value);
        }
        return out;
    }
    KviCsCfgContainer *container() { return &container_; }

  private:
    std::string name_;
    KviCsLinkedListT list_{};
    KviCsCfgContainer container_{};
};

TEST(KviConfigParser, GrammarQuirksAndRefusedLines)
{
    const std::string longKey(MAX_KEY_LENGTH - 1, 'k');
    const std::string longValue(MAX_VALUE_LENGTH - 1, 'v');
    const std::string newlines(MAX_VALUE_LENGTH - 1, '\n');
    struct Case {
        std::string text;
        Pairs expected;
        const char *message = nullptr; // logged for the refused part
    };
    const Case cases[] = {
        {"key = \"value\"\n", {{"key", "value"}}},
        {"key\t=\t\"value\"", {{"key", "value"}}},
        // The first "=" ends the key, the second is the equal sign.
        {"key==\"v\"", {{"key", "v"}}},
        {"key = \"a b # c\" # a comment\n", {{"key", "a b # c"}}},
        {"k = \"\"", {{"k", ""}}},
        {"-a = \"1\"\n.b = \"2\"\nA_z.9-_ = \"3\"", {{"-a", "1"}, {".b", "2"}, {"A_z.9-_", "3"}}},
        {"[section]\nk = \"1\"\n[other] k = \"2\"\n", {{"k", "1"}}},
        {"# k = \"1\"\n  # \n\tk = \"2\"", {{"k", "2"}}},
        {"a = \"1\"\r\n[s]\r\nb = \"2\"\r\n", {{"a", "1"}, {"b", "2"}}},
        {"a = \"x\ny\n\"\nb = \"2\"", {{"a", "x\ny\n"}, {"b", "2"}}},
        {"a = \"1\" b = \"2\"", {{"a", "1"}, {"b", "2"}}},
        // A newline may end the key; the equal sign follows on the next line.
        {"k\n= \"v\"", {{"k", "v"}}},
        {"", {}},
        {"#", {}},
        // The byte that ends a key is consumed with it, so a key written
        // against its equal sign meets the quote where "=" should be.
        {"key=\"value\"\nok = \"1\"",
         {{"ok", "1"}},
         "Unexpected token asc(34) '\"' found when expecting equal sign, line 1"},
        {"key ==\"v\"\nok = \"1\"",
         {{"ok", "1"}},
         "Value doesn't start with double quotes! line=1"},
        {"key = value\nok = \"1\"",
         {{"ok", "1"}},
         "Value doesn't start with double quotes! line=1"},
        {"\"q\" = \"1\"\nok = \"1\"",
         {{"ok", "1"}},
         "Invalid character asc(34) found in config file at position 0!"},
        {"ok = \"1\"\n!x = \"1\"",
         {{"ok", "1"}},
         "Invalid character asc(33) found in config file at position 9!"},
        {"ke!y = \"1\"\nok = \"1\"", {{"ok", "1"}}, "Invalid characher ascii(33) found. (line 1)"},
        // A carriage return inside a key is not a key character.
        {"k\r = \"1\"\nok = \"1\"", {{"ok", "1"}}, "Invalid characher ascii(13) found. (line 1)"},
        {"\xff\xfe = \"1\"\nok = \"1\"",
         {{"ok", "1"}},
         "Invalid character asc(255) found in config file at position 0!"},
        // Lines are counted outside values only, and not where a newline
        // ends a key; "bad" stands on line 4 of the first text.
        {"a = \"1\n2\n3\"\nbad \"v\"\n", {{"a", "1\n2\n3"}}, "equal sign, line 2"},
        {"k\n= \"v\"\nx \"y\"\n", {{"k", "v"}}, "equal sign, line 2"},
        {"# comment\n[section]\nx \"y\"\n", {}, "equal sign, line 3"},
        // An error found at a newline costs the following line too; one
        // before the end of the line costs that line only.
        {"k =\nlost = \"1\"\nkept = \"2\"\n",
         {{"kept", "2"}},
         "Value doesn't start with double quotes! line=1"},
        {"k = x\nkept = \"1\"\n", {{"kept", "1"}}},
        // Texts that end inside a pair.
        {"a = \"1\"\nbc", {{"a", "1"}}, "Index is greater than Size!"},
        {"a = \"1\"\nbc ", {{"a", "1"}}, "Index is greater than Size! (Line 2)"},
        {"a = \"1\"\nbc =", {{"a", "1"}}, "Index is greater than Size! (Line 2)"},
        {"a = \"1\"\nbc = \"", {{"a", "1"}}, "Index is greater than Size! (Line 2)"},
        {"a = \"1\"\nbc = \"xy", {{"a", "1"}}, "Index is greater than Size!"},
        {"a = \"1\"\nbc = \"xy\n", {{"a", "1"}}, "Index is greater than Size!"},
        // A NUL byte ends the text.
        {"a = \"1\"\n\0b = \"2\"\n"s, {{"a", "1"}}},
        {"\0a = \"1\"\n"s, {}},
        {"# c\0\na = \"1\"\n"s, {}},
        {"a = \"1\"\nb = \"x\0y\"\nc = \"3\"\n"s,
         {{"a", "1"}},
         "End of file encountered in val string"},
        {"a = \"1\"\nbc\0 = \"2\"\n"s, {{"a", "1"}}, "Invalid characher ascii(0) found. (line 2)"},
        // Lengths: 2055 characters fit, 2056 do not; newlines count too.
        {longKey + " = \"1\"", {{longKey, "1"}}},
        {longKey + "k = \"1\"\nok = \"1\"",
         {{"ok", "1"}},
         "Key longer than 2056 found in key/value pair"},
        {"k = \"" + longValue + "\"", {{"k", longValue}}},
        {"k = \"" + longValue + "v\"\nok = \"1\"",
         {{"ok", "1"}},
         "Val longer than 2056 found in key/value pair"},
        {"k = \"" + newlines + "\"", {{"k", newlines}}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.text.substr(0, 40));
        KviLogCapture log;
        Shell shell;
        EXPECT_EQ(shell.parse(c.text), SA_OK);
        EXPECT_EQ(shell.pairs(), c.expected);
        EXPECT_TRUE(c.message == nullptr || log.contains(c.message)) << c.message;
        EXPECT_FALSE(log.contains("Can't make progress"));
    }
}

TEST(KviConfigParser, AOneCharacterKeyAgainstANulStopsTheWalk)
{
    KviLogCapture log;
    Shell stuck;
    EXPECT_EQ(stuck.parse("a = \"1\"\nb\0c = \"2\"\n"s), SA_ERR_HPI_ERROR);
    EXPECT_EQ(stuck.pairs(), (Pairs{{"a", "1"}}));
    EXPECT_TRUE(log.contains("Can't make progress"));
}

TEST(KviConfigParser, OutOfMemoryDropsOnlyThatPairAndLeaksNothing)
{
    KviLogCapture log;
    Shell shell;
    SaHpiInt32T base = kviTestLiveBlocks();
    // Pair, node, key copy, value copy.
    for (SaHpiInt32T nth = 1; nth <= 4; ++nth) {
        SCOPED_TRACE(nth);
        kviCsMemoryFailNthAllocation(nth);
        EXPECT_EQ(kviCsCfgDataRegisterKeyValuePair("k", "v", shell.container()),
                  SA_ERR_HPI_OUT_OF_SPACE);
        EXPECT_EQ(kviTestLiveBlocks(), base);
    }
    EXPECT_TRUE(log.contains("malloc failed"));
    // A pair that cannot join the list is given back too.
    KviCsCfgContainer noList{};
    EXPECT_EQ(kviCsCfgDataRegisterKeyValuePair("k", "v", &noList), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsLinkedListAddToTail failed with"));
    EXPECT_EQ(kviTestLiveBlocks(), base);

    kviCsMemoryFailNthAllocation(5); // the second pair's own block
    EXPECT_EQ(shell.parse("a = \"1\"\nb = \"2\"\nc = \"3\"\n"), SA_OK);
    EXPECT_EQ(shell.pairs(), (Pairs{{"a", "1"}, {"c", "3"}}));
    EXPECT_TRUE(log.contains("kviCsCfgDataRegisterKeyValuePair failed rc="));
}

// The file reader -----------------------------------------------------------

TEST(KviConfigReader, FilesOfEveryShapeLoadWhatIsWellFormed)
{
    KviTempDir dir;
    const std::pair<std::string, size_t> files[] = {
        {"a = \"1\"\nb = \"2\"", 2}, // no final newline
        {"", 0},
        {"a = \"1\"\nke", 1},
        {"a = \"1\"\nkey = \"val", 1},
        {"a = \"1\"\n\0b = \"2\"\n"s, 1},
        {"\x89PNG\r\n\x1a\nok = \"1\"\n\xff\xd8\xff\xe0", 1},
        {"\x7f"
         "ELF\2\1\1\0\0\0\0\0\0\0\0\0\3\0>\0\1\0\0\0\x10\x10\0\0"s,
         0},
    };
    for (const auto &[text, count] : files) {
        SCOPED_TRACE(text.substr(0, 20));
        Shell shell(dir.write("cfg", text));
        SaHpiInt64T modified = 0;
        ASSERT_EQ(kviCsGetFileInfo(dir.file("cfg").c_str(), &modified, nullptr), SA_OK);
        SaHpiInt32T base = kviTestLiveBlocks();
        EXPECT_EQ(kviCsConfigLoadValues(shell.container()), SA_OK);
        EXPECT_EQ(shell.pairs().size(), count);
        EXPECT_EQ(shell.container()->UpdateTime, modified);
        EXPECT_EQ(kviTestLiveBlocks(), base + 4 * static_cast<SaHpiInt32T>(count)); // no buffer
    }
}

TEST(KviConfigReader, FilesThatCannotBeRead)
{
    KviLogCapture log;
    KviTempDir dir;
    SaHpiInt32T base = kviTestLiveBlocks();
    Shell missing(dir.file("missing"));
    EXPECT_EQ(kviCsConfigLoadValues(missing.container()), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(
        log.contains("Can't open " + dir.file("missing") + ".  error = No such file or directory"));
    Shell directory(dir.path());
    EXPECT_EQ(kviCsConfigLoadValues(directory.container()), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("ferror received while reading config file"));
    EXPECT_EQ(kviTestLiveBlocks(), base);
}

std::string growingFile;
void appendToFile(const char *)
{
    FILE *f = fopen(growingFile.c_str(), "a");
    fputs("more = \"x\"\n", f);
    fclose(f);
}

TEST(KviConfigReader, AFileThatChangesWhileReadIsGivenUpAfterFiveAttempts)
{
    KviLogCapture log;
    KviTempDir dir;
    growingFile = dir.write("cfg", "a = \"1\"\n");
    Shell shell(growingFile);
    SaHpiInt32T base = kviTestLiveBlocks();
    kviCsConfigSetReadHook(appendToFile);
    EXPECT_EQ(kviCsConfigLoadValues(shell.container()), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Avoiding infinite loop"));
    // The stream is not rewound: the retries find it at its end.
    EXPECT_EQ(log.matching("Unexpected eof found in " + growingFile).size(), 4u);
    EXPECT_TRUE(shell.pairs().empty());
    EXPECT_EQ(kviTestLiveBlocks(), base);

    // Out of memory for the buffer, and for growing it on the second attempt.
    kviCsConfigSetReadHook(nullptr);
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsConfigLoadValues(shell.container()), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Unable to malloc space!"));
    kviCsConfigSetReadHook(appendToFile);
    kviCsMemoryFailNthAllocation(2);
    EXPECT_EQ(kviCsConfigLoadValues(shell.container()), SA_ERR_HPI_OUT_OF_SPACE);
    kviCsConfigSetReadHook(nullptr);
    kviCsMemoryFailNthAllocation(0);
    EXPECT_TRUE(log.contains("Unable to realloc space!"));
    EXPECT_EQ(kviTestLiveBlocks(), base);
}

TEST(KviConfigReader, TenMegabytesWithBadLinesLoadWhatIsWellFormed)
{
    KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
    KviTempDir dir;
    std::string text;
    size_t good = 0, broken = 0;
    for (size_t line = 0; text.size() < (10u << 20); ++line) {
        const bool bad = line % 1000 == 999;
        text += bad ? "broken=\"line\"\n"s
                    : "key" + std::to_string(line) + " = \"" + std::string(80, 'a' + line % 26) +
                          "\"\n";
        ++(bad ? broken : good);
    }
    text += "last = \"unterminated";
    Shell shell(dir.write("cfg", text));
    EXPECT_EQ(kviCsConfigLoadValues(shell.container()), SA_OK);
    EXPECT_EQ(shell.pairs().size(), good);
    EXPECT_EQ(log.matching("found when expecting equal sign").size(), broken);
    EXPECT_TRUE(log.contains("Index is greater than Size!"));
}
} // namespace
