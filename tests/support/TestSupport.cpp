#include "TestSupport.h"

#include <dirent.h>
#include <fcntl.h>
#include <grp.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <future>
#include <iterator>
#include <regex>
#include <sstream>
#include <stdexcept>
#include <system_error>
#include <thread>

#include "QNLog/QNLogger.h"

namespace smbiostest {

namespace {

void writeData(std::string const& path, char const* data, size_t size) {
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    if (!out) {
        throw std::runtime_error("cannot create " + path + ": " + std::strerror(errno));
    }
    out.write(data, static_cast<std::streamsize>(size));
    out.close();
    if (!out) {
        throw std::runtime_error("cannot write " + path);
    }
}

bool isDirectory(std::string const& path) {
    struct stat st;
    return ::stat(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode);
}

std::string withoutTrailingSlash(std::string path) {
    while (path.size() > 1 && path.back() == '/') {
        path.pop_back();
    }
    return path;
}

}  // namespace

std::vector<uint8_t> fileBytes(std::string const& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) {
        throw std::runtime_error("cannot open " + path + ": " + std::strerror(errno));
    }
    std::vector<uint8_t> bytes((std::istreambuf_iterator<char>(in)),
                               std::istreambuf_iterator<char>());
    if (in.bad()) {
        throw std::runtime_error("cannot read " + path);
    }
    return bytes;
}

std::string fileText(std::string const& path) {
    std::vector<uint8_t> const bytes = fileBytes(path);
    return std::string(bytes.begin(), bytes.end());
}

void writeFile(std::string const& path, std::vector<uint8_t> const& bytes) {
    writeData(path, reinterpret_cast<char const*>(bytes.data()), bytes.size());
}

void writeFile(std::string const& path, std::string const& text) {
    writeData(path, text.data(), text.size());
}

void writeFile(std::string const& path, char const* text) {
    writeData(path, text, std::strlen(text));
}

TempDir::TempDir() {
    char const* base = std::getenv("TMPDIR");
    std::string root = (base != nullptr && *base != '\0') ? withoutTrailingSlash(base) : "/tmp";
    std::string pattern = root + "/smbios-test-XXXXXX";
    std::vector<char> buffer(pattern.begin(), pattern.end());
    buffer.push_back('\0');
    if (::mkdtemp(buffer.data()) == nullptr) {
        throw std::runtime_error("mkdtemp in " + root + " failed: " + std::strerror(errno));
    }
    path_ = buffer.data();
}

TempDir::~TempDir() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
}

ScopedEnv::ScopedEnv(std::string const& name, char const* value) : name_(name) {
    char const* old = std::getenv(name.c_str());
    if (old != nullptr) {
        hadValue_ = true;
        oldValue_ = old;
    }
    if (value != nullptr) {
        ::setenv(name.c_str(), value, 1);
    } else {
        ::unsetenv(name.c_str());
    }
}

ScopedEnv::ScopedEnv(std::string const& name, std::string const& value)
    : ScopedEnv(name, value.c_str()) {}

ScopedEnv::~ScopedEnv() {
    if (hadValue_) {
        ::setenv(name_.c_str(), oldValue_.c_str(), 1);
    } else {
        ::unsetenv(name_.c_str());
    }
}

LogCapture::LogCapture() {
    QNLog::QNLogger::startCapture();
    QNLog::QNLogger::clearCapture();
}

LogCapture::~LogCapture() { QNLog::QNLogger::stopCapture(); }

bool LogCapture::contains(std::string const& text) const { return count(text) > 0; }

size_t LogCapture::count(std::string const& text) const {
    size_t n = 0;
    for (QNLog::QNLogRecord const& record : QNLog::QNLogger::captured()) {
        if (record.text.find(text) != std::string::npos) {
            ++n;
        }
    }
    return n;
}

std::string LogCapture::dump() const {
    std::vector<QNLog::QNLogRecord> const records = QNLog::QNLogger::captured();
    std::ostringstream out;
    out << records.size() << " captured message(s):\n";
    for (QNLog::QNLogRecord const& record : records) {
        out << "  [" << record.output << " " << record.level << " " << record.logger << "] "
            << record.text << "\n";
    }
    return out.str();
}

std::string corpusDir() {
    char const* dir = std::getenv("SMBIOS_CORPUS_DIR");
    if (dir == nullptr || *dir == '\0') {
        return "";
    }
    std::string path = withoutTrailingSlash(dir);
    return isDirectory(path) ? path : "";
}

