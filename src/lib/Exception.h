// The foundation library's exception root: a message, cloneable so it can be carried across
// boundaries that must not let it pass (it is rethrown on the other side).
#pragma once

#include <exception>
#include <memory>
#include <string>
#include <utility>

namespace vek {

class Exception : public std::exception {
public:
    explicit Exception(std::string message) : message_(std::move(message)) {}
    ~Exception() override = default;

    const char* what() const noexcept override { return message_.c_str(); }
    const std::string& message() const noexcept { return message_; }

    virtual std::unique_ptr<Exception> clone() const { return std::make_unique<Exception>(*this); }
    [[noreturn]] virtual void rethrow() const { throw *this; }

private:
    std::string message_;
};

// Gives a derived exception a clone() and rethrow() that keep its dynamic type.
template <class Derived, class Base = Exception>
class CloneableException : public Base {
public:
    using Base::Base;

    std::unique_ptr<Exception> clone() const override {
        return std::make_unique<Derived>(static_cast<const Derived&>(*this));
    }
    [[noreturn]] void rethrow() const override { throw static_cast<const Derived&>(*this); }
};

}  // namespace vek
