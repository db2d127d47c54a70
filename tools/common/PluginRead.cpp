#include "PluginRead.h"

#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "smbios/SmBiosInitializer.h"

namespace smbiosdump {

namespace {

bool writeAll(int fd, std::string const& text) {
    size_t done = 0;
    while (done < text.size()) {
        ssize_t const n = ::write(fd, text.data() + done, text.size() - done);
        if (n < 0 && errno == EINTR) {
            continue;
        }
        if (n <= 0) {
            return false;
        }
        done += static_cast<size_t>(n);
    }
    return true;
}

}  // namespace

PluginRead readOverrideFile(std::string const& path) {
    PluginRead result;
    std::vector<std::string> head;
    std::vector<std::string> tables;
    // importSmBios reads the file to its end (or its header to the end when
    // </EPHEADER> is missing), which leaves the tokenizer's process-wide
    // state clean for the next file.
    result.imported = SD::importSmBios(path, head, tables);
    if (result.imported != 0) {
        return result;
    }
    result.head = SD::readHead(result.header, head);
    result.tables = SD::readTables(result.table, tables);
    return result;
}

PluginRead readOverrideText(std::string const& text) {
    char const* tmp = std::getenv("TMPDIR");
    std::string path =
        std::string(tmp != nullptr && *tmp != '\0' ? tmp : "/tmp") + "/smbios-override-XXXXXX";
    int const fd = ::mkstemp(&path[0]);
    if (fd < 0) {
        return PluginRead();
    }
    bool const written = writeAll(fd, text);
    bool const closed = ::close(fd) == 0;
    PluginRead result;
    if (written && closed) {
        result = readOverrideFile(path);
    }
    ::unlink(path.c_str());
    return result;
}

}  // namespace smbiosdump
