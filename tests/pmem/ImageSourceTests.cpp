// The image source: PMEM_IMAGE=FILE@BASE[,FILE@BASE...] presents each file
// as physical memory from BASE on, with nothing between the files.
#include <sys/stat.h>
#include <unistd.h>

#include <climits>
#include <cstring>

#include "PMemTestSupport.h"

using pmemtest::imageItem;
using pmemtest::kAnchor;
using pmemtest::kBiosArea;
using pmemtest::kTableAddress;
using pmemtest::PMemLibrary;
using pmemtest::readsBytes;

namespace {

class ImageSource : public pmemtest::PMemTest {
protected:
    // Bytes 0, 1, 2, ... of the given size, offset by `first`.
    static std::vector<uint8_t> counting(size_t size, uint8_t first) {
        std::vector<uint8_t> bytes(size);
        for (size_t i = 0; i < size; ++i) {
            bytes[i] = static_cast<uint8_t>(first + i);
        }
        return bytes;
    }
    // The library loaded with an image of `bytes` at 0x2000.
    PMemLibrary& loadImageAt0x2000(std::vector<uint8_t> const& bytes) {
        env("PMEM_IMAGE", imageItem(file("m.bin", bytes), 0x2000));
        return load();
    }
    // `size` zero bytes with `text` at `at`.
    static std::vector<uint8_t> with(size_t size, size_t at, char const* text) {
        std::vector<uint8_t> bytes(size, 0);
        std::memcpy(bytes.data() + at, text, std::strlen(text));
        return bytes;
    }
};

}  // namespace

TEST_F(ImageSource, SmEntryPointInBiosAreaIsFoundAndItsTableIsReadElsewhere) {
    std::vector<uint8_t> const table = pmemtest::sampleTable();
    std::vector<uint8_t> const ep = serveSampleImage();
    PMemLibrary& pm = load();
    ASSERT_NE(pm.isInitialized(), 0);
    ASSERT_NE(pm.open(), 0);
    EXPECT_EQ(pm.search("_SM_", 0xF0000, 0xFFFFF, 16), kAnchor);
    int status = -2;
    std::vector<uint8_t> const read = pm.bytes(kAnchor, 64, status);
    ASSERT_EQ(status, 0);
    EXPECT_EQ(pmemtest::slice(read, 0, ep.size()), ep);
    ASSERT_EQ(pmemtest::dword(read, 0x18), kTableAddress);
    ASSERT_EQ(pmemtest::word(read, 0x16), table.size());
    EXPECT_TRUE(readsBytes(pm, kTableAddress, table));
    EXPECT_NE(pm.close(), 0);
}

TEST_F(ImageSource, EntryPointBelowBiosAreaIsFoundOnlyByTheLegacySearchFromZero) {
    std::vector<uint8_t> const table = pmemtest::sampleTable();
    std::vector<uint8_t> const ep = pmemtest::smEntryPoint(table, 2, 7, kTableAddress);
    unsigned long const below = 0xE0000;
    env("PMEM_IMAGE", imageItem(file("ep.bin", ep), below) + "," +
                          imageItem(file("table.bin", table), kTableAddress));
    PMemLibrary& pm = load();
    ASSERT_NE(pm.isInitialized(), 0);
    ASSERT_NE(pm.open(), 0);
    EXPECT_EQ(pm.search("_SM_", 0xF0000, 0xFFFFF, 16), 0ul);
    unsigned long const legacy = pm.search("_DMI_", 0, 0xFFFFF, 16);
    EXPECT_EQ(legacy, below + 0x10);
    int status = -2;
    std::vector<uint8_t> const dmi = pm.bytes(legacy, 15, status);
    ASSERT_EQ(status, 0);
    EXPECT_EQ(dmi, pmemtest::slice(ep, 0x10, 0x1F));
    EXPECT_EQ(pmemtest::byteSum(dmi, 0, 15), 0);
    EXPECT_EQ(pm.bytes(pmemtest::dword(dmi, 8), pmemtest::word(dmi, 6), status), table);
    EXPECT_EQ(status, 0);
}

