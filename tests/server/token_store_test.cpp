#include "token_store.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <ctime>
#include <memory>

#include "sandbox.h"
#include "secret.h"

namespace vorn::server {
namespace {

using Outcome = TokenStore::Outcome;

class TokenStoreTest : public testing::Test {
 protected:
  Outcome Create(const std::string& name, std::int64_t expires = 0) {
    Token token;
    token.name = name;
    token.role = Role::kReader;
    token.apis = {"Nfs"};
    token.shares = {"data", "music"};
    token.expires = expires;
    const Outcome outcome = store_->Create(&token, &secret_, &error_);
    id_ = token.id;
    return outcome;
  }
  void Restart() {
    store_.reset();
    store_ = std::make_unique<TokenStore>(path_);
  }

  Sandbox sandbox_;
  std::string path_ = sandbox_.File("tokens.json");
  std::unique_ptr<TokenStore> store_ = std::make_unique<TokenStore>(path_);
  std::string secret_;
  std::string id_;
  std::string error_;
};

TEST_F(TokenStoreTest, KnowsItsTokensAfterARestart) {
  ASSERT_EQ(Create("backup"), Outcome::kDone) << error_;
  for (int i = 0; i < 2; ++i) {
    const CallerPtr caller = store_->Use(secret_, "192.0.2.7", 1000);
    ASSERT_TRUE(caller);
    EXPECT_EQ(caller->name, "token backup");
    EXPECT_EQ(caller->role, Role::kReader);
    EXPECT_EQ(caller->apis, std::vector<std::string>{"Nfs"});
    EXPECT_EQ(caller->shares, (std::vector<std::string>{"data", "music"}));
    Restart();
  }
  EXPECT_EQ(store_->List()[0].last_used, 1000) << "the last use is written before the end";
  EXPECT_EQ(store_->List()[0].last_address, "192.0.2.7");
}

TEST_F(TokenStoreTest, StoresNoSecretAndOnlyForItself) {
  ASSERT_EQ(Create("backup"), Outcome::kDone);
  const std::string text = ReadWholeFile(path_);
  EXPECT_EQ(text.find(secret_.substr(kTokenPrefix.size(), 16)), std::string::npos);
  EXPECT_NE(text.find(DigestOf(secret_)), std::string::npos);
  struct stat status {};
  ASSERT_EQ(stat(path_.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0600U);
}

TEST_F(TokenStoreTest, WritesNoUseWhenItHappens) {
  ASSERT_EQ(Create("backup"), Outcome::kDone);
  const std::string before = ReadWholeFile(path_);
  for (int i = 0; i < 1000; ++i) EXPECT_TRUE(store_->Use(secret_, "unix", i));
  EXPECT_EQ(ReadWholeFile(path_), before);
}

TEST_F(TokenStoreTest, RefusesRevokedTokens) {
  ASSERT_EQ(Create("backup"), Outcome::kDone);
  EXPECT_EQ(store_->Revoke(id_, &error_), Outcome::kDone);
  EXPECT_EQ(store_->Revoke(id_, &error_), Outcome::kUnknown);
  for (int i = 0; i < 2; ++i) {
    EXPECT_FALSE(store_->Use(secret_, "unix", 1));
    Restart();
  }
}

TEST_F(TokenStoreTest, RefusesExpiredAndUnknownTokens) {
  ASSERT_EQ(Create("backup", 5000), Outcome::kDone);
  EXPECT_TRUE(store_->Use(secret_, "unix", 4999));
  EXPECT_FALSE(store_->Use(secret_, "unix", 5000));
  EXPECT_FALSE(store_->Use(NewSecret(kTokenPrefix), "unix", 1));
  EXPECT_FALSE(store_->Use("", "unix", 1));
}

TEST_F(TokenStoreTest, HasEachNameOnce) {
  EXPECT_EQ(Create("backup"), Outcome::kDone);
  EXPECT_EQ(Create("backup"), Outcome::kNameTaken);
  EXPECT_EQ(store_->List().size(), 1U);
}

TEST_F(TokenStoreTest, KeepsAFileThatItCannotRead) {
  const char* broken[] = {
      "{",
      "[]",
      R"({"tokens": 1})",
      R"({"tokens": [{}]})",
      R"({"tokens": [], "more": 1})",
      R"({"tokens": [{"id":"a","digest":"x","name":"n","role":"reader","apis":[],"shares":[],"created":0,"expires":0,"last_used":0,"last_address":""}]})"};
  for (const char* text : broken) {
    store_.reset();
    sandbox_.Write("tokens.json", text);
    chmod(path_.c_str(), 0600);
    store_ = std::make_unique<TokenStore>(path_);
    EXPECT_EQ(Create("backup"), Outcome::kFailed) << text;
    EXPECT_NE(error_.find(path_), std::string::npos) << text;
    EXPECT_EQ(store_->Revoke("a", &error_), Outcome::kFailed) << text;
    EXPECT_EQ(ReadWholeFile(path_), text);
  }
}

TEST_F(TokenStoreTest, SaysWhyATokenIsNotStored) {
  store_ = std::make_unique<TokenStore>(sandbox_.File("none/tokens.json"));
  EXPECT_EQ(Create("backup"), Outcome::kFailed);
  EXPECT_NE(error_, "");
  EXPECT_FALSE(store_->Use(secret_, "unix", 1));
  EXPECT_TRUE(store_->List().empty());
}

}  // namespace
}  // namespace vorn::server
