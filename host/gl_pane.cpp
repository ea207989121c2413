// The host's OpenGL canvas: a grid of channel cells on the shared context.
#include <GL/gl.h>

#include <wx/dcclient.h>

#include "host/sdk_video.h"

BasicGLPane::BasicGLPane(wxWindow* parent, int* attributes, wxGLContext* context, const wxPoint& pos,
                         const wxSize& size)
    : wxGLCanvas(parent, wxID_ANY, attributes, pos, size), m_context(context)
{
}

void BasicGLPane::Init()
{
    Bind(wxEVT_PAINT, &BasicGLPane::OnRender, this);
    Bind(wxEVT_ERASE_BACKGROUND, &BasicGLPane::OnEraseBackground, this);
}

// OpenGL paints every pixel: nothing to erase, and no flicker.
void BasicGLPane::OnEraseBackground(wxEraseEvent&) {}

void BasicGLPane::OnRender(wxPaintEvent&)
{
    wxPaintDC dc(this);
    ++m_renders;
    if (!m_context || !IsShownOnScreen())
        return;
    SetCurrent(*m_context);
    const wxSize size = GetClientSize();
    glViewport(0, 0, size.x, size.y);
    glClearColor(0.06f, 0.06f, 0.08f, 1.0f);
    glClear(GL_COLOR_BUFFER_BIT | GL_DEPTH_BUFFER_BIT);

    // One cell per channel shown, in a square grid.
    int columns = 1;
    while (columns * columns < m_channelsShown)
        ++columns;
    glMatrixMode(GL_PROJECTION);
    glLoadIdentity();
    glOrtho(0, columns, columns, 0, -1, 1);
    glMatrixMode(GL_MODELVIEW);
    glLoadIdentity();
    for (int channel = 0; channel < m_channelsShown; ++channel) {
        const float x = static_cast<float>(channel % columns);
        const float y = static_cast<float>(channel / columns);
        glColor3f(0.16f, 0.16f, 0.2f);
        glBegin(GL_QUADS);
        glVertex2f(x + 0.02f, y + 0.02f);
        glVertex2f(x + 0.98f, y + 0.02f);
        glVertex2f(x + 0.98f, y + 0.98f);
        glVertex2f(x + 0.02f, y + 0.98f);
        glEnd();
    }
    glFlush();
    SwapBuffers();
}

void BasicGLPane::ProcessTexture(int operation, _TEXTURE_DATA*)
{
    if (operation != 2)
        return;
    ++m_textureUpdates;
    Refresh(false);
}

void BasicGLPane::Reset(int channel, int type)
{
    m_calls.push_back({Call::kReset, 0, channel, type});
    m_channelsShown = 0;
    Refresh(false);
}

void BasicGLPane::SetOnAllChannels(unsigned long long address, int channelCount, int type)
{
    m_calls.push_back({Call::kOn, address, channelCount, type});
    m_channelsShown = channelCount;
    Refresh(false);
}

void BasicGLPane::SetOffAllChannels(unsigned long long address, int channelCount, int type)
{
    m_calls.push_back({Call::kOff, address, channelCount, type});
    m_channelsShown = 0;
    Refresh(false);
}

int BasicGLPane::getWidth()
{
    return GetSize().x;
}