std::vector<std::string> folderEntries(std::string const& folder) {
    std::vector<std::string> names;
    DIR* handle = ::opendir(folder.c_str());
    if (handle == nullptr) {
        return names;
    }
    while (dirent* entry = ::readdir(handle)) {
        std::string const name = entry->d_name;
        if (name != "." && name != "..") {
            names.push_back(name);
        }
    }
    ::closedir(handle);
    std::sort(names.begin(), names.end());
    return names;
}

std::vector<std::string> commandLine(std::string const& program,
                                     std::vector<std::string> const& args) {
    std::vector<std::string> line;
    // The emulator runs what this build made; the system's own programs
    // (/bin/sh, promtool, chromium) run as they are.
    bool const systemProgram = program.rfind("/bin/", 0) == 0 || program.rfind("/usr/", 0) == 0 ||
                               program.rfind("/sbin/", 0) == 0;
    char const* emulator = std::getenv("SMBIOS_TEST_EMULATOR");
    if (emulator != nullptr && *emulator != '\0' && !systemProgram) {
        line.push_back(emulator);
    }
    line.push_back(program);
    line.insert(line.end(), args.begin(), args.end());
    return line;
}

int runInChild(std::function<int()> const& body, unsigned seconds) {
    std::fflush(stdout);
    std::fflush(stderr);
    pid_t const pid = ::fork();
    if (pid < 0) {
        return kChildFailed;
    }
    if (pid == 0) {
        int result = 255;
        try {
            result = body();
        } catch (...) {
        }
        ::_exit(result & 0xFF);
    }
    auto const deadline = std::chrono::steady_clock::now() + std::chrono::seconds(seconds);
    int status = 0;
    for (;;) {
        pid_t const ended = ::waitpid(pid, &status, WNOHANG);
        if (ended == pid) {
            return WIFEXITED(status) ? WEXITSTATUS(status) : kChildFailed;
        }
        if (ended < 0 && errno != EINTR) {
            return kChildFailed;
        }
        if (std::chrono::steady_clock::now() >= deadline) {
            ::kill(pid, SIGKILL);
            while (::waitpid(pid, &status, 0) < 0 && errno == EINTR) {
            }
            return kChildHung;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
}

int runAsUnprivilegedUser(std::function<int()> const& body) {
    return runInChild([&body] {
        if (::geteuid() == 0) {
            uid_t const nobody = 65534;
            if (::setgroups(0, nullptr) != 0 || ::setgid(nobody) != 0 || ::setuid(nobody) != 0 ||
                ::geteuid() == 0) {
                return kNoUnprivilegedUser;
            }
        }
        return body();
    });
}

bool waitedOnFifo(std::string const& fifo, std::function<void()> const& work) {
    std::future<void> working = std::async(std::launch::async, work);
    bool waited = false;
    std::chrono::milliseconds patience(10000);
    while (working.wait_for(patience) != std::future_status::ready) {
        waited = true;
        patience = std::chrono::milliseconds(100);
        for (int side : {O_RDONLY, O_WRONLY}) {
            int const fd = ::open(fifo.c_str(), side | O_NONBLOCK | O_CLOEXEC);
            if (fd >= 0) {
                ::close(fd);
            }
        }
    }
    working.get();
    return waited;
}

std::vector<std::string> corpusNames() {
    std::vector<std::string> names;
    std::string const dir = corpusDir();
    if (dir.empty()) {
        return names;
    }
    DIR* handle = ::opendir(dir.c_str());
    if (handle == nullptr) {
        return names;
    }
    static std::string const suffix = ".bin";
    while (dirent* entry = ::readdir(handle)) {
        std::string const name = entry->d_name;
        if (name.size() > suffix.size() &&
            name.compare(name.size() - suffix.size(), suffix.size(), suffix) == 0) {
            names.push_back(name.substr(0, name.size() - suffix.size()));
        }
    }
    ::closedir(handle);
    std::sort(names.begin(), names.end());
    return names;
}

uint8_t byteSum(std::vector<uint8_t> const& bytes, size_t begin, size_t end) {
    uint8_t sum = 0;
    for (size_t i = begin; i < end && i < bytes.size(); ++i) {
        sum = static_cast<uint8_t>(sum + bytes[i]);
    }
    return sum;
}

uint16_t word(std::vector<uint8_t> const& bytes, size_t at) {
    return static_cast<uint16_t>(bytes.at(at) | (bytes.at(at + 1) << 8));
}

uint32_t dword(std::vector<uint8_t> const& bytes, size_t at) {
    return static_cast<uint32_t>(word(bytes, at)) |
           (static_cast<uint32_t>(word(bytes, at + 2)) << 16);
}

void writeOverrideDir(std::string const& dataDir, std::vector<uint8_t> const& header,
                      std::vector<uint8_t> const& table) {
    std::string const dir = withoutTrailingSlash(dataDir) + "/SmBiosOverride";
    std::error_code error;
    std::filesystem::create_directories(dir, error);
    if (error) {
        throw std::runtime_error("cannot create " + dir + ": " + error.message());
    }
    writeFile(dir + "/smbios.txt", smbiosdump::formatOverride(header, table));
}

bool dmidecodeVersion(std::string const& name, unsigned int& major, unsigned int& minor) {
    std::ifstream in(corpusDir() + "/" + name + ".orig.txt");
    std::regex const present(R"(^SMBIOS (\d+)\.(\d+)(\.\d+)? present\.)");
    std::string line;
    while (std::getline(in, line)) {
        std::smatch m;
        if (std::regex_search(line, m, present)) {
            major = static_cast<unsigned int>(std::stoul(m[1]));
            minor = static_cast<unsigned int>(std::stoul(m[2]));
            return true;
        }
    }
    return false;
}

namespace {

// n in decimal, zero-padded to width digits.
std::string padded(unsigned n, int width) {
    std::string text = std::to_string(n);
    return std::string(text.size() < static_cast<size_t>(width) ? width - text.size() : 0, '0') +
           text;
}

}  // namespace

std::vector<uint8_t> sm3EntryPoint(uint8_t major, uint8_t minor, uint8_t docrev, uint32_t maxSize,
                                   uint64_t address) {
    std::vector<uint8_t> ep(smbiosformat::SM3_ENTRY_POINT_SIZE, 0);
    std::memcpy(ep.data(), "_SM3_", 5);
    ep[6] = static_cast<uint8_t>(smbiosformat::SM3_ENTRY_POINT_SIZE);
    ep[7] = major;
    ep[8] = minor;
    ep[9] = docrev;
    ep[0x0A] = 1;  // entry-point revision
    smbiosformat::putDword(ep, 0x0C, maxSize);
    smbiosformat::putDword(ep, 0x10, static_cast<uint32_t>(address & 0xFFFFFFFFu));
    smbiosformat::putDword(ep, 0x14, static_cast<uint32_t>(address >> 32));
    ep[5] = smbiosformat::checksumFor(ep, 0, ep.size());
    return ep;
}

std::vector<uint8_t> sm3DumpBin(std::vector<uint8_t> const& table) {
    std::vector<uint8_t> file(0x20, 0);
    std::vector<uint8_t> const entry =
        sm3EntryPoint(3, 2, 0, static_cast<uint32_t>(table.size()), 0x20);
    std::copy(entry.begin(), entry.end(), file.begin());
    file.insert(file.end(), table.begin(), table.end());
    return file;
}

std::vector<uint8_t> largeServerTable(unsigned devices) {
    TableBuilder table;
    table.add(Structure(0, 0x0000).str("Corvane").str("CVE2.10").word(0xE800).str("01/15/2026"));
    table.add(Structure(1, 0x0001).str("Corvane").str("RS-9900").str("2.0").str("CZ2026LARGE"));
    table.add(Structure(2, 0x0002).str("Corvane").str("RS-9900-MB").str("1.0").str("MB0001"));
    table.add(Structure(3, 0x0003).str("Corvane").byte(0x17).str("1.0").str("CH0001"));
    // Memory array: location, use, error correction, maximum capacity,
    // error handle, number of devices.
    table.add(Structure(16, 0x1000)
                  .byte(3)
                  .byte(3)
                  .byte(6)
                  .dword(0x80000000u)
                  .word(0xFFFE)
                  .word(static_cast<uint16_t>(devices > 0xFFFF ? 0xFFFF : devices)));
    for (unsigned n = 0; n < devices; ++n) {
        table.add(Structure(17, static_cast<uint16_t>(0x1100 + n))
                      .word(0x1000)  // memory array
                      .word(0xFFFE)  // no error information
                      .word(72)      // total width
                      .word(64)      // data width
                      .word(0x4000)  // 16384 MB
                      .byte(0x09)    // DIMM
                      .byte(0)       // no device set
                      .str("DIMM_" + padded(n, 4))
                      .str("NODE " + padded(n / 64, 2))
                      .byte(0x1A)    // DDR4
                      .word(0x0080)  // synchronous
                      .word(2666)    // MT/s
                      .str("Corvane")
                      .str("SN" + padded(n, 8))
                      .str("")  // no asset tag
                      .str("CV-16G-2666")
                      .byte(2)     // rank
                      .dword(0)    // extended size
                      .word(2666)  // configured speed
                      .word(1200)
                      .word(1200)
                      .word(1200));
    }
    table.endOfTable(0xFFFE);
    return table.build();
}

}  // namespace smbiostest
