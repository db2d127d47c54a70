// The field readers and property writers of the plug-in: the offset checks
// against the formatted-area length, the values and kinds they produce, and
// the diagnostic line of each failed check.
#include <gtest/gtest.h>

#include <cstdint>
#include <stdexcept>
#include <string>
#include <vector>

#include "IC/EnumValue.h"
#include "IC/MutableNode.h"
#include "IC/Number.h"
#include "IC/PropertyValue.h"
#include "QNLog/QNLogger.h"
#include "TestSupport.h"
#include "mi/SmBiosMI.h"
#include "smbios/SmBios.h"

using smbiostest::LogCapture;
using smbiostest::Structure;

namespace {

typedef std::vector<unsigned char> Bytes;

unsigned int const ID = 7;

// A table parsed from the structure's bytes.
SD::SmBios::Table table(Structure const& structure) { return SD::SmBios::Table(structure.build()); }

// The diagnostic line of a failed check: text, offset, " length=", length.
std::string failText(std::string const& text, unsigned int off, unsigned int length) {
    return text + std::to_string(off) + " length=" + std::to_string(length);
}

// A structure of 24 bytes (length 0x18):
//   4: byte 0x81         5: byte 0x00          6: word 0x0280
//   8: bytes 01 02 03 04 (a dword)             12: string number 1 ("Corvane")
//   13: string number 2 ("RS-7400")            14: string number 0
//   15: string number 9 (no such string)       16: byte 0x01 then 0x01
//   18: word 0xBEEF      20: byte 0x00, 0x01, 0x00   23: byte 0x5A
Structure sample() {
    return Structure(17, 0x0042)
        .byte(0x81)
        .byte(0x00)
        .word(0x0280)
        .bytes({0x01, 0x02, 0x03, 0x04})
        .str("Corvane")
        .str("RS-7400")
        .strNumber(0)
        .strNumber(9)
        .byte(0x01)
        .byte(0x01)
        .word(0xBEEF)
        .byte(0x00)
        .byte(0x01)
        .byte(0x00)
        .byte(0x5A);
}

class ReaderWriter : public ::testing::Test {
protected:
    ReaderWriter() : t(table(sample())), node(1, 0, {1}, 40, 0) {}

    void SetUp() override { ASSERT_EQ(t.getLength(), 0x18); }

    // The property, which must be set.
    IC::PropertyValue property(unsigned int id = ID) {
        IC::PropertyValue value;
        IC::Error const error = node.getProperty(id, value);
        EXPECT_EQ(error.getStatus(), 0u) << "property " << id << " not set";
        EXPECT_TRUE(value.getFlag());
        return value;
    }

    bool isSet(unsigned int id = ID) {
        IC::PropertyValue value;
        return node.getProperty(id, value).getStatus() == 0;
    }

    // A writer's failed check on the sample: property ID is not set, and
    // the diagnostic line (text, offset, " length=24") was logged.
    ::testing::AssertionResult refused(LogCapture const& log, std::string const& text,
                                       unsigned int off) {
        if (isSet()) {
            return ::testing::AssertionFailure() << "property " << ID << " is set";
        }
        std::string const line = failText(text, off, 24);
        if (!log.contains(line)) {
            return ::testing::AssertionFailure() << "no \"" << line << "\" logged\n" << log.dump();
        }
        return ::testing::AssertionSuccess();
    }

    // `write` (a writer call on the sample) fails its check: see refused.
    template <typename Write>
    ::testing::AssertionResult refuses(Write write, std::string const& text, unsigned int off) {
        LogCapture log;
        write();
        return refused(log, text, off);
    }

    // `reads` (reader calls on the sample and their checks) logs no line
    // that contains `text`.
    template <typename Reads>
    static void expectNoLine(std::string const& text, Reads reads) {
        LogCapture log;
        reads();
        EXPECT_FALSE(log.contains(text)) << log.dump();
    }

    // `read` (a reader call on the sample) fails its check: it gives
    // `expected` and logs the diagnostic line (text, offset, " length=24").
    template <typename Read, typename Value>
    static ::testing::AssertionResult failsReading(Read read, Value const& expected,
                                                   std::string const& text, unsigned int off) {
        LogCapture log;
        auto const value = read();
        if (!(value == expected)) {
            return ::testing::AssertionFailure() << "the reader gave " << value;
        }
        std::string const line = failText(text, off, 24);
        if (!log.contains(line)) {
            return ::testing::AssertionFailure() << "no \"" << line << "\" logged\n" << log.dump();
        }
        return ::testing::AssertionSuccess();
    }

