// SD::PlatformUtilities: the agent's folders, line reading and UUID text.
#include "SD/PlatformUtilities.h"

#include <dlfcn.h>
#include <sys/types.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "SD/RegularFile.h"

namespace SD {

// An open file and the buffer its lines are read into.
struct _FileHandle {
    std::FILE* stream = nullptr;
    char* buffer = nullptr;  // owned by getline(), released with free()
    size_t capacity = 0;
};

namespace {

char const kSeparator = '/';
char const kDefaultDataDir[] = "/var/lib/kestrel/";

std::string withSeparator(std::string folder) {
    if (folder.empty() || folder.back() != kSeparator) {
        folder += kSeparator;
    }
    return folder;
}

// The value of an environment variable, or "" when it is unset.
std::string environment(char const* name) {
    char const* value = std::getenv(name);
    return value != nullptr ? value : "";
}

// The folder of the shared object that holds this function, found through
// the dynamic loader so that it is right wherever the library is installed.
std::string libraryFolder() {
    Dl_info info;
    std::memset(&info, 0, sizeof info);
    if (dladdr(reinterpret_cast<void*>(&libraryFolder), &info) == 0 || info.dli_fname == nullptr) {
        return ".";
    }
    std::string const path = info.dli_fname;
    size_t const slash = path.rfind(kSeparator);
    if (slash == std::string::npos) {
        return ".";
    }
    if (slash == 0) {
        return "/";
    }
    return path.substr(0, slash);
}

}  // namespace

std::string PlatformUtilities::getKestrelDataDir() {
    std::string folder = environment("KESTREL_DATA_DIR");
    if (folder.empty()) {
        folder = kDefaultDataDir;
    }
    return withSeparator(folder);
}

std::string PlatformUtilities::getKestrelCodeDir() {
    std::string folder = environment("KESTREL_CODE_DIR");
    if (folder.empty()) {
        folder = libraryFolder();
    }
    return withSeparator(folder);
}

char PlatformUtilities::getSeparator() { return kSeparator; }

int PlatformUtilities::openFile(char const* path, _FileHandle** file, int /*mode*/, int /*flags*/) {
    if (file == nullptr) {
        return EINVAL;
    }
    *file = nullptr;
    if (path == nullptr) {
        return EINVAL;
    }
    // Only a regular file is opened, and never by waiting: a FIFO would
    // hold the caller until some writer came, a device may do anything on
    // open. The opener leaves errno alone when it refuses a file for its
    // kind, and sets it when the system refused the file.
    errno = 0;
    std::string why;
    int const fd = openRegularFile(path, why);
    if (fd < 0) {
        return errno != 0 ? errno : EINVAL;
    }
    std::FILE* stream = ::fdopen(fd, "r");
    if (stream == nullptr) {
        int const error = errno != 0 ? errno : EIO;
        ::close(fd);
        return error;
    }
    *file = new _FileHandle;
    (*file)->stream = stream;
    return 0;
}

char* PlatformUtilities::readLine(_FileHandle* file, int& length) {
    length = 0;
    if (file == nullptr || file->stream == nullptr) {
        return nullptr;
    }
    ssize_t const read = getline(&file->buffer, &file->capacity, file->stream);
    if (read < 0) {
        return nullptr;
    }
    size_t size = static_cast<size_t>(read);
    if (size > 0 && file->buffer[size - 1] == '\n') {
        --size;
    }
    if (size > 0 && file->buffer[size - 1] == '\r') {
        --size;
    }
    char* line = new char[size + 1];
    std::memcpy(line, file->buffer, size);
    line[size] = '\0';
    length = static_cast<int>(size);
    return line;
}

int PlatformUtilities::closeFile(_FileHandle** file) {
    if (file == nullptr || *file == nullptr) {
        return EBADF;
    }
    _FileHandle* handle = *file;
    *file = nullptr;
    int result = 0;
    if (handle->stream != nullptr && std::fclose(handle->stream) != 0) {
        result = errno != 0 ? errno : EIO;
    }
    std::free(handle->buffer);
    delete handle;
    return result;
}

std::string PlatformUtilities::uuid_unparse(char const* bytes, int count) {
    if (bytes == nullptr || count != 16) {
        return "";
    }
    static char const digits[] = "0123456789ABCDEF";
    std::string text;
    text.reserve(36);
    for (int i = 0; i < 16; ++i) {
        if (i == 4 || i == 6 || i == 8 || i == 10) {
            text += '-';
        }
        unsigned char const byte = static_cast<unsigned char>(bytes[i]);
        text += digits[byte >> 4];
        text += digits[byte & 0x0f];
    }
    return text;
}

}  // namespace SD
