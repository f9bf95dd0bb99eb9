// The emulated share database read from shares.json, and its path rules.
#include "shares.h"

#include <cstring>

#include <json/value.h>

#include "api.h"
#include "state_dir.h"

namespace VEXO {
namespace EMULATION {
namespace {

bool OptionalFlag(const Json::Value &share, const char *member, bool &flag)
{
    if (!share.isMember(member)) {
        return true;
    }
    if (!share[member].isBool()) {
        return false;
    }
    flag = share[member].asBool();
    return true;
}

// Every entry must be well formed: a database with one bad record fails as a whole.
bool ParseShares(const Json::Value &json, ShareList &shares)
{
    if (json.isNull()) {
        return true;
    }
    if (!json.isArray()) {
        return false;
    }
    for (const Json::Value &entry : json) {
        if (!entry.isObject() || !entry["name"].isString() || !entry["path"].isString()) {
            return false;
        }
        ShareInfo share;
        share.name = entry["name"].asString();
        share.path = entry["path"].asString();
        if (share.name.empty() || share.path.empty() || share.path[0] != '/') {
            return false;
        }
        while (share.path.size() > 1 && share.path.back() == '/') {
            share.path.pop_back();
        }
        if (!OptionalFlag(entry, "encrypted", share.encrypted) ||
            !OptionalFlag(entry, "uses_encryption", share.usesEncryption) ||
            !OptionalFlag(entry, "read_only", share.readOnly)) {
            return false;
        }
        shares.push_back(std::move(share));
    }
    return true;
}

char AsciiLower(char c)
{
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

bool EqualIgnoringAsciiCase(const std::string &a, const char *b)
{
    size_t i = 0;
    for (; i < a.size(); ++i) {
        if (b[i] == '\0' || AsciiLower(a[i]) != AsciiLower(b[i])) {
            return false;
        }
    }
    return b[i] == '\0';
}

}  // namespace

std::shared_ptr<const ShareList> LoadShares()
{
    static CachedStateFile<ShareList> shares("shares.json", ParseShares);
    std::shared_ptr<const ShareList> current = shares.Get();
    if (current == nullptr) {
        EMU_SET_ERROR(kErrStateFile);
    }
    return current;
}

const ShareInfo *FindShareByName(const ShareList &shares, const char *name)
{
    for (const ShareInfo &share : shares) {
        if (EqualIgnoringAsciiCase(share.name, name)) {
            return &share;
        }
    }
    return nullptr;
}

const ShareInfo *FindShareHolding(const ShareList &shares, const char *path)
{
    const ShareInfo *best = nullptr;
    for (const ShareInfo &share : shares) {
        if (PathWithin(path, share.path) && (best == nullptr || share.path.size() > best->path.size())) {
            best = &share;
        }
    }
    return best;
}

bool PathWithin(const char *path, const std::string &dir)
{
    if (dir == "/") {
        return path[0] == '/';
    }
    return std::strncmp(path, dir.c_str(), dir.size()) == 0 && (path[dir.size()] == '\0' || path[dir.size()] == '/');
}

bool IsInShareSubdirectory(const char *path, const char *name, bool &inside)
{
    const std::shared_ptr<const ShareList> shares = LoadShares();
    if (shares == nullptr) {
        return false;
    }
    const ShareInfo *share = FindShareHolding(*shares, path);
    inside = share != nullptr && PathWithin(path, (share->path == "/" ? std::string() : share->path) + "/" + name);
    return true;
}

}  // namespace EMULATION
}  // namespace VEXO