    void expectBool(bool expected) {
        IC::PropertyValue const value = property();
        EXPECT_EQ(value.getKind(), IC::PropertyValue::NUMBER);
        EXPECT_EQ(value.getNumber().getKind(), IC::Number::BOOL);
        EXPECT_EQ(value.getNumber().getBool(), expected);
    }

    void expectUnsigned(unsigned int expected) {
        IC::PropertyValue const value = property();
        EXPECT_EQ(value.getKind(), IC::PropertyValue::NUMBER);
        EXPECT_EQ(value.getNumber().getKind(), IC::Number::UNSIGNED);
        EXPECT_EQ(value.getNumber().getUnsigned(), expected);
    }

    void expectEnum(std::int64_t expected, unsigned int width) {
        IC::PropertyValue const value = property();
        EXPECT_EQ(value.getKind(), IC::PropertyValue::ENUM);
        EXPECT_EQ(value.getEnum().getValue(), expected);
        EXPECT_EQ(value.getEnum().getWidth(), width);
    }

    void expectString(std::string const& expected) {
        IC::PropertyValue const value = property();
        EXPECT_EQ(value.getKind(), IC::PropertyValue::STRING);
        EXPECT_EQ(value.getString(), expected);
    }

    void expectBytes(Bytes const& expected) {
        IC::PropertyValue const value = property();
        EXPECT_EQ(value.getKind(), IC::PropertyValue::BYTES);
        EXPECT_EQ(value.getBytes(), expected);
    }

    // The writer call `write`, then the check of what it set.
    template <typename Write>
    void expectBool(Write write, bool expected) {
        write();
        expectBool(expected);
    }
    template <typename Write>
    void expectUnsigned(Write write, unsigned int expected) {
        write();
        expectUnsigned(expected);
    }
    template <typename Write>
    void expectEnum(Write write, std::int64_t expected, unsigned int width) {
        write();
        expectEnum(expected, width);
    }
    template <typename Write>
    void expectString(Write write, std::string const& expected) {
        write();
        expectString(expected);
    }
    template <typename Write>
    void expectBytes(Write write, Bytes const& expected) {
        write();
        expectBytes(expected);
    }

    SD::SmBios::Table const t;
    IC::SmBiosMI mi;
    IC::MutableNode node;
};

}  // namespace

// ---------------------------------------------------------------------------
// Readers

TEST_F(ReaderWriter, GetBool16TestsTheWordAgainstTheMask) {
    expectNoLine("getBool16 offset=", [&] {
        EXPECT_TRUE(mi.getBool16(&t, 6, 0x0200));
        EXPECT_TRUE(mi.getBool16(&t, 6, 0x0080));
        EXPECT_FALSE(mi.getBool16(&t, 6, 0x0100));
    });
}

TEST_F(ReaderWriter, GetBool16FailsAtTheLength) {
    EXPECT_TRUE(
        failsReading([&] { return mi.getBool16(&t, 24, 0xFFFF); }, false, "getBool16 offset=", 24));
}

TEST_F(ReaderWriter, GetNumber16ReadsTheWord) {
    expectNoLine("getNumber16 offset=", [&] {
        EXPECT_EQ(mi.getNumber16(&t, 18), 0xBEEFu);
        EXPECT_EQ(mi.getNumber16(&t, 22), 0x5A00u);
    });
}

TEST_F(ReaderWriter, GetNumber16FailsAtTheLength) {
    EXPECT_TRUE(
        failsReading([&] { return mi.getNumber16(&t, 24); }, 0u, "getNumber16 offset=", 24));
}

TEST_F(ReaderWriter, GetEnumValue16MasksAndShifts) {
    expectNoLine("EnumValue16 offset=", [&] {
        EXPECT_EQ(mi.getEnumValue16(&t, 6, 0x0380, 7), 5u);
        EXPECT_EQ(mi.getEnumValue16(&t, 18, 0xFFFF, 0), 0xBEEFu);
        EXPECT_EQ(mi.getEnumValue16(&t, 18, 0xF000, 12), 0xBu);
    });
}

