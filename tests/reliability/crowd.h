// Writers and processors of the queue, each a process of its own, and random ends of them.
#pragma once

#include <sys/types.h>

#include <atomic>
#include <map>
#include <random>
#include <string>
#include <vector>

namespace test {

// What the processes tell the one that started them.
struct Report {
  enum Kind : int {
    kAsks,       // is about to append the request
    kAsked,      // has appended it
    kEnds,       // the writer has written all it was to write
    kTakesBatch  // a processor has moved the queue aside: `writer` lines of which `number` are torn
  };
  Kind kind;
  int op;
  int writer;
  int generation;  // how many writers of that number were before it
  int number;      // of the application
};

// What became of an application's requests.
struct Asked {
  bool added = false;          // the request to add it was written
  bool removal_begun = false;  // the request to remove it may have been written
  bool removed = false;        // it was written
};

class Crowd {
 public:
  struct Limits {
    int writers;
    int processors;
    int requests;  // that each writer is to write
    int kills;
    double seconds;  // after which writers end whatever they have written
  };

  struct Figures {
    int requests = 0;  // written for certain
    int killed_writers = 0;
    int killed_processors = 0;
    int batches = 0;
    int lines = 0;
    int torn_lines = 0;
    int failures = 0;  // processes that ended otherwise than they should
  };

  Crowd(const Limits& limits, unsigned seed);
  ~Crowd();
  Crowd(const Crowd&) = delete;
  Crowd& operator=(const Crowd&) = delete;

  // Runs all of them to the end.
  void Run();

  const Figures& Counted() const { return figures_; }
  const std::map<std::string, Asked>& Applications() const { return applications_; }

 private:
  struct Member {
    pid_t pid = -1;
    int generation = -1;
    bool ended = false;
  };

  bool IsWriter(std::size_t member) const {
    return member < static_cast<std::size_t>(limits_.writers);
  }
  void Spawn(std::size_t member);
  void Note(const Report& report);
  void NoteRequest(const Report& report);
  void KillOne();
  void WaitFor(std::size_t member, int signal);

  const Limits limits_;
  std::mt19937 random_;
  std::vector<Member> members_;  // the writers come first
  int writers_left_;
  int reports_[2] = {-1, -1};
  int doorbell_[2] = {-1, -1};
  std::atomic<bool>* stop_;  // shared with the writers
  Figures figures_;
  std::map<std::string, Asked> applications_;
};

}  // namespace test
