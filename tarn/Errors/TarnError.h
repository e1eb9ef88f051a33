// TarnError: the one error value of the library and the one type it throws.
//
// Every failure is reported by throwing a TarnError by value, built by one of
// the Fail... functions (declared in tarn/Errors/Fail.h, which this header
// includes). A function that returns has succeeded.
//
// The value holds a kind (the family of the code: "OS", "Windows", "POSIX",
// "COM", "FailNULL", "Unknown Exception", "Pav,<n>"), a system and a
// subsystem text (the area that failed), a signed 32-bit code, an optional
// error string and an optional UString attachment (usually file paths).
// Texts are stored cut to 63 (kind, system, subsystem) or 255 (optional
// error string) bytes; nothing longer is ever kept. Copying never fails
// except when copying the attachment runs out of memory.
//
// Human-readable texts come from CodeTranslators. Translators register in a
// process-wide list; GetErrorDescription asks the most recently added first:
//
//   tarn::GenericErrCodeTranslator osTexts(tarn::UString("OS"), 12594);
//   try { tarn::FailOSErr(-43); }
//   catch (const tarn::TarnError& e) {
//     tarn::UString title, text;
//     e.GetErrorDescription(tarn::TarnError::DefaultTranslator(), title, text);
//   }
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "tarn/Basics/ConstantString.h"
#include "tarn/String/UString.h"

namespace tarn {

class TarnError {
 public:
  static constexpr std::size_t kTextSize = 64;          // kind, system, subsystem
  static constexpr std::size_t kErrorStringSize = 256;  // optional error string
  using Text = ConstantString<kTextSize>;
  using ErrorString = ConstantString<kErrorStringSize>;

  // Turns errors into a title and a description. Implementations must not
  // throw from CanTranslate; Translate may throw only on allocation failure.
  class CodeTranslator {
   public:
    CodeTranslator() = default;
    CodeTranslator(const CodeTranslator&) = delete;
    CodeTranslator& operator=(const CodeTranslator&) = delete;
    virtual ~CodeTranslator() = default;

    [[nodiscard]] virtual bool CanTranslate(const TarnError& error) const = 0;
    virtual void Translate(const TarnError& error, UString& title, UString& description) const = 0;
  };

  // The result of GetErrorCode(): converts to int (the code) and to short
  // (GetMacOSErrorCode()). Refers to the error; do not keep it beyond it.
  class ErrorCodeProxy {
   public:
    explicit ErrorCodeProxy(const TarnError& error) noexcept : error_(error) {}
    operator int() const noexcept { return error_.GetIntErrorCode(); }
    operator short() const noexcept { return error_.GetMacOSErrorCode(); }

   private:
    const TarnError& error_;
  };

  // Kind "OS", code 0.
  TarnError() noexcept;
  // Kind "OS", the code.
  explicit TarnError(int code) noexcept;
  // Kind "OS", the code, optional error string "<file> <line>".
  TarnError(int code, const char* file, int line) noexcept;
  TarnError(const char* kind, const char* system, const char* subsystem, int code,
            const char* errorString = nullptr,
            const std::optional<UString>& attachment = std::nullopt);
  // As above with the optional error string "<file> <line>".
  TarnError(const char* kind, const char* system, const char* subsystem, int code, const char* file,
            int line, const std::optional<UString>& attachment = std::nullopt);
  TarnError(const TarnError&) = default;
  TarnError(TarnError&&) noexcept = default;
  TarnError& operator=(const TarnError&) = default;
  TarnError& operator=(TarnError&&) noexcept = default;
  ~TarnError() = default;

  [[nodiscard]] Text GetKind() const noexcept { return kind_; }
  [[nodiscard]] Text GetSystem() const noexcept { return system_; }
  [[nodiscard]] Text GetSubsystem() const noexcept { return subsystem_; }
  [[nodiscard]] ErrorString GetOptionalErrorString() const noexcept { return errorString_; }
  [[nodiscard]] int32_t GetIntErrorCode() const noexcept { return code_; }
  [[nodiscard]] ErrorCodeProxy GetErrorCode() const noexcept { return ErrorCodeProxy(*this); }
  [[nodiscard]] const std::optional<UString>& GetAttachment() const noexcept { return attachment_; }
  [[nodiscard]] std::optional<UString>& GetAttachment() noexcept { return attachment_; }

