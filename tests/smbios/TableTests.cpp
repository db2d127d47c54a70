// The SMBIOS structure table model: parsing a raw table into structures,
// the bounded field readers, string lookup, find, copying and the
// streaming operators, with the log lines they write.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <set>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

#include "QNLog/QNLogger.h"
#include "TestSupport.h"
#include "smbios/SmBios.h"

using smbiostest::LogCapture;
using smbiostest::Structure;
using smbiostest::TableBuilder;

namespace {

typedef std::vector<unsigned char> Bytes;

// Whether the call throws std::out_of_range with an empty message.
template <typename Call>
::testing::AssertionResult throwsEmptyOutOfRange(Call call) {
    try {
        call();
    } catch (std::out_of_range const& e) {
        if (std::string(e.what()).empty()) {
            return ::testing::AssertionSuccess();
        }
        return ::testing::AssertionFailure()
               << "std::out_of_range with message '" << e.what() << "'";
    } catch (...) {
        return ::testing::AssertionFailure() << "another exception than std::out_of_range";
    }
    return ::testing::AssertionFailure() << "no exception";
}

// The level of the first captured message whose text contains `text`, or -1.
int capturedLevel(std::string const& text) {
    for (QNLog::QNLogRecord const& record : QNLog::QNLogger::captured()) {
        if (record.text.find(text) != std::string::npos) {
            return record.level;
        }
    }
    return -1;
}

// A table model with version bytes, as the acquisition sets them.
class VersionedSmBios : public SD::SmBios {
public:
    VersionedSmBios(Bytes const& raw, unsigned char major, unsigned char minor,
                    unsigned char revision)
        : SD::SmBios(raw) {
        majorVersion_ = major;
        minorVersion_ = minor;
        revision_ = revision;
    }
};

// Type 1 with two string fields, "A" and "BC": formatted area of 6 bytes.
Structure twoStrings(uint16_t handle) { return Structure(1, handle).str("A").str("BC"); }

}  // namespace

// ---------------------------------------------------------------------------
// Parsing a raw table

TEST(SmBiosRawTable, ZeroToThreeBytesYieldNoTables) {
    Bytes const whole = Structure(1, 0x0001).byte(2).build();
    for (size_t n = 0; n <= 3; ++n) {
        LogCapture log;
        Bytes const raw(whole.begin(), whole.begin() + static_cast<std::ptrdiff_t>(n));
        SD::SmBios const smbios(raw);
        EXPECT_TRUE(smbios.getTables().empty()) << n << " bytes";
        EXPECT_EQ(smbios.getMajorVersion(), 0);
        EXPECT_EQ(smbios.getMinorVersion(), 0);
        EXPECT_EQ(smbios.getRevision(), 0);
        EXPECT_TRUE(log.contains("Constructor (const vector<Byte>) entry")) << log.dump();
        EXPECT_TRUE(log.contains("Constructor (const vector<Byte>) exit")) << log.dump();
        // With no bytes at all no structure is even tried.
        EXPECT_EQ(log.contains("Table::Constructor vector<Byte> too small return"), n > 0)
            << n << " bytes\n"
            << log.dump();
    }
}

TEST(SmBiosRawTable, TrailingFragmentOfOneToThreeBytesIsDropped) {
    Bytes const first = twoStrings(0x0001).build();
    Bytes const next = Structure(2, 0x0002).byte(7).build();
    for (size_t n = 1; n <= 3; ++n) {
        Bytes const fragment(next.begin(), next.begin() + static_cast<std::ptrdiff_t>(n));
        Bytes const raw = TableBuilder().add(twoStrings(0x0001)).addRaw(fragment).build();
        LogCapture log;
        SD::SmBios const smbios(raw);
        ASSERT_EQ(smbios.getTables().size(), 1u) << n << "-byte fragment";
        EXPECT_EQ(smbios.getTables()[0].getData(), first);
        EXPECT_TRUE(log.contains("Table::Constructor vector<Byte> too small return")) << log.dump();
    }
}

