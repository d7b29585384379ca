// Failures the host reports to its user: always "<subject>: <reason>", one line.
#pragma once

#include <stdexcept>
#include <string>

namespace noctiva::host {

class HostError : public std::runtime_error {
public:
    HostError(const std::string& subject, const std::string& reason)
        : std::runtime_error(subject + ": " + reason), subject_(subject), reason_(reason) {}
    const std::string& subject() const { return subject_; }
    const std::string& reason() const { return reason_; }

private:
    std::string subject_;
    std::string reason_;
};

}  // namespace noctiva::host
