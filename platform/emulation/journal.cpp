// Appends one line per side-effecting call to the emulation's journal.jsonl.
#include "journal.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "config/json_io.h"
#include "json_text.h"
#include "state_dir.h"

namespace VEXO {
namespace EMULATION {

void JournalCall(const char *op, const Json::Value &args, const Json::Value &result, bool forced)
{
    // Members in the order a reader expects them, which a Json::Value object would not keep.
    std::string line = "{\"op\":" + FILEINDEX::toString(TextValue(op)) + ",\"args\":" + FILEINDEX::toString(args) +
                       ",\"result\":" + FILEINDEX::toString(result) + ",\"pid\":" + std::to_string(getpid());
    if (forced) {
        line += ",\"forced\":true";
    }
    line += "}\n";

    const int fd = open(StatePath("journal.jsonl").c_str(), O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC, 0644);
    if (fd < 0) {
        return;
    }
    // One write with O_APPEND: lines of concurrent writers, in this process or others, never mix.
    ssize_t written;
    do {
        written = write(fd, line.data(), line.size());
    } while (written < 0 && errno == EINTR);
    close(fd);
}

}  // namespace EMULATION
}  // namespace VEXO
