/** How Dropbox writes its items and its errors, and how it reads what it is asked. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_DROPBOX_JSON_H
#define ZYROVFS_TESTS_CLOUDSIM_DROPBOX_JSON_H

#include <json/value.h>

#include <initializer_list>
#include <optional>
#include <string>
#include <vector>

#include "support/cloudsim/http.h"
#include "support/cloudsim/tree.h"

namespace cloudsim::dropbox {

/** Thrown by what is deep inside an operation; the operation's caller answers with it. */
struct Failure {
    Reply reply;
    Json::Value error;  ///< of what a function declares; null for what is wrong with the request
};

/** {".tag":"to","to":{".tag":"conflict",...}}: one union in the other. */
Json::Value Tagged(const std::vector<std::string>& tags);
/** 409, with the path through the unions as its summary. */
Reply Error(const Json::Value& error);
Reply ErrorWithStatus(int status, const Json::Value& error);
Failure Fail(std::initializer_list<std::string> tags);
/** 400 in plain words. */
Reply BadInput(const std::string& function, const std::string& why);

/** The arguments of one call; what isn't as it has to be ends the call with 400. */
class Arguments {
  public:
    /** `place` tells where they came from: "request body" or a header. */
    Arguments(std::string function, std::string place, const std::string& text);

    const std::string& Function() const { return function_; }
    /** All of them, as one line of JSON. */
    std::string Written() const { return OneLine(values_); }
    [[noreturn]] void Refuse(const std::string& why) const;
    bool Has(const std::string& name) const;
    std::string Text(const std::string& name) const;
    std::string TextOr(const std::string& name, const std::string& missing) const;
    bool Flag(const std::string& name, bool missing = false) const;
    uint64_t Number(const std::string& name) const;
    uint64_t NumberOr(const std::string& name, uint64_t missing) const;
    Arguments Object(const std::string& name) const;
    std::vector<Arguments> List(const std::string& name) const;
    /** Chosen member of a union, whether it came as a text or as an object. */
    std::string Tag(const std::string& name, const std::string& missing) const;
    /** "2015-05-12T15:50:38Z", and no other form. */
    std::optional<int64_t> Date(const std::string& name) const;

  private:
    Arguments(const Arguments& outer, Json::Value values)
        : function_(outer.function_), place_(outer.place_), values_(std::move(values)) {}
    const Json::Value& Member(const std::string& name, const char* kind, bool right) const;

    std::string function_, place_;
    Json::Value values_;
};

/** "/Docs/a.txt", as it was written; empty for the folder that holds all. */
std::string PathOf(const Node& node);
std::string Revision(const Node& node);
/** "2015-05-12T15:50:38Z". */
std::string Date(int64_t time);
/** "Tue, 12 May 2015 15:50:38 +0000". */
std::string OldDate(int64_t time);

/** `hash` may be empty. With `tag` where a file could stand for a folder. */
Json::Value Metadata(const Node& node, const std::string& hash, bool tag);
Json::Value Deleted(const std::string& path);
/** Members of the first version of the interface. */
void AddOldMembers(const Node& node, Json::Value& metadata);
Json::Value User(const Account& account);
/** ASCII alone, as a header has to be. */
std::string HeaderText(const Json::Value& document);

bool IsUtf8(const std::string& text);
/** Whether an item may be called so. */
bool IsName(const std::string& name);
/** "a (2).txt" for "a.txt". */
std::string Numbered(const std::string& name, bool folder, int number);
std::string Conflicted(const std::string& name, const std::string& whose, int number);

}  // namespace cloudsim::dropbox

#endif
