// The XML document in memory: building, writing, parsing and its limits. Its files are read and
// written through the configuration's tests and the atomic writer's.
#include <gtest/gtest.h>

#include <string>

#include "lib/xml/XmlDocumentRapid.h"

namespace {

using vek::xml::XmlDocumentRapid;
using vek::xml::XmlElement;

TEST(XmlDocument, BuildsWritesAndParsesBack) {
    XmlDocumentRapid doc;
    XmlElement root = doc.createRoot("settings");
    root.setAttribute("version", "2");
    XmlElement child = root.appendChild("item");
    child.setAttribute("name", "a");
    child.setAttribute("name", "b");  // replaces
    root.appendChild("note").setText("x < y & z");

    const std::string text = doc.toText();
    EXPECT_EQ(text,
              "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
              "<settings version=\"2\">\n\t<item name=\"b\"/>\n\t<note>x &lt; y &amp; z</note>\n</settings>\n");

    const auto parsed = XmlDocumentRapid::fromText(text);
    ASSERT_TRUE(parsed);
    XmlElement r = parsed->root();
    EXPECT_EQ(r.name(), "settings");
    EXPECT_EQ(r.attribute("version"), "2");
    EXPECT_FALSE(r.attribute("missing"));
    XmlElement item = r.firstChild();
    EXPECT_EQ(item.name(), "item");
    EXPECT_EQ(item.nextSibling().text(), "x < y & z");
    EXPECT_FALSE(item.nextSibling().nextSibling());
}

TEST(XmlDocument, AttributeValuesKeepEveryByte) {
    std::string all;
    for (int c = 1; c < 256; ++c) all.push_back(static_cast<char>(c));
    XmlDocumentRapid doc;
    doc.createRoot("r").setAttribute("v", all);
    const auto parsed = XmlDocumentRapid::fromText(doc.toText());
    ASSERT_TRUE(parsed);
    EXPECT_EQ(parsed->root().attribute("v"), all);
    EXPECT_EQ(parsed->root().attribute("missing"), std::nullopt);
}

TEST(XmlDocument, SkipsTextAndCommentsBetweenElements) {
    const auto doc = XmlDocumentRapid::fromText("<?xml version=\"1.0\"?><!-- c --><r>text<a/><!-- <b> --><c/></r>");
    ASSERT_TRUE(doc);
    XmlElement a = doc->root().firstChild();
    EXPECT_EQ(a.name(), "a");
    EXPECT_EQ(a.nextSibling().name(), "c");
}

TEST(XmlDocument, RefusesMalformedTextWithAReason) {
    const char* bad[] = {"", "   ", "<r>", "<r></s>", "<r a=\"1></r>", "<r><a></r>", "plain text", "<r>&#xFFFFFFFF;</r>",
                         "<!-- only a comment -->"};
    for (const char* text : bad) {
        std::string error;
        EXPECT_EQ(XmlDocumentRapid::fromText(text, &error), nullptr) << text;
        EXPECT_FALSE(error.empty()) << text;
    }
}

TEST(XmlDocument, RefusesNestingBeyondTheLimitWithoutRecursingIntoIt) {
    auto nested = [](size_t depth) {
        std::string s;
        for (size_t i = 0; i < depth; ++i) s += "<a x=\"<b>\">";
        for (size_t i = 0; i < depth; ++i) s += "</a>";
        return s;
    };
    EXPECT_TRUE(XmlDocumentRapid::fromText(nested(XmlDocumentRapid::kMaxDepth)));
    EXPECT_FALSE(XmlDocumentRapid::fromText(nested(XmlDocumentRapid::kMaxDepth + 1)));
    std::string error;
    EXPECT_FALSE(XmlDocumentRapid::fromText(nested(1000000), &error));
    EXPECT_NE(error.find("nested"), std::string::npos);
    // Self-closing siblings do not add depth.
    std::string flat = "<r>";
    for (int i = 0; i < 10000; ++i) flat += "<a/>";
    EXPECT_TRUE(XmlDocumentRapid::fromText(flat + "</r>"));
}

TEST(XmlDocument, NamesAreCheckedForUseAsElementNames) {
    for (const char* good : {"configuration", "_x", "a-b.c", "ns:tag", "Grüße"}) EXPECT_TRUE(vek::xml::isValidXmlName(good));
    for (const char* bad : {"", "1a", "a b", "a>b", "-a", "a\"b"}) EXPECT_FALSE(vek::xml::isValidXmlName(bad));
}

}  // namespace
