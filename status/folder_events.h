// Whether a share's event queue file holds an event on a folder or inside it: the question the
// progress report asks for every folder it reports on.
#ifndef FILEINDEX_STATUS_FOLDER_EVENTS_H
#define FILEINDEX_STATUS_FOLDER_EVENTS_H

#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace VEXO {
namespace FILEINDEX {

// Searches queueFile for the first event on the folder (a full path) or inside it: an event whose
// path, or for a move whose former path, with "/" appended begins with the folder with "/" appended.
// Calls malformed, in file order, with every line before that event (every line, when there is
// none) that is not a queue record. found tells whether there was one. False when the file cannot
// be opened or read, errno telling why; the lines read up to then have been passed on.
bool FindEventInFolder(const std::string &queueFile, const std::string &folder,
                       const std::function<void(std::string_view line)> &malformed, bool &found);

// While an object of this class lives, FindEventInFolder on the same thread answers for the folders
// given to it from one reading of each queue file, made when the first of them asks about that
// file: all of them see the file as that reading found it, and the answers are the ones their own
// searches of that content would give, malformed lines included. Any other folder, a file that
// cannot be read, and a file with more malformed text than is worth keeping (1 MiB) are searched as
// without it. Nothing outlives the object.
class OneQueueReadingPerCall {
public:
    explicit OneQueueReadingPerCall(std::vector<std::string> folders);
    ~OneQueueReadingPerCall();
    OneQueueReadingPerCall(const OneQueueReadingPerCall &) = delete;
    OneQueueReadingPerCall &operator=(const OneQueueReadingPerCall &) = delete;

    class Readings;

private:
    std::unique_ptr<Readings> m_readings;
    Readings *m_outer;
};

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
