#include "instrtests/Answer.h"

#include "visa/KyVisaCodedString.h"
#include "visa/VisaSessionWithLog.h"

unsigned Answer::read(VisaSessionWithLog &session, unsigned limit)
{
    clear(); // a read that fails leaves no rest of the one before
    m_count = session.read(m_bytes.data(), limit);
    m_bytes[m_count] = '\0';
    return m_count;
}

std::string Answer::printable() const
{
    return KyVisaCodedString(m_bytes.data(), m_count);
}
