// Base exceptions of the kernel.
#pragma once

#include <cstdint>
#include <exception>
#include <string>

namespace VEK_STD {

class cException : public std::exception {
public:
    ~cException() override = default;
    const char* what() const noexcept override { return "VEK_STD::cException"; }
};

class cMessageException : public cException {
public:
    cMessageException(std::string message, int32_t line = 0, std::string file = {})
        : line_(line), file_(std::move(file)), message_(std::move(message)) {}
    const char* what() const noexcept override { return message_.c_str(); }
    const std::string& message() const { return message_; }
    const std::string& file() const { return file_; }
    int32_t line() const { return line_; }

private:
    int32_t line_;
    std::string file_;
    std::string message_;
};

}  // namespace VEK_STD
