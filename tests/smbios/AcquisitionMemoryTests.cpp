// What the one acquisition keeps on the heap for an override file, against
// the file's size: the structures it holds, allocated at their size, and
// none of the text, tokens or raw bytes it went through.
#include <gtest/gtest.h>
#include <malloc.h>
#include <sys/stat.h>

#include <cstdio>
#include <string>
#include <vector>

#include "TestSupport.h"
#include "smbios/SmBios.h"

#if defined(__SANITIZE_ADDRESS__)
#define MEMORY_TEST_SANITIZED 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer)
#define MEMORY_TEST_SANITIZED 1
#endif
#endif

namespace {

#ifndef MEMORY_TEST_SANITIZED
// Bytes in use on the heap, large blocks (mapped of their own) included.
size_t heapInUse() {
    struct mallinfo2 const info = mallinfo2();
    return info.uordblks + info.hblkhd;
}

// The heap the acquisition of the override file keeps (after a first
// SmBios() has come and gone), and the file's size.
struct Kept {
    size_t heap = 0;
    size_t fileSize = 0;
    size_t structures = 0;
};

Kept acquire(std::vector<uint8_t> const& table) {
    smbiostest::TempDir data;
    smbiostest::ScopedEnv dataDir("KESTREL_DATA_DIR", data.path());
    smbiostest::ScopedEnv codeDir("KESTREL_CODE_DIR", data.path());
    std::vector<uint8_t> const header = smbiosdump::makeSmEntryPoint(2, 7, 0, 0x000E1000, 0, 0);
    smbiostest::writeOverrideDir(data.path(), header, table);
    Kept kept;
    kept.fileSize = smbiostest::fileBytes(data.path() + "/SmBiosOverride/smbios.txt").size();
    size_t const before = heapInUse();
    {
        SD::SmBios const smbios;
        kept.structures = smbios.getTables().size();
    }
    kept.heap = heapInUse() - before;
    std::printf("%zu structures: %zu bytes kept for a file of %zu bytes (%.1f times)\n",
                kept.structures, kept.heap, kept.fileSize,
                static_cast<double>(kept.heap) / static_cast<double>(kept.fileSize));
    return kept;
}

// The worst table there is for its size: nothing but zeros, so that every
// two bytes are a structure of length 0 with an empty string set.
TEST(AcquisitionMemory, ATableOfZerosKeepsAtMostTwentyTimesTheFileSize) {
    Kept const kept = acquire(std::vector<uint8_t>(1 << 20, 0));
    // The last two bytes are too few for a structure.
    EXPECT_EQ(kept.structures, (1u << 20) / 2 - 1);
    EXPECT_LE(kept.heap, 20 * kept.fileSize)
        << kept.heap << " bytes kept for a file of " << kept.fileSize;
}

// A server's table of the usual kinds: the structures' own bytes, a little
// more than half the file's hex text, plus their bookkeeping.
TEST(AcquisitionMemory, ARealisticTableKeepsAtMostTheFileSize) {
    smbiostest::TableBuilder builder;
    for (uint16_t i = 0; i < 4000; ++i) {
        builder.add(smbiostest::Structure(17, i)
                        .word(0x1000)
                        .word(0xFFFE)
                        .word(72)
                        .word(64)
                        .word(16384)
                        .byte(9)
                        .byte(0)
                        .str("DIMM " + std::to_string(i))
                        .str("BANK " + std::to_string(i % 16))
                        .byte(0x1A)
                        .word(0x0080)
                        .word(3200)
                        .str("Samsung")
                        .str("S" + std::to_string(100000 + i))
                        .str("A" + std::to_string(i))
                        .str("M393A4K40DB3-CWE")
                        .byte(2));
    }
    builder.endOfTable(0xFFFF);
    Kept const kept = acquire(builder.build());
    EXPECT_EQ(kept.structures, 4001u);
    EXPECT_LE(kept.heap, kept.fileSize)
        << kept.heap << " bytes kept for a file of " << kept.fileSize;
}
#else
// The sanitizers' allocator keeps its own books: mallinfo2 says nothing of it.
TEST(AcquisitionMemory, MeasuredOnlyWithoutSanitizers) {
    GTEST_SKIP() << "heap figures are measured in the plain build only";
}
#endif

}  // namespace
