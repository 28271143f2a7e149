// SPDX-License-Identifier: Apache-2.0
#include "devicedata/TopicWords.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <optional>

#include "core/Files.h"
#include "folding/TextFolding.h"
#include "platform/TopicCatalogue.h"

namespace keepsakes {

namespace {

struct Row {
    std::string_view topic;  ///< Its name.
    std::string_view words;  ///< Apart by blanks; a blank within a word is written as a hyphen.
};

/// As many words of a text make a word of the table at most.
constexpr std::size_t kLongestPhrase = 5;

// English, German, French, Spanish, Italian, Dutch. "workout-..." is a recorded workout,
// "genre-..." a word of a medium's genre: as words of a title they would say something else.
constexpr auto kWords = std::to_array<Row>({
    {"Toys",
     "toy toys doll dolls teddy-bear spielzeug spielwaren puppe puppen teddybär jouet jouets "
     "poupée "
     "juguete juguetes muñeca giocattolo giocattoli bambola speelgoed"},
    {"Painting",
     "painting paintings watercolor watercolour oil-painting malerei malen aquarell ölmalerei "
     "gemälde peinture aquarelle pintura acuarela pittura acquerello dipinto dipinti schilderen "
     "schilderij schilderijen schilderkunst"},
    {"Cookbooks",
     "cookbook cookbooks kochbuch kochbücher livre-de-cuisine livres-de-cuisine libro-de-cocina "
     "libros-de-cocina recetario libro-di-cucina ricettario kookboek kookboeken"},
    {"National parks",
     "national-park national-parks nationalpark nationalparks parc-national parcs-nationaux "
     "parque-nacional parques-nacionales parco-nazionale parchi-nazionali nationaal-park "
     "nationale-parken"},
    {"Fashion",
     "fashion fashion-show fashion-week mode modenschau défilé-de-mode moda desfile-de-moda "
     "sfilata-di-moda modeshow"},
    {"Comedy",
     "comedy comedian stand-up-comedy sitcom kabarett komödie comédie humoriste comedia "
     "monólogo-cómico commedia cabarettista komedie cabaretier"},
    {"Gardening",
     "gardening garden gardens gärtnern garten gartenarbeit schrebergarten jardinage jardin "
     "jardinería jardín giardinaggio giardino tuinieren tuin moestuin"},
    {"Food",
     "food foods street-food meal meals dinner brunch essen mahlzeit abendessen nourriture repas "
     "dîner comida comidas cena cibo pasto eten maaltijd avondeten"},
    {"Skiing",
     "ski skis skiing skifahren skitour skitouren skiurlaub skikurs langlauf langlaufen "
     "faire-du-ski "
     "sports-d'hiver esquí esquiar sciare sci-alpino sci-di-fondo settimana-bianca skiën "
     "wintersport"},
    {"Snowboarding", "snowboard snowboards snowboarding snowboarden planche-à-neige"},
    {"Sports",
     "sport sports sporting-event football soccer tennis basketball volleyball handball hockey "
     "rugby cricket baseball badminton swimming athletics marathon half-marathon triathlon "
     "fussball fussballspiel schwimmen leichtathletik halbmarathon turnier sportif natation "
     "deporte deportes fútbol baloncesto natación maratón calcio pallacanestro pallavolo nuoto "
     "maratona voetbal zwemmen atletiek workout-running workout-trail-running workout-cycling "
     "workout-mountain-biking workout-rowing workout-climbing workout-boxing workout-golf "
     "workout-squash workout-strength-training workout-high-intensity-interval-training"},
    {"Hiking",
     "hiking hike hikes trekking trek backpacking mountain-hiking wandern wanderung wanderungen "
     "bergwandern bergtour bergtouren hüttentour randonnée randonnées senderismo excursionismo "
     "caminata escursionismo escursione escursioni wandelen wandeltocht bergwandeling"},
    {"Shopping",
     "shopping shopping-mall flea-market einkaufen einkaufsbummel einkaufszentrum flohmarkt "
     "shoppen "
     "achats centre-commercial compras centro-comercial acquisti centro-commerciale winkelen "
     "winkelcentrum"},
    {"Movies",
     "movie movies film films cinema kino kinofilm spielfilm filmabend cinéma película películas "
     "cine bioscoop"},
    {"Film festivals",
     "film-festival film-festivals filmfestival filmfestivals filmfestspiele festival-du-film "
     "festival-de-cinéma festival-de-cine festival-del-cinema festival-del-film"},
    {"Piano",
     "piano pianos pianist piano-lesson klavier klavierabend klavierkonzert klavierunterricht "
     "klavierstunde pianiste pianista pianoforte pianoles"},
    {"Music",
     "music musik musique música musica muziek concert concerts konzert konzerte concierto "
     "conciertos concerto concerti concerten live-music song songs choir chor chorprobe orchestra "
     "orchester orchestre orquesta orkest koor opera oper opéra gig genre-rock genre-pop "
     "genre-jazz "
     "genre-indie genre-classical genre-klassik genre-classique genre-folk genre-metal "
     "genre-electronic genre-electro genre-techno genre-house genre-hop genre-rap genre-soul "
     "genre-blues genre-country genre-reggae genre-punk genre-funk genre-latin genre-soundtrack "
     "genre-alternative genre-dance genre-ambient genre-songwriter genre-schlager genre-chanson"},
    {"Skateboarding",
     "skateboard skateboards skateboarding skatepark skate-park longboard skaten monopatín"},
    {"Photography",
     "photography photographer fotografie fotografieren fotokurs photographie photographe "
     "fotografía fotografia fotograferen photo-walk photo-exhibition fotoausstellung"},
    {"Travel",
     "travel traveling travelling trip trips journey vacation vacations holidays road-trip "
     "roadtrip "
     "city-trip reise reisen urlaub ausflug städtereise voyage voyages vacances viaje viajes "
     "vacaciones viaggio viaggi vacanza vacanze reis reizen vakantie stedentrip uitstap"},
    {"eSports", "esport esports e-sport e-sports lan-party gaming-tournament"},
    {"Baking",
     "baking bakery sourdough backen brotbacken kuchenbacken bäckerei gebäck sauerteig pâtisserie "
     "boulangerie repostería pastelería pasticceria panificazione bakken bakkerij zuurdesem"},
    {"Sports games",
     "sports-game sports-games sports-video-game sports-video-games sportspiel sportspiele "
     "jeu-de-sport jeux-de-sport juego-deportivo juegos-deportivos gioco-sportivo giochi-sportivi "
     "sportspel sportspellen"},
    {"Music festivals",
     "music-festival music-festivals rock-festival jazz-festival open-air-festival musikfestival "
     "musikfestivals rockfestival jazzfestival festival-de-musique festivals-de-musique "
     "festival-de-música festival-musicale festival-di-musica muziekfestival muziekfestivals"},
    {"Cuisines",
     "cuisine cuisines sushi ramen tapas italian-food chinese-food indian-food thai-food "
     "mexican-food japanese-food italienische-küche chinesische-küche indische-küche "
     "thailändische-küche mexikanische-küche japanische-küche gastronomie cocina gastronomía "
     "cucina "
     "gastronomia"},
    {"Plants",
     "plant plants houseplant flower flowers orchid botany botanical-garden pflanze pflanzen "
     "zimmerpflanze blume blumen botanik botanischer-garten plante plantes fleur fleurs "
     "jardin-botanique planta plantas flor flores jardín-botánico pianta piante fiore fiori "
     "orto-botanico bloem bloemen kamerplant"},
    {"Furniture",
     "furniture sofa armchair bookshelf möbel möbelhaus sessel meuble meubles fauteuil mueble "
     "muebles mobili divano poltrona meubel meubels"},
    {"Cameras",
     "camera cameras dslr mirrorless-camera kamera kameras spiegelreflexkamera appareil-photo "
     "appareils-photo cámara cámaras fotocamera fotocamere fototoestel fotocamera's"},
    {"Recipes",
     "recipe recipes rezept rezepte recette recettes receta recetas ricetta ricette recept "
     "recepten"},
    {"Restaurants",
     "restaurant restaurants bistro pizzeria gasthaus gasthof wirtshaus brasserie restaurante "
     "restaurantes ristorante ristoranti trattoria osteria eetcafé"},
});

std::optional<std::string_view> identifierOf(std::string_view name) {
    const auto wanted = foldWord(name);
    for (const auto& topic : topicCatalogue()) {
        if (foldWord(topic.name) == wanted) return topic.identifier;
    }
    return std::nullopt;
}

/// Calls `visit` with what stands between the separators, and the number of each, from 1.
template <class Visit>
void forEachPart(std::string_view text, char separator, const Visit& visit) {
    for (std::size_t number = 1;; ++number) {
        const auto end = std::min(text.find(separator), text.size());
        visit(text.substr(0, end), number);
        if (end == text.size()) return;
        text.remove_prefix(end + 1);
    }
}

}  // namespace

TopicWords::TopicWords() {
    for (const auto& row : kWords) {
        const auto* const topic =
            std::ranges::find(topicCatalogue(), row.topic, &Topic::name).base();
        for (auto& word : foldedWords(row.words)) add(topic->identifier, std::move(word));
    }
}

void TopicWords::add(std::string_view topic, std::string key) {
    topics_.emplace(std::move(key), topic);
}

std::vector<std::string> TopicWords::addFile(const std::filesystem::path& file) {
    const auto text = readFile(file, kLargestFile);
    if (!text) return {text.error().description()};
    std::vector<std::string> problems;
    forEachPart(*text, '\n', [&](std::string_view line, std::size_t number) {
        line = line.substr(0, line.find('#'));
        if (foldWord(line).empty()) return;
        const auto complain = [&](std::string_view what) {
            problems.push_back(fmt::format("{}:{}: {}", file.string(), number, what));
        };
        const auto colon = line.find(':');
        if (colon == line.npos) {
            complain("must be a topic's name, a colon and words");
            return;
        }
        const auto topic = identifierOf(line.substr(0, colon));
        if (!topic) {
            complain(fmt::format("there is no topic \"{}\"", cleanText(line.substr(0, colon))));
            return;
        }
        forEachPart(line.substr(colon + 1), ',', [&](std::string_view word, std::size_t) {
            auto key = foldWord(word);
            if (!key.empty()) add(*topic, std::move(key));
        });
    });
    return problems;
}

std::set<std::string_view> TopicWords::topicsOf(std::string_view text) const {
    std::set<std::string_view> topics;
    forEachPart(text, '\n',
                [&](std::string_view line, std::size_t) { addTopicsOfLine(line, topics); });
    return topics;
}

void TopicWords::addTopicsOfLine(std::string_view line, std::set<std::string_view>& topics) const {
    const auto tokens = foldedTokens(line, kMostTokens);
    for (std::size_t first = 0; first < tokens.size();) {
        std::size_t length = std::min(kLongestPhrase, tokens.size() - first);
        for (; length > 0; --length) {
            std::string key;
            for (std::size_t i = first; i < first + length; ++i) key += tokens[i];
            const auto [begin, end] = topics_.equal_range(key);
            if (begin == end) continue;
            for (auto found = begin; found != end; ++found) topics.insert(found->second);
            break;
        }
        first += std::max<std::size_t>(length, 1);
    }
}

}  // namespace keepsakes