TEST_F(ImageSource, ReadsSpanAdjacentFilesButFailOnAnyByteOfAHole) {
    env("PMEM_IMAGE", imageItem(file("a.bin", counting(16, 0x00)), 0x1000) + "," +
                          imageItem(file("b.bin", counting(16, 0x10)), 0x1010) + "," +
                          imageItem(file("c.bin", counting(16, 0x80)), 0x2000));
    PMemLibrary& pm = load();
    ASSERT_NE(pm.isInitialized(), 0);
    EXPECT_TRUE(readsBytes(pm, 0x1008, counting(16, 0x08)));
    EXPECT_TRUE(readsBytes(pm, 0x1000, counting(32, 0x00)));
    EXPECT_TRUE(readsBytes(pm, 0x1018, counting(8, 0x18)));
    EXPECT_TRUE(readsBytes(pm, 0x2000, counting(16, 0x80)));

    // One byte past the second file, one before the first, the hole itself,
    // and a range from the second file across the hole into the third.
    unsigned char buffer[0x1100];
    std::memset(buffer, 0xAA, sizeof buffer);
    EXPECT_NE(pm.read(buffer, 0x1018, 9), 0);
    EXPECT_NE(pm.read(buffer, 0x0FFF, 2), 0);
    EXPECT_NE(pm.read(buffer, 0x1800, 1), 0);
    EXPECT_NE(pm.read(buffer, 0x1FFF, 1), 0);
    EXPECT_NE(pm.read(buffer, 0x1010, 0x1000), 0);
    // A failed read leaves the buffer as it was.
    for (unsigned char byte : buffer) {
        ASSERT_EQ(byte, 0xAA);
    }
}

TEST_F(ImageSource, SearchesJumpHolesAndMatchAcrossAdjacentFilesOnly) {
    // "_S" ends a.bin and "M_" starts b.bin right after it: one anchor across
    // two files. d.bin ends with "_S" too, but a hole follows it.
    env("PMEM_IMAGE", imageItem(file("a.bin", with(32, 30, "_S")), 0x1000) + "," +
                          imageItem(file("b.bin", with(16, 0, "M_")), 0x1020) + "," +
                          imageItem(file("c.bin", with(32, 16, "_SM_")), 0x3000) + "," +
                          imageItem(file("d.bin", with(16, 14, "_S")), 0x5000) + "," +
                          imageItem(file("e.bin", with(16, 0, "M_")), 0x5020));
    PMemLibrary& pm = load();
    ASSERT_NE(pm.isInitialized(), 0);
    EXPECT_EQ(pm.search("_SM_", 0x1000, 0x6000, 2), 0x101Eul);
    EXPECT_EQ(pm.search("_SM_", 0x1000, 0x6000, 16), 0x3010ul);
    EXPECT_EQ(pm.search("_SM_", 0, 0x6000, 16), 0x3010ul);
    EXPECT_EQ(pm.search("_SM_", 0x4000, 0x6000, 1), 0ul);
    EXPECT_EQ(pm.search("M_", 0x4000, 0x6000, 1), 0x5020ul);
}

TEST_F(ImageSource, SearchAdvancesByStepAndStopsAfterTheEnd) {
    env("PMEM_IMAGE", imageItem(file("m.bin",
                                     [] {
                                         std::vector<uint8_t> bytes(64, 0);
                                         std::memcpy(bytes.data() + 0x10, "_SM_", 4);
                                         std::memcpy(bytes.data() + 0x30, "_SM_", 4);
                                         return bytes;
                                     }()),
                                0x2000));
    PMemLibrary& pm = load();
    ASSERT_NE(pm.isInitialized(), 0);
    EXPECT_EQ(pm.search("_SM_", 0x2000, 0x203F, 16), 0x2010ul);  // the first of two
    EXPECT_EQ(pm.search("_SM_", 0x2000, 0x200F, 16), 0ul);       // the end comes first
    EXPECT_EQ(pm.search("_SM_", 0x2000, 0x2010, 16), 0x2010ul);  // a match at the end counts
    EXPECT_EQ(pm.search("_SM_", 0x2011, 0x203F, 1), 0x2030ul);
    EXPECT_EQ(pm.search("_SM_", 0x2000, 0x2FFF, 32), 0ul);       // 0x2000, 0x2020, ...
    EXPECT_EQ(pm.search("_SM_", 0x1FF0, 0x2FFF, 32), 0x2010ul);  // 0x1FF0, 0x2010
    EXPECT_EQ(pm.search("_SM_", 0x2031, 0x2030, 1), 0ul);        // start after the end
}

TEST_F(ImageSource, UnalignedAnchorIsNotFoundWithStep16) {
    PMemLibrary& pm = loadImageAt0x2000(with(64, 4, "_SM_"));
    ASSERT_NE(pm.isInitialized(), 0);
    EXPECT_EQ(pm.search("_SM_", 0x2000, 0x203F, 16), 0ul);
    EXPECT_EQ(pm.search("_SM_", 0x2000, 0x203F, 4), 0x2004ul);
    EXPECT_EQ(pm.search("_SM_", 0x2000, 0x203F, 1), 0x2004ul);
}

