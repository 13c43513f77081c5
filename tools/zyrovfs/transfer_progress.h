/**
 * How a running transfer is shown, slowed down and stopped. The engine takes plain functions and
 * moves one file at a time, so there is one progress in a process.
 */
#ifndef ZYROVFS_TOOLS_TRANSFER_PROGRESS_H
#define ZYROVFS_TOOLS_TRANSFER_PROGRESS_H

#include <csignal>
#include <string>

namespace tool {

class Progress {
  public:
    /**
     * `total` 0 or less: not known. `rate` in bytes per second, 0 for no limit. Bytes `already`
     * there count for the bar alone.
     */
    Progress(std::string name, long long total, long long rate, bool bar, long long already = 0);
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;
    /** Takes the bar off the terminal. */
    ~Progress();

    /** From now on SIGINT and SIGTERM end the transfer as cancelled, and a reader who has gone is
     * an error of writing. */
    static void CatchSignals();

    /** What has arrived; bytes that a retry sends again count once. */
    long long Bytes() const;
    /** A piece begins, of which the engine counts from 0, behind so many bytes. */
    void BeginAt(long long bytes);
    double Seconds() const;
    static bool Cancelled();

    // What the engine calls, from its threads.
    static int OnProgress(unsigned long long chunk, unsigned long long done);
    static int OnCancel();
    static long long OnSpeed(unsigned long long chunk, unsigned long long done);

  private:
    void Draw() const;

    std::string name_;
    long long total_;
    long long rate_;
    bool bar_;
    long long already_;
};

/** "12.3 MiB". */
std::string HumanBytes(double bytes);

/** "1:02:03". */
std::string HumanTime(double seconds);

/** A number with K, M or G behind it, in 1024s; false for anything else. */
bool ParseRate(const std::string& text, long long& rate);

}  // namespace tool

#endif
