// The host's OpenGL canvas: a grid of channel cells on the shared context,
// each showing the newest picture its decoder handed over.
#include <GL/gl.h>

#include <algorithm>
#include <vector>

#include <wx/dcclient.h>
#include <wx/dcmemory.h>
#include <wx/font.h>

#include "host/sdk_video.h"

BasicGLPane::BasicGLPane(wxWindow* parent, int* attributes, wxGLContext* context, const wxPoint& pos,
                         const wxSize& size)
    : wxGLCanvas(parent, wxID_ANY, attributes, pos, size), m_context(context)
{
}

int* BasicGLPane::HostAttributes()
{
    static int attributes[] = {WX_GL_RGBA, WX_GL_MIN_RED, 1, WX_GL_MIN_GREEN, 1, WX_GL_MIN_BLUE, 1,
                               WX_GL_DEPTH_SIZE, 1, WX_GL_DOUBLEBUFFER, 0};
    return attributes;
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
    DrawScene();
    SwapBuffers();
}

void BasicGLPane::DrawScene()
{
    const wxSize size = GetClientSize();
    glViewport(0, 0, size.x, size.y);
    glClearColor(0.06f, 0.06f, 0.08f, 1.0f);
    glClear(GL_COLOR_BUFFER_BIT | GL_DEPTH_BUFFER_BIT);

    int columns = 1;
    while (columns * columns < m_channelsShown)
        ++columns;
    glMatrixMode(GL_PROJECTION);
    glLoadIdentity();
    glOrtho(0, columns, columns, 0, -1, 1);
    glMatrixMode(GL_MODELVIEW);
    glLoadIdentity();
    for (int channel = 0; channel < m_channelsShown && channel < kMaxChannels; ++channel)
        DrawCell(channel, columns);
    DrawCaption();
    glFlush();
}

namespace {

void DrawQuad(float left, float top, float right, float bottom)
{
    glBegin(GL_QUADS);
    glTexCoord2f(0, 0);
    glVertex2f(left, top);
    glTexCoord2f(1, 0);
    glVertex2f(right, top);
    glTexCoord2f(1, 1);
    glVertex2f(right, bottom);
    glTexCoord2f(0, 1);
    glVertex2f(left, bottom);
    glEnd();
}

}  // namespace

// One cell of the square grid: the channel's picture at its own shape,
// centred with dark bars where the cell is wider or taller, or an empty frame.
void BasicGLPane::DrawCell(int channel, int columns)
{
    const float x = static_cast<float>(channel % columns);
    const float y = static_cast<float>(channel / columns);
    const float inset = columns > 1 ? 0.01f : 0.0f;
    if (!m_hasTexture[channel]) {
        glDisable(GL_TEXTURE_2D);
        glColor3f(0.16f, 0.16f, 0.2f);
        DrawQuad(x + inset, y + inset, x + 1 - inset, y + 1 - inset);
        return;
    }
    const wxSize canvas = GetClientSize();
    const wxSize picture = m_pictureSize[channel];
    float width = 1 - 2 * inset;
    float height = 1 - 2 * inset;
    if (canvas.x > 0 && canvas.y > 0 && picture.x > 0 && picture.y > 0) {
        const float cellShape = static_cast<float>(canvas.x) / static_cast<float>(canvas.y);
        const float pictureShape = static_cast<float>(picture.x) / static_cast<float>(picture.y);
        if (pictureShape > cellShape)
            height *= cellShape / pictureShape;
        else
            width *= pictureShape / cellShape;
    }
    const float left = x + (1 - width) / 2;
    const float top = y + (1 - height) / 2;
    glEnable(GL_TEXTURE_2D);
    glBindTexture(GL_TEXTURE_2D, m_textures[channel]);
    glColor3f(1, 1, 1);
    DrawQuad(left, top, left + width, top + height);
    glDisable(GL_TEXTURE_2D);
}

// The caption in its own pixels at the lower left, over the picture.
void BasicGLPane::DrawCaption()
{
    if (m_captionTexture == 0 || m_captionSize.x <= 0)
        return;
    const wxSize canvas = GetClientSize();
    glMatrixMode(GL_PROJECTION);
    glLoadIdentity();
    glOrtho(0, canvas.x, canvas.y, 0, -1, 1);
    glEnable(GL_TEXTURE_2D);
    glBindTexture(GL_TEXTURE_2D, m_captionTexture);
    glColor3f(1, 1, 1);
    const float left = 6;
    const float bottom = static_cast<float>(canvas.y) - 6;
    DrawQuad(left, bottom - static_cast<float>(m_captionSize.y), left + static_cast<float>(m_captionSize.x), bottom);
    glDisable(GL_TEXTURE_2D);
}

void BasicGLPane::ShowCaption(const std::string& caption)
{
    std::lock_guard<std::mutex> lock(m_pictureMutex);
    if (caption == m_caption)
        return;
    m_caption = caption;
    m_captionFresh = true;
}

std::string BasicGLPane::Caption() const
{
    std::lock_guard<std::mutex> lock(m_pictureMutex);
    return m_caption;
}

