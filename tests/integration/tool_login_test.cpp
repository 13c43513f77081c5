// `zyrovfs login` at the four simulated clouds: the service's page, the answer on the loopback port
// or pasted, and what is said when it does not come to that.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <regex>

#include "support/machine_clouds.h"

namespace {

using machine::Eventually;
using machine::Must;
using machine::Outcome;
using machine::Read;
using machine_clouds::kTool;
using machine_clouds::Place;
using machine_clouds::TheClouds;
using testing::HasSubstr;
using testing::Not;

const auto* const kClouds = testing::AddGlobalTestEnvironment(&TheClouds());

Outcome ForAmy(const std::string& arguments) {
    return machine::Run(kTool + " " + arguments + " --user amy");
}

/** A login under way in the background. */
class LoginCommand {
  public:
    explicit LoginCommand(const std::string& arguments) {
        Must("rm -f /tmp/login.*; mkfifo /tmp/login.in");
        // With both ends open here, neither side waits for the other.
        input_ = open("/tmp/login.in", O_RDWR | O_CLOEXEC);
        Must("{ " + kTool + " login " + arguments +
             " --user amy </tmp/login.in >/tmp/login.out 2>&1; echo $? >/tmp/login.code; } "
             ">/dev/null 2>&1 &");
    }
    LoginCommand(const LoginCommand&) = delete;
    LoginCommand& operator=(const LoginCommand&) = delete;
    ~LoginCommand() { close(input_); }

    /** The service's page; "" when the command ended without one. */
    std::string Address() const {
        std::smatch found;
        std::string text;
        Eventually([&] {
            text = Read("/tmp/login.out");
            return std::regex_search(text, std::regex("\n  (http\\S+)\n")) || Ended();
        });
        return std::regex_search(text, found, std::regex("\n  (http\\S+)\n")) ? found[1].str() : "";
    }
    bool Ended() const { return !Read("/tmp/login.code").empty(); }
    void Type(const std::string& line) const {
        const std::string text = line + "\n";
        EXPECT_EQ(static_cast<ssize_t>(text.size()), write(input_, text.data(), text.size()));
    }
    Outcome End() const {
        EXPECT_TRUE(Eventually([this] { return Ended(); })) << Read("/tmp/login.out");
        return {atoi(Read("/tmp/login.code").c_str()), Read("/tmp/login.out")};
    }

  private:
    int input_;
};

std::string Curl(const std::string& arguments) {
    return Must("curl -sS " + arguments);
}
/** Where the service sends the browser of the person who presses this button. */
std::string Press(const std::string& page, const std::string& decision,
                  const std::string& account = "amy@example.com") {
    return Curl("-o /dev/null -w '%{redirect_url}' --data-urlencode account=" + account +
                " --data decision=" + decision + " '" + page + "'");
}

class ToolLogin : public testing::TestWithParam<const char*> {
  protected:
    ToolLogin() {
        for (Place& place : TheClouds().places) {
            place_ = place.protocol == GetParam() ? &place : place_;
        }
        Must(kTool + " profile delete " + place_->Id() + " --user amy");
    }
    std::string Service() const { return GetParam(); }
    bool HasProfile() const { return ForAmy("profile show " + place_->Id()).status == 0; }

    Place* place_ = nullptr;
};

TEST_P(ToolLogin, AConsentInTheBrowserSavesTheAccount) {
    const LoginCommand login(Service() + " --port 0 --alias mine");
    const std::string page = login.Address();
    EXPECT_THAT(Curl("'" + page + "'"), HasSubstr("<option>amy@example.com</option>"));
    const std::string shown = Curl("'" + Press(page, "allow") + "'");
    EXPECT_THAT(shown, HasSubstr("The answer has arrived."));
    const Outcome outcome = login.End();
    EXPECT_EQ(outcome.status, 0) << outcome.output;
    EXPECT_THAT(outcome.output, HasSubstr("Signed in as Amy <amy@example.com>.\n"));
    EXPECT_THAT(outcome.output, HasSubstr("Saved " + place_->Id() + ".\n"));
    EXPECT_THAT(ForAmy("account " + place_->Id()).output, HasSubstr("E-mail: amy@example.com"));
    EXPECT_THAT(ForAmy("profile show " + place_->Id()).output, HasSubstr("mine"));
    const std::string token = place_->account->LastTokens().access_token;
    EXPECT_THAT(outcome.output, Not(HasSubstr(token)));
}

TEST_P(ToolLogin, APastedAddressDoesTheSame) {
    const LoginCommand login(Service() + " --paste");
    const std::string page = login.Address();
    login.Type("what is this?");
    login.Type(Press(page, "allow"));
    const Outcome outcome = login.End();
    EXPECT_EQ(outcome.status, 0) << outcome.output;
    EXPECT_THAT(outcome.output, HasSubstr("That is not the answer to this login."));
    EXPECT_TRUE(HasProfile());
}

TEST_P(ToolLogin, ARefusedConsentSavesNothing) {
    const LoginCommand login(Service() + " --port 0");
    Curl("'" + Press(login.Address(), "deny") + "'");
    const Outcome outcome = login.End();
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, HasSubstr("refused on the page of the service"));
    EXPECT_FALSE(HasProfile());
}

