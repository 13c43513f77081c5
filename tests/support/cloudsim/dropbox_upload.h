/** Requests to Dropbox that bring bytes. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_DROPBOX_UPLOAD_H
#define ZYROVFS_TESTS_CLOUDSIM_DROPBOX_UPLOAD_H

#include "support/cloudsim/dropbox.h"

namespace cloudsim {

namespace dropbox {

/** Arguments of a function at the contents' host. */
Arguments ReadHeader(const Request& request, const std::string& function);
/** 400 for a body of another type. */
void CheckType(const Request& request, const std::string& function, bool may_be_none,
               std::initializer_list<const char*> types);

}  // namespace dropbox

/** A piece counts when it has come whole, and not at all before. */
class DropboxUpload : public Handler {
  public:
    struct Kind {
        const char* name;
        void (DropboxUpload::*check)(const DropboxCall& call) const;
        Reply (DropboxUpload::*store)(const DropboxCall& call);
    };
    static const Kind* Find(const std::string& name);

    DropboxUpload(Dropbox& dropbox, const Request& request, Account& account, const Kind& kind);
    void Data(const char* data, size_t size) override;
    Reply Finish() override;

  private:
    static const Kind kKinds[];

    void CheckNothing(const DropboxCall&) const {}
    void CheckCursor(const DropboxCall& call) const;
    void CheckOldCursor(const DropboxCall& call) const;
    void CheckFinish(const DropboxCall& call) const;
    Reply Store(const DropboxCall& call);
    Reply Start(const DropboxCall& call);
    Reply Append(const DropboxCall& call);
    Reply AppendOld(const DropboxCall& call);
    Reply FinishSession(const DropboxCall& call);
    Reply AppendAt(const DropboxCall& call, const dropbox::Arguments& cursor);
    void CheckSize(uint64_t size) const;

    Dropbox& dropbox_;
    const Request& request_;
    Account& account_;
    const Kind& kind_;
    std::unique_ptr<Sink> sink_;
    std::optional<Reply> refused_;
    uint64_t came_ = 0;
    bool failed_ = false;
};

}  // namespace cloudsim

#endif