TEST(SmBiosRawTable, StructuresKeepTheirFieldsAndRawBytes) {
    Bytes const a = twoStrings(0x1234).build();
    Bytes const b = Structure(4, 0x0005).byte(0x11).word(0x2233).str("CPU").build();
    Bytes const raw = TableBuilder()
                          .add(twoStrings(0x1234))
                          .add(Structure(4, 0x0005).byte(0x11).word(0x2233).str("CPU"))
                          .build();
    LogCapture log;
    SD::SmBios const smbios(raw);
    ASSERT_EQ(smbios.getTables().size(), 2u);
    SD::SmBios::Table const& t0 = smbios.getTables()[0];
    EXPECT_EQ(t0.getType(), 1);
    EXPECT_EQ(t0.getLength(), 6);
    EXPECT_EQ(t0.getHandle(), 0x1234);
    EXPECT_EQ(t0.getStrCount(), 2u);
    EXPECT_EQ(t0.getData(), a);
    SD::SmBios::Table const& t1 = smbios.getTables()[1];
    EXPECT_EQ(t1.getType(), 4);
    EXPECT_EQ(t1.getLength(), 8);
    EXPECT_EQ(t1.getHandle(), 0x0005);
    EXPECT_EQ(t1.getStrCount(), 1u);
    EXPECT_EQ(t1.getData(), b);
    // Each message goes through both the log and the trace.
    EXPECT_EQ(log.count("Table::Constructor vector<Byte> good return"), 2u * 2u) << log.dump();
}

TEST(SmBiosRawTable, TableFromBytesParsesOnlyTheFirstStructure) {
    Bytes const first = twoStrings(0x0101).build();
    Bytes const raw =
        TableBuilder().add(twoStrings(0x0101)).add(Structure(2, 0x0202).byte(1)).build();
    SD::SmBios::Table const table(raw);
    EXPECT_EQ(table.getType(), 1);
    EXPECT_EQ(table.getHandle(), 0x0101);
    EXPECT_EQ(table.getData(), first);
}

TEST(SmBiosRawTable, DefaultTableIsEmpty) {
    SD::SmBios::Table const table;
    EXPECT_EQ(table.getType(), 0);
    EXPECT_EQ(table.getLength(), 0);
    EXPECT_EQ(table.getHandle(), 0);
    EXPECT_TRUE(table.getData().empty());
}

TEST(SmBiosRawTable, TwoStructuresWithTheSameHandleSurviveParsingAndSorting) {
    Bytes const raw = TableBuilder()
                          .add(Structure(17, 0x0005).byte(1))
                          .add(Structure(4, 0x0003).byte(2))
                          .add(Structure(7, 0x0005).byte(3))
                          .build();
    SD::SmBios smbios(raw);
    ASSERT_EQ(smbios.getTables().size(), 3u);
    std::vector<SD::SmBios::Table> tables = smbios.getTables();
    std::sort(tables.begin(), tables.end(), SD::_sort_criterion_handle);
    ASSERT_EQ(tables.size(), 3u);
    EXPECT_EQ(tables[0].getHandle(), 0x0003);
    EXPECT_EQ(tables[0].getType(), 4);
    EXPECT_EQ(tables[1].getHandle(), 0x0005);
    EXPECT_EQ(tables[2].getHandle(), 0x0005);
    // Equal handles keep no defined order among themselves: both are there.
    std::set<unsigned int> const types = {tables[1].getType(), tables[2].getType()};
    EXPECT_EQ(types, (std::set<unsigned int>{7, 17}));
}

TEST(SmBiosRawTable, EndOfTableStructureIsKeptAtItsHandlesPlace) {
    Bytes const raw = TableBuilder()
                          .add(Structure(0, 0x0010).str("BIOS"))
                          .add(Structure(1, 0x0030).str("Corvane"))
                          .endOfTable(0x0020)
                          .build();
    SD::SmBios smbios(raw);
    ASSERT_EQ(smbios.getTables().size(), 3u);
    EXPECT_EQ(smbios.getTables()[2].getType(), 127);
    std::vector<SD::SmBios::Table> tables = smbios.getTables();
    std::sort(tables.begin(), tables.end(), SD::_sort_criterion_handle);
    EXPECT_EQ(tables[0].getHandle(), 0x0010);
    EXPECT_EQ(tables[1].getType(), 127);
    EXPECT_EQ(tables[1].getHandle(), 0x0020);
    EXPECT_EQ(tables[2].getHandle(), 0x0030);
}

