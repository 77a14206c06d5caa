// The configuration file's grammar, its quirks and the reader's retry loop.
// Texts are handed to the parser in heap buffers of exactly their size, with
// no terminating NUL, so that AddressSanitizer reports any read past the end.
#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <random>
#include <string>
#include <utility>
#include <vector>

#include "core/utils/KviConfig.h"
#include "core/utils/Memory.h"
#include "support/KviTestSupport.h"

namespace
{
using Pairs = std::vector<std::pair<std::string, std::string>>;

// A bare list in a container shell: all the parser needs.
class ParsedText
{
  public:
    ParsedText()
    {
        kviCsLinkedListInitialize(&list_);
        container_.KeyValueList = &list_;
    }
    ~ParsedText() { EXPECT_EQ(kviCsCfgFreeKeyValueList(&list_), SA_OK); }
    ParsedText(const ParsedText &) = delete;
    ParsedText &operator=(const ParsedText &) = delete;

    SaErrorT parse(std::string_view text)
    {
        std::unique_ptr<char[]> exact(new char[text.size()]);
        if (!text.empty())
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
    KviCsLinkedListT list_{};
    KviCsCfgContainer container_{};
};

Pairs parsePairs(std::string_view text)
{
    ParsedText parsed;
    EXPECT_EQ(parsed.parse(text), SA_OK) << text;
    return parsed.pairs();
}

TEST(KviConfigParser, GrammarOfAPair)
{
    KviLogCapture log;
    struct Case {
        const char *text;
        Pairs expected;
    };
    const Case cases[] = {
        {"key = \"value\"\n", {{"key", "value"}}},
        {"key\t=\t\"value\"", {{"key", "value"}}},
        {"key =\"v\"", {{"key", "v"}}},
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
        {"dup = \"first\"\ndup = \"second\"\n", {{"dup", "first"}, {"dup", "second"}}},
        // A newline may end the key; the equal sign follows on the next line.
        {"k\n= \"v\"", {{"k", "v"}}},
        {"", {}},
        {"\n\n  \t\r\n", {}},
        {"#", {}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.text);
        EXPECT_EQ(parsePairs(c.text), c.expected);
    }
}

TEST(KviConfigParser, RefusedLinesAreSkippedAndReported)
{
    struct Case {
        const char *text;
        const char *message;
        Pairs expected;
    };
    const Case cases[] = {
        // The byte that ends a key is consumed with it, so a key written
        // against its equal sign meets the quote where "=" should be.
        {"key=\"value\"\nok = \"1\"",
         "Unexpected token asc(34) '\"' found when expecting equal sign, line 1",
         {{"ok", "1"}}},
        {"key ==\"v\"\nok = \"1\"",
         "Value doesn't start with double quotes! line=1",
         {{"ok", "1"}}},
        {"key = value\nok = \"1\"",
         "Value doesn't start with double quotes! line=1",
         {{"ok", "1"}}},
        {"\"q\" = \"1\"\nok = \"1\"",
         "Invalid character asc(34) found in config file at position 0!",
         {{"ok", "1"}}},
        {"ok = \"1\"\n!x = \"1\"",
         "Invalid character asc(33) found in config file at position 9!",
         {{"ok", "1"}}},
        {"ke!y = \"1\"\nok = \"1\"", "Invalid characher ascii(33) found. (line 1)", {{"ok", "1"}}},
        // A carriage return inside a key is not a key character.
        {"k\r = \"1\"\nok = \"1\"", "Invalid characher ascii(13) found. (line 1)", {{"ok", "1"}}},
        {"\xff\xfe = \"1\"\nok = \"1\"",
         "Invalid character asc(255) found in config file at position 0!",
         {{"ok", "1"}}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.text);
        KviLogCapture log;
        EXPECT_EQ(parsePairs(c.text), c.expected);
        EXPECT_TRUE(log.contains(c.message));
    }
}

TEST(KviConfigParser, LineNumbersSkipNewlinesInsideValuesAndAfterKeys)
{
    KviLogCapture log;
    // "bad" stands on line 4, but the value's two newlines are not counted.
    EXPECT_EQ(parsePairs("a = \"1\n2\n3\"\nbad \"v\"\n"), (Pairs{{"a", "1\n2\n3"}}));
    EXPECT_TRUE(log.contains("found when expecting equal sign, line 2"));

    log.clear();
    // The newline that ends the key "k" is not counted either.
    EXPECT_EQ(parsePairs("k\n= \"v\"\nx \"y\"\n"), (Pairs{{"k", "v"}}));
    EXPECT_TRUE(log.contains("found when expecting equal sign, line 2"));

    log.clear();
    EXPECT_EQ(parsePairs("# comment\n[section]\nx \"y\"\n"), Pairs{});
    EXPECT_TRUE(log.contains("found when expecting equal sign, line 3"));
}

TEST(KviConfigParser, ErrorAtANewlineCostsTheFollowingLine)
{
    KviLogCapture log;
    EXPECT_EQ(parsePairs("k =\nlost = \"1\"\nkept = \"2\"\n"), (Pairs{{"kept", "2"}}));
    EXPECT_TRUE(log.contains("Value doesn't start with double quotes! line=1"));
    EXPECT_EQ(parsePairs("k = \t\nlost = \"1\"\nkept = \"2\"\n"), (Pairs{{"kept", "2"}}));
    // An error before the end of the line costs that line only.
    EXPECT_EQ(parsePairs("k = x\nkept = \"1\"\n"), (Pairs{{"kept", "1"}}));
}

TEST(KviConfigParser, KeyAndValueLengthLimits)
{
    const std::string longest(MAX_KEY_LENGTH - 1, 'k');
    const std::string tooLong(MAX_KEY_LENGTH, 'k');
    const std::string value(MAX_VALUE_LENGTH - 1, 'v');
    const std::string tooLongValue(MAX_VALUE_LENGTH, 'v');
    KviLogCapture log;

    EXPECT_EQ(parsePairs(longest + " = \"1\""), (Pairs{{longest, "1"}}));
    EXPECT_EQ(parsePairs(tooLong + " = \"1\"\nok = \"1\""), (Pairs{{"ok", "1"}}));
    EXPECT_TRUE(log.contains("Key longer than 2056 found in key/value pair"));

    EXPECT_EQ(parsePairs("k = \"" + value + "\""), (Pairs{{"k", value}}));
    log.clear();
    EXPECT_EQ(parsePairs("k = \"" + tooLongValue + "\"\nok = \"1\""), (Pairs{{"ok", "1"}}));
    EXPECT_TRUE(log.contains("Val longer than 2056 found in key/value pair"));

    // A value of newlines only is as long as any other.
    const std::string newlines(MAX_VALUE_LENGTH - 1, '\n');
    EXPECT_EQ(parsePairs("k = \"" + newlines + "\""), (Pairs{{"k", newlines}}));
}

TEST(KviConfigParser, TextsThatEndEarly)
{
    struct Case {
        std::string text;
        const char *message;
    };
    const Case cases[] = {
        {"a = \"1\"\nbc", "Index is greater than Size!"},
        {"a = \"1\"\nbc ", "Index is greater than Size! (Line 2)"},
        {"a = \"1\"\nbc =", "Index is greater than Size! (Line 2)"},
        {"a = \"1\"\nbc = \"", "Index is greater than Size! (Line 2)"},
        {"a = \"1\"\nbc = \"xy", "Index is greater than Size!"},
        {"a = \"1\"\nbc = \"xy\n", "Index is greater than Size!"},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.text);
        KviLogCapture log;
        EXPECT_EQ(parsePairs(c.text), (Pairs{{"a", "1"}}));
        EXPECT_TRUE(log.contains(c.message));
    }
    // No final newline is no problem.
    EXPECT_EQ(parsePairs("a = \"1\"\nb = \"2\""), (Pairs{{"a", "1"}, {"b", "2"}}));
}

TEST(KviConfigParser, NulBytesEndTheText)
{
    using namespace std::string_literals;
    KviLogCapture log;
    EXPECT_EQ(parsePairs("a = \"1\"\n\0b = \"2\"\n"s), (Pairs{{"a", "1"}}));
    EXPECT_EQ(parsePairs("\0a = \"1\"\n"s), Pairs{});
    EXPECT_EQ(parsePairs("# c\0\na = \"1\"\n"s), Pairs{});

    EXPECT_EQ(parsePairs("a = \"1\"\nb = \"x\0y\"\nc = \"3\"\n"s), (Pairs{{"a", "1"}}));
    EXPECT_TRUE(log.contains("End of file encountered in val string"));

    log.clear();
    EXPECT_EQ(parsePairs("a = \"1\"\nbc\0 = \"2\"\n"s), (Pairs{{"a", "1"}}));
    EXPECT_TRUE(log.contains("Invalid characher ascii(0) found. (line 2)"));
    EXPECT_FALSE(log.contains("Can't make progress"));

    // A one-character key against a NUL leaves the walk where the key began.
    log.clear();
    ParsedText stuck;
    EXPECT_EQ(stuck.parse("a = \"1\"\nb\0c = \"2\"\n"s), SA_ERR_HPI_ERROR);
    EXPECT_EQ(stuck.pairs(), (Pairs{{"a", "1"}}));
    EXPECT_TRUE(log.contains("Can't make progress"));
}

TEST(KviConfigParser, BinaryNoiseLoadsOnlyWellFormedPairs)
{
    KviLogCapture log(KVI_LOG_ERR_FATAL_NUM);
    std::mt19937 random(20240611);
    for (int round = 0; round < 20; ++round) {
        std::string text(4096 + round * 512, '\0');
        for (auto &byte : text) {
            // Mostly the grammar's own bytes, so that pairs do form now and
            // then; NUL bytes (which end the text) only in a few rounds.
            static const char alphabet[] = "ab = \"\n#[;\r\t\xff";
            byte = random() % 4 == 0 ? static_cast<char>(random())
                                     : alphabet[random() % (sizeof alphabet - 1)];
            if (byte == '\0' && round % 5 != 0)
                byte = 'z';
        }
        ParsedText parsed;
        parsed.parse(text);
        for (auto &[key, value] : parsed.pairs()) {
            ASSERT_FALSE(key.empty());
            EXPECT_EQ(key.find_first_not_of(KV_VALID_CHARACTERS), std::string::npos);
            EXPECT_LT(key.size(), static_cast<size_t>(MAX_KEY_LENGTH));
            EXPECT_LT(value.size(), static_cast<size_t>(MAX_VALUE_LENGTH));
            EXPECT_EQ(value.find('"'), std::string::npos);
        }
    }
}

TEST(KviConfigParser, PairParserStopsOnTheClosingQuote)
{
    KviLogCapture log;
    ParsedText parsed;
    const char text[] = {'k', ' ', '=', ' ', '"', 'v', '"', ' ', 'x'};
    SaHpiUint32T index = 0;
    EXPECT_EQ(kviCsCfgDataParseKeyValuePair(text, sizeof text, 1, &index, parsed.container()),
              SA_OK);
    EXPECT_EQ(index, 6u);
    EXPECT_EQ(parsed.pairs(), (Pairs{{"k", "v"}}));

    EXPECT_EQ(kviCsCfgDataParseKeyValuePair(nullptr, 1, 1, &index, parsed.container()),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("CfgFileText pointer is NULL."));
    EXPECT_EQ(kviCsCfgDataParseKeyValuePair(text, 1, 1, nullptr, parsed.container()),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Index pointer is NULL."));
    EXPECT_EQ(kviCsCfgDataParseKeyValuePair(text, 1, 1, &index, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsCfgDataParseData(nullptr, 1, parsed.container()), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsCfgDataParseData(text, 1, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("CfgCont pointer is NULL."));
}

TEST(KviConfigParser, RegisteringAPairGivesBackEverythingWhenMemoryRunsOut)
{
    KviLogCapture log;
    ParsedText parsed;
    SaHpiInt32T base = kviTestLiveBlocks();
    // Pair, node, key copy, value copy.
    for (SaHpiInt32T nth = 1; nth <= 4; ++nth) {
        SCOPED_TRACE(nth);
        kviCsMemoryFailNthAllocation(nth);
        EXPECT_EQ(kviCsCfgDataRegisterKeyValuePair("k", "v", parsed.container()),
                  SA_ERR_HPI_OUT_OF_SPACE);
        EXPECT_EQ(kviTestLiveBlocks(), base);
    }
    EXPECT_TRUE(log.contains("malloc failed"));
    EXPECT_EQ(parsed.pairs(), Pairs{});

    // A pair that cannot join the list is given back too.
    KviCsCfgContainer noList{};
    EXPECT_EQ(kviCsCfgDataRegisterKeyValuePair("k", "v", &noList), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsLinkedListAddToTail failed with"));
    EXPECT_EQ(kviTestLiveBlocks(), base);

    EXPECT_EQ(kviCsCfgDataRegisterKeyValuePair(nullptr, "v", parsed.container()),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Key pointer is NULL."));
    EXPECT_EQ(kviCsCfgDataRegisterKeyValuePair("k", nullptr, parsed.container()),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Value pointer is NULL."));
}

TEST(KviConfigParser, OutOfMemoryWhileParsingDropsOnlyThatPair)
{
    KviLogCapture log;
    ParsedText parsed;
    kviCsMemoryFailNthAllocation(5); // the second pair's own block
    EXPECT_EQ(parsed.parse("a = \"1\"\nb = \"2\"\nc = \"3\"\n"), SA_OK);
    EXPECT_EQ(parsed.pairs(), (Pairs{{"a", "1"}, {"c", "3"}}));
    EXPECT_TRUE(log.contains("kviCsCfgDataRegisterKeyValuePair failed rc="));
}

TEST(KviConfigParser, TrailingWhitespaceIsCut)
{
    const std::pair<std::string, std::string> cases[] = {
        {"12 \t\n\r\v\f", "12"}, {"", ""}, {"   ", ""}, {" a b ", " a b"}, {"x", "x"}};
    for (const auto &[in, out] : cases) {
        std::string text = in;
        EXPECT_EQ(rmTrailingWhitespace(text.data()), SA_OK);
        EXPECT_STREQ(text.c_str(), out.c_str());
    }
    EXPECT_EQ(rmTrailingWhitespace(nullptr), SA_ERR_HPI_INVALID_PARAMS);
}

// The file reader -----------------------------------------------------------

class FileShell
{
  public:
    explicit FileShell(const std::string &path) : name_(path)
    {
        kviCsLinkedListInitialize(&list_);
        container_.KeyValueList = &list_;
        container_.Filename = name_.data();
    }
    ~FileShell() { kviCsCfgFreeKeyValueList(&list_); }
    KviCsCfgContainer *container() { return &container_; }
    size_t pairCount() const
    {
        size_t n = 0;
        for (auto *node = list_.HeadPointer; node != nullptr; node = node->Next)
            ++n;
        return n;
    }

  private:
    std::string name_;
    KviCsLinkedListT list_{};
    KviCsCfgContainer container_{};
};

std::string growingFile;
void appendToFile(const char *)
{
    FILE *f = fopen(growingFile.c_str(), "a");
    fputs("more = \"x\"\n", f);
    fclose(f);
}

TEST(KviConfigReader, LoadsAFileAndKeepsItsModificationTime)
{
    KviLogCapture log;
    KviTempDir dir;
    FileShell shell(dir.write("cfg", "a = \"1\"\nb = \"2\""));
    SaHpiInt64T modified = 0;
    ASSERT_EQ(kviCsGetFileInfo(dir.file("cfg").c_str(), &modified, nullptr), SA_OK);
    SaHpiInt32T base = kviTestLiveBlocks();
    EXPECT_EQ(kviCsConfigLoadValues(shell.container()), SA_OK);
    EXPECT_EQ(shell.pairCount(), 2u);
    EXPECT_EQ(shell.container()->UpdateTime, modified);
    EXPECT_EQ(kviTestLiveBlocks(), base + 2 * 4); // the buffer is given back
    EXPECT_TRUE(log.contains("File opened"));
}

TEST(KviConfigReader, AnEmptyFileIsAnEmptyConfiguration)
{
    KviTempDir dir;
    FileShell shell(dir.write("cfg", ""));
    SaHpiInt32T base = kviTestLiveBlocks();
    EXPECT_EQ(kviCsConfigLoadValues(shell.container()), SA_OK);
    EXPECT_EQ(shell.pairCount(), 0u);
    EXPECT_EQ(kviTestLiveBlocks(), base);
}

TEST(KviConfigReader, FilesThatCannotBeRead)
{
    KviLogCapture log;
    KviTempDir dir;
    SaHpiInt32T base = kviTestLiveBlocks();
    FileShell missing(dir.file("missing"));
    EXPECT_EQ(kviCsConfigLoadValues(missing.container()), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(
        log.contains("Can't open " + dir.file("missing") + ".  error = No such file or directory"));

    FileShell directory(dir.path());
    EXPECT_EQ(kviCsConfigLoadValues(directory.container()), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("ferror received while reading config file"));
    EXPECT_EQ(kviTestLiveBlocks(), base);

    EXPECT_EQ(kviCsConfigLoadValues(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("ConfigContainer pointer is NULL."));
    KviCsCfgContainer unnamed{};
    EXPECT_EQ(kviCsConfigLoadValues(&unnamed), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("ConfigContainer->Filename pointer is NULL."));
}

TEST(KviConfigReader, AFileThatChangesWhileReadIsGivenUpAfterFiveAttempts)
{
    KviLogCapture log;
    KviTempDir dir;
    growingFile = dir.write("cfg", "a = \"1\"\n");
    FileShell shell(growingFile);
    SaHpiInt32T base = kviTestLiveBlocks();
    kviCsConfigSetReadHook(appendToFile);
    EXPECT_EQ(kviCsConfigLoadValues(shell.container()), SA_ERR_HPI_ERROR);
    kviCsConfigSetReadHook(nullptr);
    EXPECT_TRUE(log.contains("Avoiding infinite loop"));
    // The stream is not rewound: the retries find it at its end.
    EXPECT_EQ(log.matching("Unexpected eof found in " + growingFile).size(), 4u);
    EXPECT_EQ(shell.pairCount(), 0u);
    EXPECT_EQ(kviTestLiveBlocks(), base);
}

TEST(KviConfigReader, OutOfMemoryForTheBuffer)
{
    KviLogCapture log;
    KviTempDir dir;
    growingFile = dir.write("cfg", "a = \"1\"\n");
    FileShell shell(growingFile);
    SaHpiInt32T base = kviTestLiveBlocks();

    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsConfigLoadValues(shell.container()), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Unable to malloc space!"));
    EXPECT_EQ(kviTestLiveBlocks(), base);

    // The second attempt grows the buffer for the longer file.
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
    text.reserve(10u << 20);
    size_t good = 0;
    size_t broken = 0;
    for (size_t line = 0; text.size() < (10u << 20); ++line) {
        if (line % 1000 == 999) {
            text += "broken=\"line\"\n";
            ++broken;
            continue;
        }
        text += "key" + std::to_string(line) + " = \"" + std::string(80, 'a' + line % 26) + "\"\n";
        ++good;
    }
    text += "last = \"unterminated";
    FileShell shell(dir.write("cfg", text));
    EXPECT_EQ(kviCsConfigLoadValues(shell.container()), SA_OK);
    EXPECT_EQ(shell.pairCount(), good);
    EXPECT_EQ(log.matching("found when expecting equal sign").size(), broken);
    EXPECT_TRUE(log.contains("Index is greater than Size!"));
}
} // namespace