TEST_P(ToolLogin, AWrongStateIsToldToTheBrowserAndWaitedPast) {
    const LoginCommand login(Service() + " --port 0");
    const std::string answer = Press(login.Address(), "allow");
    const std::string begin = answer.substr(0, answer.find('?'));
    for (const char* wrong : {"?code=4%2Fstolen&state=other", "?code=x", "", "favicon.ico"}) {
        EXPECT_THAT(Curl("-o /dev/null -w '%{http_code}' '" + begin + wrong + "'"),
                    testing::AnyOf("400", "404"))
            << wrong;
    }
    Curl("'" + answer + "'");
    EXPECT_EQ(login.End().status, 0);
    // A second answer finds nobody.
    EXPECT_EQ(machine::Run("curl -s '" + answer + "'").status, 7);
}

TEST_P(ToolLogin, AgainRenewsTheProfileOfTheSameAccountAlone) {
    {
        const LoginCommand first(Service() + " --port 0 --alias kept");
        Curl("'" + Press(first.Address(), "allow") + "'");
        ASSERT_EQ(first.End().status, 0);
    }
    place_->account->ExpireAccessTokens();
    place_->account->RevokeRefreshTokens();
    EXPECT_EQ(ForAmy("account " + place_->Id()).status, 1);
    place_->service->AddAccount("bob@example.com", "Bob");
    {
        const LoginCommand other(Service() + " --port 0 --again " + place_->Id());
        Curl("'" + Press(other.Address(), "allow", "bob@example.com") + "'");
        const Outcome outcome = other.End();
        EXPECT_EQ(outcome.status, 1);
        EXPECT_THAT(outcome.output, HasSubstr("That was the account bob@example.com"));
    }
    const LoginCommand again(Service() + " --port 0 --again " + place_->Id());
    Curl("'" + Press(again.Address(), "allow") + "'");
    const Outcome outcome = again.End();
    EXPECT_EQ(outcome.status, 0) << outcome.output;
    EXPECT_THAT(outcome.output, HasSubstr("Renewed " + place_->Id()));
    EXPECT_EQ(ForAmy("account " + place_->Id()).status, 0);
    EXPECT_THAT(ForAmy("profile show " + place_->Id()).output, HasSubstr("kept"));
}

TEST_P(ToolLogin, AnAccountThatIsSavedAlreadyIsKept) {
    for (int i = 0; i < 2; ++i) {
        const LoginCommand login(Service() + " --port 0");
        Curl("'" + Press(login.Address(), "allow") + "'");
        const Outcome outcome = login.End();
        EXPECT_EQ(outcome.status, i);
        if (i == 1) {
            EXPECT_THAT(outcome.output, HasSubstr("SERVER_EXISTS"));
            EXPECT_THAT(outcome.output, HasSubstr("--again ID"));
        }
    }
}

INSTANTIATE_TEST_SUITE_P(Services, ToolLogin,
                         testing::Values("box", "dropbox", "google", "onedrive"),
                         [](const auto& service) { return std::string(service.param); });

TEST(ToolLoginAlone, APortThatIsTakenIsToldWithWhatToDo) {
    const LoginCommand first("box --port 48790");
    ASSERT_NE("", first.Address());
    const Outcome second = ForAmy("login box --port 48790 </dev/null");
    EXPECT_EQ(second.status, 1);
    EXPECT_THAT(second.output, HasSubstr("Port 48790 of this machine cannot be had"));
    EXPECT_THAT(second.output, HasSubstr("--port"));
    Curl("'" + Press(first.Address(), "deny") + "'");
    EXPECT_EQ(first.End().status, 1);
}

TEST(ToolLoginAlone, ABrowserThatNeverComesIsWaitedForSoLong) {
    const Outcome outcome = ForAmy("login box --port 0 --timeout 1 </dev/null");
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, HasSubstr("No answer came in time."));
}

TEST(ToolLoginAlone, AnInputThatEndsIsNoAnswer) {
    const Outcome outcome = ForAmy("login box --paste </dev/null");
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, HasSubstr("The input ended before an answer."));
}

TEST(ToolLoginAlone, JsonKeepsTheAddressOutOfTheDocument) {
    const Outcome outcome =
        machine::Run(kTool +
                     " login box --json --port 0 --timeout 1 --user amy </dev/null "
                     "2>/tmp/login.err");
    EXPECT_EQ(outcome.status, 1);
    EXPECT_EQ(outcome.output[0], '{') << outcome.output;
    EXPECT_THAT(Read("/tmp/login.err"), HasSubstr("/api/oauth2/authorize?"));
}

TEST(ToolLoginAlone, AClientThatIsMissingOrUnknownIsASentence) {
    const Outcome unknown = ForAmy("login box --client nosuch </dev/null");
    EXPECT_EQ(unknown.status, 1);
    EXPECT_THAT(unknown.output, HasSubstr("Client nosuch of box is not known"));
    EXPECT_EQ(ForAmy("login nowhere </dev/null").status, 2);
    EXPECT_EQ(ForAmy("login box --paste --port 0 </dev/null").status, 2);
    Must(kTool + " cloud client remove box client");
    const Outcome none = ForAmy("login box </dev/null");
    Must(kTool + " cloud client add box client --password-file /tmp/secret");
    EXPECT_EQ(none.status, 1);
    EXPECT_THAT(none.output, HasSubstr("There is no OAuth client of box"));
}

}  // namespace
