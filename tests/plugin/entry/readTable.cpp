// SPDX-License-Identifier: Apache-2.0
#include "plugin/entry/AttributeTable.h"
#include "plugin/entry/tableTexts.h"

#include <fstream>
#include <sstream>
#include <stdexcept>

namespace attributeTable {
namespace {

std::vector<std::string> split(const std::string& text, char separator) {
    std::vector<std::string> parts;
    std::istringstream all(text + separator);
    for (std::string part; std::getline(all, part, separator);) {
        const auto begin = part.find_first_not_of(' ');
        parts.push_back(begin == std::string::npos ? "" : part.substr(begin, part.find_last_not_of(' ') + 1 - begin));
    }
    return parts;
}

std::vector<std::string> words(const std::string& text) {
    std::istringstream all(text);
    std::vector<std::string> found;
    for (std::string word; all >> word;)
        found.push_back(word);
    return found;
}

double number(const std::string& text) {
    std::size_t end = 0;
    const double value = std::stod(text, &end); // throws for what is no number at all
    if (end != text.size())
        throw std::runtime_error("'" + text + "' is no number");
    return value;
}

std::string defaultText(const std::string& type, const std::string& written) {
    const bool isAsWritten = written.empty() || written == "null" || written.front() == '"' || type == "bool";
    return isAsWritten ? written : numberText(number(written), type == "float");
}

std::string limitText(const std::string& written) {
    std::map<std::string, std::string> limits;
    for (const std::string& limit : split(written, ','))
        if (const std::vector<std::string> parts = words(limit); parts.size() == 2)
            limits[parts[0]] = numberText(number(parts[1]), false);
        else if (!parts.empty())
            throw std::runtime_error("'" + limit + "' is no limit");
    return limitsText(limits);
}

// as on a new attribute of that kind
Fields flagsOfNew(const std::string& type) {
    const bool isNumber = type == "bool" || type == "short" || type == "int" || type == "float" || type == "double" ||
                          type.compare(0, 5, "enum ") == 0;
    Fields flags;
    for (const char* name : {"readable", "writable", "connectable", "storable", "indexMatters"})
        flags[name] = "on";
    for (const char* name : {"array", "hidden", "builder", "filename"})
        flags[name] = "off";
    flags["keyable"] = isNumber ? "on" : "off";
    flags["disconnect"] = "nothing";
    return flags;
}

void setFlag(Fields& fields, const std::string& flag) {
    if (flag == "reset" || flag == "delete") {
        fields["disconnect"] = flag;
        return;
    }
    const bool isOff = flag.front() == '-';
    const std::string name = isOff ? flag.substr(1) : flag;
    if (fields.count(name) == 0)
        throw std::runtime_error("there is no flag '" + name + "'");
    fields[name] = isOff ? "off" : "on";
}

void readAttribute(const std::string& line, Table& table) {
    const std::vector<std::string> columns = split(line, '|');
    if (columns.size() != 7)
        throw std::runtime_error("not seven columns");
    Fields fields = flagsOfNew(columns[2]);
    for (const std::string& flag : split(columns[5], ','))
        if (!flag.empty())
            setFlag(fields, flag);
    fields["short name"] = columns[1];
    fields["type"] = columns[2];
    fields["default"] = defaultText(columns[2], columns[3]);
    fields["limits"] = limitText(columns[4]);
    fields["parent"] = columns[6];
    if (!table.attributes.emplace(columns[0], fields).second)
        throw std::runtime_error("'" + columns[0] + "' stands there twice");
    table.names.push_back(columns[0]);
    if (!columns[6].empty())
        table.order[columns[6]].push_back(columns[0]);
}

void readDependencies(const std::vector<std::string>& line, Table& table) {
    std::vector<std::string> from;
    std::vector<std::string> to;
    bool isLeft = true;
    const bool isTree = line.back() == "tree";
    for (std::size_t i = 1; i < line.size() - (isTree ? 1 : 0); ++i)
        if (line[i] == "->")
            isLeft = false;
        else
            (isLeft ? from : to).push_back(line[i]);
    if (from.empty() || to.empty())
        throw std::runtime_error("a dependency has two sides");
    for (const std::string& affecting : from)
        for (const std::string& affected : to)
            table.dependencies.push_back(affecting + " -> " + affected + (isTree ? " tree" : ""));
}

void readLine(const std::string& line, Table& table) {
    const std::vector<std::string> parts = words(line);
    if (parts.empty() || parts[0] == "#")
        return;
    if (parts[0] == "add")
        table.order[""].insert(table.order[""].end(), parts.begin() + 1, parts.end());
    else if (parts[0] == "affects")
        readDependencies(parts, table);
    else
        readAttribute(line, table);
}

} // namespace

Table readTable(const std::string& path) {
    std::ifstream file(path);
    if (!file)
        throw std::runtime_error(path + " cannot be read");
    Table table;
    int number = 0;
    for (std::string line; std::getline(file, line);) {
        ++number;
        try {
            readLine(line, table);
        } catch (const std::exception& error) {
            throw std::runtime_error(path + ", line " + std::to_string(number) + ": " + error.what());
        }
    }
    std::size_t placed = 0;
    for (const auto& [parent, children] : table.order)
        placed += children.size();
    if (placed != table.names.size())
        throw std::runtime_error(path +
                                 ": an attribute without a parent is not added, or one is added that is not there");
    return table;
}

} // namespace attributeTable
