#include "support/standin/StandinState.h"

#include <visa.h>

#include <algorithm>
#include <cstring>
#include <thread>

namespace standin
{

void Gate::open()
{
    const std::lock_guard lock(m_mutex);
    m_open = true;
    m_changed.notify_all();
}

bool Gate::waitForArrival(std::chrono::milliseconds timeout)
{
    std::unique_lock lock(m_mutex);
    return m_changed.wait_for(lock, timeout, [this] { return m_arrived > 0; });
}

void Gate::pass()
{
    std::unique_lock lock(m_mutex);
    ++m_arrived;
    m_changed.notify_all();
    m_changed.wait(lock, [this] { return m_open; });
}

State &State::instance()
{
    static State state;
    return state;
}

void State::clear()
{
    scripts.clear();
    calls.clear();
    managers = 0;
    sessions.clear();
    findLists.clear();
    contexts.clear();
    nextSession = 2;
    nextFindList = 1001;
    nextContext = 2001;
    resources.clear();
    replies = {{"*IDN?", "Oltrava,Stand-in,1,1.0\n"}};
    unread.clear();
    handlers.clear();
    attributes = {
        {VI_ATTR_TMO_VALUE, {.number = 2000, .width = 4}},
        {VI_ATTR_TERMCHAR, {.number = '\n', .width = 1}},
        {VI_ATTR_TERMCHAR_EN, {.number = VI_FALSE, .width = 2}},
        {VI_ATTR_SEND_END_EN, {.number = VI_TRUE, .width = 2}},
        {VI_ATTR_IO_PROT, {.number = VI_PROT_NORMAL, .width = 2}},
        {VI_ATTR_INTF_TYPE, {.number = VI_INTF_TCPIP, .width = 2}},
        {VI_ATTR_INTF_NUM, {.number = 0, .width = 2}},
        {VI_ATTR_RSRC_LOCK_STATE, {.number = VI_NO_LOCK, .width = 4}},
        {VI_ATTR_MAX_QUEUE_LENGTH, {.number = 50, .width = 4}},
        {VI_ATTR_USER_DATA, {.number = 0, .width = 8}},
        {VI_ATTR_RSRC_SPEC_VERSION, {.number = VI_SPEC_VERSION, .width = 4}},
        {VI_ATTR_RSRC_CLASS, {.text = "INSTR"}},
        {VI_ATTR_RSRC_MANF_NAME, {.text = "Oltrava"}},
        {VI_KY_ATTR_TCPIP_FIND_RSRC_TMO, {.number = 2000, .width = 4}},
        {VI_KY_ATTR_TCPIP_FIND_RSRC_MODE, {.number = 6, .width = 4}},
    };
}

bool State::isOpen(ViObject object) const
{
    return (object == 1 && managers > 0) || sessions.contains(object) || findLists.contains(object) ||
           contexts.contains(object);
}

const AttributeValue *State::attribute(ViObject object, ViAttr attribute)
{
    if (const auto list = findLists.find(object); list != findLists.end()) {
        const auto &texts = resources.at(list->second.position).texts;
        const auto text = texts.find(attribute);
        if (text == texts.end())
            return nullptr;
        scratch = {.text = text->second};
        return &scratch;
    }
    const auto known = attributes.find(attribute);
    if (known != attributes.end())
        return &known->second;
    const auto session = sessions.find(object);
    if (session == sessions.end() || attribute != VI_ATTR_RSRC_NAME)
        return nullptr;
    scratch = {.text = session->second};
    return &scratch;
}

Answer enter(Call call)
{
    entered(call.operation.c_str());
    State &state = State::instance();
    Answer answer;
    {
        const std::lock_guard lock(state.mutex);
        auto &queue = state.scripts[call.operation];
        if (!queue.empty()) {
            answer = std::move(queue.front());
            queue.pop_front();
        }
        state.calls.push_back(std::move(call));
        state.called.notify_all();
    }
    if (answer.delay.count() > 0)
        std::this_thread::sleep_for(answer.delay);
    if (answer.gate)
        answer.gate->pass();
    if (answer.then)
        answer.then();
    return answer;
}

void copyText(ViChar *target, const std::string &text)
{
    if (target != nullptr)
        std::memcpy(target, text.c_str(), text.size() + 1);
}

void reset()
{
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    state.clear();
}

void forgetCalls()
{
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    state.calls.clear();
}

void script(const std::string &operation, Answer answer)
{
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    state.scripts[operation].push_back(std::move(answer));
}

std::size_t pending(const std::string &operation)
{
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    return state.scripts[operation].size();
}

void setReply(const std::string &command, const std::string &reply)
{
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    state.replies[command] = reply;
}

void addResource(Resource resource)
{
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    state.resources.push_back(std::move(resource));
}

void setAttribute(ViAttr attribute, std::uint64_t value, unsigned width)
{
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    state.attributes[attribute] = {.number = value, .width = width};
}

void setTextAttribute(ViAttr attribute, const std::string &text)
{
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    state.attributes[attribute] = {.text = text};
}

void fireEvent(ViSession vi, ViEventType type)
{
    State &state = State::instance();
    std::vector<Handler> handlers;
    ViEvent context;
    {
        const std::lock_guard lock(state.mutex);
        context = state.nextContext++;
        state.contexts.insert(context);
        for (const auto &handler : state.handlers)
            if (handler.vi == vi && handler.type == type)
                handlers.push_back(handler);
    }
    std::thread([&] {
        for (const auto &handler : handlers)
            handler.handler(vi, type, context, handler.userHandle);
    }).join();
    const std::lock_guard lock(state.mutex);
    state.contexts.erase(context);
}

std::vector<Call> calls()
{
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    return state.calls;
}

std::vector<Call> calls(const std::string &operation)
{
    std::vector<Call> all = calls();
    std::erase_if(all, [&](const Call &call) { return call.operation != operation; });
    return all;
}

std::vector<std::string> operations()
{
    std::vector<std::string> names;
    const auto all = calls();
    std::transform(all.begin(), all.end(), std::back_inserter(names), [](const Call &call) { return call.operation; });
    return names;
}

bool waitForCalls(const std::string &operation, std::size_t count, std::chrono::milliseconds timeout)
{
    State &state = State::instance();
    std::unique_lock lock(state.mutex);
    return state.called.wait_for(lock, timeout, [&] {
        const auto matches = std::count_if(state.calls.begin(), state.calls.end(),
                                           [&](const Call &call) { return call.operation == operation; });
        return static_cast<std::size_t>(matches) >= count;
    });
}

std::size_t openObjects()
{
    State &state = State::instance();
    const std::lock_guard lock(state.mutex);
    return state.managers + state.sessions.size() + state.findLists.size() + state.contexts.size();
}

} // namespace standin
