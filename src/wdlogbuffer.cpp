#include "wdlogbuffer.h"

WDLogBuffer& WDLogBuffer::operator<<(const char* piece)
{
    if (piece == nullptr) {
        piece = "null";
    }
    if (stream != nullptr) {
        *stream << piece;
    } else {
        text += piece;
    }
    return *this;
}

WDLogBuffer& WDLogBuffer::operator<<(char* piece)
{
    return *this << static_cast<const char*>(piece);
}

WDLogBuffer& WDLogBuffer::operator<<(const std::string& piece)
{
    if (stream != nullptr) {
        *stream << piece;
    } else {
        text += piece;
    }
    return *this;
}

WDLogBuffer& WDLogBuffer::operator<<(char piece)
{
    if (stream != nullptr) {
        // The message is in the stream; `text` is free to make a string of the character.
        text = piece;
        *stream << text;
    } else {
        text += piece;
    }
    return *this;
}

std::ostream& WDLogBuffer::operator<<(void* value)
{
    return static_cast<std::ostream&>(*this) << value;
}

std::ostream& WDLogBuffer::operator<<(long double value)
{
    return static_cast<std::ostream&>(*this) << value;
}

std::ostream& WDLogBuffer::operator<<(double value)
{
    return static_cast<std::ostream&>(*this) << value;
}

std::ostream& WDLogBuffer::operator<<(float value)
{
    return static_cast<std::ostream&>(*this) << static_cast<double>(value);
}

std::ostream& WDLogBuffer::operator<<(unsigned long value)
{
    return static_cast<std::ostream&>(*this) << value;
}

std::ostream& WDLogBuffer::operator<<(long value)
{
    return static_cast<std::ostream&>(*this) << value;
}

std::ostream& WDLogBuffer::operator<<(unsigned int value)
{
    return static_cast<std::ostream&>(*this) << static_cast<unsigned long>(value);
}

std::ostream& WDLogBuffer::operator<<(int value)
{
    return static_cast<std::ostream&>(*this) << value;
}

std::ostream& WDLogBuffer::operator<<(short value)
{
    return static_cast<std::ostream&>(*this) << value;
}

std::ostream& WDLogBuffer::operator<<(bool value)
{
    return static_cast<std::ostream&>(*this) << value;
}

std::ostream& WDLogBuffer::operator<<(std::ios_base& (*manipulator)(std::ios_base&))
{
    return static_cast<std::ostream&>(*this) << manipulator;
}

WDLogBuffer::operator std::ostream&()
{
    if (stream == nullptr) {
        stream = std::make_unique<std::ostringstream>();
        if (!text.empty()) {
            *stream << text;
        }
    }
    return *stream;
}

bool WDLogBuffer::hasStream() const noexcept
{
    return stream != nullptr;
}

std::string& WDLogBuffer::str(WDLogBuffer& /*chainEnd*/)
{
    return text;
}

std::string& WDLogBuffer::str(std::ostream& /*chainEnd*/)
{
    text = stream->str();
    return text;
}
