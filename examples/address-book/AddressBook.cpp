// QELO.Example.AddressBook: each user's own address book, an SQLite file among the user's settings.

#include <sqlite3.h>
#include <webapi/Method.h>

#include <fstream>
#include <sstream>

namespace {

using QELO::Call, QELO::Error, QELO::Method, QELO::Optional, QELO::Required, std::to_string;
using Texts = std::vector<std::string>;
enum : int { kUnavailable = 400, kNobody = 401, kBadLine = 402 };

struct Person {
  long long id = 0;  // given by the book
  std::string name, phone, mail;
  static constexpr auto Fields() {
    return QELO::Fields(Optional("id", &Person::id), Required("name", &Person::name).Line(1, 100),
                        Optional("phone", &Person::phone).Line(0, 30),
                        Optional("mail", &Person::mail).Line(0, 200));
  }
};
struct Which {
  long long id;
  static constexpr auto Fields() { return QELO::Fields(Required("id", &Which::id)); }
};
struct Search {
  std::string part;  // of a name
  int limit = 100;
  static constexpr auto Fields() {
    return QELO::Fields(Optional("part", &Search::part).Length(0, 100),
                        Optional("limit", &Search::limit).Between(1, 1000));
  }
};
struct Lines {
  QELO::UploadedFile file;
  static constexpr auto Fields() {
    return QELO::Fields(Required("file", &Lines::file).Length(0, 1 << 20));
  }
};

// The caller's book. What is asked in SQL gives people, or throws.
class Book {
 public:
  explicit Book(const Call& call) {
    const std::string place = call.Request().GetPreferenceDir();
    // Who has no home gets "/tmp", which is everybody's.
    const std::string file =
        place + (place != "/tmp" ? "/address-book.db" : throw Error{kUnavailable});
    sqlite3* opened = nullptr;
    sqlite3_open(file.c_str(), &opened);  // a failure shows at the first question
    database_.reset(opened);
    sqlite3_busy_timeout(opened, 5000);
    Ask("CREATE TABLE IF NOT EXISTS person (id INTEGER PRIMARY KEY, name, phone, mail)");
  }
  std::vector<Person> Ask(const char* sql, const Texts& values = {}) const {
    sqlite3_stmt* row = nullptr;
    Expect(sqlite3_prepare_v2(database_.get(), sql, -1, &row, nullptr) == SQLITE_OK);
    const std::unique_ptr<sqlite3_stmt, int (*)(sqlite3_stmt*)> owner(row, sqlite3_finalize);
    for (int at = 0; const std::string& value : values) {
      sqlite3_bind_text64(row, ++at, value.data(), value.size(), SQLITE_STATIC, SQLITE_UTF8);
    }
    const auto text = [row](int column) {
      const auto* bytes = static_cast<const char*>(sqlite3_column_blob(row, column));
      return bytes != nullptr ? std::string(bytes, sqlite3_column_bytes(row, column)) : "";
    };
    std::vector<Person> people;
    while (sqlite3_step(row) == SQLITE_ROW) {
      people.push_back({sqlite3_column_int64(row, 0), text(1), text(2), text(3)});
    }
    Expect(sqlite3_reset(row) == SQLITE_OK);  // what the last step said
    return people;
  }
  Person AskOne(const char* sql, const Texts& values) const {
    const std::vector<Person> people = Ask(sql, values);
    return people.empty() ? throw Error{kNobody} : people[0];
  }
  Person Add(const Person& person) const {
    return AskOne("INSERT INTO person (name, phone, mail) VALUES (?, ?, ?) RETURNING *",
                  {person.name, person.phone, person.mail});
  }

 private:
  void Expect(bool isGood) const {
    if (!isGood) {
      throw Error{kUnavailable, sqlite3_errmsg(database_.get())};
    }
  }
  std::unique_ptr<sqlite3, int (*)(sqlite3*)> database_{nullptr, sqlite3_close};
};

std::vector<Person> List(const Call& call, const Search& search) {
  return Book(call).Ask("SELECT * FROM person WHERE instr(name, ?) ORDER BY name, id LIMIT ?",
                        {search.part, to_string(search.limit)});
}
Person Get(const Call& call, const Which& which) {
  return Book(call).AskOne("SELECT * FROM person WHERE id = ?", {to_string(which.id)});
}
Person Create(const Call& call, const Person& person) {
  return Book(call).Add(person);
}
Person Update(const Call& call, const Person& to) {
  return Book(call).AskOne("UPDATE person SET name=?, phone=?, mail=? WHERE id=? RETURNING *",
                           {to.name, to.phone, to.mail, to_string(to.id)});
}
void Remove(const Call& call, const Which& which) {
  Book(call).AskOne("DELETE FROM person WHERE id = ? RETURNING *", {to_string(which.id)});
}

// A person a line: name, phone, mail address, with tabs between them. All come, or none.
QELO::Answered Import(const Call& call, const Lines& given) {
  std::ifstream lines(given.file.path);  // gone when the method ends, but open
  const auto work = [&](QELO::Progress& progress) {
    const Book book(call);
    int count = 0;
    book.Ask("BEGIN IMMEDIATE");
    for (std::string line; std::getline(lines, line); progress.Tell(++count)) {
      std::istringstream columns(line);
      Person person;
      std::getline(columns, person.name, '\t') && std::getline(columns, person.phone, '\t') &&
          std::getline(columns, person.mail);
      book.Add(!person.name.empty() ? person : throw Error{kBadLine, count + 1});
    }
    book.Ask("COMMIT");
    return count;
  };
  return QELO::StartWork(call, {.prefix = "import_", .limit = 1, .keepResult = true}, work);
}
QELO::Download Export(const Call& call) {
  std::string all;
  for (const Person& person : Book(call).Ask("SELECT * FROM person ORDER BY name, id")) {
    all += person.name + "\t" + person.phone + "\t" + person.mail + "\n";
  }
  return {.content = all, .name = "address-book.tsv", .type = "text/tab-separated-values"};
}

constexpr QELO::NamedMethod kMethods[] = {{"list", Method<List>},     {"get", Method<Get>},
                                          {"create", Method<Create>}, {"update", Method<Update>},
                                          {"remove", Method<Remove>}, {"import", Method<Import>},
                                          {"export", Method<Export>}};

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  static auto table = QELO::MethodTable("QELO.Example.AddressBook", 1, kMethods);
  return table.data();
}
