#include "text.h"

#include <algorithm>
#include <cstdint>
#include <cstdio>

namespace tool {
namespace {

bool IsContinuation(unsigned char byte) {
    return (byte & 0xc0) == 0x80;
}

/** Length of the UTF-8 character at `at` and its number; 0 for bytes that are none. */
size_t Decode(const std::string& text, size_t at, uint32_t& number) {
    struct Form {
        unsigned char mask, lead;
        size_t length;
        uint32_t least;
    };
    constexpr Form kForms[] = {{0x80, 0x00, 1, 0},
                               {0xe0, 0xc0, 2, 0x80},
                               {0xf0, 0xe0, 3, 0x800},
                               {0xf8, 0xf0, 4, 0x10000}};
    const auto lead = static_cast<unsigned char>(text[at]);
    for (const Form& form : kForms) {
        if ((lead & form.mask) != form.lead) {
            continue;
        }
        number = lead & static_cast<unsigned char>(~form.mask);
        for (size_t i = 1; i < form.length; ++i) {
            const auto byte = static_cast<unsigned char>(at + i < text.size() ? text[at + i] : 0);
            if (!IsContinuation(byte)) {
                return 0;
            }
            number = number << 6 | (byte & 0x3f);
        }
        const bool surrogate = number >= 0xd800 && number <= 0xdfff;
        return number >= form.least && number <= 0x10ffff && !surrogate ? form.length : 0;
    }
    return 0;
}

/** Characters that act on the terminal instead of showing. */
bool IsHarmful(uint32_t number) {
    constexpr struct {
        uint32_t first, last;
    } kRanges[] = {{0x00, 0x1f},     {0x7f, 0x9f},     {0x200b, 0x200f},  {0x2028, 0x202e},
                   {0x2060, 0x206f}, {0xfeff, 0xfeff}, {0xe0000, 0xe007f}};
    return std::any_of(std::begin(kRanges), std::end(kRanges), [number](const auto& range) {
        return number >= range.first && number <= range.last;
    });
}

std::string Format(const char* format, uint32_t number) {
    char text[16];
    snprintf(text, sizeof text, format, number);
    return text;
}

/** Of printable text; wide characters count as one column. */
size_t Width(const std::string& text) {
    return static_cast<size_t>(std::count_if(text.begin(), text.end(), [](char c) {
        return !IsContinuation(static_cast<unsigned char>(c));
    }));
}

}  // namespace

std::string Printable(const std::string& text) {
    std::string out;
    for (size_t at = 0; at < text.size();) {
        uint32_t number = 0;
        const size_t length = Decode(text, at, number);
        if (length == 0) {
            out += Format("\\x%02x", static_cast<unsigned char>(text[at]));
        } else if (IsHarmful(number)) {
            out += number < 0x80 ? Format("\\x%02x", number) : Format("\\u{%04x}", number);
        } else {
            out += text.substr(at, length);
        }
        at += length == 0 ? 1 : length;
    }
    return out;
}

Table::Table(std::vector<std::string> heading) {
    rows_.push_back(std::move(heading));
}

void Table::Add(std::vector<std::string> row) {
    for (std::string& cell : row) {
        cell = Printable(cell);
    }
    row.resize(rows_.front().size());
    rows_.push_back(std::move(row));
}

std::string Table::Format() const {
    std::vector<size_t> widths(rows_.front().size());
    for (const auto& row : rows_) {
        for (size_t i = 0; i < row.size(); ++i) {
            widths[i] = std::max(widths[i], Width(row[i]));
        }
    }
    std::string out;
    for (const auto& row : rows_) {
        std::string line;
        for (size_t i = 0; i < row.size(); ++i) {
            line += row[i] + std::string(widths[i] - Width(row[i]) + 2, ' ');
        }
        out += line.substr(0, line.find_last_not_of(' ') + 1) + "\n";
    }
    return out;
}

}  // namespace tool
