/** Text for people at a terminal. */
#ifndef ZYROVFS_TOOLS_TEXT_H
#define ZYROVFS_TOOLS_TEXT_H

#include <string>
#include <vector>

namespace tool {

/**
 * Text that came from a server or a profile, safe to show: control characters, marks that turn the
 * reading direction and bytes that are not UTF-8 become \xNN or \u{NNNN}.
 */
std::string Printable(const std::string& text);

/** Aligned columns below a heading; cells are made printable. */
class Table {
  public:
    explicit Table(std::vector<std::string> heading);
    void Add(std::vector<std::string> row);
    size_t Rows() const { return rows_.size() - 1; }
    std::string Format() const;

  private:
    std::vector<std::vector<std::string>> rows_;
};

}  // namespace tool

#endif
