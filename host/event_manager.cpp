// The host's event identifiers, event classes and event manager.
#include <algorithm>
#include <map>


#include "host/sdk_events.h"

// Window identifiers above the toolkit's stock range (the toolkit hands out
// negative ones itself); event types far above the ones the toolkit
// allocates. The event types only travel through the event manager.
int iEVT_REMOTEPLAY_TOOLBAR = 7001;
int iEVT_MORVANE_WINDOW = 7002;
int iEVT_TIMER_UPDATED = 31001;
int iEVT_HDD_COMMAND = 31002;
int iEVT_HDD_CONNECTED = 31003;
int iEVT_HDD_DISCONNECTED = 31004;
int QRIX_START_FILEPLAY = 31005;
int iEVT_REMOTE_DISCONNECTED = 31006;
int QRIX_CLOSE_ALL = 31007;

QrixEvent::QrixEvent(wxEventType type, int id) : wxCommandEvent(type, id), values{} {}

wxEvent* QrixEvent::Clone() const
{
    return new QrixEvent(*this);
}

QrixFileEvent::QrixFileEvent(wxEventType type, int id)
    : wxEvent(id, type), record(0), reserved(0), channelCount(0), mode(0), command(0), panelId(0), words{}
{
}

wxEvent* QrixFileEvent::Clone() const
{
    return new QrixFileEvent(*this);
}

QrixConnectEvent::QrixConnectEvent(wxEventType type, int id)
    : wxEvent(id, type), record(0), reserved(0), channelCount(0), reserved2{}, panelId(0)
{
}

wxEvent* QrixConnectEvent::Clone() const
{
    return new QrixConnectEvent(*this);
}

struct EventManager::Impl {
    struct Sink {
        IEventFunctorBase<QrixEvent>* functor;
        bool removed;
    };
    std::map<int, std::vector<Sink>> sinks;
    std::vector<HostEventRecord> history;
    void (*fileHandler)(QrixFileEvent&) = nullptr;
    void (*qrixHandler)(QrixEvent&) = nullptr;
    int dispatching = 0;

    // Sinks removed while a dispatch runs are only marked, and deleted here
    // once no dispatch is using them.
    void Purge()
    {
        if (dispatching > 0)
            return;
        for (auto& [type, list] : sinks) {
            for (Sink& s : list)
                if (s.removed)
                    delete s.functor;
            list.erase(std::remove_if(list.begin(), list.end(), [](const Sink& s) { return s.removed; }), list.end());
        }
    }
};

EventManager::EventManager() : m_impl(new Impl) {}

EventManager* EventManager::Get()
{
    static EventManager* manager = new EventManager;
    return manager;
}

bool EventManager::RegisterEventSink(int type, IEventFunctorBase<QrixEvent>* sink)
{
    if (!sink)
        return false;
    m_impl->sinks[type].push_back({sink, false});
    return true;
}

void EventManager::RemoveAllEventSinksFor(void* owner)
{
    for (auto& [type, list] : m_impl->sinks)
        for (Impl::Sink& s : list)
            if (!s.removed && s.functor->GetThis() == owner)
                s.removed = true;
    m_impl->Purge();
}

std::size_t EventManager::SinkCount(int type) const
{
    auto it = m_impl->sinks.find(type);
    if (it == m_impl->sinks.end())
        return 0;
    return std::count_if(it->second.begin(), it->second.end(), [](const Impl::Sink& s) { return !s.removed; });
}

void EventManager::ProcessEvent(QrixEvent& event)
{
    if (event.GetEventType() != iEVT_TIMER_UPDATED) {
        HostEventRecord r{HostEventRecord::kQrixEvent, event.GetEventType(), event.GetId(), {}, {}, {}, {}, 0, 0, 0, 0, 0};
        m_impl->history.push_back(r);
    }
    ++m_impl->dispatching;
    auto it = m_impl->sinks.find(event.GetEventType());
    if (it != m_impl->sinks.end()) {
        // Sinks registered during the dispatch wait for the next event.
        const std::size_t count = it->second.size();
        for (std::size_t i = 0; i < count; ++i) {
            Impl::Sink sink = it->second[i];
            if (!sink.removed)
                sink.functor->Call(event);
            it = m_impl->sinks.find(event.GetEventType());
        }
    }
    --m_impl->dispatching;
    m_impl->Purge();
    if (m_impl->qrixHandler)
        m_impl->qrixHandler(event);
}

void EventManager::ProcessEvent(QrixFileEvent& event)
{
    if (m_impl->fileHandler)
        m_impl->fileHandler(event);
    m_impl->history.push_back({HostEventRecord::kFileEvent, event.GetEventType(), event.GetId(), event.text1,
                               event.text2, event.address, event.path, event.record, event.channelCount, event.mode,
                               event.command, event.panelId});
}

void EventManager::ProcessEvent(QrixConnectEvent& event)
{
    m_impl->history.push_back({HostEventRecord::kConnectEvent, event.GetEventType(), event.GetId(), event.text1,
                               event.text2, event.address, event.path, event.record, event.channelCount, 0, 0,
                               event.panelId});
}

void EventManager::SetFileEventHandler(void (*handler)(QrixFileEvent&))
{
    m_impl->fileHandler = handler;
}

void EventManager::SetQrixEventHandler(void (*handler)(QrixEvent&))
{
    m_impl->qrixHandler = handler;
}

const std::vector<HostEventRecord>& EventManager::History() const
{
    return m_impl->history;
}

void EventManager::ClearHistory()
{
    m_impl->history.clear();
}
