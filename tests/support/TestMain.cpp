// The main of every test program: it sets the folders the tests need (unless
// the environment already names them) and keeps the logger quiet, so that a
// test program behaves the same under CTest and when run by hand.
#include <gtest/gtest.h>

#include <cstdlib>

int main(int argc, char** argv) {
    setenv("SMBIOS_CORPUS_DIR", SMBIOS_TEST_CORPUS_DIR, 0);
    setenv("SMBIOS_OUT_DIR", SMBIOS_TEST_OUT_DIR, 0);
    setenv("SMBIOS_SOURCE_DIR", SMBIOS_TEST_SOURCE_DIR, 0);
    // The program that runs the programs a test starts ("" when they run as
    // they are): the 32-bit tests on a kernel without IA-32 emulation.
    setenv("SMBIOS_TEST_EMULATOR", SMBIOS_TEST_EMULATOR, 0);
    setenv("QNLOG_LEVEL", "off", 0);
    setenv("QNLOG_TRACE_LEVEL", "off", 0);
    ::testing::InitGoogleTest(&argc, argv);
    return RUN_ALL_TESTS();
}
