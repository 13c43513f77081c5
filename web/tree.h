/** The files of a connection by their paths: listing and changing them, not their contents. */
#ifndef ZYROVFS_WEB_TREE_H
#define ZYROVFS_WEB_TREE_H

#include <functional>
#include <string>
#include <vector>

namespace web {

/** A format in which a service gives a document that has no bytes of its own. */
struct Export {
    std::string format;  ///< MIME type
    std::string title;
    std::string extension;  ///< with its dot
};

struct Entry {
    std::string name;
    bool folder = false;
    bool file = false;        ///< neither: a link of the server, or something odd
    long long size = -1;      ///< bytes; -1 when it is not known
    long long modified = -1;  ///< epoch seconds; -1 when it is not known
    std::vector<Export> exports;
};

/**
 * Paths have been checked (name.h). Every operation ends by a Failure when it cannot be done;
 * nothing takes the place of an item that is there already.
 */
class Tree {
  public:
    Tree() = default;
    Tree(const Tree&) = delete;
    Tree& operator=(const Tree&) = delete;
    virtual ~Tree() = default;

    /** Whether the root is there, as far as can be told without asking a service. */
    virtual bool IsThere() = 0;
    /** Tells of each entry, in the order in which they come. */
    virtual void List(const std::string& path, const std::function<void(Entry)>& tell) = 0;
    /** The item at a path; Failure with status 404 when there is none. */
    virtual Entry Look(const std::string& path) = 0;
    virtual void MakeFolder(const std::string& path) = 0;
    /** Into `folder`, under the name `name`; both may be the item's own. */
    virtual void Move(const std::string& path, const std::string& folder,
                      const std::string& name) = 0;
    /** A folder with something in it only with `recursive`. */
    virtual void Delete(const std::string& path, bool recursive) = 0;
};

/** The root of a connection is a folder wherever it lies, and is not asked for. */
Entry RootEntry();

}  // namespace web

#endif
