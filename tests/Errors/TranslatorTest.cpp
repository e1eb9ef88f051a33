#include <gtest/gtest.h>

#include <string>

#include "tarn/Basics/TarnCoreLibCallbacks.h"
#include "tarn/Errors/TarnError.h"

namespace tarn {
namespace {

// Translates one kind, stamping its own name into the title.
class NamedTranslator : public TarnError::CodeTranslator {
 public:
  NamedTranslator(std::string kind, std::string name)
      : kind_(std::move(kind)), name_(std::move(name)) {}
  bool CanTranslate(const TarnError& e) const override { return e.GetKind().view() == kind_; }
  void Translate(const TarnError&, UString& title, UString& description) const override {
    title = UString(name_);
    description = UString(name_ + " text");
  }

 private:
  std::string kind_, name_;
};

// Registers for the scope of a test.
class Registered {
 public:
  explicit Registered(TarnError::CodeTranslator* t) : t_(t) { TarnError::AddTranslator(t); }
  ~Registered() { TarnError::RemoveTranslator(t_); }

 private:
  TarnError::CodeTranslator* t_;
};

// A host that knows a few texts and counts idle requests.
class TestHost : public TarnCoreLibCallbacks {
 public:
  bool GetIndString(short listID, short index, UString& text) override {
    if (listID == 30000 && index == 0)
      text = UString("Host title");
    else if (listID == 30000 && index == -36)
      text = UString("Host I/O text");
    else if (listID == kGeneralLabelsStringList && index == kAttachmentLabelIndex)
      text = UString("Dateien:");
    else
      return false;
    return true;
  }
  void RequestIdleTime() override { ++idleRequests; }
  int idleRequests = 0;
};

class InstalledHost {
 public:
  explicit InstalledHost(TarnCoreLibCallbacks* host) { TarnCoreLibCallbacks::SetCallbackAPI(host); }
  ~InstalledHost() { TarnCoreLibCallbacks::SetCallbackAPI(nullptr); }
};

std::string Title(const TarnError& e, const TarnError::CodeTranslator& fallback) {
  UString title;
  e.GetErrorDescription(fallback, title);
  return title.utf8_str();
}

TEST(TranslatorRegistry, LaterRegistrationWinsAndRemovalKeepsOrder) {
  NamedTranslator fallback("", "fallback"), a("K1", "a"), b("K1", "b"), c("K2", "c");
  auto& list = TarnError::GetTranslatorList();
  const std::size_t before = list.size();
  const TarnError k1("K1", "", "", 1), k2("K2", "", "", 1), k3("K3", "", "", 1);
  {
    Registered ra(&a), rb(&b), rc(&c);
    ASSERT_EQ(list.size(), before + 3);
    EXPECT_EQ(list[before], &a);
    EXPECT_EQ(list[before + 2], &c);
    EXPECT_EQ(Title(k1, fallback), "b");
    EXPECT_EQ(Title(k2, fallback), "c");
    EXPECT_EQ(Title(k3, fallback), "fallback");

    TarnError::RemoveTranslator(&b);
    ASSERT_EQ(list.size(), before + 2);
    EXPECT_EQ(list[before], &a);
    EXPECT_EQ(list[before + 1], &c);
    EXPECT_EQ(Title(k1, fallback), "a");
    TarnError::RemoveTranslator(&b);  // absent: no effect
    EXPECT_EQ(list.size(), before + 2);
    TarnError::AddTranslator(&b);  // so that rb's removal finds it
  }
  EXPECT_EQ(list.size(), before);
}

TEST(TranslatorRegistry, RemoveTakesOnlyTheFirstEqualPointer) {
  NamedTranslator a("K1", "a"), b("K1", "b");
  auto& list = TarnError::GetTranslatorList();
  const std::size_t before = list.size();
  TarnError::AddTranslator(&a);
  TarnError::AddTranslator(&b);
  TarnError::AddTranslator(&a);
  TarnError::RemoveTranslator(&a);
  ASSERT_EQ(list.size(), before + 2);
  EXPECT_EQ(list[before], &b);
  EXPECT_EQ(list[before + 1], &a);
  TarnError::RemoveTranslator(&a);
  TarnError::RemoveTranslator(&b);
  EXPECT_EQ(list.size(), before);
}

TEST(GenericErrCodeTranslator, RegistersForItsLifetimeAndTranslatesItsKind) {
  InstalledHost installed(nullptr);
  const std::size_t before = TarnError::GetTranslatorList().size();
  NamedTranslator fallback("", "fallback");
  const TarnError err("Host", "File I/O", "", -36);
  {
    GenericErrCodeTranslator t(UString("Host"), 30000);
    EXPECT_EQ(TarnError::GetTranslatorList().size(), before + 1);
    EXPECT_TRUE(t.CanTranslate(err));
    EXPECT_FALSE(t.CanTranslate(TarnError("Hos", "", "", -36)));
    EXPECT_FALSE(t.CanTranslate(TarnError(-36)));

    TestHost host;
    InstalledHost withHost(&host);
    UString title, description;
    err.GetErrorDescription(fallback, title, description);
    EXPECT_EQ(title.utf8_str(), "Host title");
    EXPECT_EQ(description.utf8_str(), "Host I/O text");

    // The optional error string takes precedence over the list text.
    TarnError withText("Host", "", "", -36, "from the system");
    withText.GetErrorDescription(fallback, title, description);
    EXPECT_EQ(description.utf8_str(), "from the system");

    // An attachment follows a blank line, the label and a line break.
    TarnError withFiles("Host", "", "", -36, nullptr, UString("/a.wav\n/b.wav"));
    withFiles.GetErrorDescription(fallback, title, description);
    EXPECT_EQ(description.utf8_str(), "Host I/O text\n\nDateien:\n/a.wav\n/b.wav");

    // A code without text, or beyond the index range, gives an empty text.
    TarnError("Host", "", "", -37).GetErrorDescription(fallback, title, description);
    EXPECT_EQ(description.utf8_str(), "");
    TarnError("Host", "", "", 65536 - 36).GetErrorDescription(fallback, title, description);
    EXPECT_EQ(description.utf8_str(), "");
  }
  EXPECT_EQ(TarnError::GetTranslatorList().size(), before);
  EXPECT_EQ(Title(err, fallback), "fallback");
}

TEST(TarnCoreLibCallbacks, BuiltInTextsWithoutAHost) {
  TarnCoreLibCallbacks::SetCallbackAPI(nullptr);
  TarnCoreLibCallbacks* api = TarnCoreLibCallbacks::GetCallbackAPI();
  ASSERT_NE(api, nullptr);
  UString text;
  EXPECT_TRUE(api->GetIndString(kGeneralLabelsStringList, kAttachmentLabelIndex, text));
  EXPECT_EQ(text.utf8_str(), "Files:");
  EXPECT_FALSE(api->GetIndString(kGeneralLabelsStringList, 999, text));
  api->RequestIdleTime();  // the built-in object ignores it

  const char* formats[] = {
      "8-bit offset", "8-bit",      "16-bit",      "24-bit", "24-bit (32-bit container)",
      "32-bit float", "64-bit (A)", "64-bit float"};
  for (short format = 0; format < 8; ++format)
    EXPECT_EQ(GetIndUString(kSampleFormatNamesStringList, format + 1).utf8_str(), formats[format]);
  EXPECT_EQ(GetIndUString(kSampleFormatNamesStringList, 0).utf8_str(), "");
  EXPECT_EQ(GetIndUString(kSampleFormatNamesStringList, 9).utf8_str(), "");

  EXPECT_EQ(GetIndUString(kChannelSuffixesStringList, 1).utf8_str(), ".L");
  EXPECT_EQ(GetIndUString(kChannelSuffixesStringList, 4).utf8_str(), ".LFE");
  for (short code : {-36, -39, -43, -48, -50, -108, -128, -192, -5000})
    EXPECT_FALSE(GetIndUString(kOSErrorsStringList, code).empty()) << code;
  EXPECT_EQ(GetIndUString(kOSErrorsStringList, -43).utf8_str(), "File not found");
  EXPECT_FALSE(GetIndUString(kFailNULLStringList, 0).empty());
}

TEST(TarnCoreLibCallbacks, HostTextsFirstThenBuiltIns) {
  TestHost host;
  {
    InstalledHost installed(&host);
    EXPECT_EQ(TarnCoreLibCallbacks::GetCallbackAPI(), &host);
    EXPECT_EQ(GetIndUString(kGeneralLabelsStringList, kAttachmentLabelIndex).utf8_str(),
              "Dateien:");
    EXPECT_EQ(GetIndUString(kSampleFormatNamesStringList, 3).utf8_str(), "16-bit");
    EXPECT_EQ(GetIndUString(30000, 1).utf8_str(), "");
    TarnCoreLibCallbacks::GetCallbackAPI()->RequestIdleTime();
    EXPECT_EQ(host.idleRequests, 1);
  }
  EXPECT_NE(TarnCoreLibCallbacks::GetCallbackAPI(), &host);
  EXPECT_EQ(GetIndUString(kGeneralLabelsStringList, kAttachmentLabelIndex).utf8_str(), "Files:");
}

TEST(DefaultTranslator, DescribesAnyErrorOnOneLine) {
  TarnCoreLibCallbacks::SetCallbackAPI(nullptr);
  EXPECT_EQ(TarnError(-43).Describe(), "OS, , , -43, File not found");
  EXPECT_EQ(TarnError(-108, "x.cpp", 3).Describe(), "OS, , , -108, Out of memory");
  EXPECT_EQ(TarnError(-7777).Describe(), "OS, , , -7777, Error -7777 (OS)");
  EXPECT_EQ(TarnError("POSIX", "Threads", "Lock", 22, "Invalid argument").Describe(),
            "POSIX, Threads, Lock, 22, Invalid argument");
  EXPECT_EQ(TarnError("OS", "File I/O", "", -43, nullptr, UString("/a\n/b")).Describe(),
            "OS, File I/O, , -43, File not found Files: /a /b");

  UString title, description;
  TarnError(-43).GetErrorDescription(TarnError::DefaultTranslator(), title, description);
  EXPECT_EQ(title.utf8_str(), "Error");
  EXPECT_EQ(description.utf8_str(), "File not found");
}

}  // namespace
}  // namespace tarn
