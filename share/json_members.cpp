// Typed reading of one member of a JSON object: a string or a boolean, or false when the member is
// missing or of another type.
#include "fileindex/utils.h"

namespace VEXO {
namespace FILEINDEX {

namespace {

// object[key] when object is an object holding that member, else null; one look-up.
const Json::Value *FindMember(const Json::Value &object, const std::string &key)
{
    return object.isObject() ? object.find(key.data(), key.data() + key.size()) : nullptr;
}

}  // namespace

bool RetrieveStringFromJsonObj(std::string &value, const std::string &key, const Json::Value &object)
{
    const Json::Value *member = FindMember(object, key);
    if (member == nullptr || !member->isString()) {
        return false;
    }
    value = member->asString();
    return true;
}

bool RetrieveBoolFromJsonObj(bool &value, const std::string &key, const Json::Value &object)
{
    const Json::Value *member = FindMember(object, key);
    if (member == nullptr || !member->isBool()) {
        return false;
    }
    value = member->asBool();
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