TEST(SmBiosRawTable, ParsingGoesOnAfterTheEndOfTableStructure) {
    Bytes const raw =
        TableBuilder().endOfTable(0x0001).add(Structure(2, 0x0002).str("Board")).build();
    SD::SmBios const smbios(raw);
    ASSERT_EQ(smbios.getTables().size(), 2u);
    EXPECT_EQ(smbios.getTables()[0].getType(), 127);
    EXPECT_EQ(smbios.getTables()[1].getType(), 2);
    EXPECT_EQ(smbios.getTables()[1].getHandle(), 0x0002);
}

TEST(SmBiosRawTable, SortCriterionComparesHandlesUnsigned) {
    SD::SmBios::Table const low(Structure(1, 0x7FFF).build());
    SD::SmBios::Table const high(Structure(1, 0x8000).build());
    EXPECT_TRUE(SD::_sort_criterion_handle(low, high));
    EXPECT_FALSE(SD::_sort_criterion_handle(high, low));
    EXPECT_FALSE(SD::_sort_criterion_handle(low, low));
}

TEST(SmBiosRawTable, LengthByteBeyondTheRemainingBytesStopsParsingSafely) {
    Bytes const first = twoStrings(0x0001).build();
    Bytes const overlong = Structure(2, 0x0002).byte(9).length(0x40).build();
    Bytes const raw = TableBuilder()
                          .add(twoStrings(0x0001))
                          .add(Structure(2, 0x0002).byte(9).length(0x40))
                          .build();
    SD::SmBios const smbios(raw);
    ASSERT_EQ(smbios.getTables().size(), 2u);
    EXPECT_EQ(smbios.getTables()[0].getData(), first);
    SD::SmBios::Table const& t = smbios.getTables()[1];
    EXPECT_EQ(t.getType(), 2);
    EXPECT_EQ(t.getLength(), 0x40);
    EXPECT_EQ(t.getHandle(), 0x0002);
    ASSERT_GE(t.getData().size(), overlong.size());
    EXPECT_TRUE(std::equal(overlong.begin(), overlong.end(), t.getData().begin()));
    EXPECT_EQ(t.getByte(4), 9);
    EXPECT_TRUE(
        throwsEmptyOutOfRange([&t] { t.getByte(static_cast<unsigned char>(t.getData().size())); }));
}

TEST(SmBiosRawTable, LastStructureWithoutStringSetEndsParsing) {
    Bytes const raw = TableBuilder()
                          .add(twoStrings(0x0001))
                          .add(Structure(2, 0x0002).byte(9).noTerminator())
                          .build();
    SD::SmBios const smbios(raw);
    ASSERT_EQ(smbios.getTables().size(), 2u);
    SD::SmBios::Table const& t = smbios.getTables()[1];
    EXPECT_EQ(t.getType(), 2);
    EXPECT_EQ(t.getLength(), 5);
    // The formatted area, then the two NULs the parser appends.
    EXPECT_EQ(t.getData(), (Bytes{2, 5, 2, 0, 9, 0, 0}));
    EXPECT_EQ(t.getStrCount(), 1u);
    ASSERT_NE(t.getString(1), nullptr);
    EXPECT_STREQ(t.getString(1), "");
}

TEST(SmBiosRawTable, LastStructureWithUnterminatedStringsKeepsThem) {
    Bytes const raw = TableBuilder()
                          .add(twoStrings(0x0001))
                          .add(Structure(3, 0x0003).str("XY").noTerminator())
                          .build();
    SD::SmBios const smbios(raw);
    ASSERT_EQ(smbios.getTables().size(), 2u);
    SD::SmBios::Table const& t = smbios.getTables()[1];
    EXPECT_EQ(t.getStrCount(), 1u);
    ASSERT_NE(t.getString(1), nullptr);
    EXPECT_STREQ(t.getString(1), "XY");
    EXPECT_EQ(t.getString(2), nullptr);
}

