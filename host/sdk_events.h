// The host SDK's events: the exported event identifiers, the event classes
// a plugin sends and receives, the sink functors and the event manager.
#ifndef HOST_SDK_EVENTS_H
#define HOST_SDK_EVENTS_H

#include <cstddef>
#include <cstdint>
#include <vector>

#include <wx/event.h>
#include <wx/string.h>

#include "host/sdk_api.h"

// Identifiers the host exports. They hold their values before any plugin is
// loaded: a plugin's static event tables copy iEVT_REMOTEPLAY_TOOLBAR when
// the library is loaded.
extern QRIX_SDK_API int iEVT_REMOTEPLAY_TOOLBAR;   // tool and menu command of the playback plugin
extern QRIX_SDK_API int iEVT_TIMER_UPDATED;        // the host's periodic tick
extern QRIX_SDK_API int iEVT_HDD_COMMAND;          // transport command on a disk playback
extern QRIX_SDK_API int iEVT_MORVANE_WINDOW;       // window identifier of disk playback events
extern QRIX_SDK_API int iEVT_HDD_CONNECTED;        // a disk playback connects
extern QRIX_SDK_API int iEVT_HDD_DISCONNECTED;     // a disk playback disconnects
extern QRIX_SDK_API int QRIX_START_FILEPLAY;       // hand playback to the host's file player
extern QRIX_SDK_API int iEVT_REMOTE_DISCONNECTED;  // a remote stream is gone
extern QRIX_SDK_API int QRIX_CLOSE_ALL;            // close all playback windows

// A command event with five integers.
class QRIX_SDK_API QrixEvent : public wxCommandEvent {
public:
    explicit QrixEvent(wxEventType type = wxEVT_NULL, int id = 0);
    wxEvent* Clone() const override;
    std::int32_t values[5];
};

// A disk playback event: connect, disconnect or command.
class QRIX_SDK_API QrixFileEvent : public wxEvent {
public:
    explicit QrixFileEvent(wxEventType type = wxEVT_NULL, int id = 0);
    wxEvent* Clone() const override;
    wxString text1;
    wxString text2;
    wxString address;
    std::uint16_t record;
    wxString path;
    std::int32_t reserved;
    std::int32_t channelCount;  // the host writes the channel count of a connect here
    std::int32_t mode;
    std::int32_t command;       // speed in 1/1024 of normal, negative backwards
    long long panelId;
    std::int32_t words[4];
    wxString texts[2];
};

// A remote stream event.
class QRIX_SDK_API QrixConnectEvent : public wxEvent {
public:
    explicit QrixConnectEvent(wxEventType type = wxEVT_NULL, int id = 0);
    wxEvent* Clone() const override;
    wxString text1;
    wxString text2;
    wxString address;
    std::uint16_t record;
    wxString path;
    std::int32_t reserved;
    std::int32_t channelCount;
    std::int32_t reserved2[2];
    long long panelId;
    wxString texts[2];
};

class QRIX_SDK_API IFunctorBase {
public:
    virtual ~IFunctorBase() {}
    virtual void* GetThis() = 0;
};

template <typename EventT>
class IEventFunctorBase : public IFunctorBase {
public:
    virtual void Call(EventT& event) = 0;
};

// A sink calling a member function of an object.
template <class ClassT, typename EventT>
class iEventFunctor : public IEventFunctorBase<EventT> {
public:
    typedef void (ClassT::*Member)(EventT&);
    iEventFunctor(ClassT* target, Member member) : m_target(target), m_member(member) {}
    void* GetThis() override { return m_target; }
    void Call(EventT& event) override
    {
        if (m_target)
            (m_target->*m_member)(event);
    }

private:
    ClassT* m_target;
    Member m_member;
};

// What the event manager processed, kept for whoever watches the host.
struct QRIX_SDK_API HostEventRecord {
    enum Kind { kQrixEvent, kFileEvent, kConnectEvent } kind;
    int type;
    int id;
    wxString text1, text2, address, path;
    unsigned record;
    int channelCount;
    int mode;
    int command;
    long long panelId;
};

class QRIX_SDK_API EventManager {
public:
    static EventManager* Get();

    // Takes ownership of the sink; it is called for every event of the type.
    bool RegisterEventSink(int type, IEventFunctorBase<QrixEvent>* sink);
    // Drops (and deletes) every sink whose GetThis() is `owner`.
    void RemoveAllEventSinksFor(void* owner);

    // Synchronous: when these return, the host is done with the event and
    // has written its answer into it (the channel count of a connect).
    void ProcessEvent(QrixEvent& event);
    void ProcessEvent(QrixFileEvent& event);
    void ProcessEvent(QrixConnectEvent& event);

    // The host's own handling of a kind of event, called after the record.
    void SetFileEventHandler(void (*handler)(QrixFileEvent&));
    void SetQrixEventHandler(void (*handler)(QrixEvent&));

    // Every event processed, oldest first (the periodic tick is not kept).
    const std::vector<HostEventRecord>& History() const;
    void ClearHistory();
    std::size_t SinkCount(int type) const;

private:
    EventManager();
    struct Impl;
    Impl* m_impl;
};

#endif
