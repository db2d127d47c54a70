// The agent's system utilities: where the agent keeps its data and code,
// line-oriented file reading, and UUID formatting.
#pragma once

#include <string>

namespace SD {

struct _FileHandle;

class PlatformUtilities {
public:
    // KESTREL_DATA_DIR, else the system default "/var/lib/kestrel/"; always
    // ends with the separator.
    static std::string getKestrelDataDir();
    // KESTREL_CODE_DIR, else the folder that holds the platform library
    // itself; always ends with the separator.
    static std::string getKestrelCodeDir();
    static char getSeparator();

    // Opens a file for reading. Returns 0 and sets *file, or an error code
    // (the system's errno value) and sets *file to null. Only a regular file
    // is opened: anything else (a FIFO, a folder, a device, a socket) gives
    // EINVAL at once, without being opened or waited for.
    static int openFile(char const* path, _FileHandle** file, int mode, int flags);
    // Returns the next line without its terminator (a carriage return before
    // the line feed is stripped too), allocated with new[]; the caller
    // releases it with delete[]. length is set to its length. Returns null at
    // the end of the file.
    static char* readLine(_FileHandle* file, int& length);
    // Closes the file and sets *file to null. Returns 0, or an error code.
    static int closeFile(_FileHandle** file);

    // The upper-case 8-4-4-4-12 text of 16 bytes, in the order given; "" when
    // count is not 16 or bytes is null.
    static std::string uuid_unparse(char const* bytes, int count);
};

}  // namespace SD