// ---------------------------------------------------------------------------
// Strings

TEST(SmBiosTableStrings, EmptyStringSetCountsOneEmptyString) {
    Bytes const raw = Structure(2, 0x0010).byte(7).build();
    SD::SmBios const smbios(raw);
    ASSERT_EQ(smbios.getTables().size(), 1u);
    SD::SmBios::Table const& t = smbios.getTables()[0];
    EXPECT_EQ(t.getStrCount(), 1u);
    EXPECT_EQ(t.getData(), raw);
    LogCapture log;
    SD::SmBios::String const first = t.getString(1);
    ASSERT_NE(first, nullptr);
    EXPECT_STREQ(first, "");
    // The first of the two closing NULs.
    EXPECT_EQ(first, reinterpret_cast<char const*>(&t.getData()[t.getLength()]));
    EXPECT_EQ(t.getString(2), nullptr);
    EXPECT_TRUE(log.contains("Table::getString index 2 > max of 1 return null char* pointer"))
        << log.dump();
}

TEST(SmBiosTableStrings, TwoStringsOfOneAndTwoCharacters) {
    SD::SmBios const smbios(twoStrings(0x0001).build());
    ASSERT_EQ(smbios.getTables().size(), 1u);
    SD::SmBios::Table const& t = smbios.getTables()[0];
    EXPECT_EQ(t.getStrCount(), 2u);
    LogCapture log;
    ASSERT_NE(t.getString(1), nullptr);
    EXPECT_STREQ(t.getString(1), "A");
    ASSERT_NE(t.getString(2), nullptr);
    EXPECT_STREQ(t.getString(2), "BC");
    EXPECT_TRUE(log.contains("Table::getString return good string BC")) << log.dump();
    EXPECT_EQ(t.getString(3), nullptr);
    EXPECT_TRUE(log.contains(" > max of "));
    EXPECT_TRUE(log.contains("Table::getString index 3 > max of 2 return null char* pointer"))
        << log.dump();
}

TEST(SmBiosTableStrings, IndexZeroIsNullAndLogged) {
    SD::SmBios::Table const t(twoStrings(0x0001).build());
    LogCapture log;
    EXPECT_EQ(t.getString(0), nullptr);
    EXPECT_TRUE(log.contains("Table::getString index 0, return null char* ponter")) << log.dump();
}

TEST(SmBiosTableStrings, EmptyFirstStringIsStringOne) {
    Bytes const raw = Structure(11, 0x0020).byte(2).addString("").addString("B").build();
    SD::SmBios const smbios(raw);
    ASSERT_EQ(smbios.getTables().size(), 1u);
    SD::SmBios::Table const& t = smbios.getTables()[0];
    EXPECT_EQ(t.getData(), raw);
    EXPECT_EQ(t.getStrCount(), 2u);
    ASSERT_NE(t.getString(1), nullptr);
    EXPECT_STREQ(t.getString(1), "");
    ASSERT_NE(t.getString(2), nullptr);
    EXPECT_STREQ(t.getString(2), "B");
    EXPECT_EQ(t.getString(3), nullptr);
}

TEST(SmBiosTableStrings, StringSetRunningOutThrowsEmptyOutOfRangeAndLogsError) {
    // The length byte says 0x40 but the structure ends long before: the
    // string set starts beyond the data.
    SD::SmBios::Table const t(Structure(2, 0x0002).str("A").length(0x40).build());
    ASSERT_GE(t.getStrCount(), 1u);
    LogCapture log;
    EXPECT_TRUE(throwsEmptyOutOfRange([&t] { t.getString(1); }));
    EXPECT_TRUE(log.contains("Table::getString throw out of range exception")) << log.dump();
    EXPECT_EQ(capturedLevel("Table::getString throw out of range exception"), 6000);
}