TEST_F(ImageSource, AnchorRunningPastTheLastFileDoesNotMatch) {
    PMemLibrary& pm = loadImageAt0x2000(with(16, 13, "_SM"));
    ASSERT_NE(pm.isInitialized(), 0);
    EXPECT_EQ(pm.search("_SM_", 0x2000, 0x2FFF, 1), 0ul);
    EXPECT_EQ(pm.search("_SM", 0x2000, 0x2FFF, 1), 0x200Dul);
}

TEST_F(ImageSource, TopOfTheAddressSpaceIsServedWithoutWrapping) {
    unsigned long const top = ULONG_MAX - 15;  // the file's last byte is at ULONG_MAX
    env("PMEM_IMAGE", imageItem(file("top.bin", with(16, 12, "_SM_")), top));
    PMemLibrary& pm = load();
    ASSERT_NE(pm.isInitialized(), 0);
    EXPECT_TRUE(readsBytes(pm, ULONG_MAX, std::vector<uint8_t>{'_'}));
    EXPECT_TRUE(readsBytes(pm, ULONG_MAX - 3, std::vector<uint8_t>{'_', 'S', 'M', '_'}));
    unsigned char buffer[8] = {};
    EXPECT_NE(pm.read(buffer, ULONG_MAX, 2), 0);
    EXPECT_NE(pm.read(buffer, ULONG_MAX - 3, 8), 0);
    // Whole address space, one byte at a time: it ends, and at the top.
    EXPECT_EQ(pm.search("_SM_", 0, ULONG_MAX, 1), ULONG_MAX - 3);
    EXPECT_EQ(pm.search("_SM_X", 0, ULONG_MAX, 1), 0ul);
    EXPECT_EQ(pm.search("_SM_", ULONG_MAX - 3, ULONG_MAX, LONG_MAX), ULONG_MAX - 3);
    EXPECT_EQ(pm.search("absent", 0, ULONG_MAX, LONG_MAX), 0ul);
    // From the file's first byte by 16: the next step would wrap.
    EXPECT_EQ(pm.search("_SM_", top, ULONG_MAX, 16), 0ul);
    EXPECT_EQ(pm.search("_SM_", top - 4, ULONG_MAX, 16), ULONG_MAX - 3);
}

TEST_F(ImageSource, BaseIsHexadecimalWithOrWithoutPrefixInEitherCase) {
    std::string const a = file("a.bin", counting(4, 1));
    std::string const b = file("b.bin", counting(4, 5));
    std::string const c = file("c.bin", counting(4, 9));
    env("PMEM_IMAGE", a + "@0XaBcD0," + b + "@abce0," + c + "@00000000000000ABCF0");
    PMemLibrary& pm = load();
    ASSERT_NE(pm.isInitialized(), 0);
    EXPECT_TRUE(readsBytes(pm, 0xABCD0, counting(4, 1)));
    EXPECT_TRUE(readsBytes(pm, 0xABCE0, counting(4, 5)));
    EXPECT_TRUE(readsBytes(pm, 0xABCF0, counting(4, 9)));
}

TEST_F(ImageSource, FileNameMayHoldAnAtSign) {
    env("PMEM_IMAGE", imageItem(file("dump@host.bin", counting(8, 0x40)), 0x1000));
    PMemLibrary& pm = load();
    ASSERT_NE(pm.isInitialized(), 0);
    EXPECT_TRUE(readsBytes(pm, 0x1000, counting(8, 0x40)));
}

TEST_F(ImageSource, EmptyFilePresentsNothing) {
    env("PMEM_IMAGE", imageItem(file("empty.bin", {}), 0x1000) + "," +
                          imageItem(file("m.bin", counting(4, 1)), 0x2000));
    PMemLibrary& pm = load();
    ASSERT_NE(pm.isInitialized(), 0);
    unsigned char buffer[4] = {};
    EXPECT_NE(pm.read(buffer, 0x1000, 1), 0);
    EXPECT_EQ(pm.read(buffer, 0x2000, 4), 0);
}