  // Setters cut the text to 63 (255) bytes; nullptr is the empty text.
  void SetKind(const char* kind) noexcept { kind_.assign(kind); }
  void SetKind(std::string_view kind) noexcept { kind_.assign(kind); }
  void SetSystem(const char* system) noexcept { system_.assign(system); }
  void SetSystem(std::string_view system) noexcept { system_.assign(system); }
  void SetSubsystem(const char* subsystem) noexcept { subsystem_.assign(subsystem); }
  void SetSubsystem(std::string_view subsystem) noexcept { subsystem_.assign(subsystem); }
  void SetOptionalErrorString(const char* text) noexcept { errorString_.assign(text); }
  void SetOptionalErrorString(std::string_view text) noexcept { errorString_.assign(text); }
  void SetIntErrorCode(int32_t code) noexcept { code_ = code; }
  void SetAttachment(const std::optional<UString>& attachment) { attachment_ = attachment; }

  // The code as a 16-bit status. Kind "OS": the low 16 bits. Other kinds:
  // -128 for code 0, else the low 16 bits, but 32767 when those are 0 or
  // -128, so that a foreign error never reads as no-error or user-cancelled.
  [[nodiscard]] short GetMacOSErrorCode() const noexcept;
  [[nodiscard]] bool IsMacOSError() const noexcept;
  [[nodiscard]] bool IsMacOSError(int code) const noexcept;

  // Compares kind, system, subsystem, code and optional error string; the
  // attachment is ignored.
  friend bool operator==(const TarnError& a, const TarnError& b) noexcept;

  [[nodiscard]] static const char* MacOSKind() noexcept;             // "OS"
  [[nodiscard]] static const char* UnknownExceptionKind() noexcept;  // "Unknown Exception"

  // Translator registry. Not locked: register at start-up and unregister at
  // shut-down, never while another thread looks up descriptions.
  static void AddTranslator(CodeTranslator* translator);
  static void RemoveTranslator(CodeTranslator* translator) noexcept;  // first equal pointer
  [[nodiscard]] static std::vector<CodeTranslator*>& GetTranslatorList();

  // Asks the registered translators, newest first; the first that can
  // translate this error does; if none can, fallback does.
  void GetErrorDescription(const CodeTranslator& fallback, UString& title,
                           UString& description) const;
  void GetErrorDescription(const CodeTranslator& fallback, UString& title) const;

  // A translator that handles every error with the host's (or the built-in)
  // texts: titles from list 12593, "OS" codes from list 12594, otherwise the
  // optional error string or "Error <code> (<kind>)". Not registered; meant
  // as the fallback of GetErrorDescription.
  [[nodiscard]] static const CodeTranslator& DefaultTranslator() noexcept;

  // One line, UTF-8: "<kind>, <system>, <subsystem>, <code>, <text>", where
  // text is the description from the translators (DefaultTranslator as the
  // fallback) with line breaks turned into blanks.
  [[nodiscard]] std::string Describe() const;

 private:
  Text kind_;
  Text system_;
  Text subsystem_;
  int32_t code_ = 0;
  ErrorString errorString_;
  std::optional<UString> attachment_;
};

// True when the error is kind "OS" with system "File I/O".
[[nodiscard]] bool IsFileSystemError(const TarnError& error) noexcept;

// Translates the errors of one kind with the texts of one host string list:
// the title is index 0; the description is the optional error string, or
// else the list's text at index = code; an attachment is appended after the
// label at list 12593 index 11. Registers itself on construction and
// unregisters on destruction.
class GenericErrCodeTranslator : public TarnError::CodeTranslator {
 public:
  GenericErrCodeTranslator(const UString& kind, short stringListID);
  ~GenericErrCodeTranslator() override;

  [[nodiscard]] bool CanTranslate(const TarnError& error) const override;
  void Translate(const TarnError& error, UString& title, UString& description) const override;

  [[nodiscard]] const UString& GetKind() const noexcept { return kind_; }
  [[nodiscard]] short GetStringListID() const noexcept { return stringListID_; }

  // Appends "\n\n", the attachment label and "\n" and the attachment, if the
  // error has one. Shared by the built-in translators.
  static void AppendAttachment(const TarnError& error, UString& description);

 private:
  UString kind_;
  std::string kindUTF8_;  // kind_ as stored in errors, for a cheap comparison
  short stringListID_;
};

}  // namespace tarn

#include "tarn/Errors/ExceptionThrower.h"
#include "tarn/Errors/Fail.h"