// ---------------------------------------------------------------------------
// Field readers

TEST(SmBiosTableFields, GetByteReachesIntoTheStringSetGetWordDoesNot) {
    SD::SmBios::Table const t(twoStrings(0x0001).build());
    unsigned char const length = t.getLength();
    EXPECT_EQ(t.getByte(length), 'A');
    EXPECT_EQ(t.getByte(static_cast<unsigned char>(t.getData().size() - 1)), 0);
    EXPECT_TRUE(
        throwsEmptyOutOfRange([&t] { t.getByte(static_cast<unsigned char>(t.getData().size())); }));
    EXPECT_TRUE(throwsEmptyOutOfRange([&t, length] { t.getWord(length - 1); }));
    EXPECT_EQ(t.getWord(length - 2), 0x0201);  // the two string numbers
}

TEST(SmBiosTableFields, WordDWordQWordAreLittleEndianUpToTheLength) {
    SD::SmBios::Table const t(
        Structure(3, 0x0001).dword(0x11223344).qword(0x0102030405060708ull).str("S").build());
    ASSERT_EQ(t.getLength(), 17);
    EXPECT_EQ(t.getWord(4), 0x3344);
    EXPECT_EQ(t.getDWord(4), 0x11223344u);
    EXPECT_EQ(t.getQWord(8), 0x0102030405060708ull);
    EXPECT_EQ(t.getDWord(12), 0x01020304u);
    EXPECT_EQ(t.getWord(15), 0x0101);  // the qword's top byte and the string number
}

TEST(SmBiosTableFields, QWordEndingAtTheLengthSucceeds) {
    SD::SmBios::Table const t(Structure(3, 0x0001).dword(0).qword(0x8877665544332211ull).build());
    ASSERT_EQ(t.getLength(), 16);
    EXPECT_EQ(t.getQWord(8), 0x8877665544332211ull);
    EXPECT_TRUE(throwsEmptyOutOfRange([&t] { t.getQWord(9); }));
}

TEST(SmBiosTableFields, ReadsPastTheFormattedAreaThrowEmptyOutOfRange) {
    SD::SmBios::Table const t(Structure(3, 0x0001).dword(0x11223344).str("WXYZ").build());
    ASSERT_EQ(t.getLength(), 9);
    EXPECT_EQ(t.getDWord(5), 0x01112233u);
    EXPECT_TRUE(throwsEmptyOutOfRange([&t] { t.getDWord(6); }));
    EXPECT_EQ(t.getWord(7), 0x0111);
    EXPECT_TRUE(throwsEmptyOutOfRange([&t] { t.getWord(8); }));
    EXPECT_TRUE(throwsEmptyOutOfRange([&t] { t.getQWord(2); }));
    EXPECT_TRUE(throwsEmptyOutOfRange([&t] { t.getByte(255); }));
    // The table is unchanged by the failed reads.
    EXPECT_EQ(t.getDWord(5), 0x01112233u);
}

TEST(SmBiosTableFields, UnprotectedReadersReachPastTheFormattedAreaAndReadZeroBeyondTheData) {
    SD::SmBios::Table const t(Structure(1, 0x0001).str("AB").build());
    ASSERT_EQ(t.getLength(), 5);
    ASSERT_EQ(t.getData().size(), 9u);
    EXPECT_EQ(t.getByteUnprot(0), 1);
    EXPECT_EQ(t.getByteUnprot(5), 'A');
    EXPECT_EQ(t.getWordUnprot(5), 'A' | ('B' << 8));
    EXPECT_EQ(t.getByteUnprot(9), 0);
    EXPECT_EQ(t.getByteUnprot(100000), 0);
    EXPECT_EQ(t.getWordUnprot(9), 0);
    EXPECT_EQ(t.getWordUnprot(100000), 0);
}

// ---------------------------------------------------------------------------
// find and operator[]

