// The 'enbl' expression: a recursive-descent parser into a flat node list, and its evaluation.
#include <cctype>
#include <cstdint>
#include <stdexcept>
#include <string>

#include "noctiva/host/ModuleInfo.h"

namespace noctiva::host {

namespace {

struct ModeName {
    const char* word;  // as written in 'enbl'
    const char* user;  // as shown in messages
    int depth;
};

// Indexed by mode number.
constexpr ModeName kModes[] = {
    {"BitmapMode", "Bitmap", 1},
    {"GrayScaleMode", "Gray", 8},
    {"IndexedColorMode", "Indexed Color", 8},
    {"RGBMode", "RGB", 8},
    {"CMYKMode", "CMYK", 8},
    {"HSLMode", "HSL", 8},
    {"HSBMode", "HSB", 8},
    {"MultichannelMode", "Multichannel", 8},
    {"DuotoneMode", "Duotone", 8},
    {"LabMode", "Lab", 8},
    {"Gray16Mode", "Gray", 16},
    {"RGB48Mode", "RGB", 16},
    {"Lab48Mode", "Lab", 16},
    {"CMYK64Mode", "CMYK", 16},
    {"DeepMultichannelMode", "Multichannel", 16},
    {"Duotone16Mode", "Duotone", 16},
    {"RGB96Mode", "RGB", 32},
    {"Gray32Mode", "Gray", 32},
};
constexpr int kModeCount = int(std::size(kModes));

// Untrusted text: deep nesting or a long operator chain must not exhaust the stack, in parsing
// or in evaluation (a chain of n operators evaluates n levels deep).
constexpr int kMaxNesting = 64;
constexpr std::size_t kMaxNodes = 1024;

enum Compare : std::int64_t { Eq, Ne, Lt, Le, Gt, Ge };

class Parser {
public:
    Parser(std::string_view text, std::vector<EnableExpression::Node>& nodes) : text_(text), nodes_(nodes) {}

    int parseAll() {
        const int root = parseOr(0);
        skipSpace();
        if (pos_ != text_.size()) fail("unexpected '" + std::string(1, text_[pos_]) + "'");
        return root;
    }

private:
    using Node = EnableExpression::Node;

    [[noreturn]] void fail(const std::string& what) const {
        throw std::invalid_argument(what + " at character " + std::to_string(pos_ + 1));
    }
    void skipSpace() {
        while (pos_ < text_.size() && std::isspace(static_cast<unsigned char>(text_[pos_]))) ++pos_;
    }
    bool accept(std::string_view token) {
        skipSpace();
        if (text_.substr(pos_, token.size()) != token) return false;
        pos_ += token.size();
        return true;
    }
    void expect(std::string_view token) {
        if (!accept(token)) fail("expected '" + std::string(token) + "'");
    }
    int add(Node node) {
        if (nodes_.size() >= kMaxNodes) fail("expression too long");
        nodes_.push_back(std::move(node));
        return int(nodes_.size()) - 1;
    }
    void nest(int depth) const {
        if (depth > kMaxNesting) fail("expression nested too deeply");
    }

