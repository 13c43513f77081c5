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
};

}  // namespace web

#endif
