// Helpers shared by the tests: files and temporary folders, environment
// variables, log capture, the corpus of real SMBIOS dumps, and override
// files for the plug-in. The structure and table builders come with it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "TableBuilder.h"

namespace smbiostest {

// The whole file. Throws std::runtime_error when it cannot be read.
std::vector<uint8_t> fileBytes(std::string const& path);
// The whole file as text. Throws std::runtime_error when it cannot be read.
std::string fileText(std::string const& path);
// Creates or replaces the file. Throws std::runtime_error on failure.
void writeFile(std::string const& path, std::vector<uint8_t> const& bytes);
void writeFile(std::string const& path, std::string const& text);
void writeFile(std::string const& path, char const* text);

// The base of an object that holds something only it may give back (a
// folder, a setting, a capture, a loaded library): neither copied nor
// assigned.
class NonCopyable {
public:
    NonCopyable(NonCopyable const&) = delete;
    NonCopyable& operator=(NonCopyable const&) = delete;

protected:
    NonCopyable() = default;
    ~NonCopyable() = default;
};

// A private folder under $TMPDIR (or /tmp), removed with everything in it
// when the object goes. path() has no trailing '/'.
class TempDir : NonCopyable {
public:
    TempDir();
    ~TempDir();

    std::string const& path() const { return path_; }
    // path() + "/" + name
    std::string file(std::string const& name) const { return path_ + "/" + name; }

private:
    std::string path_;
};

// Sets an environment variable for the object's lifetime, then restores its
// previous value or unsets it again. A null value unsets it meanwhile.
class ScopedEnv : NonCopyable {
public:
    ScopedEnv(std::string const& name, char const* value);
    ScopedEnv(std::string const& name, std::string const& value);
    ~ScopedEnv();

private:
    std::string name_;
    bool hadValue_ = false;
    std::string oldValue_;
};

// Captures every log and trace message while it lives (QNLog's in-memory
// capture, cleared when it starts).
class LogCapture : NonCopyable {
public:
    LogCapture();
    ~LogCapture();