TEST_F(ReaderWriter, GetEnumValue16FailsWithItsOwnSpelling) {
    LogCapture log;
    EXPECT_EQ(mi.getEnumValue16(&t, 30, 0xFFFF, 0), 0u);
    EXPECT_TRUE(log.contains(failText("gtetEnumValue16 offset=", 30, 24))) << log.dump();
    EXPECT_FALSE(log.contains("getEnumValue16 offset=")) << log.dump();
}

TEST_F(ReaderWriter, SixteenBitReadersCheckOnlyTheOffsetAndGetWordBoundsTheRead) {
    // A word whose first byte is the last of the formatted area passes the
    // readers' own check; the word read itself is then out of range.
    SD::SmBios::Table const u = table(Structure(1, 1).bytes(Bytes(19, 0)).byte(0x7F));
    ASSERT_EQ(u.getLength(), 0x18);
    LogCapture log;
    EXPECT_THROW(mi.getNumber16(&u, 0x17), std::out_of_range);
    EXPECT_THROW(mi.getBool16(&u, 0x17, 0xFFFF), std::out_of_range);
    EXPECT_THROW(mi.getEnumValue16(&u, 0x17, 0xFFFF, 0), std::out_of_range);
    EXPECT_FALSE(log.contains("getNumber16 offset=")) << log.dump();
    EXPECT_FALSE(log.contains("getBool16 offset=")) << log.dump();
    EXPECT_FALSE(log.contains("gtetEnumValue16 offset=")) << log.dump();
}

TEST_F(ReaderWriter, GetBool8TestsTheByteAgainstTheMask) {
    EXPECT_TRUE(mi.getBool8(&t, 4, 0x80));
    EXPECT_TRUE(mi.getBool8(&t, 4, 0x01));
    EXPECT_FALSE(mi.getBool8(&t, 4, 0x7E));
    EXPECT_FALSE(mi.getBool8(&t, 5, 0xFF));
}

TEST_F(ReaderWriter, GetNumber8ReadsTheByteUpToTheLastOfTheFormattedArea) {
    expectNoLine("getNumber8 offset=", [&] {
        EXPECT_EQ(mi.getNumber8(&t, 0), 17u);
        EXPECT_EQ(mi.getNumber8(&t, 23), 0x5Au);
    });
}

TEST_F(ReaderWriter, GetNumber8FailsAtTheLengthThoughStringsFollow) {
    EXPECT_TRUE(failsReading([&] { return mi.getNumber8(&t, 24); }, 0u, "getNumber8 offset=", 24));
}

TEST_F(ReaderWriter, GetBool8FailsAtTheLength) {
    EXPECT_TRUE(
        failsReading([&] { return mi.getBool8(&t, 24, 0xFF); }, false, "getBool8 offset=", 24));
}

TEST_F(ReaderWriter, GetEnumValueMasksTheByte) {
    EXPECT_EQ(mi.getEnumValue(&t, 4, 0x0F), 0x01u);
    EXPECT_EQ(mi.getEnumValue(&t, 4, 0xFF), 0x81u);
    EXPECT_EQ(mi.getEnumValue(&t, 23, 0xF0), 0x50u);
}

TEST_F(ReaderWriter, GetEnumValueFailsAtTheLength) {
    EXPECT_TRUE(failsReading([&] { return mi.getEnumValue(&t, 25, 0xFF); }, 0u,
                             "getEnumValue offset=", 25));
}

TEST_F(ReaderWriter, GetNumber8UnprotReadsPastTheFormattedArea) {
    expectNoLine(" offset=", [&] {
        EXPECT_EQ(mi.getNumber8Unprot(&t, 23), 0x5Au);
        EXPECT_EQ(mi.getNumber8Unprot(&t, 24), static_cast<unsigned int>('C'));
        EXPECT_EQ(mi.getNumber8Unprot(&t, 25), static_cast<unsigned int>('o'));
    });
}

TEST_F(ReaderWriter, GetStrByIdxReturnsTheStringOrEmpty) {
    EXPECT_EQ(mi.getStrByIdx(&t, 1), "Corvane");
    EXPECT_EQ(mi.getStrByIdx(&t, 2), "RS-7400");
    EXPECT_EQ(mi.getStrByIdx(&t, 0), "");
    EXPECT_EQ(mi.getStrByIdx(&t, 3), "");
    EXPECT_EQ(mi.getStrByIdx(&t, 255), "");
}