    int parseOr(int depth) {
        nest(depth);
        int left = parseAnd(depth);
        while (accept("||")) left = add({Node::Kind::Or, 0, {left, parseAnd(depth)}});
        return left;
    }
    int parseAnd(int depth) {
        int left = parseCompare(depth);
        while (accept("&&")) left = add({Node::Kind::And, 0, {left, parseCompare(depth)}});
        return left;
    }
    int parseCompare(int depth) {
        int left = parseUnary(depth);
        for (;;) {
            // Two-character operators first, so "<=" is not read as "<".
            std::int64_t op;
            if (accept("==")) op = Eq;
            else if (accept("!=")) op = Ne;
            else if (accept("<=")) op = Le;
            else if (accept(">=")) op = Ge;
            else if (accept("<")) op = Lt;
            else if (accept(">")) op = Gt;
            else return left;
            left = add({Node::Kind::Compare, op, {left, parseUnary(depth)}});
        }
    }
    int parseUnary(int depth) {
        skipSpace();
        // "!=" never starts an operand, so a leading '!' is a negation.
        if (accept("!")) {
            nest(depth + 1);
            return add({Node::Kind::Not, 0, {parseUnary(depth + 1)}});
        }
        return parsePrimary(depth);
    }
    int parsePrimary(int depth) {
        skipSpace();
        if (pos_ >= text_.size()) fail("expression ends early");
        const char c = text_[pos_];
        if (c == '(') {
            ++pos_;
            const int inner = parseOr(depth + 1);
            expect(")");
            return inner;
        }
        if (std::isdigit(static_cast<unsigned char>(c))) {
            std::int64_t value = 0;
            while (pos_ < text_.size() && std::isdigit(static_cast<unsigned char>(text_[pos_]))) {
                value = value * 10 + (text_[pos_++] - '0');
                if (value > INT32_MAX) fail("number too large");
            }
            return add({Node::Kind::Number, value, {}});
        }
        if (std::isalpha(static_cast<unsigned char>(c)) || c == '_') {
            const std::size_t start = pos_;
            while (pos_ < text_.size() &&
                   (std::isalnum(static_cast<unsigned char>(text_[pos_])) || text_[pos_] == '_'))
                ++pos_;
            const std::string_view word = text_.substr(start, pos_ - start);
            if (word == "in") return parseIn(depth);
            if (word == "true") return add({Node::Kind::Number, 1, {}});
            if (word == "false") return add({Node::Kind::Number, 0, {}});
            if (word == "PSHOP_ImageMode") return add({Node::Kind::ImageMode, 0, {}});
            if (word == "PSHOP_ImageDepth") return add({Node::Kind::ImageDepth, 0, {}});
            if (const auto mode = modeFromWord(word)) return add({Node::Kind::Number, *mode, {}});
            pos_ = start;
            fail("unknown name '" + std::string(word) + "'");
        }
        fail("unexpected '" + std::string(1, c) + "'");
    }
    int parseIn(int depth) {
        nest(depth + 1);
        expect("(");
        Node in{Node::Kind::In, 0, {parseOr(depth + 1)}};
        expect(",");
        do in.operands.push_back(parseOr(depth + 1));
        while (accept(","));
        expect(")");
        return add(std::move(in));
    }

    std::string_view text_;
    std::vector<Node>& nodes_;
    std::size_t pos_ = 0;
};

}  // namespace

std::optional<pi::int16> modeFromWord(std::string_view word) {
    for (int m = 0; m < kModeCount; ++m)
        if (word == kModes[m].word) return pi::int16(m);
    return std::nullopt;
}

std::string modeDescription(pi::int16 imageMode, int depth) {
    if (imageMode < 0 || imageMode >= kModeCount) return "mode " + std::to_string(imageMode);
    const ModeName& m = kModes[imageMode];
    if (m.depth == 1 || imageMode == pi::plugInModeIndexedColor || imageMode == pi::plugInModeHSLColor ||
        imageMode == pi::plugInModeHSBColor)
        return m.user;
    return std::string(m.user) + " " + std::to_string(depth) + "-bit";
}

int naturalDepth(pi::int16 imageMode) {
    return imageMode >= 0 && imageMode < kModeCount ? kModes[imageMode].depth : 8;
}

EnableExpression EnableExpression::parse(std::string_view text) {
    EnableExpression e;
    e.text_ = std::string(text);
    Parser parser(e.text_, e.nodes_);
    e.root_ = parser.parseAll();
    return e;
}

bool EnableExpression::evaluate(pi::int16 imageMode, int depth) const {
    return root_ >= 0 && eval(root_, imageMode, depth) != 0;
}

std::int64_t EnableExpression::eval(int index, pi::int16 imageMode, int depth) const {
    const Node& n = nodes_[std::size_t(index)];
    auto operand = [&](std::size_t i) { return eval(n.operands[i], imageMode, depth); };
    switch (n.kind) {
        case Node::Kind::Number: return n.value;
        case Node::Kind::ImageMode: return imageMode;
        case Node::Kind::ImageDepth: return depth;
        case Node::Kind::Not: return operand(0) == 0;
        case Node::Kind::And: return operand(0) != 0 && operand(1) != 0;
        case Node::Kind::Or: return operand(0) != 0 || operand(1) != 0;
        case Node::Kind::Compare: {
            const std::int64_t a = operand(0), b = operand(1);
            switch (n.value) {
                case Eq: return a == b;
                case Ne: return a != b;
                case Lt: return a < b;
                case Le: return a <= b;
                case Gt: return a > b;
                default: return a >= b;
            }
        }
        case Node::Kind::In: {
            const std::int64_t value = operand(0);
            for (std::size_t i = 1; i < n.operands.size(); ++i)
                if (operand(i) == value) return 1;
            return 0;
        }
    }
    return 0;
}

}  // namespace noctiva::host
