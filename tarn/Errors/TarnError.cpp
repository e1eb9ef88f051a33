#include "tarn/Errors/TarnError.h"

#include <algorithm>
#include <cstdio>
#include <string_view>

#include "tarn/Basics/TarnCoreLibCallbacks.h"
#include "tarn/Errors/ErrorsImpl.h"
#include "tarn/String/ParamUString.h"

namespace tarn {

namespace {

constexpr const char kOSKind[] = "OS";

// Translates every error: the fallback of last resort.
class DefaultErrCodeTranslator final : public TarnError::CodeTranslator {
 public:
  bool CanTranslate(const TarnError&) const override { return true; }

  void Translate(const TarnError& error, UString& title, UString& description) const override {
    const int32_t code = error.GetIntErrorCode();
    const bool codeFitsIndex = code >= -32768 && code <= 32767;
    description.clear();
    if (error.IsMacOSError()) {
      title = GetIndUString(kOSErrorsStringList, 0);
      if (codeFitsIndex) description = GetIndUString(kOSErrorsStringList, static_cast<short>(code));
    } else {
      title = GetIndUString(kGeneralLabelsStringList, kErrorTitleLabelIndex);
    }
    if (description.empty() && !error.GetOptionalErrorString().empty())
      description = UStringFromUTF8(error.GetOptionalErrorString().view());
    if (description.empty()) {
      ParamUString text(GetIndUString(kGeneralLabelsStringList, kErrorCodeLabelIndex),
                        UStringFromUTF8(std::to_string(code)),
                        UStringFromUTF8(error.GetKind().view()));
      description = text.GetString();
    }
    GenericErrCodeTranslator::AppendAttachment(error, description);
  }
};

}  // namespace

TarnError::TarnError() noexcept : kind_(kOSKind) {}

TarnError::TarnError(int code) noexcept : kind_(kOSKind), code_(code) {}

TarnError::TarnError(int code, const char* file, int line) noexcept : kind_(kOSKind), code_(code) {
  FormatFileAndLine(errorString_, file, line);
}

TarnError::TarnError(const char* kind, const char* system, const char* subsystem, int code,
                     const char* errorString, const std::optional<UString>& attachment)
    : kind_(kind),
      system_(system),
      subsystem_(subsystem),
      code_(code),
      errorString_(errorString),
      attachment_(attachment) {}

TarnError::TarnError(const char* kind, const char* system, const char* subsystem, int code,
                     const char* file, int line, const std::optional<UString>& attachment)
    : kind_(kind), system_(system), subsystem_(subsystem), code_(code), attachment_(attachment) {
  FormatFileAndLine(errorString_, file, line);
}

short TarnError::GetMacOSErrorCode() const noexcept {
  const auto low = static_cast<short>(static_cast<uint16_t>(static_cast<uint32_t>(code_)));
  if (IsMacOSError()) return low;
  if (code_ == 0) return static_cast<short>(kUserCanceledErr);
  if (low == 0 || low == kUserCanceledErr) return 32767;
  return low;
}

bool TarnError::IsMacOSError() const noexcept { return kind_ == kOSKind; }

bool TarnError::IsMacOSError(int code) const noexcept { return code_ == code && IsMacOSError(); }

bool operator==(const TarnError& a, const TarnError& b) noexcept {
  return a.kind_ == b.kind_ && a.system_ == b.system_ && a.subsystem_ == b.subsystem_ &&
         a.code_ == b.code_ && a.errorString_ == b.errorString_;
}

const char* TarnError::MacOSKind() noexcept { return kOSKind; }

const char* TarnError::UnknownExceptionKind() noexcept { return "Unknown Exception"; }

std::vector<TarnError::CodeTranslator*>& TarnError::GetTranslatorList() {
  // Created once, never destroyed: translators may unregister during exit.
  static auto* list = new std::vector<CodeTranslator*>;
  return *list;
}

void TarnError::AddTranslator(CodeTranslator* translator) {
  GetTranslatorList().push_back(translator);
}

void TarnError::RemoveTranslator(CodeTranslator* translator) noexcept {
  auto& list = GetTranslatorList();
  auto it = std::find(list.begin(), list.end(), translator);
  if (it != list.end()) list.erase(it);
}

void TarnError::GetErrorDescription(const CodeTranslator& fallback, UString& title,
                                    UString& description) const {
  const auto& list = GetTranslatorList();
  for (auto it = list.rbegin(); it != list.rend(); ++it) {
    if ((*it)->CanTranslate(*this)) {
      (*it)->Translate(*this, title, description);
      return;
    }
  }
  fallback.Translate(*this, title, description);
}

void TarnError::GetErrorDescription(const CodeTranslator& fallback, UString& title) const {
  UString description;
  GetErrorDescription(fallback, title, description);
}

const TarnError::CodeTranslator& TarnError::DefaultTranslator() noexcept {
  static const DefaultErrCodeTranslator translator;
  return translator;
}

std::string TarnError::Describe() const {
  UString title, description;
  GetErrorDescription(DefaultTranslator(), title, description);
  std::string text = description.utf8_str();
  // One line: each run of line breaks becomes one blank.
  std::string oneLine;
  oneLine.reserve(text.size());
  for (char c : text) {
    const bool lineBreak = c == '\n' || c == '\r';
    if (!lineBreak)
      oneLine += c;
    else if (oneLine.empty() || oneLine.back() != ' ')
      oneLine += ' ';
  }
  std::string line;
  line.append(kind_.view()).append(", ");
  line.append(system_.view()).append(", ");
  line.append(subsystem_.view()).append(", ");
  line.append(std::to_string(code_)).append(", ");
  line.append(oneLine);
  return line;
}

bool IsFileSystemError(const TarnError& error) noexcept {
  return error.IsMacOSError() && error.GetSystem() == "File I/O";
}

GenericErrCodeTranslator::GenericErrCodeTranslator(const UString& kind, short stringListID)
    : kind_(kind), kindUTF8_(kind.utf8_str()), stringListID_(stringListID) {
  TarnError::AddTranslator(this);
}

GenericErrCodeTranslator::~GenericErrCodeTranslator() { TarnError::RemoveTranslator(this); }

bool GenericErrCodeTranslator::CanTranslate(const TarnError& error) const {
  return error.GetKind().view() == kindUTF8_;
}

void GenericErrCodeTranslator::Translate(const TarnError& error, UString& title,
                                         UString& description) const {
  title = GetIndUString(stringListID_, 0);
  const TarnError::ErrorString text = error.GetOptionalErrorString();
  if (!text.empty()) {
    description = UStringFromUTF8(text.view());
  } else {
    // The code is the index; codes outside the index range have no text.
    const int32_t code = error.GetIntErrorCode();
    description = code >= -32768 && code <= 32767
                      ? GetIndUString(stringListID_, static_cast<short>(code))
                      : UString();
  }
  AppendAttachment(error, description);
}

void GenericErrCodeTranslator::AppendAttachment(const TarnError& error, UString& description) {
  const auto& attachment = error.GetAttachment();
  if (!attachment) return;
  description += UStringFromUTF8("\n\n");
  description += GetIndUString(kGeneralLabelsStringList, kAttachmentLabelIndex);
  description += UStringFromUTF8("\n");
  description += *attachment;
}

}  // namespace tarn