TEST_F(ReaderWriter, GetStringFollowsTheStringNumberField) {
    expectNoLine("getString invalid offset=", [&] {
        EXPECT_EQ(mi.getString(&t, 12), "Corvane");
        EXPECT_EQ(mi.getString(&t, 13), "RS-7400");
        EXPECT_EQ(mi.getString(&t, 14), "");
        EXPECT_EQ(mi.getString(&t, 15), "");
    });
}

TEST_F(ReaderWriter, GetStringFailsAtTheLength) {
    EXPECT_TRUE(
        failsReading([&] { return mi.getString(&t, 24); }, "", "getString invalid offset=", 24));
}

TEST_F(ReaderWriter, GetBufferKeepsMemoryOrder) {
    LogCapture log;
    EXPECT_EQ(mi.getBuffer(&t, 8, 4), (Bytes{0x01, 0x02, 0x03, 0x04}));
    // The last byte of the formatted area is inside the check.
    EXPECT_EQ(mi.getBuffer(&t, 20, 4), (Bytes{0x00, 0x01, 0x00, 0x5A}));
    EXPECT_TRUE(mi.getBuffer(&t, 24, 0).empty());
    EXPECT_FALSE(log.contains("propBuffer offset=")) << log.dump();
}

TEST_F(ReaderWriter, GetBufferFailsPastTheLengthWithTheWritersText) {
    LogCapture log;
    EXPECT_TRUE(mi.getBuffer(&t, 21, 4).empty());
    EXPECT_TRUE(log.contains(failText("propBuffer offset=", 21, 24))) << log.dump();
    EXPECT_FALSE(log.contains("getBuffer offset=")) << log.dump();
}

TEST_F(ReaderWriter, GetBufferUnprotReadsPastTheFormattedArea) {
    expectNoLine(" offset=", [&] {
        EXPECT_EQ(mi.getBufferUnprot(&t, 22, 5), (Bytes{0x00, 0x5A, 'C', 'o', 'r'}));
        EXPECT_TRUE(mi.getBufferUnprot(&t, 0, 0).empty());
    });
}

// ---------------------------------------------------------------------------
// Boolean writers

TEST_F(ReaderWriter, PropBool64SetsBoolFromTheByteAtTheOffset) {
    // 16 + 7 < 24: the whole 8-byte field is inside.
    expectBool([&] { mi.propBool64(&t, 16, 0x01, ID, &node); }, true);
}

TEST_F(ReaderWriter, PropBool64ReadsOnlyTheByteAtTheOffset) {
    // The byte at 16 is 0x01 and the byte at 17 is 0x01 too: mask 0x100
    // would find the second one in a full-width read.
    expectBool([&] { mi.propBool64(&t, 16, 0x100ull, ID, &node); }, false);
    expectBool([&] { mi.propBool64(&t, 16, 0x0101010101010100ull, ID, &node); }, false);
}

TEST_F(ReaderWriter, PropBool64FailsWhenTheFieldPassesTheLength) {
    EXPECT_TRUE(refuses([&] { mi.propBool64(&t, 17, 0x01, ID, &node); }, "propBool64 offset=", 17));
}

TEST_F(ReaderWriter, PropBool32SetsBoolFromTheByteAtTheOffset) {
    expectBool([&] { mi.propBool32(&t, 20, 0xFF, ID, &node); }, false);
    expectBool([&] { mi.propBool32(&t, 16, 0x01, ID, &node); }, true);
}

TEST_F(ReaderWriter, PropBool32WithMask0x100AlwaysSetsFalse) {
    for (unsigned char off : {4, 8, 16, 20}) {
        IC::MutableNode fresh(2, 0, {1}, 40, 0);
        mi.propBool32(&t, off, 0x100, ID, &fresh);
        IC::PropertyValue value;
        ASSERT_EQ(fresh.getProperty(ID, value).getStatus(), 0u) << "offset " << int(off);
        EXPECT_EQ(value.getNumber().getKind(), IC::Number::BOOL);
        EXPECT_FALSE(value.getNumber().getBool()) << "offset " << int(off);
    }
}

TEST_F(ReaderWriter, PropBool32FailsWhenTheFieldPassesTheLength) {
    EXPECT_TRUE(refuses([&] { mi.propBool32(&t, 21, 0x01, ID, &node); }, "propBool32 offset=", 21));
}

