// Translator registry, the generic translator, host texts and the default
// one-line description.
#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "tarn/Basics/TarnCoreLibCallbacks.h"
#include "tarn/Errors/TarnError.h"

namespace tarn {
namespace {

// Translates one kind into its own name.
struct NamedTranslator : TarnError::CodeTranslator {
  NamedTranslator(std::string k, std::string n) : kind(std::move(k)), name(std::move(n)) {}
  bool CanTranslate(const TarnError& e) const override { return e.GetKind().view() == kind; }
  void Translate(const TarnError&, UString& title, UString&) const override {
    title = UString(name);
  }
  std::string kind, name;
};

// Knows a few texts and counts idle requests; installed for its lifetime.
struct TestHost : TarnCoreLibCallbacks {
  TestHost() { SetCallbackAPI(this); }
  ~TestHost() override { SetCallbackAPI(nullptr); }
  bool GetIndString(short listID, short index, UString& text) override {
    if (listID == 30000 && (index == 0 || index == -36))
      text = UString(index ? "Host I/O" : "Host title");
    if (listID == kGeneralLabelsStringList && index == kAttachmentLabelIndex)
      text = UString("Dateien:");
    return !text.empty();
  }
  void RequestIdleTime() override { ++idleRequests; }
  int idleRequests = 0;
};

std::string Title(const TarnError& e) {
  static NamedTranslator fallback("", "fallback");
  UString title;
  e.GetErrorDescription(fallback, title);
  return title.utf8_str();
}

TEST(TranslatorRegistry, LaterRegistrationWinsAndRemovalTakesTheFirstEqualPointer) {
  NamedTranslator a("K1", "a"), b("K1", "b"), c("K2", "c");
  auto& list = TarnError::GetTranslatorList();
  const std::vector<TarnError::CodeTranslator*> before = list;
  for (auto* t : {&a, &b, &c, &a}) TarnError::AddTranslator(t);
  EXPECT_EQ(Title(TarnError("K1", "", "", 1)), "a");
  EXPECT_EQ(Title(TarnError("K2", "", "", 1)), "c");
  EXPECT_EQ(Title(TarnError("K3", "", "", 1)), "fallback");
  TarnError::RemoveTranslator(&a);
  EXPECT_EQ(Title(TarnError("K1", "", "", 1)), "a");
  ASSERT_EQ(list.size(), before.size() + 3);
  EXPECT_EQ(list[before.size()], &b);
  for (auto* t : {&a, &b, &c, &c}) TarnError::RemoveTranslator(t);  // the last: absent
  EXPECT_EQ(list, before);
}

TEST(GenericErrCodeTranslator, HostTextsOptionalStringAndAttachment) {
  {
    GenericErrCodeTranslator t(UString("Host"), 30000);
    EXPECT_FALSE(t.CanTranslate(TarnError("Hos", "", "", -36)));
    TestHost host;
    UString title, description;
    for (const auto& [e, text] : std::initializer_list<std::pair<TarnError, const char*>>{
             {TarnError("Host", "File I/O", "", -36), "Host I/O"},
             {TarnError("Host", "", "", -36, "from the system"), "from the system"},
             {TarnError("Host", "", "", -36, nullptr, UString("/a\n/b")),
              "Host I/O\n\nDateien:\n/a\n/b"},
             {TarnError("Host", "", "", -37), ""},
             {TarnError("Host", "", "", 65536 - 36), ""}}) {
      e.GetErrorDescription(TarnError::DefaultTranslator(), title, description);
      EXPECT_EQ(title.utf8_str(), "Host title");
      EXPECT_EQ(description.utf8_str(), text);
    }
    EXPECT_EQ(GetIndUString(kSampleFormatNamesStringList, 3).utf8_str(), "16-bit");  // built in
    TarnCoreLibCallbacks::GetCallbackAPI()->RequestIdleTime();
    EXPECT_EQ(host.idleRequests, 1);
  }
  EXPECT_EQ(Title(TarnError("Host", "", "", -36)), "fallback");
}

TEST(DefaultTranslator, BuiltInTextsAndOneLineDescriptions) {
  EXPECT_EQ(GetIndUString(kSampleFormatNamesStringList, 5).utf8_str(), "24-bit (32-bit container)");
  EXPECT_EQ(GetIndUString(kChannelSuffixesStringList, 4).utf8_str(), ".LFE");
  EXPECT_EQ(TarnError(-108, "x.cpp", 3).Describe(), "OS, , , -108, Out of memory");
  EXPECT_EQ(TarnError("POSIX", "Threads", "Lock", 22, "Invalid argument").Describe(),
            "POSIX, Threads, Lock, 22, Invalid argument");
  EXPECT_EQ(TarnError("OS", "File I/O", "", -43, nullptr, UString("/a\n/b")).Describe(),
            "OS, File I/O, , -43, File not found Files: /a /b");
}

TEST(TarnCoreLibCallbacks, InstallingWhileOtherThreadsReadTexts) {
  TestHost host;
  std::atomic<bool> stop{false};
  std::atomic<int> wrong{0};
  std::vector<std::thread> readers;
  for (int t = 0; t < 3; ++t) {
    readers.emplace_back([&] {
      while (!stop) {
        const std::string label =
            GetIndUString(kGeneralLabelsStringList, kAttachmentLabelIndex).utf8_str();
        wrong += label != "Files:" && label != "Dateien:";
      }
    });
  }
  for (int i = 0; i < 2000; ++i) TarnCoreLibCallbacks::SetCallbackAPI(i % 2 ? nullptr : &host);
  stop = true;
  for (auto& r : readers) r.join();
  EXPECT_EQ(wrong.load(), 0);
}

}  // namespace
}  // namespace tarn
