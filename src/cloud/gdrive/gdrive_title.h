/** From the name of an item in the file tree to its title at the service. */
#ifndef ZYROVFS_CLOUD_GDRIVE_TITLE_H
#define ZYROVFS_CLOUD_GDRIVE_TITLE_H

#include <json/value.h>

#include <string>

namespace ZYROCloud::gdrive {

/**
 * What a name may mean. The tree shows the second of two items of a title with the date of its
 * creation, as "a - 2015-03-02T10:11:12.000Z.txt", and documents with the extension of their kind.
 */
class ShownTitle {
  public:
    explicit ShownTitle(const std::string& name);

    /** Condition that finds such items, narrowed by `extra` unless that is empty. */
    std::string Query(const std::string& extra) const;
    /** Whether an item of the answer is meant. Json::Exception for values of the wrong type. */
    bool Means(const Json::Value& item) const;

    const std::string& Name() const { return name_; }
    /** The other title that the name may stand for, "" for none. */
    const std::string& Other() const { return other_; }
    /** When that one was created, as the service writes it; "" for any name but of that form. */
    const std::string& Date() const { return date_; }

  private:
    void TakeDate(const std::string& stem);

    const std::string name_;
    std::string other_;
    std::string date_;
};

}  // namespace ZYROCloud::gdrive

#endif
