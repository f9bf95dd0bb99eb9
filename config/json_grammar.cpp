// IsJsonText: the grammar check of json_grammar.h with an observer that records nothing.
#include "config/json_grammar.h"

namespace VEXO {
namespace FILEINDEX {
namespace {

struct IgnoreEverything {
    void Key(int, const char *, const char *, bool) {}
    void Value(int, JsonToken, const char *, const char *, bool) {}
};

}  // namespace

bool IsJsonText(const char *text, size_t length)
{
    IgnoreEverything observer;
    return ScanJsonText(text, length, observer);
}

}  // namespace FILEINDEX
}  // namespace VEXO
