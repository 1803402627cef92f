#include "kyvisa/core/ResourcePattern.h"

#include "kyvisa/core/TextReader.h"

#include <algorithm>
#include <cctype>
#include <utility>

namespace kyvisa
{
namespace
{

using Step = ResourcePattern::Step;
using Program = ResourcePattern::Program;

constexpr int MaxNesting = 64;

int length(const Program &program)
{
    return static_cast<int>(program.size());
}

void append(Program &program, const Program &more)
{
    program.insert(program.end(), more.begin(), more.end());
}

Step either(int first, int second)
{
    return {Step::Kind::Either, {}, first, second};
}

Step jump(int target)
{
    return {Step::Kind::Jump, {}, target, 0};
}

void addMember(std::bitset<256> &characters, unsigned char member)
{
    characters.set(static_cast<unsigned char>(std::tolower(member)));
    characters.set(static_cast<unsigned char>(std::toupper(member)));
}

/// alternatives := sequence { "|" sequence }
class PatternParser
{
public:
    explicit PatternParser(TextReader &reader) : m_reader(reader) {}

    bool alternatives(int depth, Program &program)
    {
        if (!sequence(depth, program))
            return false;
        while (m_reader.take("|")) {
            Program other;
            if (!sequence(depth, other))
                return false;
            Program joined{either(1, length(program) + 2)};
            append(joined, program);
            joined.push_back(jump(length(other) + 1));
            append(joined, other);
            program = std::move(joined);
        }
        return true;
    }

private:
    bool sequence(int depth, Program &program)
    {
        int elements = 0;
        while (!m_reader.atEnd() && m_reader.peek() != '|' && m_reader.peek() != ')' && m_reader.peek() != '{') {
            Program piece;
            if (!element(depth, piece))
                return false;
            ++elements;
            if (m_reader.take("*")) {
                program.push_back(either(1, length(piece) + 2));
                append(program, piece);
                program.push_back(jump(-length(piece) - 1));
            } else {
                append(program, piece);
                if (m_reader.take("+"))
                    program.push_back(either(-length(piece), 1));
            }
        }
        return elements > 0;
    }

    bool element(int depth, Program &program)
    {
        Step step{Step::Kind::Character, {}};
        switch (const char c = m_reader.next()) {
        case '*':
        case '+':
        case ']':
        case '}':
            return false;
        case '(':
            return depth < MaxNesting && alternatives(depth + 1, program) && m_reader.take(")");
        case '[':
            if (!characterList(step.characters))
                return false;
            break;
        case '?':
            step.characters.set();
            break;
        case '\\':
            if (m_reader.atEnd())
                return false;
            addMember(step.characters, static_cast<unsigned char>(m_reader.next()));
            break;
        default:
            addMember(step.characters, static_cast<unsigned char>(c));
        }
        program.push_back(step);
        return true;
    }

    bool characterList(std::bitset<256> &characters)
    {
        const bool excluded = m_reader.take("^");
        while (!m_reader.take("]")) {
            unsigned char from = 0;
            if (!member(from))
                return false;
            unsigned char to = from;
            if (m_reader.take("-") && (!member(to) || to < from))
                return false;
            for (unsigned character = from; character <= to; ++character)
                addMember(characters, static_cast<unsigned char>(character));
        }
        const bool any = characters.any();
        if (excluded)
            characters.flip();
        return any;
    }

    bool member(unsigned char &character)
    {
        m_reader.take("\\");
        if (m_reader.atEnd())
            return false;
        character = static_cast<unsigned char>(m_reader.next());
        return true;
    }

    TextReader &m_reader;
};

} // namespace

std::optional<ResourcePattern> ResourcePattern::parse(TextReader &reader)
{
    Program program;
    if (!PatternParser(reader).alternatives(0, program) || !(reader.atEnd() || reader.peek() == '{'))
        return std::nullopt;
    program.push_back({Step::Kind::Match, {}});
    return ResourcePattern(std::move(program));
}

/// Everything that can be reached from @p start without taking a character.
void ResourcePattern::follow(std::size_t start, std::vector<bool> &reached, std::vector<std::size_t> &waiting) const
{
    waiting.push_back(start);
    while (!waiting.empty()) {
        const std::size_t at = waiting.back();
        waiting.pop_back();
        if (reached[at])
            continue;
        reached[at] = true;
        const Step &step = m_program[at];
        if (step.kind == Step::Kind::Either || step.kind == Step::Kind::Jump)
            waiting.push_back(at + static_cast<std::size_t>(step.first));
        if (step.kind == Step::Kind::Either)
            waiting.push_back(at + static_cast<std::size_t>(step.second));
    }
}

std::vector<bool> ResourcePattern::reachedAfter(std::string_view text) const
{
    std::vector<bool> current(m_program.size());
    std::vector<std::size_t> waiting;
    follow(0, current, waiting);
    for (const char c : text) {
        std::vector<bool> next(m_program.size());
        for (std::size_t at = 0; at < m_program.size(); ++at)
            if (current[at] && m_program[at].kind == Step::Kind::Character &&
                m_program[at].characters.test(static_cast<unsigned char>(c)))
                follow(at + 1, next, waiting);
        current = std::move(next);
    }
    return current;
}

bool ResourcePattern::matches(std::string_view text) const
{
    return reachedAfter(text).back();
}

bool ResourcePattern::mayMatch(std::string_view beginning) const
{
    const std::vector<bool> reached = reachedAfter(beginning);
    return std::find(reached.begin(), reached.end(), true) != reached.end();
}

} // namespace kyvisa