TEST_F(ReaderWriter, PropBool16SetsBoolFromTheByteAtTheOffset) {
    expectBool([&] { mi.propBool16(&t, 22, 0x01, ID, &node); }, false);
    expectBool([&] { mi.propBool16(&t, 16, 0x0100, ID, &node); }, false);
    expectBool([&] { mi.propBool16(&t, 4, 0x0080, ID, &node); }, true);
}

TEST_F(ReaderWriter, PropBool8SetsBoolFromTheByte) {
    expectBool([&] { mi.propBool8(&t, 23, 0x02, ID, &node); }, true);
    expectBool([&] { mi.propBool8(&t, 23, 0x01, ID, &node); }, false);
}

TEST_F(ReaderWriter, PropBool16FailsWhenTheWordPassesTheLength) {
    EXPECT_TRUE(refuses([&] { mi.propBool16(&t, 23, 0x01, ID, &node); }, "propBool16 offset=", 23));
}

TEST_F(ReaderWriter, PropBool8FailsAtTheLength) {
    EXPECT_TRUE(refuses([&] { mi.propBool8(&t, 24, 0x01, ID, &node); }, "propBool8 offset=", 24));
}

// ---------------------------------------------------------------------------
// Number and enumerated-value writers

TEST_F(ReaderWriter, PropNumber16SetsTheWordAsUnsigned) {
    expectUnsigned([&] { mi.propNumber16(&t, 18, ID, &node); }, 0xBEEF);
    expectUnsigned([&] { mi.propNumber16(&t, 22, ID, &node); }, 0x5A00);
}

TEST_F(ReaderWriter, PropNumber16AtTheLastByteSetsNothingWhileGetNumber16PassesItsCheck) {
    ASSERT_EQ(t.getLength(), 0x18);
    LogCapture log;
    mi.propNumber16(&t, 0x17, ID, &node);
    EXPECT_FALSE(isSet());
    EXPECT_TRUE(log.contains("propNumber16 offset=23 length=24")) << log.dump();
    // The reader's own check passes; the word read is then bounded by the
    // structure's word reader, which refuses a word that passes the length.
    EXPECT_THROW(mi.getNumber16(&t, 0x17), std::out_of_range);
    EXPECT_FALSE(log.contains("getNumber16 offset=")) << log.dump();
}

TEST_F(ReaderWriter, PropNumber8SetsTheByteAsUnsigned) {
    expectUnsigned([&] { mi.propNumber8(&t, 4, ID, &node); }, 0x81);
    expectUnsigned([&] { mi.propNumber8(&t, 23, ID, &node); }, 0x5A);
}

TEST_F(ReaderWriter, PropNumber8FailsAtTheLength) {
    EXPECT_TRUE(refuses([&] { mi.propNumber8(&t, 24, ID, &node); }, "propNumber8 offset=", 24));
}

TEST_F(ReaderWriter, PropEnumValue16SetsAWidthTwoEnum) {
    expectEnum([&] { mi.propEnumValue16(&t, 6, 0x0380, 7, ID, &node); }, 5, 2);
    expectEnum([&] { mi.propEnumValue16(&t, 18, 0xFFFF, 0, ID, &node); }, 0xBEEF, 2);
}

TEST_F(ReaderWriter, PropEnumValue16FailsWhenTheWordPassesTheLength) {
    EXPECT_TRUE(refuses([&] { mi.propEnumValue16(&t, 23, 0xFFFF, 0, ID, &node); },
                        "propEnumValue16 offset=", 23));
}

TEST_F(ReaderWriter, PropEnumValueWithMaskSetsAWidthOneEnum) {
    expectEnum([&] { mi.propEnumValue(&t, 4, static_cast<unsigned char>(0x0F), ID, &node); }, 0x01,
               1);
    expectEnum([&] { mi.propEnumValue(&t, 23, static_cast<unsigned char>(0xF0), ID, &node); }, 0x50,
               1);
}

TEST_F(ReaderWriter, PropEnumValueWithMaskFailsAtTheLength) {
    EXPECT_TRUE(
        refuses([&] { mi.propEnumValue(&t, 24, static_cast<unsigned char>(0xFF), ID, &node); },
                "propEnumValue offset=", 24));
}