TEST(SmBiosFind, ReturnsTableCountMinusPositionOr255) {
    SD::SmBios smbios(TableBuilder()
                          .add(Structure(1, 0x0001))
                          .add(Structure(4, 0x0002))
                          .add(Structure(4, 0x0003))
                          .add(Structure(17, 0x0004))
                          .build());
    ASSERT_EQ(smbios.getTables().size(), 4u);
    LogCapture log;
    EXPECT_EQ(smbios.find(1), 4);
    EXPECT_EQ(smbios.find(4), 3);
    EXPECT_EQ(smbios.find(17), 1);
    EXPECT_EQ(smbios.find(9), 255);
    EXPECT_TRUE(log.contains("find 17 entry")) << log.dump();
    EXPECT_TRUE(log.contains("find 17 return found")) << log.dump();
    EXPECT_TRUE(log.contains("find 9 entry")) << log.dump();
    EXPECT_TRUE(log.contains("find 9 return not found")) << log.dump();
}

TEST(SmBiosFind, TypeOnlyInTheLastTableGivesOneAndAbsentTypeGives255) {
    SD::SmBios smbios(TableBuilder()
                          .add(Structure(0, 0x0000).str("BIOS"))
                          .add(Structure(1, 0x0001).str("System"))
                          .endOfTable(0x0002)
                          .build());
    EXPECT_EQ(smbios.find(127), 1);
    EXPECT_EQ(smbios.find(2), 255);
}

TEST(SmBiosFind, ResultIsTruncatedToEightBits) {
    TableBuilder builder;
    builder.add(Structure(9, 0x0000));
    for (uint16_t handle = 1; handle < 300; ++handle) {
        builder.add(Structure(1, handle));
    }
    SD::SmBios smbios(builder.build());
    ASSERT_EQ(smbios.getTables().size(), 300u);
    EXPECT_EQ(smbios.find(9), 300 & 0xFF);
    EXPECT_EQ(smbios.find(1), 299 & 0xFF);
}

TEST(SmBiosFind, EmptyTableFindsNothing) {
    SD::SmBios smbios(Bytes{});
    EXPECT_EQ(smbios.find(0), 255);
}

TEST(SmBiosIndex, OperatorIndexReturnsTheTableAtThePosition) {
    SD::SmBios smbios(TableBuilder()
                          .add(Structure(1, 0x0101))
                          .add(Structure(2, 0x0202))
                          .add(Structure(3, 0x0303))
                          .build());
    ASSERT_EQ(smbios.getTables().size(), 3u);
    EXPECT_EQ(smbios[0].getHandle(), 0x0101);
    EXPECT_EQ(smbios[1].getType(), 2);
    EXPECT_EQ(smbios[2].getHandle(), 0x0303);
    EXPECT_EQ(&smbios[1], &smbios.getTables()[1]);
}

// ---------------------------------------------------------------------------
// Copying and destruction

TEST(SmBiosCopy, CopyConstructorCopiesVersionBytesAndTables) {
    VersionedSmBios const original(
        TableBuilder().add(twoStrings(0x0001)).add(Structure(4, 0x0002).byte(3)).build(), 2, 7, 1);
    LogCapture log;
    SD::SmBios copy(static_cast<SD::SmBios const&>(original));
    EXPECT_TRUE(log.contains("Constructor (const SmBios) entry")) << log.dump();
    EXPECT_TRUE(log.contains("Constructor (const SmBios) exit")) << log.dump();
    EXPECT_EQ(copy.getMajorVersion(), 2);
    EXPECT_EQ(copy.getMinorVersion(), 7);
    EXPECT_EQ(copy.getRevision(), 1);
    ASSERT_EQ(copy.getTables().size(), 2u);
    for (size_t i = 0; i < 2; ++i) {
        EXPECT_EQ(copy.getTables()[i].getType(), original.getTables()[i].getType());
        EXPECT_EQ(copy.getTables()[i].getHandle(), original.getTables()[i].getHandle());
        EXPECT_EQ(copy.getTables()[i].getStrCount(), original.getTables()[i].getStrCount());
        EXPECT_EQ(copy.getTables()[i].getData(), original.getTables()[i].getData());
    }
    // The copy is independent of the original.
    copy[0] = SD::SmBios::Table();
    EXPECT_EQ(copy.getTables()[0].getType(), 0);
    EXPECT_EQ(original.getTables()[0].getType(), 1);
    ASSERT_NE(original.getTables()[0].getString(2), nullptr);
    EXPECT_STREQ(original.getTables()[0].getString(2), "BC");
}

