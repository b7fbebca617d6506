#include "tls_files.h"

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <syslog.h>

#include <optional>

#include "sandbox.h"
#include "self_signed.h"
#include "tls_upkeep.h"

namespace vorn::server {
namespace {

using testing::HasSubstr;
using testing::Not;

constexpr std::time_t kDay = std::time_t{24} * 60 * 60;

class TlsFiles : public testing::Test {
 protected:
  TlsFiles() { openlog("test", LOG_PERROR, LOG_USER); }
  ~TlsFiles() override { closelog(); }

  // Writes a new certificate and its key, as PEM in one file, with this mode. Returns its path.
  std::string Issue(const std::string& name, mode_t mode = 0600) {
    sandbox_.Write(name, MakeSelfSigned({name}, &error_).value_or(""));
    chmod(sandbox_.File(name).c_str(), mode);
    return sandbox_.File(name);
  }
  TlsIdentityPtr Open(std::time_t now) {
    TlsIdentityPtr identity = OpenTlsIdentity(settings_, path_, now, &error_);
    EXPECT_EQ(identity != nullptr, error_.empty()) << error_;
    return identity;
  }

  const Sandbox sandbox_;
  const std::string path_ = sandbox_.File("self-signed.pem");
  const std::time_t now_ = std::time(nullptr);
  std::string error_;
  Settings settings_;
};

TEST_F(TlsFiles, AreThoseOfTheSettings) {
  settings_.certificate.path = settings_.key.path = Issue("nas.example");
  const TlsIdentityPtr identity = Open(now_ + 1000 * kDay);
  ASSERT_TRUE(identity);
  EXPECT_TRUE(identity->Covers("nas.example"));
  EXPECT_FALSE(identity->Covers("other.example"));
  EXPECT_EQ(ReadWholeFile(path_), "") << "no certificate is made, even if that of others has expired";
}

TEST_F(TlsFiles, WithFaultsAreRefusedWithTheReason) {
  sandbox_.Write("empty", "");
  chmod(sandbox_.File("empty").c_str(), 0600);
  const std::string good = Issue("good");
  const std::string other = Issue("other");
  const std::string open_to_all = Issue("open", 0604);
  const struct {
    std::string certificate;
    std::string key;
    const char* error;
  } cases[] = {{good, other, "the key does not belong to the certificate"},
               {good, sandbox_.File("none"), "/none: No such file or directory"},
               {sandbox_.File("none"), good, "/none: No such file or directory"},
               {sandbox_.File("empty"), good, "the certificate cannot be used"},
               {open_to_all, open_to_all, "/open: every user may use the key; its mode must be 0600 or 0640"},
               {good, sandbox_.path(), "not a regular file"}};
  for (const auto& c : cases) {
    settings_.certificate.path = c.certificate;
    settings_.key.path = c.key;
    error_.clear();
    EXPECT_FALSE(ReadTlsFiles(settings_, &error_));
    EXPECT_THAT(error_, HasSubstr(c.error));
    EXPECT_THAT(error_, Not(HasSubstr("PRIVATE KEY")));
  }
}

TEST_F(TlsFiles, OfTheServerItselfAreMadeOnce) {
  EXPECT_FALSE(ReadSelfSigned(path_, &error_));
  EXPECT_EQ(error_, "") << "there is none yet";
  const TlsIdentityPtr made = Open(now_);
  ASSERT_TRUE(made);
  EXPECT_TRUE(made->Covers("localhost"));
  EXPECT_TRUE(made->Covers("127.0.0.1"));
  EXPECT_EQ(Open(now_)->fingerprint(), made->fingerprint());
  struct stat status {};
  ASSERT_EQ(stat(path_.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0600U);
}

TEST_F(TlsFiles, OfTheServerItselfAreRenewedAMonthBeforeTheirEnd) {
  const TlsIdentityPtr made = Open(now_);
  EXPECT_EQ(Open(made->not_after() - 31 * kDay)->fingerprint(), made->fingerprint());
  EXPECT_NE(Open(made->not_after() - 29 * kDay)->fingerprint(), made->fingerprint());
}

TEST_F(TlsFiles, OfTheServerItselfAreMadeForNewNames) {
  const std::string first = Open(now_)->fingerprint();
  settings_.host_names.each = {"nas.example", "[2001:db8::1]"};
  const TlsIdentityPtr second = Open(now_);
  EXPECT_NE(second->fingerprint(), first);
  EXPECT_TRUE(second->Covers("nas.example") && second->Covers("2001:db8::1"));
  settings_.host_names.each.pop_back();
  EXPECT_EQ(Open(now_)->fingerprint(), second->fingerprint()) << "it is for the remaining name, too";
}

TEST_F(TlsFiles, OfTheServerItselfThatAreBrokenAreReplaced) {
  sandbox_.Write("self-signed.pem", "no certificate");
  chmod(path_.c_str(), 0600);
  testing::internal::CaptureStderr();
  EXPECT_TRUE(Open(now_));
  EXPECT_THAT(testing::internal::GetCapturedStderr(), HasSubstr("another certificate is made"));
}

TEST_F(TlsFiles, WarnOfTheirEndTwoWeeksBefore) {
  const TlsIdentityPtr identity = Open(now_);
  EXPECT_EQ(ExpiryWarning(*identity, identity->not_after() - 15 * kDay), "");
  EXPECT_EQ(ExpiryWarning(*identity, identity->not_after() - 13 * kDay), "The certificate expires in 13 days");
  EXPECT_EQ(ExpiryWarning(*identity, identity->not_after()), "The certificate has expired; clients refuse it");
}

class TlsUpkeep : public TlsFiles {
 protected:
  // Maintains the certificate. Returns what was logged.
  std::string Maintain(std::time_t now) {
    testing::internal::CaptureStderr();
    MaintainTls(settings_, path_, now, tls_.get());
    return testing::internal::GetCapturedStderr();
  }
  std::string Fingerprint() const { return tls_->identity()->fingerprint(); }
  void OpenServer() {
    tls_ = OpenTlsServer(settings_, path_, now_, &error_);
    ASSERT_TRUE(tls_) << error_;
  }

  std::unique_ptr<TlsServer> tls_;
};

TEST_F(TlsUpkeep, RenewsTheCertificateOfARunningServer) {
  OpenServer();
  const std::string first = Fingerprint();
  const std::time_t end = tls_->identity()->not_after();
  EXPECT_EQ(Maintain(end - 31 * kDay), "");
  EXPECT_EQ(Fingerprint(), first);
  const std::string log = Maintain(end - 29 * kDay);
  EXPECT_NE(Fingerprint(), first);
  EXPECT_THAT(log, HasSubstr("has the SHA-256 fingerprint " + Fingerprint()));
  EXPECT_THAT(log, Not(HasSubstr("PRIVATE KEY")));
}

TEST_F(TlsUpkeep, KeepsACertificateThatItCannotReplace) {
  OpenServer();
  const std::string first = Fingerprint();
  const std::time_t end = tls_->identity()->not_after();
  ASSERT_EQ(rename(path_.c_str(), sandbox_.File("kept").c_str()), 0);
  ASSERT_EQ(mkdir(path_.c_str(), 0700), 0);  // which no file replaces
  EXPECT_THAT(Maintain(end - 10 * kDay), HasSubstr("The certificate expires in 10 days"));
  EXPECT_EQ(Fingerprint(), first);
}

TEST_F(TlsUpkeep, WarnsOfACertificateOfOthersAndKeepsIt) {
  settings_.certificate.path = settings_.key.path = Issue("nas.example");
  settings_.strict_transport.time = std::chrono::hours(1);
  OpenServer();
  EXPECT_EQ(tls_->strict_transport(), "max-age=3600");
  const std::string first = Fingerprint();
  EXPECT_THAT(Maintain(tls_->identity()->not_after() + kDay), HasSubstr("The certificate has expired"));
  EXPECT_EQ(Fingerprint(), first);
}

TEST_F(TlsUpkeep, IsNotBegunWithoutAUsableCertificate) {
  settings_.certificate.path = settings_.key.path = sandbox_.File("none");
  EXPECT_FALSE(OpenTlsServer(settings_, path_, now_, &error_));
  EXPECT_THAT(error_, HasSubstr("No such file or directory"));
}

TEST_F(TlsUpkeep, ACheckMakesNoCertificate) {
  EXPECT_FALSE(CheckTls(settings_, path_, &error_)) << "TLS is not wanted";
  settings_.listen.each = {"tls:127.0.0.1:8443"};
  EXPECT_FALSE(CheckTls(settings_, path_, &error_));
  EXPECT_EQ(error_, "");
  EXPECT_EQ(ReadWholeFile(path_), "");
  const TlsIdentityPtr made = Open(now_);
  EXPECT_EQ(CheckTls(settings_, path_, &error_)->fingerprint(), made->fingerprint());
}

}  // namespace
}  // namespace vorn::server
