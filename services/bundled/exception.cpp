#include "services/exception.h"

#include <utility>

namespace kelm {

Exception::Exception(std::string message, std::string sourcePath, std::string function,
                     unsigned line)
    : moMessage(std::move(message)), moSourcePath(std::move(sourcePath)),
      moFunction(std::move(function)), mnLine(line) {}

Exception::Exception(const Exception&) = default;
Exception& Exception::operator=(const Exception&) = default;
Exception::~Exception() = default;

const char* Exception::what() const noexcept {
    return moMessage.c_str();
}
const std::string& Exception::GetMessage() const noexcept {
    return moMessage;
}
const std::string& Exception::GetSourcePath() const noexcept {
    return moSourcePath;
}
const std::string& Exception::GetFunction() const noexcept {
    return moFunction;
}
unsigned Exception::GetLine() const noexcept {
    return mnLine;
}

DataException::DataException(const DataException&) = default;
DataException& DataException::operator=(const DataException&) = default;
DataException::~DataException() = default;

ParameterException::ParameterException(std::string parameter, Type eType, std::string actual,
                                       std::string expected, std::string message,
                                       std::string sourcePath, std::string function, unsigned line)
    : DataException(std::move(message), std::move(sourcePath), std::move(function), line),
      moParameter(std::move(parameter)), meType(eType), moActual(std::move(actual)),
      moExpected(std::move(expected)) {}

ParameterException::ParameterException(const ParameterException&) = default;
ParameterException& ParameterException::operator=(const ParameterException&) = default;
ParameterException::~ParameterException() = default;

const std::string& ParameterException::GetParameter() const noexcept {
    return moParameter;
}
ParameterException::Type ParameterException::GetType() const noexcept {
    return meType;
}
const std::string& ParameterException::GetActual() const noexcept {
    return moActual;
}
const std::string& ParameterException::GetExpected() const noexcept {
    return moExpected;
}

} // namespace kelm
