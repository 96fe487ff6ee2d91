#pragma once

#include "services/servicesexport.h"

#include <exception>
#include <string>

namespace kelm {

/// Base of all failures that the library raises. Thrown by value; what() is the message.
///
/// Reading an exception object is safe from any number of threads.
class KELM_SERVICES_EXPORT Exception : public std::exception {
  public:
    /// @param message    the text for a person
    /// @param sourcePath path of the source that raised the failure, without its file extension
    /// @param function   signature of the enclosing function, as text
    /// @param line       line in that source
    Exception(std::string message, std::string sourcePath, std::string function, unsigned line);
    Exception(const Exception&);
    Exception& operator=(const Exception&);
    ~Exception() override;

    const char* what() const noexcept override;
    const std::string& GetMessage() const noexcept;
    const std::string& GetSourcePath() const noexcept;
    const std::string& GetFunction() const noexcept;
    unsigned GetLine() const noexcept;

  private:
    std::string moMessage;
    std::string moSourcePath;
    std::string moFunction;
    unsigned mnLine;
};

/// Data that cannot be used: a file, a layer, a shape or a vertex.
class KELM_SERVICES_EXPORT DataException : public Exception {
  public:
    using Exception::Exception;
    DataException(const DataException&);
    DataException& operator=(const DataException&);
    ~DataException() override;
};

/// An argument that a contract does not allow.
class KELM_SERVICES_EXPORT ParameterException : public DataException {
  public:
    /// What is wrong with the argument. The library raises one kind only.
    enum Type { PT_Invalid = 1 };

    /// @param parameter name of the parameter
    /// @param eType     what is wrong with it
    /// @param actual    the value passed, as text; may be empty
    /// @param expected  the value expected, as text; may be empty
    ParameterException(std::string parameter, Type eType, std::string actual, std::string expected,
                       std::string message, std::string sourcePath, std::string function,
                       unsigned line);
    ParameterException(const ParameterException&);
    ParameterException& operator=(const ParameterException&);
    ~ParameterException() override;

    const std::string& GetParameter() const noexcept;
    Type GetType() const noexcept;
    const std::string& GetActual() const noexcept;
    const std::string& GetExpected() const noexcept;

  private:
    std::string moParameter;
    Type meType;
    std::string moActual;
    std::string moExpected;
};

} // namespace kelm
