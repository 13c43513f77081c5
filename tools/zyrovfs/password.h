/** Passwords come from a prompt, a file or standard input, never from the argument list. */
#ifndef ZYROVFS_TOOLS_PASSWORD_H
#define ZYROVFS_TOOLS_PASSWORD_H

#include <CLI/CLI.hpp>
#include <string>

namespace tool {

struct PasswordOptions {
    bool ask = false;
    bool from_stdin = false;
    std::string file;
    const char* word = "password";  ///< what it is, for sentences

    bool Given() const { return ask || from_stdin || !file.empty(); }
};

/** --ask-password, --password-file and --password-stdin, of which one may be given. */
void AddPasswordOptions(CLI::App& command, PasswordOptions& options);

/** One line's newline at the end is not part of the password. False with a sentence. */
bool ReadPassword(const PasswordOptions& options, std::string& password, std::string& problem);

}  // namespace tool

#endif