TEST(SmBiosCopy, CopiedTablesPointIntoTheirOwnData) {
    SD::SmBios const original(twoStrings(0x0001).build());
    SD::SmBios const copy(original);
    ASSERT_EQ(copy.getTables().size(), 1u);
    SD::SmBios::String const s = copy.getTables()[0].getString(1);
    EXPECT_EQ(s, reinterpret_cast<char const*>(&copy.getTables()[0].getData()[6]));
    EXPECT_NE(s, original.getTables()[0].getString(1));
}

TEST(SmBiosCopy, DestructorLogsEntryExit) {
    LogCapture log;
    {
        SD::SmBios const smbios(Bytes{});
        EXPECT_FALSE(log.contains("Destructor  entry-exit"));
    }
    EXPECT_TRUE(log.contains("Destructor  entry-exit")) << log.dump();
}

// ---------------------------------------------------------------------------
// Streaming operators

TEST(SmBiosStreaming, BytesAreWrittenAsNumbersBetweenAngleBrackets) {
    using SD::operator<<;
    std::vector<SD::SmBios::Byte> const bytes = {1, 2, 65, 255};
    LogCapture log;
    std::ostringstream out;
    std::ostream& returned = (out << bytes);
    EXPECT_EQ(&returned, &out);
    EXPECT_EQ(out.str(), "<1><2><65><255>");
    EXPECT_TRUE(log.contains("<< entry vector<SmBios::Byte>")) << log.dump();
    EXPECT_TRUE(log.contains("<< return vector<SmBios::Byte> =")) << log.dump();
}

TEST(SmBiosStreaming, BytesFollowTheStreamsBase) {
    using SD::operator<<;
    std::vector<SD::SmBios::Byte> const bytes = {0x1F, 0xA0, 0x07};
    std::ostringstream out;
    out << std::hex << bytes;
    EXPECT_EQ(out.str(), "<1f><a0><7>");
}

TEST(SmBiosStreaming, WordsAreWrittenAsNumbersInTheStreamsBase) {
    using SD::operator<<;
    std::vector<SD::SmBios::Word> const words = {0x1234, 7};
    LogCapture log;
    std::ostringstream decimal;
    std::ostream& returned = (decimal << words);
    EXPECT_EQ(&returned, &decimal);
    EXPECT_EQ(decimal.str(), "<4660><7>");
    std::ostringstream hex;
    hex << std::hex << std::uppercase << words;
    EXPECT_EQ(hex.str(), "<1234><7>");
    EXPECT_TRUE(log.contains("<< entry vector<SmBios::Word>")) << log.dump();
    EXPECT_TRUE(log.contains("<< return vector<SmBios::Word> =")) << log.dump();
}

TEST(SmBiosStreaming, StringsAreWrittenAsText) {
    using SD::operator<<;
    std::vector<SD::SmBios::String> const strings = {"Corvane", "", "RS-7400"};
    LogCapture log;
    std::ostringstream out;
    std::ostream& returned = (out << strings);
    EXPECT_EQ(&returned, &out);
    EXPECT_EQ(out.str(), "<Corvane><><RS-7400>");
    EXPECT_TRUE(log.contains("<< entry vector<SmBios::String>")) << log.dump();
    EXPECT_TRUE(log.contains("<< return vector<SmBios::String> =")) << log.dump();
}

TEST(SmBiosStreaming, EmptyVectorsWriteNothing) {
    using SD::operator<<;
    std::ostringstream out;
    out << std::vector<SD::SmBios::Byte>() << std::vector<SD::SmBios::Word>()
        << std::vector<SD::SmBios::String>();
    EXPECT_EQ(out.str(), "");
}
