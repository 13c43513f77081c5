/** Who may stop what runs: the page, by the job's record, and the system, by a signal. */
#ifndef ZYROVFS_WEB_STOP_H
#define ZYROVFS_WEB_STOP_H

namespace web {

class Job;

/**
 * While it lives, SIGTERM asks for a stop and ends nothing by itself: the web server sends it when
 * the browser has gone, and who takes a connection down to its transfers. One at a time.
 */
class StopWatch {
  public:
    /** `job` may be null. */
    explicit StopWatch(const Job* job);
    StopWatch(const StopWatch&) = delete;
    StopWatch& operator=(const StopWatch&) = delete;
    ~StopWatch();

    /** As the transfer engine asks: anything but 0 stops. */
    static int IsAsked();
    /** For a download into standard output, which is asked for its speed alone: when a stop is
     * asked for, what follows finds no room there. Answers that there is no limit. */
    static long long NoLimit(unsigned long long chunk, unsigned long long done);
};

}  // namespace web

#endif