// Light text on a dark strip, drawn by the toolkit and handed to OpenGL as
// a texture: the canvas has no text of its own.
void BasicGLPane::UploadCaption()
{
    std::string caption;
    {
        std::lock_guard<std::mutex> lock(m_pictureMutex);
        if (!m_captionFresh)
            return;
        caption = m_caption;
        m_captionFresh = false;
    }
    const wxString text = wxString::FromUTF8(caption.c_str());
    wxBitmap probe(1, 1, 24);
    wxMemoryDC measure(probe);
    measure.SetFont(wxFont(wxFontInfo(11)));
    const wxSize extent = measure.GetTextExtent(text);
    measure.SelectObject(wxNullBitmap);
    m_captionSize = wxSize(extent.x + 12, extent.y + 6);
    wxBitmap strip(m_captionSize.x, m_captionSize.y, 24);
    {
        wxMemoryDC dc(strip);
        dc.SetBackground(wxBrush(wxColour(16, 16, 20)));
        dc.Clear();
        dc.SetFont(wxFont(wxFontInfo(11)));
        dc.SetTextForeground(wxColour(250, 250, 235));
        dc.DrawText(text, 6, 3);
    }
    const wxImage image = strip.ConvertToImage();
    if (m_captionTexture == 0)
        glGenTextures(1, &m_captionTexture);
    glBindTexture(GL_TEXTURE_2D, m_captionTexture);
    glTexParameteri(GL_TEXTURE_2D, GL_TEXTURE_MIN_FILTER, GL_NEAREST);
    glTexParameteri(GL_TEXTURE_2D, GL_TEXTURE_MAG_FILTER, GL_NEAREST);
    glPixelStorei(GL_UNPACK_ALIGNMENT, 1);
    glTexImage2D(GL_TEXTURE_2D, 0, GL_RGB, image.GetWidth(), image.GetHeight(), 0, GL_RGB, GL_UNSIGNED_BYTE,
                 image.GetData());
}

void BasicGLPane::ShowPicture(int channel, Picture picture)
{
    if (channel < 0 || channel >= kMaxChannels)
        return;
    std::lock_guard<std::mutex> lock(m_pictureMutex);
    ++m_picturesReceived;
    m_last.width = picture.width;
    m_last.height = picture.height;
    m_last.block = picture.block;
    m_last.entry = picture.entry;
    m_last.key = picture.key;
    m_newest[channel] = std::move(picture);
    m_fresh[channel] = true;
}

int BasicGLPane::PicturesReceived() const
{
    std::lock_guard<std::mutex> lock(m_pictureMutex);
    return m_picturesReceived;
}

Picture BasicGLPane::LastPicture() const
{
    std::lock_guard<std::mutex> lock(m_pictureMutex);
    return m_last;
}

void BasicGLPane::UploadNewestPictures()
{
    Picture pictures[kMaxChannels];
    bool any = false;
    {
        std::lock_guard<std::mutex> lock(m_pictureMutex);
        for (int c = 0; c < kMaxChannels; ++c) {
            if (m_fresh[c]) {
                pictures[c] = std::move(m_newest[c]);
                m_fresh[c] = false;
                any = true;
            }
        }
    }
    if (!m_context || !IsShownOnScreen())
        return;
    SetCurrent(*m_context);
    UploadCaption();
    if (!any)
        return;
    glPixelStorei(GL_UNPACK_ALIGNMENT, 1);
    for (int c = 0; c < kMaxChannels; ++c) {
        if (pictures[c].rgb.empty())
            continue;
        if (!m_hasTexture[c])
            glGenTextures(1, &m_textures[c]);
        glBindTexture(GL_TEXTURE_2D, m_textures[c]);
        glTexParameteri(GL_TEXTURE_2D, GL_TEXTURE_MIN_FILTER, GL_LINEAR);
        glTexParameteri(GL_TEXTURE_2D, GL_TEXTURE_MAG_FILTER, GL_LINEAR);
        glTexImage2D(GL_TEXTURE_2D, 0, GL_RGB, pictures[c].width, pictures[c].height, 0, GL_RGB, GL_UNSIGNED_BYTE,
                     pictures[c].rgb.data());
        m_hasTexture[c] = true;
        m_pictureSize[c] = wxSize(pictures[c].width, pictures[c].height);
    }
}

void BasicGLPane::ProcessTexture(int operation, _TEXTURE_DATA*)
{
    if (operation != 2)
        return;
    ++m_textureUpdates;
    UploadNewestPictures();
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
    m_channelsShown = std::min(channelCount, static_cast<int>(kMaxChannels));
    Refresh(false);
}

void BasicGLPane::SetOffAllChannels(unsigned long long address, int channelCount, int type)
{
    m_calls.push_back({Call::kOff, address, channelCount, type});
    m_channelsShown = 0;
    Refresh(false);
}

wxImage BasicGLPane::Snapshot()
{
    if (!m_context || !IsShownOnScreen())
        return wxImage();
    SetCurrent(*m_context);
    DrawScene();  // into the back buffer, which is not shown until a swap
    const wxSize size = GetClientSize();
    std::vector<unsigned char> rows(static_cast<std::size_t>(size.x) * size.y * 3);
    glReadBuffer(GL_BACK);
    glPixelStorei(GL_PACK_ALIGNMENT, 1);
    glReadPixels(0, 0, size.x, size.y, GL_RGB, GL_UNSIGNED_BYTE, rows.data());
    wxImage image(size.x, size.y);
    // OpenGL counts rows from the bottom.
    for (int y = 0; y < size.y; ++y)
        std::copy_n(rows.data() + static_cast<std::size_t>(size.y - 1 - y) * size.x * 3, size.x * 3,
                    image.GetData() + static_cast<std::size_t>(y) * size.x * 3);
    return image;
}

int BasicGLPane::getWidth()
{
    return GetSize().x;
}
