// fileindexctl's --help, wrapped to 72 columns, so that it fits an 80-column terminal and the man
// page that help2man makes of it.
#ifndef FILEINDEXCTL_HELP_FORMAT_H
#define FILEINDEXCTL_HELP_FORMAT_H

#include <memory>
#include <string>

#include <CLI/CLI.hpp>

namespace fileindexctl {

// The formatter to give the program before any subcommand is added (subcommands take their
// parent's).
std::shared_ptr<CLI::Formatter> WrappingFormatter();

}  // namespace fileindexctl

#endif
