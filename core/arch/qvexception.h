// The exceptions that the engine throws.
#pragma once

#include <memory>

#include "core/arch/api.h"

// Base of the family, which is not derived from std::exception: a `catch (const std::exception&)` lets it
// pass. Callers of the engine catch both:
//
//     try {
//         task.restore(state, decoders, &pipe);
//     } catch (const QvException& failure) {   // the engine's own; std::bad_alloc is not one of them
//         fprintf(stderr, "%s\n", failure.what());
//     } catch (const std::exception& failure) {
//         fprintf(stderr, "%s\n", failure.what());
//     }
//
// Holds a copy of its text, cut to 1,023 characters. If there is no memory for the copy
// the object stays without a text and what() gives "Tarsel exception".
class QV_API QvException {
  public:
    explicit QvException(const char* text = nullptr);  // null: no text is kept
    QvException(const QvException& other);
    QvException& operator=(const QvException& other);
    virtual ~QvException();
    virtual const char* what() const;  // never null; lives as long as the exception keeps its text
    operator const char*() const { return what(); }

  private:
    std::unique_ptr<char[]> text_;
};

// A parameter that a codec does not know. Null text: "unknown parameter".
class QV_API QvParamException : public QvException {
  public:
    explicit QvParamException(const char* text = nullptr);
    ~QvParamException() override;
};

// A broken contract, thrown by qvAssertFail. Null text: "assertion failure".
class QV_API QvAssertFailure : public QvException {
  public:
    explicit QvAssertFailure(const char* text = nullptr);
    ~QvAssertFailure() override;
};

// A broken contract whose cause is that there is no memory: where a contract promises a result that needs
// memory, its failure is an assertion, and this shows that it is no mistake of the caller.
class QV_API QvMemoryFailure : public QvAssertFailure {
  public:
    explicit QvMemoryFailure(const char* text = nullptr);
    ~QvMemoryFailure() override;
};

// Null text: "file access error".
class QV_API QvFileException : public QvException {
  public:
    explicit QvFileException(const char* text = nullptr);
    ~QvFileException() override;
};
