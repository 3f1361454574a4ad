/// @file
/// PostgreSQL's libpq, opened when the first catalogue on a server is: it brings some twenty
/// libraries along, which take longer to load than all else that a short run does. Each object here
/// is called as the function of its name; what calls one that is not here does not link.
#pragma once

#include <atomic>

#include <libpq-fe.h>

namespace kzcat::postgresql {

/// The address of a function of libpq; opens it at first. Any thread may call this. Throws
/// StoreError::Kind::cannot_open where there is no libpq.
void* libpq_address(const char* function);

template <class Signature>
class LibpqFunction;

template <class Result, class... Arguments>
class LibpqFunction<Result(Arguments...)> {
public:
    explicit constexpr LibpqFunction(const char* name) : name_(name) {}

    Result operator()(Arguments... arguments) const
    {
        return reinterpret_cast<Result (*)(Arguments...)>(address())(arguments...);
    }

private:
    void* address() const
    {
        void* found = address_.load(std::memory_order_acquire);
        if (found == nullptr) {
            found = libpq_address(name_);
            address_.store(found, std::memory_order_release);
        }
        return found;
    }

    const char* name_;
    mutable std::atomic<void*> address_ = nullptr;
};

inline const LibpqFunction<decltype(::PQclear)> PQclear("PQclear");
inline const LibpqFunction<decltype(::PQcmdStatus)> PQcmdStatus("PQcmdStatus");
inline const LibpqFunction<decltype(::PQcmdTuples)> PQcmdTuples("PQcmdTuples");
inline const LibpqFunction<decltype(::PQconnectdbParams)> PQconnectdbParams("PQconnectdbParams");
inline const LibpqFunction<decltype(::PQconninfo)> PQconninfo("PQconninfo");
inline const LibpqFunction<decltype(::PQconninfoFree)> PQconninfoFree("PQconninfoFree");
inline const LibpqFunction<decltype(::PQconninfoParse)> PQconninfoParse("PQconninfoParse");
inline const LibpqFunction<decltype(::PQconsumeInput)> PQconsumeInput("PQconsumeInput");
inline const LibpqFunction<decltype(::PQerrorMessage)> PQerrorMessage("PQerrorMessage");
inline const LibpqFunction<decltype(::PQexec)> PQexec("PQexec");
inline const LibpqFunction<decltype(::PQexecParams)> PQexecParams("PQexecParams");
inline const LibpqFunction<decltype(::PQexecPrepared)> PQexecPrepared("PQexecPrepared");
inline const LibpqFunction<decltype(::PQfinish)> PQfinish("PQfinish");
inline const LibpqFunction<decltype(::PQgetisnull)> PQgetisnull("PQgetisnull");
inline const LibpqFunction<decltype(::PQgetlength)> PQgetlength("PQgetlength");
inline const LibpqFunction<decltype(::PQgetvalue)> PQgetvalue("PQgetvalue");
inline const LibpqFunction<decltype(::PQntuples)> PQntuples("PQntuples");
inline const LibpqFunction<decltype(::PQpass)> PQpass("PQpass");
inline const LibpqFunction<decltype(::PQprepare)> PQprepare("PQprepare");
inline const LibpqFunction<decltype(::PQresultErrorField)> PQresultErrorField("PQresultErrorField");
inline const LibpqFunction<decltype(::PQresultStatus)> PQresultStatus("PQresultStatus");
inline const LibpqFunction<decltype(::PQsetClientEncoding)>
    PQsetClientEncoding("PQsetClientEncoding");
inline const LibpqFunction<decltype(::PQsetNoticeProcessor)>
    PQsetNoticeProcessor("PQsetNoticeProcessor");
inline const LibpqFunction<decltype(::PQsocket)> PQsocket("PQsocket");
inline const LibpqFunction<decltype(::PQstatus)> PQstatus("PQstatus");
inline const LibpqFunction<decltype(::PQtransactionStatus)>
    PQtransactionStatus("PQtransactionStatus");
inline const LibpqFunction<decltype(::PQuser)> PQuser("PQuser");

} // namespace kzcat::postgresql
