// The start of a form, byte by byte from standard input.
#include "form.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include "failure.h"
#include "input.h"
#include "support/input_seam.h"

namespace {

using web::BoundaryOf;
using web::Form;
using web::ReadForm;

/** Standard input that holds these bytes and then ends. */
class Input {
  public:
    explicit Input(const std::string& bytes) : before_(dup(STDIN_FILENO)) {
        FILE* const file = tmpfile();
        fwrite(bytes.data(), 1, bytes.size(), file);
        fflush(file);
        lseek(fileno(file), 0, SEEK_SET);
        dup2(fileno(file), STDIN_FILENO);
        fclose(file);
    }
    Input(const Input&) = delete;
    Input& operator=(const Input&) = delete;
    ~Input() {
        dup2(before_, STDIN_FILENO);
        close(before_);
    }
    static std::string Rest() {
        std::string rest(1 << 16, '\0');
        const ssize_t n = read(STDIN_FILENO, rest.data(), rest.size());
        rest.resize(n < 0 ? 0 : static_cast<size_t>(n));
        return rest;
    }

  private:
    int before_;
};

int StatusOf(const std::function<void()>& call) {
    try {
        call();
    } catch (const web::Failure& failure) {
        return failure.Status();
    }
    return 200;
}

constexpr const char* kHeaders =
    "Content-Disposition: form-data; name=\"file\"; filename=\"a\"\r\nContent-Type: x/y\r\n\r\n";

TEST(WebForm, TheBoundaryIsReadAsBrowsersAndOthersWriteIt) {
    const std::string longest(70, '=');
    EXPECT_EQ(BoundaryOf("multipart/form-data; boundary=----WebKitFormBoundaryX"),
              "----WebKitFormBoundaryX");
    EXPECT_EQ(BoundaryOf("Multipart/Form-Data; charset=utf-8; boundary=\"a b;c\""), "a b;c");
    EXPECT_EQ(BoundaryOf("multipart/form-data; boundary=x; charset=utf-8"), "x");
    EXPECT_EQ(BoundaryOf("multipart/form-data; boundary=" + longest), longest);
    EXPECT_EQ(BoundaryOf("multipart/form-data; boundary=.*[a-z]+?(^$)|"), ".*[a-z]+?(^$)|");
    for (const std::string& type : std::vector<std::string>{
             "", "multipart/form-data",
             "multipart/form-data; boundary=", "multipart/form-data; boundary=\"\"",
             "application/json; boundary=x", "multipart/form-data; boundary=" + longest + "="}) {
        EXPECT_EQ(StatusOf([&] { BoundaryOf(type); }), 400) << type;
    }
}

TEST(WebForm, InputStandsAtTheFilesFirstByte) {
    const Input input(std::string("--B\r\n") + kHeaders + "content\r\n--B--\r\n");
    const Form form = ReadForm("multipart/form-data; boundary=B");
    EXPECT_EQ(form.boundary, "--B");
    EXPECT_EQ(form.read, 5 + std::string(kHeaders).size());
    EXPECT_EQ(Input::Rest(), "content\r\n--B--\r\n");
}

TEST(WebForm, AFormThatBeginsOtherwiseIsRefusedAtItsFirstWrongByte) {
    for (const char* body : {"--C\r\n", "B\r\n", "x", "--B \r\n", "--B--\r\n", "--B\n\n"}) {
        const Input input(std::string(body) + kHeaders);
        EXPECT_EQ(StatusOf([] { ReadForm("multipart/form-data; boundary=B"); }), 400) << body;
    }
}

TEST(WebForm, AFormThatEndsEarlyIsRefused) {
    const std::string whole = std::string("--B\r\n") + kHeaders;
    for (size_t size = 0; size < whole.size(); ++size) {
        const Input input(whole.substr(0, size));
        EXPECT_EQ(StatusOf([] { ReadForm("multipart/form-data; boundary=B"); }), 400) << size;
    }
}

TEST(WebForm, HeadersWithoutEndAreRefused) {
    const Input input("--B\r\n" + std::string(20000, 'h'));
    EXPECT_EQ(StatusOf([] { ReadForm("multipart/form-data; boundary=B"); }), 413);
}

TEST(WebForm, ABrowserThatIsSilentForAnHourHasGone) {
    const Input input("--B\r\n");
    input_seam::Reset();
    input_seam::answers = {input_seam::Silence()};
    EXPECT_EQ(StatusOf([] { ReadForm("multipart/form-data; boundary=B"); }), 408);
    EXPECT_THAT(input_seam::waits, testing::ElementsAre(3600 * 1000));
    input_seam::Reset();
}

TEST(WebForm, ASignalDoesNotEndTheWait) {
    const Input input("x");
    input_seam::Reset();
    input_seam::answers = {input_seam::Fails(EINTR)};
    char byte = 0;
    EXPECT_EQ(web::ReadInput(&byte, 1), 1U);
    EXPECT_EQ(byte, 'x');
    input_seam::Reset();
}

}  // namespace
