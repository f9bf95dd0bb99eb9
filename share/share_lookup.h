// Share look-ups that other rooms make too, with the buffer sizes the platform's calls are given:
// 492 bytes for a share name, 4096 for a path, each zero-filled.
#ifndef FILEINDEX_SHARE_SHARE_LOOKUP_H
#define FILEINDEX_SHARE_SHARE_LOOKUP_H

#include <map>
#include <string>

namespace VEXO {
namespace FILEINDEX {

constexpr int kShareNameSize = 492;
constexpr int kSharePathSize = 4096;

// The share holding a full path and the share's own path (VEXOShareNamePathGet). Failure: false,
// outputs untouched, "VEXOShareNamePathGet failed, path=<path>"; no error code is set.
bool FindShareOfFullPath(std::string &share, std::string &sharePath, const std::string &fullPath);

// The share's event queue path, from FILEIDXQueuePathGet (which logs its own failures). False when
// that fails; the caller logs what the failure means to it.
bool GetQueuePath(std::string &queuePath, const std::string &share);

// While an object of this class lives, GetFullPath on the same thread asks the share database about
// each share name once and answers later paths of that share from the first answer: a listing of
// many folders resolves each share once per call instead of once per folder. A share the database
// does not know is asked about again at every path, so that each such path fails, sets its error
// code and logs exactly as it would alone. Nothing outlives the object.
class OneShareLookupPerCall {
public:
    OneShareLookupPerCall();
    ~OneShareLookupPerCall();
    OneShareLookupPerCall(const OneShareLookupPerCall &) = delete;
    OneShareLookupPerCall &operator=(const OneShareLookupPerCall &) = delete;

    // The share path answered for share during the innermost live object; false when there is none.
    static bool Find(const std::string &share, std::string &sharePath);
    // Keeps the database's answer for share, when an object lives.
    static void Keep(const std::string &share, const std::string &sharePath);

private:
    std::map<std::string, std::string> m_sharePaths;
    OneShareLookupPerCall *m_outer;
};

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
