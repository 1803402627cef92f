#pragma once

class QByteArray;
class QTextCodec;

/// The codec that reads @p bytes of a configuration file and writes every one of them back as it was: UTF-8 where they
/// are valid UTF-8, otherwise Latin-1, which maps each byte to one character.
QTextCodec *configEncoding(const QByteArray &bytes);
