// The command line: `zdrlab labels|list|post [--company DIR] [--settings FILE]
// [--set NAME=VALUE]... [--open]`.
#pragma once

#include <string>
#include <vector>

namespace zdr {

class SettingsStore;
class UserSeam;

// True when `word` is one of the command line's commands.
bool IsCliCommand(const std::string& word);

// Runs one command with the arguments after the program name. `store` is used when no
// --settings FILE is given. Prints the output's path on standard output and everything else
// on standard error. Returns the process exit code: 0 when the command produced its file,
// 1 when it failed (the command's own failure, or a data load that did not read all it
// should), 2 for wrong usage (said in Hebrew): an unknown word, an option of another command,
// an option word where a file name belongs, a value the table of values refuses by --set or
// stored in the settings, an unusable label stock.
//
// `post --check` writes no file: it prints the dispatch checks' findings on standard output
// as CSV (FindingsCsv) and returns 0. `post --strict` returns 3 when a check found an error:
// the files are then not written and the findings are printed as with --check.
int RunCli(const std::vector<std::string>& args, SettingsStore& defaultStore);

}  // namespace zdr
