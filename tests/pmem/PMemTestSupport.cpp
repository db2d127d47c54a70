#include "PMemTestSupport.h"

#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <sstream>

namespace pmemtest {

std::string outDir() {
    char const* dir = std::getenv("SMBIOS_OUT_DIR");
    return dir == nullptr ? std::string() : std::string(dir);
}

std::string libraryPath() { return outDir() + "/libpmem.so"; }

PMemLibrary::PMemLibrary() : library_(libraryPath()) {
    if (!library_.loadAndBind()) {
        if (library_.getHandle() == nullptr) {
            ADD_FAILURE() << "cannot load " << libraryPath() << ": " << library_.getLastError();
        } else {
            ADD_FAILURE() << libraryPath() << " does not export " << library_.missing();
        }
        return;
    }
    functions_ = library_.functions();
}

PMemLibrary::~PMemLibrary() = default;

int PMemLibrary::isInitialized() const {
    return functions_.isInitialized ? functions_.isInitialized() : 0;
}
int PMemLibrary::open() const { return functions_.open ? functions_.open() : 0; }
int PMemLibrary::close() const { return functions_.close ? functions_.close() : 0; }

int PMemLibrary::read(void* buffer, unsigned long address, long count) const {
    return functions_.read ? functions_.read(buffer, address, count) : -1;
}

unsigned long PMemLibrary::search(char const* anchor, unsigned long start, unsigned long end,
                                  long step) const {
    return functions_.search ? functions_.search(anchor, start, end, step) : 0;
}

std::string PMemLibrary::sourceReport() const {
    return functions_.sourceReport ? functions_.sourceReport() : "(no PMemSourceReport)";
}

bool PMemLibrary::tableCut(TableCutFigures& figures) const {
    return functions_.tableCut &&
           functions_.tableCut(&figures.tableBytes, &figures.tableStructures, &figures.servedBytes,
                               &figures.servedStructures) != 0;
}

std::vector<uint8_t> PMemLibrary::bytes(unsigned long address, size_t n, int& status) const {
    std::vector<uint8_t> out(n, 0);
    status = read(out.data(), address, static_cast<long>(n));
    return out;
}

::testing::AssertionResult readsBytes(PMemLibrary const& pm, unsigned long address,
                                      std::vector<uint8_t> const& expected) {
    int status = -2;
    std::vector<uint8_t> const got = pm.bytes(address, expected.size(), status);
    if (status != 0) {
        return ::testing::AssertionFailure() << "PMemRead of " << expected.size() << " bytes at "
                                             << hex(address) << " returned " << status;
    }
    if (got != expected) {
        return ::testing::AssertionFailure()
               << "the " << expected.size() << " bytes at " << hex(address) << " differ";
    }
    return ::testing::AssertionSuccess();
}

int isInitializedInChild() {
    return runInChild([] {
        PMemLibrary pm;
        if (!pm.loaded()) {
            return kNotLoaded;
        }
        return pm.isInitialized() != 0 ? 1 : 0;
    });
}

void PMemTest::env(std::string const& name, char const* value) {
    envs_.emplace_back(new smbiostest::ScopedEnv(name, value));
}

std::string PMemTest::file(std::string const& name, std::vector<uint8_t> const& bytes) {
    std::string const path = work_.file(name);
    smbiostest::writeFile(path, bytes);
    return path;
}

void PMemTest::serveImage(std::vector<uint8_t> const& entryPoint,
                          std::vector<uint8_t> const& table) {
    env("PMEM_IMAGE", imageItem(file("bios.bin", biosArea(entryPoint, kAnchor)), kBiosArea) + "," +
                          imageItem(file("table.bin", table), kTableAddress));
}

std::vector<uint8_t> PMemTest::serveSampleImage() {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> const ep = smEntryPoint(table, 2, 7, kTableAddress);
    serveImage(ep, table);
    return ep;
}

std::string PMemTest::sysfsFolder(std::vector<uint8_t> const* entryPoint,
                                  std::vector<uint8_t> const* table) {
    std::string const folder = work_.file("sysfs");
    if (::mkdir(folder.c_str(), 0755) != 0 && errno != EEXIST) {
        ADD_FAILURE() << "cannot make " << folder << ": " << std::strerror(errno);
    }
    if (entryPoint != nullptr) {
        smbiostest::writeFile(folder + "/smbios_entry_point", *entryPoint);
    }
    if (table != nullptr) {
        smbiostest::writeFile(folder + "/DMI", *table);
    }
    return folder;
}

PMemLibrary& PMemTest::load() {
    if (!library_) {
        library_.reset(new PMemLibrary());
    }
    return *library_;
}

std::string hex(unsigned long address) {
    std::ostringstream text;
    text << "0x" << std::hex << std::uppercase << address;
    return text.str();
}

std::string imageItem(std::string const& path, unsigned long base) {
    return path + "@" + hex(base);
}

std::vector<uint8_t> biosArea(std::vector<uint8_t> const& entry, unsigned long anchor) {
    std::vector<uint8_t> area(0x10000, 0);
    std::copy(entry.begin(), entry.end(),
              area.begin() + static_cast<std::ptrdiff_t>(anchor - kBiosArea));
    return area;
}

std::vector<uint8_t> sampleTable() {
    smbiostest::TableBuilder table;
    table.add(smbiostest::Structure(1, 0x0100).str("Corvane").str("RS-7400").str("1.0"));
    table.add(smbiostest::Structure(0, 0x0000).str("Corvane").str("CVE1.05").word(0xE800));
    table.add(smbiostest::Structure(4, 0x0400).str("CPU1").byte(3).byte(0xB3));
    table.add(smbiostest::Structure(17, 0x0200).word(0x1000).str("DIMM_A1"));
    table.endOfTable(0x0500);
    return table.build();
}

std::vector<uint8_t> smEntryPoint(std::vector<uint8_t> const& table, uint8_t major, uint8_t minor,
                                  uint32_t address) {
    smbiosdump::TableStats const stats = smbiosdump::tableStats(table);
    return smbiosdump::makeSmEntryPoint(major, minor, static_cast<uint16_t>(table.size()), address,
                                        stats.count, stats.maxSize);
}

void putDword(std::vector<uint8_t>& bytes, size_t at, uint32_t value) {
    for (size_t i = 0; i < 4; ++i) {
        bytes.at(at + i) = static_cast<uint8_t>((value >> (8 * i)) & 0xFF);
    }
}

void putQword(std::vector<uint8_t>& bytes, size_t at, uint64_t value) {
    putDword(bytes, at, static_cast<uint32_t>(value & 0xFFFFFFFFu));
    putDword(bytes, at + 4, static_cast<uint32_t>(value >> 32));
}

void setChecksum(std::vector<uint8_t>& bytes, size_t at, size_t begin, size_t end) {
    bytes.at(at) = 0;
    bytes.at(at) = static_cast<uint8_t>(0x100 - byteSum(bytes, begin, end));
}

std::vector<uint8_t> slice(std::vector<uint8_t> const& bytes, size_t begin, size_t end) {
    return std::vector<uint8_t>(bytes.begin() + static_cast<std::ptrdiff_t>(begin),
                                bytes.begin() + static_cast<std::ptrdiff_t>(end));
}

std::vector<std::string> describeStructures(SD::SmBios const& smbios) {
    static char const digits[] = "0123456789ABCDEF";
    std::vector<std::string> lines;
    for (SD::SmBios::Table const& table : smbios.getTables()) {
        std::string line =
            std::to_string(table.getType()) + " " + std::to_string(table.getHandle()) + " ";
        for (unsigned char byte : table.getData()) {
            line += digits[byte >> 4];
            line += digits[byte & 0x0F];
        }
        lines.push_back(line);
    }
    return lines;
}

namespace {

bool writeAll(int fd, std::string const& text) {
    size_t done = 0;
    while (done < text.size()) {
        ssize_t const n = ::write(fd, text.data() + done, text.size() - done);
        if (n < 0) {
            if (errno == EINTR) {
                continue;
            }
            return false;
        }
        done += static_cast<size_t>(n);
    }
    return true;
}

// The child's side: acquire, then report "major minor revision" and one
// structure a line.
[[noreturn]] void acquireAndReport(
    int fd, std::vector<std::pair<std::string, std::string>> const& environment) {
    int status = 0;
    try {
        for (auto const& variable : environment) {
            ::setenv(variable.first.c_str(), variable.second.c_str(), 1);
        }
        SD::SmBios smbios;
        std::string report = std::to_string(smbios.getMajorVersion()) + " " +
                             std::to_string(smbios.getMinorVersion()) + " " +
                             std::to_string(smbios.getRevision()) + "\n";
        for (std::string const& line : describeStructures(smbios)) {
            report += line + "\n";
        }
        status = writeAll(fd, report) ? 0 : 2;
    } catch (...) {
        status = 3;
    }
    ::close(fd);
    ::_exit(status);
}

}  // namespace

Acquired acquireInChild(std::vector<std::pair<std::string, std::string>> const& environment) {
    Acquired acquired;
    int fds[2];
    if (::pipe(fds) != 0) {
        acquired.failure = std::string("pipe: ") + std::strerror(errno);
        return acquired;
    }
    std::fflush(stdout);
    std::fflush(stderr);
    pid_t const pid = ::fork();
    if (pid < 0) {
        acquired.failure = std::string("fork: ") + std::strerror(errno);
        ::close(fds[0]);
        ::close(fds[1]);
        return acquired;
    }
    if (pid == 0) {
        ::close(fds[0]);
        acquireAndReport(fds[1], environment);
    }
    ::close(fds[1]);
    std::string report;
    char buffer[4096];
    for (;;) {
        ssize_t const n = ::read(fds[0], buffer, sizeof buffer);
        if (n < 0 && errno == EINTR) {
            continue;
        }
        if (n <= 0) {
            break;
        }
        report.append(buffer, static_cast<size_t>(n));
    }
    ::close(fds[0]);
    int status = 0;
    while (::waitpid(pid, &status, 0) < 0 && errno == EINTR) {
    }
    if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) {
        acquired.failure = "the acquiring child ended with status " + std::to_string(status);
        return acquired;
    }
    std::istringstream in(report);
    in >> acquired.major >> acquired.minor >> acquired.revision;
    std::string line;
    std::getline(in, line);  // the rest of the version line
    while (std::getline(in, line)) {
        acquired.structures.push_back(line);
    }
    if (!in.eof()) {
        acquired.failure = "unreadable report from the acquiring child";
    }
    return acquired;
}

}  // namespace pmemtest
