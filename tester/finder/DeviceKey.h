#pragma once

class QString;

/**
 * The leading part of a resource string that all resources of one device share; the finder groups its results by it.
 *
 *     USB0::0x0AAD::0x0119::100123::INSTR    USB0::0x0AAD::0x0119::100123
 *     TCPIP::192.168.1.9::hislip0::INSTR     TCPIP::192.168.1.9
 *     GPIB0::5::INSTR, ASRL1::INSTR          GPIB, ASRL
 *
 * A string with too few separators is its own key.
 */
QString deviceKey(const QString &resource);
