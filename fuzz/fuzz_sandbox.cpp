// The fuzz targets' sandbox appliance, made before the first input, and their quiet syslog.
#include "fuzz/fuzz_sandbox.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>

#include "appliance_paths.h"

// Every rejected input makes the library log a line; the targets format it, so that a bad format
// argument is still caught, and keep it out of the host's log.
extern "C" void syslog(int, const char *format, ...)
{
    char line[1024];
    va_list arguments;
    va_start(arguments, format);
    vsnprintf(line, sizeof(line), format, arguments);
    va_end(arguments);
}

namespace fileindex_fuzz {

// A new file each time: truncating one that holds data makes the file system flush it to disk,
// which would slow a target down a hundredfold.
void WriteInput(const char *path, const void *data, size_t size)
{
    unlink(path);
    const int fd = open(path, O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0644);
    if (fd < 0 || write(fd, data, size) != static_cast<ssize_t>(size) || close(fd) != 0) {
        perror(path);
        abort();
    }
}

}  // namespace fileindex_fuzz

extern "C" int LLVMFuzzerInitialize(int *, char ***)
{
    namespace stdfs = std::filesystem;
    const std::string root = FILEINDEX_ROOT_DIR;
    if (root.empty()) {
        abort();
    }
    for (const char *file : {FILEINDEX_APPLIANCE_FILES}) {
        stdfs::create_directories(stdfs::path(file).parent_path());
    }
    stdfs::create_directories(FILEINDEX_EMULATION_STATE_DIR);
    const std::string share = root + "/volume1/photo";
    stdfs::create_directories(share);
    const std::string database = "[{\"name\": \"photo\", \"path\": \"" + share + "\"}]";
    fileindex_fuzz::WriteInput(FILEINDEX_EMULATION_STATE_DIR "/shares.json", database.data(), database.size());
    return 0;
}
