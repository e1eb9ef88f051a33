#include "tarn/Errors/ExceptionThrower.h"

#include <charconv>
#include <cstring>
#include <exception>
#include <string>
#include <string_view>

#include "tarn/Errors/ErrorsImpl.h"

namespace tarn {

namespace {

constexpr std::string_view kPackedPrefix = "TarnError,";  // text 1 of a packed TarnError
constexpr std::string_view kPavPrefix = "Pav,";           // kind of an unpacked plain record
constexpr std::size_t kRecordText = sizeof(TarnException::text1);  // 50
constexpr std::size_t kMaxRecordChars = kRecordText - 1;           // 49
constexpr std::size_t kMaxLengthDigits = 15;
constexpr std::size_t kDetailedMessageChars = 2048;

// Stores text cut to 49 bytes and NUL-fills the rest of the field.
void PutText(char (&field)[kRecordText], std::string_view text) noexcept {
  const std::size_t n = text.size() < kMaxRecordChars ? text.size() : kMaxRecordChars;
  std::memcpy(field, text.data(), n);
  std::memset(field + n, 0, kRecordText - n);
}

// A record's text, never reading past its field even without a terminator.
std::string_view GetText(const char (&field)[kRecordText]) noexcept {
  return std::string_view(field, ::strnlen(field, kRecordText));
}

// The number after "Pav," in an unpacked record's kind (0 if unreadable).
int32_t PavNumber(std::string_view kind) noexcept {
  int32_t number = 0;
  kind.remove_prefix(kPavPrefix.size());
  std::from_chars(kind.data(), kind.data() + kind.size(), number);
  return number;
}

bool IsPavKind(const TarnError& error, int32_t number) noexcept {
  return IsPackedTarnException(error) && PavNumber(error.GetKind().view()) == number;
}

}  // namespace

ExceptionThrower::ExceptionThrower(const char* file, int line) noexcept : error_(0, file, line) {}

ExceptionThrower::~ExceptionThrower() noexcept(false) {
  if (error_.GetIntErrorCode() != 0) throw TarnError(error_);
}

TarnExceptionThrower::~TarnExceptionThrower() noexcept(false) {
  if (record_.code != 0 && std::uncaught_exceptions() == 0) throw Convert(record_);
}

TarnException Convert(const TarnError& error) {
  TarnException record{};
  if (IsPackedTarnException(error)) {
    PutText(record.text1, error.GetSystem().view());
    PutText(record.text2, error.GetSubsystem().view());
    record.kind = PavNumber(error.GetKind().view());
  } else {
    std::string text1(kPackedPrefix);
    text1.append(error.GetKind().view());
    PutText(record.text1, text1);
    // "<n>,<system><subsystem>". n counts the system characters that survive
    // the cut to 49, so that the record always unpacks to what it holds.
    const std::string_view system = error.GetSystem().view();
    std::string text2;
    std::size_t kept = system.size();
    for (;;) {
      text2 = std::to_string(kept) + ",";
      const std::size_t room = text2.size() < kMaxRecordChars ? kMaxRecordChars - text2.size() : 0;
      if (kept <= room) break;
      kept = room;
    }
    text2.append(system.substr(0, kept));
    text2.append(error.GetSubsystem().view());
    PutText(record.text2, text2);
    record.kind = -1;
  }
  PutText(record.text3, error.GetOptionalErrorString().view());
  record.code = error.GetIntErrorCode();
  if (const auto& attachment = error.GetAttachment())
    TPOSetDetailedErrorMessage(&record, attachment->utf8_str().c_str());
  return record;
}

TarnError Convert(const TarnException& record) {
  TarnError error;
  char detail[kDetailedMessageChars + 1];
  if (TPOGetDetailedErrorMessage(&record, detail, sizeof detail)) {
    error.SetAttachment(UStringFromUTF8(detail));
  } else {
    error.SetOptionalErrorString(GetText(record.text3));
  }
  const std::string_view text1 = GetText(record.text1);
  const std::string_view text2 = GetText(record.text2);
  if (IsPackedTarnError(record)) {
    error.SetKind(text1.substr(kPackedPrefix.size()));
    const std::size_t comma = text2.find(',');
    if (comma == std::string_view::npos)
      FatalInvariantViolation("malformed packed TarnException record: no length in text 2");
    if (comma > kMaxLengthDigits)
      FatalInvariantViolation("malformed packed TarnException record: length too long");
    std::size_t n = 0;
    for (std::size_t i = 0; i < comma; ++i) {
      if (text2[i] < '0' || text2[i] > '9')
        FatalInvariantViolation("malformed packed TarnException record: length not a number");
      n = n * 10 + static_cast<std::size_t>(text2[i] - '0');
    }
    if (n >= kRecordText)
      FatalInvariantViolation("malformed packed TarnException record: length of 50 or more");
    const std::string_view rest = text2.substr(comma + 1);
    const std::string_view system = rest.substr(0, n);
    error.SetSystem(system);
    error.SetSubsystem(rest.substr(system.size()));
  } else {
    error.SetKind(std::string(kPavPrefix) + std::to_string(record.kind));
    error.SetSystem(text1);
    error.SetSubsystem(text2);
  }
  error.SetIntErrorCode(record.code);
  return error;
}

bool IsPackedTarnError(const TarnException& record) noexcept {
  return GetText(record.text1).starts_with(kPackedPrefix);
}

bool IsPackedTarnException(const TarnError& error) noexcept {
  return error.GetKind().view().starts_with(kPavPrefix);
}

bool IsPackedTarnInternalErr(const TarnError& error) noexcept { return IsPavKind(error, 0); }

bool IsPackedTarnMacOSErr(const TarnError& error) noexcept { return IsPavKind(error, 1); }

}  // namespace tarn