TEST_F(ReaderWriter, PropEnumValueWithoutMaskSetsTheByte) {
    expectEnum([&] { mi.propEnumValue(&t, 4, ID, &node); }, 0x81, 1);
    expectEnum([&] { mi.propEnumValue(&t, 23, ID, &node); }, 0x5A, 1);
}

TEST_F(ReaderWriter, PropEnumValueWithoutMaskFailsAtTheLength) {
    EXPECT_TRUE(refuses([&] { mi.propEnumValue(&t, 24, ID, &node); }, "propEnumValue offset=", 24));
}

// ---------------------------------------------------------------------------
// String and buffer writers

TEST_F(ReaderWriter, PropStringSetsTheNamedString) {
    expectString([&] { mi.propString(&t, 12, ID, &node); }, "Corvane");
    mi.propString(&t, 13, 8, &node);
    IC::PropertyValue const second = property(8);
    EXPECT_EQ(second.getKind(), IC::PropertyValue::STRING);
    EXPECT_EQ(second.getString(), "RS-7400");
}

TEST_F(ReaderWriter, PropStringOnStringNumberZeroSetsEmpty) {
    expectString([&] { mi.propString(&t, 14, ID, &node); }, "");
}

TEST_F(ReaderWriter, PropStringOnANumberBeyondTheStringsSetsEmpty) {
    expectString([&] { mi.propString(&t, 15, ID, &node); }, "");
}

TEST_F(ReaderWriter, PropStringFailsAtTheLength) {
    EXPECT_TRUE(refuses([&] { mi.propString(&t, 24, ID, &node); }, "propString offset=", 24));
}

TEST_F(ReaderWriter, PropBufferStoresTheBytesReversedAndGetBufferDoesNot) {
    expectBytes([&] { mi.propBuffer(&t, 8, 4, ID, &node); }, Bytes{0x04, 0x03, 0x02, 0x01});
    EXPECT_EQ(mi.getBuffer(&t, 8, 4), (Bytes{0x01, 0x02, 0x03, 0x04}));
}

TEST_F(ReaderWriter, PropBufferReachesTheLastByteOfTheFormattedArea) {
    expectBytes([&] { mi.propBuffer(&t, 20, 4, ID, &node); }, Bytes{0x5A, 0x00, 0x01, 0x00});
}

TEST_F(ReaderWriter, PropBufferFailsPastTheLength) {
    EXPECT_TRUE(refuses([&] { mi.propBuffer(&t, 21, 4, ID, &node); }, "propBuffer offset=", 21));
}

// ---------------------------------------------------------------------------
// Checks in general

TEST_F(ReaderWriter, FailedWriterKeepsThePreviousValue) {
    node.setProperty(ID, IC::PropertyValue("before", true));
    expectString([&] { mi.propNumber8(&t, 200, ID, &node); }, "before");
}

TEST_F(ReaderWriter, FailedCheckIsLoggedOnceThroughLogAndTrace) {
    LogCapture log;
    mi.propNumber8(&t, 24, ID, &node);
    std::string const text = failText("propNumber8 offset=", 24, 24);
    EXPECT_EQ(log.count(text), 2u) << log.dump();
    EXPECT_EQ(QNLog::QNLogger::capturedCount(text, "log"), 1u);
    EXPECT_EQ(QNLog::QNLogger::capturedCount(text, "trace"), 1u);
    for (QNLog::QNLogRecord const& record : QNLog::QNLogger::captured()) {
        if (record.text.find(text) != std::string::npos) {
            EXPECT_EQ(record.level, 3000);
        }
    }
}