    // Whether any captured message's text contains `text`.
    bool contains(std::string const& text) const;
    // How many captured messages' texts contain `text` (every output; a
    // message written through both the log and the trace counts twice).
    size_t count(std::string const& text) const;
    // The captured messages, one a line, for failure messages.
    std::string dump() const;
};

// The folder of real SMBIOS dumps (SMBIOS_CORPUS_DIR), without a trailing
// '/'; "" when the variable is unset or the folder does not exist.
std::string corpusDir();
// The names of the corpus's dumps, sorted: "Asus-UX307LA" for
// Asus-UX307LA.bin (whose dmidecode decoding is Asus-UX307LA.orig.txt).
// Empty when there is no corpus.
std::vector<std::string> corpusNames();
// The SMBIOS version dmidecode printed for a corpus dump, from the line
// "SMBIOS 2.7 present." ("SMBIOS 3.1.1 present." gives 3.1) of NAME.orig.txt;
// false when the file has no such line.
bool dmidecodeVersion(std::string const& name, unsigned int& major, unsigned int& minor);

// In a test: skips it when there is no corpus folder, saying that there are
// no real dumps for `purpose` ("to read"). The second also fails it when the
// folder holds no dump.
#define SMBIOS_SKIP_WITHOUT_CORPUS(purpose)                                              \
    do {                                                                                 \
        if (smbiostest::corpusDir().empty()) {                                           \
            GTEST_SKIP() << "SMBIOS_CORPUS_DIR is unset or not a folder; no real dumps " \
                         << purpose;                                                     \
        }                                                                                \
    } while (0)
#define SMBIOS_REQUIRE_CORPUS(purpose)                         \
    do {                                                       \
        SMBIOS_SKIP_WITHOUT_CORPUS(purpose);                   \
        ASSERT_FALSE(smbiostest::corpusNames().empty())        \
            << "no .bin dumps in " << smbiostest::corpusDir(); \
    } while (0)

// The names in a folder (without "." and ".."), sorted; empty when it cannot
// be read.
std::vector<std::string> folderEntries(std::string const& folder);

// The command line that starts PROGRAM with ARGS in a test: PROGRAM first,
// or, when SMBIOS_TEST_EMULATOR names a program (qemu-i386 for a 32-bit build
// on a kernel that cannot run it), that program first, unless PROGRAM is
// one of the system's own (under /bin, /sbin or /usr).
std::vector<std::string> commandLine(std::string const& program,
                                     std::vector<std::string> const& args);

// What runInChild returns when the child did not exit by itself.
constexpr int kChildHung = -1;    // still running when its time was up: killed
constexpr int kChildFailed = -2;  // not started, or ended by a signal
// The time a child gets: far more than any test's child ever takes, so that
// only a child that waits for something that never comes runs out.
constexpr unsigned kChildSeconds = 10;

// Runs body in a child process (which has this process's environment and
// sees the files made so far) and returns its result as the child's exit
// status (0-255), or kChildHung or kChildFailed. The guard of the tests
// that, should the code under test regress, would wait forever (a FIFO opened for
// reading waits for a writer): the child is killed instead.
int runInChild(std::function<int()> const& body, unsigned seconds = kChildSeconds);

// What runAsUnprivilegedUser returns when this process, running as root,
// cannot become the unprivileged user "nobody" (65534).
constexpr int kNoUnprivilegedUser = 77;

// runInChild, with the child running as an unprivileged user: as this
// process's user when it is not root, else as "nobody", to whom files that
// only root may read are unreadable as they are to an ordinary user.
int runAsUnprivilegedUser(std::function<int()> const& body);

// Runs `work` on a thread of its own. Should it still run after 10 s, it is
// taken to wait on the FIFO `fifo`: the FIFO is then opened from both sides
// and closed again, every 100 ms until the work ends, which releases a
// reader waiting for a writer and a writer waiting for a reader. Returns
// whether that was needed, so that a test fails instead of hanging.
bool waitedOnFifo(std::string const& fifo, std::function<void()> const& work);

// The 8-bit sum of bytes[begin, end) (as far as the bytes go): 0 over a
// structure whose checksum is right.
uint8_t byteSum(std::vector<uint8_t> const& bytes, size_t begin, size_t end);
// The little-endian word and double word at `at`; std::out_of_range past
// the end.
uint16_t word(std::vector<uint8_t> const& bytes, size_t at);
uint32_t dword(std::vector<uint8_t> const& bytes, size_t at);

// Writes dataDir/SmBiosOverride/smbios.txt (creating the folder) with the
// override text of the entry point and table. dataDir may end with '/'.
void writeOverrideDir(std::string const& dataDir, std::vector<uint8_t> const& header,
                      std::vector<uint8_t> const& table);

// The 24-byte "_SM3_" entry point of a 3.x table of at most maxSize bytes
// at address, entry-point revision 1, its checksum set.
std::vector<uint8_t> sm3EntryPoint(uint8_t major, uint8_t minor, uint8_t docrev, uint32_t maxSize,
                                   uint64_t address);

// A dmidecode --dump-bin image of an SMBIOS 3.2 table: the "_SM3_" entry
// point at 0 naming the table, which follows at 0x20.
std::vector<uint8_t> sm3DumpBin(std::vector<uint8_t> const& table);

// The table of a large server: BIOS, system, baseboard, chassis, one
// memory array, then `devices` memory devices of 16 GB (type 17, all of one
// length: locator "DIMM_<nnnn>", bank "NODE <nn>", maker, serial "SN<nnnnnnnn>",
// part number) and the end-of-table structure. 1,100 devices make a table
// of about 100,000 bytes, more than a 2.x entry point can describe.
std::vector<uint8_t> largeServerTable(unsigned devices);

}  // namespace smbiostest
