// The share database of shares.json and the path rules that go with it.
#ifndef VEXOEMU_SHARES_H
#define VEXOEMU_SHARES_H

#include <memory>
#include <string>
#include <vector>

namespace VEXO {
namespace EMULATION {

struct ShareInfo {
    std::string name;
    std::string path;  // without trailing slashes, except for "/" itself
    bool encrypted = false;
    bool usesEncryption = false;
    bool readOnly = false;
};

using ShareList = std::vector<ShareInfo>;

// The database as shares.json holds it now; null, with kErrStateFile in the error state, when the
// file is unreadable or malformed.
std::shared_ptr<const ShareList> LoadShares();

// The first share whose name equals the text ignoring ASCII letter case; null when none does.
const ShareInfo *FindShareByName(const ShareList &shares, const char *name);
// The share with the longest path that holds the path; null when none does.
const ShareInfo *FindShareHolding(const ShareList &shares, const char *path);

// True when path is dir or lies below it by whole components ("/a/bc" is not below "/a/b").
bool PathWithin(const char *path, const std::string &dir);
// Sets inside to whether path lies in "<share path>/<name>" of the share holding it, for the
// directories a share keeps for itself (#recycle, #snapshot). False when LoadShares fails.
bool IsInShareSubdirectory(const char *path, const char *name, bool &inside);

}  // namespace EMULATION
}  // namespace VEXO

#endif
