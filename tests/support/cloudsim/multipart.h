/** Reads a multipart body piece by piece. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_MULTIPART_H
#define ZYROVFS_TESTS_CLOUDSIM_MULTIPART_H

#include <functional>
#include <string>

namespace cloudsim {

class Multipart {
  public:
    struct Part {
        std::string name;
        bool file = false;  ///< it came with a file name
        std::string file_name;
        std::string type;  ///< value of its Content-Type
    };
    using OnData = std::function<void(const Part&, const char* data, size_t size)>;

    /**
     * `content_type` is the request's, with the boundary, and has to be of this `kind`. `begin` is
     * told of every part.
     */
    Multipart(const std::string& content_type, std::function<void(const Part&)> begin, OnData data,
              const std::string& kind = "multipart/form-data");
    void Feed(const char* data, size_t size);
    /** The closing boundary was seen, and nothing was wrong before. */
    bool Complete() const { return state_ == State::kEnd; }

  private:
    enum class State { kPreamble, kBoundary, kHeaders, kBody, kEnd, kBroken };
    bool Step();
    bool StepBoundary();
    bool StepHeaders();
    bool StepBody();

    const std::function<void(const Part&)> begin_;
    const OnData data_;
    std::string boundary_;  ///< line break, two dashes, and the boundary
    std::string buffer_;
    State state_ = State::kPreamble;
    Part part_;
};

}  // namespace cloudsim

#endif