TEST_F(ReaderWriter, Offset255FailsEveryCheckWithoutWrapping) {
    // A structure of the largest length: offset 255 plus any width would
    // wrap to a small offset in 8-bit arithmetic.
    SD::SmBios::Table const u = table(Structure(1, 1).bytes(Bytes(251, 0xFF)));
    ASSERT_EQ(u.getLength(), 255);
    LogCapture log;
    unsigned char const off = 255;
    EXPECT_FALSE(mi.getBool16(&u, off, 0xFFFF));
    EXPECT_EQ(mi.getNumber16(&u, off), 0u);
    EXPECT_EQ(mi.getEnumValue16(&u, off, 0xFFFF, 0), 0u);
    EXPECT_FALSE(mi.getBool8(&u, off, 0xFF));
    EXPECT_EQ(mi.getNumber8(&u, off), 0u);
    EXPECT_EQ(mi.getEnumValue(&u, off, 0xFF), 0u);
    EXPECT_EQ(mi.getString(&u, off), "");
    EXPECT_TRUE(mi.getBuffer(&u, off, 4).empty());
    EXPECT_TRUE(mi.getBuffer(&u, 250, 10).empty());
    mi.propBool64(&u, off, 0x01, 1, &node);
    mi.propBool32(&u, off, 0x01, 2, &node);
    mi.propBool16(&u, off, 0x01, 3, &node);
    mi.propBool8(&u, off, 0x01, 4, &node);
    mi.propNumber16(&u, off, 5, &node);
    mi.propNumber8(&u, off, 6, &node);
    mi.propEnumValue16(&u, off, 0xFFFF, 0, 7, &node);
    mi.propEnumValue(&u, off, static_cast<unsigned char>(0xFF), 8, &node);
    mi.propEnumValue(&u, off, 9, &node);
    mi.propString(&u, off, 10, &node);
    mi.propBuffer(&u, off, 4, 11, &node);
    mi.propBuffer(&u, 250, 10, 12, &node);
    EXPECT_TRUE(node.getProperties().empty());
    for (char const* text :
         {"getBool16 offset=", "getNumber16 offset=", "gtetEnumValue16 offset=", "getBool8 offset=",
          "getNumber8 offset=", "getEnumValue offset=", "getString invalid offset=",
          "propBool64 offset=", "propBool32 offset=", "propBool16 offset=", "propBool8 offset=",
          "propNumber16 offset=", "propNumber8 offset=", "propEnumValue16 offset=",
          "propString offset="}) {
        EXPECT_TRUE(log.contains(failText(text, 255, 255))) << text << "\n" << log.dump();
    }
    // Both enumerated-value writers, and getBuffer and propBuffer twice each.
    EXPECT_EQ(log.count(failText("propEnumValue offset=", 255, 255)), 2u * 2u) << log.dump();
    EXPECT_EQ(log.count(failText("propBuffer offset=", 255, 255)), 2u * 2u) << log.dump();
    EXPECT_EQ(log.count(failText("propBuffer offset=", 250, 255)), 2u * 2u) << log.dump();
}

TEST_F(ReaderWriter, WideFieldEndingAtTheLastByteOfTheLargestStructurePasses) {
    // Byte 247 is 0x01; the 8-byte field at 247 ends at byte 254, the last.
    SD::SmBios::Table const u =
        table(Structure(1, 1).bytes(Bytes(243, 0)).byte(0x01).bytes(Bytes(7, 0)));
    ASSERT_EQ(u.getLength(), 255);
    mi.propBool64(&u, 247, 0x01, ID, &node);
    expectBool(true);
    LogCapture log;
    mi.propBool64(&u, 248, 0x01, 2, &node);
    EXPECT_FALSE(isSet(2));
    EXPECT_TRUE(log.contains(failText("propBool64 offset=", 248, 255))) << log.dump();
    mi.propNumber8(&u, 254, 3, &node);
    EXPECT_EQ(property(3).getNumber().getUnsigned(), 0u);
    EXPECT_EQ(mi.getBuffer(&u, 247, 8), (Bytes{0x01, 0, 0, 0, 0, 0, 0, 0}));
}

// ---------------------------------------------------------------------------
// Text functions

TEST(SmBiosMIText, PBGivesTwoUpperCaseHexDigits) {
    EXPECT_EQ(IC::SmBiosMI::pB(0x00), "00");
    EXPECT_EQ(IC::SmBiosMI::pB(0x0A), "0A");
    EXPECT_EQ(IC::SmBiosMI::pB(0x5F), "5F");
    EXPECT_EQ(IC::SmBiosMI::pB(0xA0), "A0");
    EXPECT_EQ(IC::SmBiosMI::pB(0xFF), "FF");
}

TEST(SmBiosMIText, PSConcatenatesTheDigitsOfEveryCharacter) {
    char text[] = "AB";
    EXPECT_EQ(IC::SmBiosMI::pS(text), "4142");
    char mixed[] = "_SM_\x01\xFE";
    EXPECT_EQ(IC::SmBiosMI::pS(mixed), "5F534D5F01FE");
    char empty[] = "";
    EXPECT_EQ(IC::SmBiosMI::pS(empty), "");
}
