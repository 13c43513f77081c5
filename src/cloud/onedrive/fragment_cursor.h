/** Where a file stands on its way through a session of fragments. Arithmetic, and nothing else. */
#ifndef ZYROVFS_CLOUD_ONEDRIVE_FRAGMENT_CURSOR_H
#define ZYROVFS_CLOUD_ONEDRIVE_FRAGMENT_CURSOR_H

namespace ZYROCloud::onedrive {

/**
 * Bytes that the service has behind an attempt of `length` bytes from `offset` on, of which it says
 * that it has received `received` in all. Its word counts, but for more than it was sent.
 */
long long OffsetBehind(long long offset, long long length, long long received);

/**
 * The offset is what the service is taken to have. An attempt moves it on, or back when the service
 * tells less; an attempt that failed without a word from the service moves it to the start of the
 * file, and the next one tells where the service really is.
 */
class FragmentCursor {
  public:
    explicit FragmentCursor(long long total) : total_(total) {}

    long long Offset() const { return offset_; }
    bool IsWhole() const { return offset_ >= total_; }
    /** What the service has stored short of what was sent has to be read again. */
    bool IsSourceElsewhere() const { return position_ != offset_; }
    void SourceIsAtOffset() { position_ = offset_; }

    /** A fragment of up to `length` bytes begins at the offset. */
    void BeginFragment(long long length);
    /** Bytes that the next attempt of it sends, from the offset on; 0 when the service has the
     * fragment already and only the answer was lost. */
    long long BeginAttempt(long long length);
    /** Behind an attempt: what OffsetBehind says. */
    void MoveTo(long long offset) { offset_ = offset; }
    /** Before a repeat, on to where the service says it is, but not beyond the fragment. */
    void AdoptServerOffset(long long received);
    /** Behind an attempt that went well: what is still to be sent of the fragment, since the
     * attempt began in front of it. */
    long long RestOfFragment(long long received);

  private:
    const long long total_;
    long long offset_ = 0;
    long long begin_ = 0;     ///< of the fragment, in the file
    long long end_ = 0;       ///< of the same
    long long start_ = 0;     ///< of the last attempt
    long long position_ = 0;  ///< of the source behind the last attempt
};

}  // namespace ZYROCloud::onedrive

#endif