TEST_F(ImageSource, OpenAndCloseJustSucceedAndReadsNeedNoOpen) {
    PMemLibrary& pm = loadImageAt0x2000(counting(4, 1));
    ASSERT_NE(pm.isInitialized(), 0);
    unsigned char buffer[4] = {};
    EXPECT_EQ(pm.read(buffer, 0x2000, 4), 0);
    EXPECT_NE(pm.open(), 0);
    EXPECT_NE(pm.open(), 0);
    EXPECT_NE(pm.close(), 0);
    EXPECT_NE(pm.close(), 0);
    EXPECT_EQ(pm.read(buffer, 0x2000, 4), 0);
}

// Every malformed PMEM_IMAGE makes the forced image source unusable: in the
// text "{good}" stands for a readable 16-byte file holding "_SM_", "{dir}"
// for the test's folder.
struct BadImage {
    char const* name;
    char const* value;
};

void PrintTo(BadImage const& bad, std::ostream* out) { *out << bad.name; }

class BadImageValue : public pmemtest::PMemTest, public ::testing::WithParamInterface<BadImage> {};

TEST_P(BadImageValue, MakesTheImageSourceUnusable) {
    std::string const good = file("good.bin", [] {
        std::vector<uint8_t> bytes(16, 0);
        std::memcpy(bytes.data(), "_SM_", 4);
        return bytes;
    }());
    std::string value = GetParam().value;
    for (auto const& placeholder : {std::make_pair(std::string("{good}"), good),
                                    std::make_pair(std::string("{dir}"), work_.path())}) {
        for (size_t at = value.find(placeholder.first); at != std::string::npos;
             at = value.find(placeholder.first)) {
            value.replace(at, placeholder.first.size(), placeholder.second);
        }
    }
    env("PMEM_SOURCE", "image");
    env("PMEM_IMAGE", value);
    PMemLibrary& pm = load();
    EXPECT_EQ(pm.isInitialized(), 0) << value;
    EXPECT_EQ(pm.open(), 0);
    unsigned char buffer[4] = {};
    EXPECT_NE(pm.read(buffer, 0xF0000, 4), 0);
    EXPECT_EQ(pm.search("_SM_", 0, ULONG_MAX, 16), 0ul);
    EXPECT_EQ(pm.close(), 0);
}

INSTANTIATE_TEST_SUITE_P(
    ImageSource, BadImageValue,
    ::testing::Values(
        BadImage{"Empty", ""}, BadImage{"NoAt", "{good}"}, BadImage{"NoBase", "{good}@"},
        BadImage{"PrefixOnly", "{good}@0x"}, BadImage{"NotHex", "{good}@F000G"},
        BadImage{"SignedBase", "{good}@-1"}, BadImage{"BlankInBase", "{good}@ F0000"},
        BadImage{"BaseBeyondAnyAddress", "{good}@10000000000000000"},
        BadImage{"FileRunsPastTheLastAddress",
                 sizeof(unsigned long) == 8 ? "{good}@FFFFFFFFFFFFFFF8" : "{good}@FFFFFFF8"},
        BadImage{"NoFile", "@F0000"}, BadImage{"MissingFile", "{dir}/missing.bin@F0000"},
        BadImage{"FolderForFile", "{dir}@F0000"}, BadImage{"TrailingComma", "{good}@F0000,"},
        BadImage{"EmptyItem", "{good}@F0000,,{good}@100000"},
        BadImage{"OverlappingFiles", "{good}@F0000,{good}@F0008"},
        BadImage{"SameBaseTwice", "{good}@F0000,{good}@F0000"},
        BadImage{"OneBadAmongGood", "{good}@E0000,{good}@F0000,{good}"}),
    [](::testing::TestParamInfo<BadImage> const& info) { return std::string(info.param.name); });

TEST_F(ImageSource, FileWithoutReadPermissionMakesTheImageSourceUnusable) {
    std::string const path = file("locked.bin", std::vector<uint8_t>(16, 1));
    ASSERT_EQ(::chmod(path.c_str(), 0), 0);
    ASSERT_EQ(::chmod(work_.path().c_str(), 0755), 0);
    env("PMEM_SOURCE", "image");
    env("PMEM_IMAGE", imageItem(path, 0xF0000));
    // Root reads files whatever their permissions: the library is loaded
    // as an unprivileged user.
    int const result = pmemtest::runAsUnprivilegedUser([] {
        PMemLibrary pm;
        return pm.loaded() ? pm.isInitialized() : 3;
    });
    if (result == pmemtest::kNoUnprivilegedUser) {
        GTEST_SKIP() << "cannot become an unprivileged user (nobody) here";
    }
    EXPECT_EQ(result, 0);
}
