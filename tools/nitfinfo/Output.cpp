// The two forms of a report: aligned lines for people, JSON for scripts.
#include "FileInfo.h"

namespace {

// Text is printable ASCII already; JSON needs only the quote and backslash escaped.
std::string Quoted(const std::string& text)
{
    std::string quoted = "\"";
    for (char c : text) {
        if (c == '"' || c == '\\')
            quoted += '\\';
        quoted += c;
    }
    return quoted + '"';
}

void TextFields(const InfoFields& fields, const std::string& indent, std::string& out)
{
    for (const InfoField& field : fields) {
        std::string value = field.text;
        if (field.kind == InfoField::kFlag)
            value = field.text == "true" ? "yes" : "no";
        for (const std::string& item : field.items)
            value += (value.empty() ? "" : " ") + item;
        const std::string gap(value.empty() ? 0 : field.name.size() < 12 ? 12 - field.name.size() : 1, ' ');
        out += indent + field.name + gap + value + "\n";
    }
}

void JsonFields(const InfoFields& fields, std::string& out)
{
    out += "{";
    for (size_t i = 0; i < fields.size(); ++i) {
        const InfoField& field = fields[i];
        out += (i ? ", " : "") + Quoted(field.name) + ": ";
        if (field.kind == InfoField::kText)
            out += Quoted(field.text);
        else if (field.kind != InfoField::kList)
            out += field.text;
        else {
            out += "[";
            for (size_t j = 0; j < field.items.size(); ++j)
                out += (j ? ", " : "") + Quoted(field.items[j]);
            out += "]";
        }
    }
    out += "}";
}

} // namespace

void PrintText(const FileInfo& info, std::string& out)
{
    out += PrintableText(info.path.data(), info.path.size()) + "\n";
    TextFields(info.header, "  ", out);
    if (!info.rpf.empty()) {
        out += "  RPF frame\n";
        TextFields(info.rpf, "    ", out);
    }
    for (size_t i = 0; i < info.images.size(); ++i) {
        out += "  image " + std::to_string(i + 1) + "\n";
        TextFields(info.images[i], "    ", out);
    }
}

void PrintJson(const FileInfo& info, std::string& out)
{
    InfoFields top{{"file", InfoField::kText, PrintableText(info.path.data(), info.path.size()), {}}};
    top.insert(top.end(), info.header.begin(), info.header.end());
    JsonFields(top, out);
    out.pop_back(); // the object goes on with the RPF frame and the images
    if (!info.rpf.empty()) {
        out += ", \"rpf\": ";
        JsonFields(info.rpf, out);
    }
    out += ", \"images\": [";
    for (size_t i = 0; i < info.images.size(); ++i) {
        out += i ? ", " : "";
        JsonFields(info.images[i], out);
    }
    out += "]}";
}
