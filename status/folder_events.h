// Whether a share's event queue file holds an event on a folder or inside it: the question the
// progress report asks for every folder it reports on.
#ifndef FILEINDEX_STATUS_FOLDER_EVENTS_H
#define FILEINDEX_STATUS_FOLDER_EVENTS_H

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "share/share_lookup.h"

namespace VEXO {
namespace FILEINDEX {

// What one call has read of queue files. With Reuse::kOncePerCall, once told the full paths of the
// folders the call will ask about, each queue file is read once, when the first of them asks about
// it, and each of them is answered from that reading: all see the file as the reading found it, and
// the answers are the ones their own searches of that content would give, malformed lines included.
// A file's existence is likewise looked at once. Any other folder, a file that cannot be read, a
// file with more malformed text than is worth keeping (1 MiB), and every question with
// kAskEveryTime are searched afresh.
class QueueReadings {
public:
    explicit QueueReadings(Reuse reuse);
    ~QueueReadings();
    QueueReadings(const QueueReadings &) = delete;
    QueueReadings &operator=(const QueueReadings &) = delete;

    // The full paths of the folders whose events the call will look for, before the first question.
    void ReadOnceFor(std::vector<std::string> folders);
    // IsFileExist(queueFile).
    bool Exists(const std::string &queueFile);
    // Searches queueFile for the first event on the folder (a full path) or inside it: an event
    // whose path, or for a move whose former path, with "/" appended begins with the folder with
    // "/" appended. Calls malformed, in file order, with every line before that event (every line,
    // when there is none) that is not a queue record. found tells whether there was one. False when
    // the file cannot be opened or read, errno telling why; the lines read up to then have been
    // passed on.
    bool FindEventInFolder(const std::string &queueFile, const std::string &folder,
                           const std::function<void(std::string_view line)> &malformed, bool &found);

    class Readings;

private:
    const Reuse m_reuse;
    std::unique_ptr<Readings> m_readings;
    std::map<std::string, bool> m_exists;
};

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
