#pragma once
// The program's one exception class.

#include <cstdint>
#include <exception>
#include <memory>
#include <string>

class CTavException : public std::exception {
 public:
  CTavException(const char* file_I, int line_I, const char* message_I, uint16_t status_I);
  ~CTavException() override = default;

  const char* what() const noexcept override;

  const char* GetFile() const { return mFile; }
  int32_t GetLine() const { return mLine; }
  const std::string& GetMessage() const { return mMessage; }
  uint16_t GetStatus() const { return mStatus; }

 private:
  const char* mFile;
  int32_t mLine;
  std::string mMessage;
  uint16_t mStatus;
  std::string mWhat;
  std::shared_ptr<void> mUnused;  // kept empty; nothing sets it
};
